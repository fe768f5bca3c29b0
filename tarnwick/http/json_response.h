// The JSON step of the one-call functions.
#ifndef TARNWICK_HTTP_JSON_RESPONSE_H_
#define TARNWICK_HTTP_JSON_RESPONSE_H_

#include <json/value.h>

#include <string>

namespace tarnwick {

// Parses a JSON service's response into `value`.
//
// Results: 0 when the member "success" of the object is true (for a number: not 0), and for an
//   empty text, which leaves `value` as it was; -1 when the text cannot be parsed, which is logged;
//   -2 when "success" is missing, not true, or of another kind.
// Text that is nested more deeply than the parser or the stack allow is not parsed. On a
// stack that is not the thread's own 64 KiB are assumed to be left.
int JsonParse(const std::string& text, Json::Value& value);

// The deepest nesting of objects and arrays in `text`, strings and comments aside.
int JsonDepth(const std::string& text);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_JSON_RESPONSE_H_
