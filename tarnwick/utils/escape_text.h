// Text of somebody else, made fit for one line of a log.
#ifndef TARNWICK_UTILS_ESCAPE_TEXT_H_
#define TARNWICK_UTILS_ESCAPE_TEXT_H_

#include <string>
#include <string_view>

namespace tarnwick {

// `text` with \xHH, in upper case, for each byte
//   - of the control characters U+0000 to U+001F and U+007F to U+009F,
//   - of the line and paragraph separators, U+2028 and U+2029,
//   - of the characters that turn the direction of text, U+061C, U+200E, U+200F, U+202A to U+202E
//     and U+2066 to U+2069,
//   - that belongs to no valid UTF-8 character (RFC 3629),
// and with a doubled backslash for a backslash, so that no two texts give the same.
std::string EscapeText(std::string_view text);

}  // namespace tarnwick

#endif  // TARNWICK_UTILS_ESCAPE_TEXT_H_
