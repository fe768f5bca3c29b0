// Small steps of the parsers.
#ifndef TARNWICK_PLATFORM_TEXT_VIEW_H_
#define TARNWICK_PLATFORM_TEXT_VIEW_H_

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <string>
#include <string_view>

namespace tarnwick {

// `text` without the characters of `set` at its ends.
inline std::string_view Trim(std::string_view text, std::string_view set) {
  const size_t first = std::min(text.find_first_not_of(set), text.size());
  return text.substr(first, text.find_last_not_of(set) + 1 - first);
}

// The number that `text` begins with, 0 when it begins with none. One that no int holds is the
// nearest int, on every word size.
inline int ToInt(const std::string& text) {
  const long value = std::strtol(text.c_str(), nullptr, 10);
  return static_cast<int>(std::clamp<long>(value, INT_MIN, INT_MAX));
}

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_TEXT_VIEW_H_
