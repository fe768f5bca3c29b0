#include "tools/twhttp/secrets.h"

#include <algorithm>
#include <cctype>

#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"
#include "tools/common/text.h"
#include "tools/twhttp/message.h"

namespace {

constexpr char kMask[] = "***";

void ReplaceAll(std::string* text, const std::string& secret) {
  if (secret.empty()) return;
  for (size_t at = 0; (at = text->find(secret, at)) != std::string::npos; at += 3) {
    text->replace(at, secret.size(), kMask);
  }
}

std::string Base64(const std::string& text) {
  const tarnwick::UniqueMalloc<char> encoded(Base64Encode(text.c_str()));
  return encoded ? encoded.get() : "";
}

// The line between `begin` and `end`, which is its line feed or the end of the head.
std::string MaskLine(const Options& options, const std::string& line) {
  const size_t colon = line.find(':');
  if (colon == std::string::npos) return line;
  const size_t value = std::min(line.find_first_not_of(" \t", colon + 1), line.size());
  const size_t end = std::max(line.find_last_not_of("\r\n") + 1, value);
  return line.substr(0, value) +
         MaskValue(options, line.substr(0, colon), line.substr(value, end - value)) +
         line.substr(end);
}

}  // namespace

std::string MaskValue(const Options& options, const std::string& name, const std::string& value) {
  if (options.show_secrets) return value;
  if (EqualsIgnoringCase(name, "Cookie") || EqualsIgnoringCase(name, "Set-Cookie")) return kMask;
  const bool credentials =
      EqualsIgnoringCase(name, "Authorization") || EqualsIgnoringCase(name, "Proxy-Authorization");
  if (!credentials) return value;
  const size_t blank = value.find(' ');
  return (blank == std::string::npos ? "" : value.substr(0, blank + 1)) + kMask;
}

std::string MaskHead(const Options& options, const std::string& message) {
  std::string masked;
  size_t begin = 0;
  while (begin < message.size()) {
    const size_t feed = message.find('\n', begin);
    const size_t end = feed == std::string::npos ? message.size() : feed + 1;
    const std::string line = message.substr(begin, end - begin);
    begin = end;
    masked += MaskLine(options, line);
    if (line == "\r\n" || line == "\n") break;
  }
  return masked + message.substr(begin);
}

std::string MaskText(const Options& options, const std::string& text) {
  if (options.show_secrets) return text;
  std::string masked = text;
  ReplaceAll(&masked, Base64(options.target.user + ":" + options.target.password));
  ReplaceAll(&masked, options.target.password);
  ReplaceAll(&masked, options.cookie);
  // A header line that the library has logged.
  const size_t cookie = std::min(masked.find("ookie:"), masked.find("OOKIE:"));
  return cookie == std::string::npos ? masked : masked.substr(0, cookie + 6) + " ***";
}
