#include "tarnwick/platform/settings_text.h"

#include "tarnwick/platform/text_view.h"

namespace tarnwick {

namespace {

constexpr std::string_view kBlanks = " \t\r";

// The last quote of the line closes the value: a value may hold quotes itself.
std::string_view Unquote(std::string_view value) {
  if (value.empty() || value.front() != '"') return value;
  const size_t last = value.rfind('"');
  if (last == 0) return value.substr(1);
  return value.substr(1, last - 1);
}

bool LineHasKey(std::string_view line, std::string_view key, std::string_view* value) {
  const size_t equals = line.find('=');
  if (equals == std::string_view::npos || Trim(line.substr(0, equals), kBlanks) != key)
    return false;
  *value = Unquote(Trim(line.substr(equals + 1), kBlanks));
  return true;
}

}  // namespace

SettingsLine FindSettingsLine(std::string_view text, std::string_view key) {
  SettingsLine line;
  while (line.end < text.size()) {
    line.begin = line.end;
    const size_t feed = text.find('\n', line.begin);
    const size_t stop = feed == std::string_view::npos ? text.size() : feed;
    line.end = feed == std::string_view::npos ? text.size() : feed + 1;
    line.found = LineHasKey(text.substr(line.begin, stop - line.begin), key, &line.value);
    if (line.found) return line;
  }
  return {};
}

bool FormatSettingsLine(std::string_view format, std::string_view key, std::string_view value,
                        std::string* line) {
  const std::string_view arguments[] = {key, value};
  size_t used = 0;
  line->clear();
  for (size_t i = 0; i < format.size(); ++i) {
    if (format[i] != '%') {
      line->push_back(format[i]);
      continue;
    }
    if (++i == format.size()) return false;
    if (format[i] == '%') {
      line->push_back('%');
    } else if (format[i] == 's' && used < 2) {
      line->append(arguments[used++]);
    } else {
      return false;
    }
  }
  return used == 2;
}

std::string ReplaceSettingsLine(std::string_view text, std::string_view key,
                                std::string_view line) {
  const SettingsLine old = FindSettingsLine(text, key);
  std::string result(text.substr(0, old.found ? old.begin : text.size()));
  // A last line without its line feed must not swallow the new one.
  if (!result.empty() && result.back() != '\n') result.push_back('\n');
  result.append(line);
  if (!old.found || old.end == text.size()) return result;
  // Nor must a line format without one swallow the next key.
  if (line.back() != '\n') result.push_back('\n');
  result.append(text.substr(old.end));
  return result;
}

}  // namespace tarnwick
