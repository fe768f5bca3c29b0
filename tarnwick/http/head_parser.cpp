#include "tarnwick/http/head_parser.h"

#include <strings.h>

#include <algorithm>
#include <string>

#include "tarnwick/platform/text_view.h"

namespace tarnwick {

namespace {

constexpr char kNameEnds[] = " :;=";

// Removes the next word from the front of `rest`, and the one delimiter after it.
std::string_view NextToken(std::string_view* rest, const char* delimiters) {
  const size_t begin = std::min(rest->find_first_not_of(delimiters), rest->size());
  const size_t end = std::min(rest->find_first_of(delimiters, begin), rest->size());
  const std::string_view token = rest->substr(begin, end - begin);
  rest->remove_prefix(std::min(end + 1, rest->size()));
  return token;
}

bool EqualLetters(char a, char b) {
  return (a | 0x20) == (b | 0x20);
}

// The first and the last letter come first: they reject most other names without a call of
// strncasecmp. REQUIRES: `text` is not empty.
bool BeginsWith(std::string_view text, std::string_view name) {
  return EqualLetters(text[0], name[0]) && text.size() >= name.size() &&
         EqualLetters(text[name.size() - 1], name.back()) &&
         strncasecmp(text.data(), name.data(), name.size()) == 0;
}

// REQUIRES: `text` starts at the field's name, and is not empty.
const KeptField* FindKeptField(std::string_view text) {
  for (const KeptField& field : kKeptFields) {
    if (BeginsWith(text, field.name)) return &field;
  }
  return nullptr;
}

}  // namespace

StatusLine ParseStatusLine(std::string_view line, int* status) {
  const std::string_view version = NextToken(&line, " ");
  if (version.empty()) return StatusLine::kIncomplete;
  const std::string_view protocol = version.substr(0, 8);
  if (protocol != "HTTP/1.0" && protocol != "HTTP/1.1") return StatusLine::kNotHttp;
  const std::string_view number = NextToken(&line, " ");
  if (number.empty()) return StatusLine::kIncomplete;
  *status = ToInt(std::string(number));
  return StatusLine::kParsed;
}

HeaderLine ParseHeaderLine(std::string_view line) {
  HeaderLine result;
  const size_t begin = line.find_first_not_of(kNameEnds);
  if (begin == std::string_view::npos) return result;
  result.hasName = true;
  // No kept name holds a character that ends names, so it need not be cut out of the line first.
  line.remove_prefix(begin);
  result.field = FindKeptField(line);
  if (result.field == nullptr) return result;
  const size_t end =
      std::min(line.find_first_of(kNameEnds, result.field->name.size()), line.size());
  result.value = line.substr(std::min(end + 1, line.size()));
  return result;
}

std::string_view ParseCookie(std::string_view value) {
  const size_t semicolon = value.find(';');
  if (semicolon == std::string_view::npos) return {};
  return Trim(value.substr(0, semicolon + 1), " ");
}

}  // namespace tarnwick
