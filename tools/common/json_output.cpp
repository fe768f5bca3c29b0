#include "tools/common/json_output.h"

#include <json/writer.h>

#include <cstdio>
#include <string_view>

#include "tarnwick/utils/utf8.h"

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

// Outside its strings a JSON text is plain ASCII, so the whole text can be looked through.
std::string ReplaceInvalid(std::string_view text) {
  std::string result;
  result.reserve(text.size());
  while (!text.empty()) {
    const size_t length = tarnwick::Utf8CharacterLength(text);
    result.append(length > 0 ? text.substr(0, length) : kReplacement);
    text.remove_prefix(length > 0 ? length : 1);
  }
  return result;
}

Json::StreamWriterBuilder CompactBuilder() {
  Json::StreamWriterBuilder builder;
  builder["commentStyle"] = "None";
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  // Microseconds of a time in seconds, without the digits that a binary fraction adds.
  builder["precisionType"] = "decimal";
  builder["precision"] = 6;
  return builder;
}

}  // namespace

std::string CompactJson(const Json::Value& value) {
  return ReplaceInvalid(Json::writeString(CompactBuilder(), value));
}

bool PrintJsonLine(const Json::Value& value) {
  const std::string line = CompactJson(value) + '\n';
  return fwrite(line.data(), 1, line.size(), stdout) == line.size() && fflush(stdout) == 0;
}
