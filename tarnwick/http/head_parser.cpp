#include "tarnwick/http/head_parser.h"

#include <strings.h>

#include <algorithm>
#include <climits>
#include <cstdlib>

#include "tarnwick/utils/utils.h"

namespace {

constexpr char kNameEnds[] = " :;=";

// Takes the next word off the front of `rest`, and the one delimiter behind it.
std::string_view TakeToken(std::string_view* rest, const char* delimiters) {
  const size_t begin = std::min(rest->find_first_not_of(delimiters), rest->size());
  const size_t end = std::min(rest->find_first_of(delimiters, begin), rest->size());
  const std::string_view token = rest->substr(begin, end - begin);
  rest->remove_prefix(std::min(end + 1, rest->size()));
  return token;
}

// A status that does not fit stays out of every range, on every word size.
int LeadingNumber(std::string_view text) {
  const long value = std::strtol(std::string(text).c_str(), nullptr, 10);
  return static_cast<int>(std::clamp<long>(value, INT_MIN, INT_MAX));
}

bool BeginsWith(std::string_view name, std::string_view known) {
  return name.size() >= known.size() && strncasecmp(name.data(), known.data(), known.size()) == 0;
}

Header HeaderOf(std::string_view name) {
  constexpr struct {
    std::string_view name;
    Header header;
  } kKnown[] = {
      {"content-type", Header::kContentType},      {"content-length", Header::kContentLength},
      {"Content-Range", Header::kContentRange},    {"Set-Cookie", Header::kSetCookie},
      {"WWW-Authenticate", Header::kAuthenticate}, {"Transfer-Encoding", Header::kTransferEncoding},
  };
  for (const auto& known : kKnown) {
    if (BeginsWith(name, known.name)) return known.header;
  }
  return Header::kOther;
}

}  // namespace

StatusLine ParseStatusLine(std::string_view line, int* status) {
  const std::string_view version = TakeToken(&line, " ");
  if (version.empty()) return StatusLine::kIncomplete;
  const std::string_view protocol = version.substr(0, 8);
  if (protocol != "HTTP/1.0" && protocol != "HTTP/1.1") return StatusLine::kNotHttp;
  const std::string_view number = TakeToken(&line, " ");
  if (number.empty()) return StatusLine::kIncomplete;
  *status = LeadingNumber(number);
  return StatusLine::kParsed;
}

HeaderLine ParseHeaderLine(std::string_view line) {
  HeaderLine result;
  const std::string_view name = TakeToken(&line, kNameEnds);
  result.hasName = !name.empty();
  result.header = HeaderOf(name);
  result.value = line;
  return result;
}

std::string CookieOf(std::string_view value) {
  const size_t semicolon = value.find(';');
  if (semicolon == std::string_view::npos) return std::string();
  return TrimString(std::string(value.substr(0, semicolon + 1)), " ");
}
