// What people meant by the names that they typed.
#ifndef TARNWICK_TOOLS_COMMON_TEXT_H_
#define TARNWICK_TOOLS_COMMON_TEXT_H_

#include <string>
#include <string_view>
#include <vector>

// `text` with its ASCII letters in lower case.
std::string LowerCase(std::string_view text);

// The three names at most that differ least from `text` (edit distance), the nearest first; none
// when all of them differ by more than half of their letters. Those that differ by two letters more
// than the nearest are left out.
std::vector<std::string> NearestNames(std::string_view text, const std::vector<std::string>& names);

#endif  // TARNWICK_TOOLS_COMMON_TEXT_H_
