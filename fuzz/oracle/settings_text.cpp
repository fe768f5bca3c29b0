#include "fuzz/oracle/settings_text.h"

#include <algorithm>
#include <climits>
#include <cstdint>

namespace oracle {

namespace {

constexpr char kBlanks[] = " \t\r";

std::string Stripped(std::string text) {
  const std::string blanks = kBlanks;
  while (!text.empty() && blanks.find(text.front()) != std::string::npos) text.erase(0, 1);
  while (!text.empty() && blanks.find(text.back()) != std::string::npos) text.pop_back();
  return text;
}

std::string Unquoted(std::string text) {
  if (text.empty() || text.front() != '"') return text;
  text.erase(0, 1);
  // The last quote closes the value; without one it is the rest of the line.
  const size_t last = text.rfind('"');
  return last == std::string::npos ? text : text.substr(0, last);
}

bool EndsLine(const std::string& text) {
  return !text.empty() && text.back() == '\n';
}

// The decimal number at the start of the field; the nearest one when it does not fit.
int LeadingNumber(const std::string& field) {
  const size_t begin = std::min(field.find_first_not_of(" \t\n\v\f\r"), field.size());
  const bool negative = field[begin] == '-';
  size_t at = begin + (negative || field[begin] == '+' ? 1 : 0);
  constexpr int64_t kBeyond = int64_t{1} << 40;
  int64_t value = 0;
  for (; at < field.size() && field[at] >= '0' && field[at] <= '9'; ++at) {
    value = std::min(value * 10 + (field[at] - '0'), kBeyond);
  }
  return static_cast<int>(std::clamp<int64_t>(negative ? -value : value, INT_MIN, INT_MAX));
}

}  // namespace

std::vector<std::string> LinesOf(const std::string& text) {
  std::vector<std::string> lines;
  std::string line;
  for (const char c : text) {
    line += c;
    if (c != '\n') continue;
    lines.push_back(line);
    line.clear();
  }
  if (!line.empty()) lines.push_back(line);
  return lines;
}

std::optional<std::string> ValueIn(const std::string& line, const std::string& key) {
  std::string content = line;
  if (EndsLine(content)) content.pop_back();
  content = Stripped(content);
  const size_t sign = content.find('=');
  if (!IsWord(key) || content[0] == '#' || sign == std::string::npos) return std::nullopt;
  if (Stripped(content.substr(0, sign)) != key) return std::nullopt;
  return Unquoted(Stripped(content.substr(sign + 1)));
}

std::optional<std::string> ValueOf(const std::string& text, const std::string& key) {
  for (const std::string& line : LinesOf(text)) {
    if (auto value = ValueIn(line, key)) return value;
  }
  return std::nullopt;
}

std::string WithSetting(const std::string& text, const std::string& key, const std::string& line) {
  std::string out;
  bool done = false;
  for (const std::string& old : LinesOf(text)) {
    if (done || !ValueIn(old, key)) {
      // A line that follows must begin on a line of its own.
      if (!out.empty() && !EndsLine(out)) out += '\n';
      out += old;
      continue;
    }
    out += line;
    done = true;
  }
  if (done) return out;
  if (!out.empty() && !EndsLine(out)) out += '\n';
  return out + line;
}

std::optional<std::string> Formatted(const std::string& format, const std::string& key,
                                     const std::string& value) {
  std::string out;
  int texts = 0;
  for (size_t i = 0; i < format.size(); ++i) {
    if (format[i] != '%') {
      out += format[i];
      continue;
    }
    const char conversion = ++i < format.size() ? format[i] : '\0';
    if (conversion == '%') {
      out += '%';
    } else if (conversion == 's' && texts < 2) {
      out += texts++ == 0 ? key : value;
    } else {
      return std::nullopt;
    }
  }
  if (texts != 2) return std::nullopt;
  return out;
}

bool IsWord(const std::string& key) {
  return !key.empty() && key.find_first_of(" \t\r\n=#") == std::string::npos;
}

bool CanBeReadBack(const std::string& key, const std::string& value) {
  return IsWord(key) && value.find('\n') == std::string::npos;
}

std::vector<int> IntList(const std::string& text, const std::string& delimiters) {
  std::vector<int> numbers;
  if (text.empty() || delimiters.empty()) return numbers;
  std::string field;
  for (const char c : text) {
    if (delimiters.find(c) == std::string::npos) {
      field += c;
      continue;
    }
    if (!field.empty()) numbers.push_back(LeadingNumber(field));
    field.clear();
  }
  if (!field.empty()) numbers.push_back(LeadingNumber(field));
  return numbers;
}

int Load(const std::string& text, Levels* record) {
  constexpr size_t kLevelsBuffer = 1024;
  constexpr size_t kFlagBuffer = 8;
  const std::string levels = ValueOf(text, "tw_dbglog_settings").value_or("");
  const std::string flag = ValueOf(text, "tw_dbglog_time_scale").value_or("");
  const std::string kept = levels.substr(0, kLevelsBuffer - 1).c_str();
  const std::vector<int> numbers = IntList(kept, ",");
  for (size_t i = 0; i < numbers.size() && i < record->levels.size(); ++i) {
    record->levels[i] = numbers[i];
  }
  if (flag.empty()) return -1;
  record->milliseconds = std::string(flag.substr(0, kFlagBuffer - 1).c_str()) == "yes";
  return levels.empty() ? -1 : 0;
}

}  // namespace oracle
