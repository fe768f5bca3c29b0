// Records for --json: one compact JSON object a line.
#ifndef TARNWICK_TOOLS_COMMON_JSON_OUTPUT_H_
#define TARNWICK_TOOLS_COMMON_JSON_OUTPUT_H_

#include <json/value.h>

#include <string>

// `value` on one line without a line end. Bytes that are not valid UTF-8 become U+FFFD.
std::string CompactJson(const Json::Value& value);

// Prints `value` and a line feed to standard output, at once.
// Results: false when standard output is gone.
bool PrintJsonLine(const Json::Value& value);

#endif  // TARNWICK_TOOLS_COMMON_JSON_OUTPUT_H_
