// A strict JSON reader of its own (RFC 8259) that keeps nothing but what decides about a reply.
#ifndef TARNWICK_FUZZ_ORACLE_JSON_REPLY_H_
#define TARNWICK_FUZZ_ORACLE_JSON_REPLY_H_

#include <string>
#include <string_view>

namespace oracle {

struct JsonVerdict {
  bool strict = false;   // the text is JSON by the letter
  bool certain = true;   // no number or surrogate on which readers may differ
  bool success = false;  // the root is an object whose last "success" is true, or a number not 0
  int depth = 0;         // the deepest nesting of arrays and objects
};

// REQUIRES: the text is nested at most kMostLevels deep, or counts as not strict.
inline constexpr int kMostLevels = 3000;
JsonVerdict JudgeJson(const std::string& text);

// The deepest nesting in any text, with strings and comments left aside.
int NestingOf(const std::string& text);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_JSON_REPLY_H_
