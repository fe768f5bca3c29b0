#include "tarnwick/utils/escape_text.h"

#include <algorithm>

#include "tarnwick/utils/utf8.h"

namespace tarnwick {

namespace {

// The UTF-8 characters from `first` to `last` are escaped. Their bytes sort as their numbers do.
struct Range {
  std::string_view first;
  std::string_view last;
};

constexpr Range kEscaped[] = {
    {"\xC2\x80", "\xC2\x9F"},          // U+0080 to U+009F: terminals take them for controls
    {"\xD8\x9C", "\xD8\x9C"},          // U+061C
    {"\xE2\x80\x8E", "\xE2\x80\x8F"},  // U+200E, U+200F
    {"\xE2\x80\xA8", "\xE2\x80\xAE"},  // U+2028 to U+202E
    {"\xE2\x81\xA6", "\xE2\x81\xA9"},  // U+2066 to U+2069
};

// REQUIRES: `character` is a UTF-8 character.
bool IsPlain(std::string_view character) {
  const char first = character.front();
  if (character.size() == 1) return first >= ' ' && first != '\x7F' && first != '\\';
  return std::none_of(std::begin(kEscaped), std::end(kEscaped), [&](const Range& range) {
    return character >= range.first && character <= range.last;
  });
}

void AppendEscaped(char byte, std::string* result) {
  constexpr char kDigits[] = "0123456789ABCDEF";
  const auto value = static_cast<unsigned char>(byte);
  if (byte == '\\') {
    result->append("\\\\");
    return;
  }
  result->append({'\\', 'x', kDigits[value >> 4], kDigits[value & 0x0F]});
}

}  // namespace

std::string EscapeText(std::string_view text) {
  std::string result;
  result.reserve(text.size());
  while (!text.empty()) {
    const size_t length = Utf8CharacterLength(text);
    const std::string_view character = text.substr(0, length == 0 ? 1 : length);
    if (length > 0 && IsPlain(character)) {
      result.append(character);
    } else {
      for (const char byte : character) AppendEscaped(byte, &result);
    }
    text.remove_prefix(character.size());
  }
  return result;
}

}  // namespace tarnwick
