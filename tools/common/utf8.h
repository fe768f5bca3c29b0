// Telling text from bytes.
#ifndef TARNWICK_TOOLS_COMMON_UTF8_H_
#define TARNWICK_TOOLS_COMMON_UTF8_H_

#include <cstddef>
#include <string_view>

// The length in bytes of the UTF-8 character that `text` begins with: 1 to 4; 0 when it begins with
// none, which covers overlong forms, surrogates and everything beyond U+10FFFF.
size_t Utf8CharacterLength(std::string_view text);

#endif  // TARNWICK_TOOLS_COMMON_UTF8_H_
