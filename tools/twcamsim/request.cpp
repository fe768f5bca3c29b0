#include "tools/twcamsim/request.h"

#include <charconv>

std::string Request::Get(std::string_view name) const {
  for (const Header& header : headers) {
    if (EqualsIgnoringCase(header.name, name)) return header.value;
  }
  return "";
}

int64_t Request::Length() const {
  const std::string text = Get("Content-Length");
  int64_t length = -1;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), length);
  return error == std::errc() && end == text.data() + text.size() ? length : -1;
}

// The library's form POST writes "close;" (docs/wire.md), so only the beginning is compared.
bool Request::KeepsAlive() const {
  const std::string wish = Get("Connection");
  if (EqualsIgnoringCase(wish.substr(0, 5), "close")) return false;
  return version >= 11 || EqualsIgnoringCase(wish, "keep-alive");
}
