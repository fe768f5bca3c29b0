#include "fuzz/oracle/json_response.h"

#include <algorithm>
#include <cstdlib>
#include <nlohmann/json.hpp>

namespace oracle {

namespace {

using Json = nlohmann::json;

// Told of each part of the text in turn. Every function returns true: go on.
class Judge : public nlohmann::json_sax<Json> {
 public:
  JsonVerdict verdict;

  bool null() override { return Value(false); }
  bool boolean(bool value) override { return Value(value); }
  bool string(std::string& /*value*/) override { return Value(false); }
  bool binary(Json::binary_t& /*value*/) override { return false; }  // no text has it

  bool number_integer(Json::number_integer_t value) override {
    if (value < -kSureNumber) verdict.certain = false;
    return Value(value != 0);
  }

  bool number_unsigned(Json::number_unsigned_t value) override {
    if (value > static_cast<uint64_t>(kSureNumber)) verdict.certain = false;
    return Value(value != 0);
  }

  bool number_float(Json::number_float_t value, const std::string& text) override {
    if (text.size() > kSureDigits || text.find_first_of("eE") != std::string::npos) {
      verdict.certain = false;
    }
    return Value(value != 0);
  }

  bool start_object(size_t /*members*/) override { return Enter(); }
  bool start_array(size_t /*elements*/) override { return Enter(); }
  bool end_object() override { return Leave(); }
  bool end_array() override { return Leave(); }

  bool key(std::string& name) override {
    decides_ = level_ == 1 && name == "success";
    return true;
  }

  bool parse_error(size_t /*position*/, const std::string& /*token*/,
                   const nlohmann::detail::exception& /*error*/) override {
    return false;
  }

 private:
  static constexpr size_t kSureDigits = 15;  // a number this long has one double
  static constexpr int64_t kSureNumber = 99'999'999'999'999;

  bool Value(bool truth) {
    if (decides_) verdict.success = truth;
    decides_ = false;
    return true;
  }

  bool Enter() {
    Value(false);
    verdict.depth = std::max(verdict.depth, ++level_);
    return true;
  }

  bool Leave() {
    --level_;
    return true;
  }

  int level_ = 0;
  bool decides_ = false;  // the next value is the root's "success"
};

// One past the comment that begins at `at`, or `at` when none does.
size_t SkipComment(const std::string& text, size_t at) {
  if (text.compare(at, 2, "/*") == 0) {
    const size_t end = text.find("*/", at + 2);
    return end == std::string::npos ? text.size() : end + 2;
  }
  if (text.compare(at, 2, "//") == 0) return std::min(text.find_first_of("\r\n", at), text.size());
  return at;
}

// One past the string that begins at `at`.
size_t SkipString(const std::string& text, size_t at) {
  for (++at; at < text.size() && text[at] != '"'; ++at) {
    if (text[at] == '\\') ++at;
  }
  return std::min(at + 1, text.size());
}

}  // namespace

JsonVerdict JudgeJson(const std::string& text) {
  // The parser takes a zero byte for the end of the text, and it skips a byte order mark; neither is
  // JSON.
  if (text.find('\0') != std::string::npos || text.rfind("\xef\xbb\xbf", 0) == 0) return {};
  Judge judge;
  judge.verdict.strict = Json::sax_parse(text, &judge);
  return judge.verdict;
}

int NestingOf(const std::string& text) {
  int level = 0;
  int deepest = 0;
  for (size_t at = 0; at < text.size();) {
    const size_t end = text[at] == '"' ? SkipString(text, at) : SkipComment(text, at);
    if (end > at) {
      at = end;
      continue;
    }
    if (text[at] == '[' || text[at] == '{') deepest = std::max(deepest, ++level);
    if (text[at] == ']' || text[at] == '}') --level;
    ++at;
  }
  return deepest;
}

}  // namespace oracle
