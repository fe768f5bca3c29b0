#include "fuzz/oracle/json_reply.h"

#include <algorithm>
#include <cctype>

namespace oracle {

namespace {

class Judge {
 public:
  explicit Judge(const std::string& text) : text_(text) {}

  JsonVerdict Verdict() {
    SkipSpace();
    verdict_.strict = Value(1);
    SkipSpace();
    if (at_ != text_.size()) verdict_.strict = false;
    return verdict_;
  }

 private:
  static constexpr size_t kSureDigits = 15;  // a number this long has one double

  bool More() const { return at_ < text_.size(); }
  char Next() const { return More() ? text_[at_] : '\0'; }

  bool Take(char c) {
    if (!More() || text_[at_] != c) return false;
    ++at_;
    return true;
  }

  bool TakeWord(std::string_view word) {
    if (text_.compare(at_, word.size(), word) != 0) return false;
    at_ += word.size();
    return true;
  }

  void SkipSpace() {
    while (More() && std::string_view(" \t\r\n").find(Next()) != std::string_view::npos) ++at_;
  }

  // A value; `truth_` is then what it means for "success".
  bool Value(int level) {
    truth_ = false;
    const char c = Next();
    if (c == '{' || c == '[') return Nested(level);
    if (c == '"') return String();
    if (c == '-' || std::isdigit(static_cast<unsigned char>(c)) != 0) return Number();
    if (TakeWord("true")) return truth_ = true;
    return TakeWord("false") || TakeWord("null");
  }

  bool Nested(int level) {
    if (level > kMostLevels) return false;
    verdict_.depth = std::max(verdict_.depth, level);
    const bool good = Next() == '{' ? Object(level) : Array(level);
    truth_ = false;
    return good;
  }

  bool Array(int level) {
    Take('[');
    SkipSpace();
    if (Take(']')) return true;
    do {
      SkipSpace();
      if (!Value(level + 1)) return false;
      SkipSpace();
    } while (Take(','));
    return Take(']');
  }

  bool Object(int level) {
    Take('{');
    SkipSpace();
    if (Take('}')) return true;
    do {
      if (!Member(level)) return false;
      SkipSpace();
    } while (Take(','));
    return Take('}');
  }

  bool Member(int level) {
    SkipSpace();
    if (!String()) return false;
    const bool decides = level == 1 && string_ == "success";
    SkipSpace();
    if (!Take(':')) return false;
    SkipSpace();
    if (!Value(level + 1)) return false;
    if (decides) verdict_.success = truth_;
    return true;
  }

  bool String() {
    string_.clear();
    if (!Take('"')) return false;
    while (More() && Next() != '"') {
      if (static_cast<unsigned char>(Next()) < 0x20) return false;
      if (Take('\\')) {
        if (!Escape()) return false;
      } else {
        string_ += text_[at_++];
      }
    }
    return Take('"');
  }

  bool Escape() {
    static constexpr std::string_view kNames = "\"\\/bfnrt";
    static constexpr std::string_view kMeanings = "\"\\/\b\f\n\r\t";
    if (Take('u')) return CodePoint();
    const size_t name = More() ? kNames.find(Next()) : std::string_view::npos;
    if (name == std::string_view::npos) return false;
    string_ += kMeanings[name];
    ++at_;
    return true;
  }

  // Beyond ASCII a name cannot be "success" any more, so any stand-in will do.
  bool CodePoint() {
    unsigned code = 0;
    for (int i = 0; i < 4; ++i, ++at_) {
      const int c = std::tolower(static_cast<unsigned char>(Next()));
      if (!More() || std::isxdigit(c) == 0) return false;
      code = code * 16 + static_cast<unsigned>(c <= '9' ? c - '0' : c - 'a' + 10);
    }
    if (code >= 0xd800 && code <= 0xdfff) verdict_.certain = false;
    string_ += code < 0x80 ? static_cast<char>(code) : '\xff';
    return true;
  }

  size_t Digits() {
    const size_t begin = at_;
    while (More() && std::isdigit(static_cast<unsigned char>(Next())) != 0) {
      if (text_[at_++] != '0') truth_ = true;
    }
    return at_ - begin;
  }

  bool Number() {
    const size_t begin = at_;
    Take('-');
    const bool zero = Next() == '0';
    const size_t digits = Digits();
    if (digits == 0 || (zero && digits > 1)) return false;
    if (Take('.') && Digits() == 0) return false;
    const bool truth = truth_;
    if (Take('e') || Take('E')) {
      verdict_.certain = false;
      if (!Take('-')) Take('+');
      if (Digits() == 0) return false;
    }
    truth_ = truth;
    if (at_ - begin > kSureDigits) verdict_.certain = false;
    return true;
  }

  const std::string& text_;
  size_t at_ = 0;
  bool truth_ = false;
  std::string string_;
  JsonVerdict verdict_;
};

// One past the comment that begins at `at`, or `at` when none does.
size_t BehindComment(const std::string& text, size_t at) {
  if (text.compare(at, 2, "/*") == 0) {
    const size_t end = text.find("*/", at + 2);
    return end == std::string::npos ? text.size() : end + 2;
  }
  if (text.compare(at, 2, "//") == 0) return std::min(text.find_first_of("\r\n", at), text.size());
  return at;
}

// One past the string that begins at `at`.
size_t BehindString(const std::string& text, size_t at) {
  for (++at; at < text.size() && text[at] != '"'; ++at) {
    if (text[at] == '\\') ++at;
  }
  return std::min(at + 1, text.size());
}

}  // namespace

JsonVerdict JudgeJson(const std::string& text) {
  return Judge(text).Verdict();
}

int NestingOf(const std::string& text) {
  int level = 0;
  int deepest = 0;
  for (size_t at = 0; at < text.size();) {
    const size_t behind = text[at] == '"' ? BehindString(text, at) : BehindComment(text, at);
    if (behind > at) {
      at = behind;
      continue;
    }
    if (text[at] == '[' || text[at] == '{') deepest = std::max(deepest, ++level);
    if (text[at] == ']' || text[at] == '}') --level;
    ++at;
  }
  return deepest;
}

}  // namespace oracle
