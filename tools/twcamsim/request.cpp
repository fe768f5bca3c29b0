#include "tools/twcamsim/request.h"

#include <strings.h>

#include <charconv>

bool SameName(std::string_view left, std::string_view right) {
  return left.size() == right.size() && strncasecmp(left.data(), right.data(), left.size()) == 0;
}

std::string Request::Get(std::string_view name) const {
  for (const Header& header : headers) {
    if (SameName(header.name, name)) return header.value;
  }
  return "";
}

int64_t Request::Length() const {
  const std::string text = Get("Content-Length");
  int64_t length = -1;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), length);
  return error == std::errc() && end == text.data() + text.size() ? length : -1;
}

// A client in the field ends its "close" with a semicolon, so the beginning counts.
bool Request::KeepsAlive() const {
  const std::string wish = Get("Connection");
  if (SameName(wish.substr(0, 5), "close")) return false;
  return version >= 11 || SameName(wish, "keep-alive");
}
