// Strings as people type them and as HTTP compares them.
#ifndef TARNWICK_TOOLS_COMMON_TEXT_H_
#define TARNWICK_TOOLS_COMMON_TEXT_H_

#include <string>
#include <string_view>
#include <vector>

// `text` with its ASCII letters in lower case.
std::string LowerCase(std::string_view text);

// True when the strings differ in nothing but the case of ASCII letters.
bool EqualsIgnoringCase(std::string_view left, std::string_view right);

// "did you mean a, b?" with the three names at most that differ least from `text` (edit distance),
// the nearest first. Empty when all of them differ by more than half of their letters; those that
// differ by two letters more than the nearest are left out.
std::string DidYouMean(std::string_view text, const std::vector<std::string>& names);

#endif  // TARNWICK_TOOLS_COMMON_TEXT_H_
