// What decides about a response, by a parser that is not the library's: nlohmann's, which accepts
// nothing but RFC 8259.
#ifndef TARNWICK_FUZZ_ORACLE_JSON_RESPONSE_H_
#define TARNWICK_FUZZ_ORACLE_JSON_RESPONSE_H_

#include <string>

namespace oracle {

struct JsonVerdict {
  bool strict = false;   // the text is JSON by the letter
  bool certain = true;   // no number on which parsers may differ
  bool success = false;  // the root is an object whose last "success" is true, or a number not 0
  int depth = 0;         // the deepest nesting of arrays and objects
};

JsonVerdict JudgeJson(const std::string& text);

// The deepest nesting in any text, with strings and comments left aside.
int NestingOf(const std::string& text);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_JSON_RESPONSE_H_
