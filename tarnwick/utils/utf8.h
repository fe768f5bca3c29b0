// Telling text from bytes.
#ifndef TARNWICK_UTILS_UTF8_H_
#define TARNWICK_UTILS_UTF8_H_

#include <cstddef>
#include <string_view>

namespace tarnwick {

// The length in bytes of the UTF-8 character that `text` begins with: 1 to 4; 0 when it begins with
// none, which covers overlong forms, surrogates and everything beyond U+10FFFF.
size_t Utf8CharacterLength(std::string_view text);

}  // namespace tarnwick

#endif  // TARNWICK_UTILS_UTF8_H_
