#include "tools/twlogctl/settings_file.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tools/common/private_file.h"
#include "tools/common/terminal.h"

namespace {

constexpr std::string_view kBlanks = " \t\r";

// A settings file of the whole product is small.
constexpr size_t kLongestFile = 16 << 20;

// A value and where it stands.
struct Value {
  std::string_view text;
  size_t line = 0;
  size_t column = 0;  // of its first byte
};

bool Fail(const Value& value, size_t offset, const std::string& text, SettingsFault* fault) {
  *fault = {value.line, value.column + offset, text};
  return false;
}

// Takes the quotes off, both or none: one alone is what half a file looks like.
bool Unquote(Value* value, SettingsFault* fault) {
  if (value->text.empty() || value->text.front() != '"') return true;
  if (value->text.size() < 2 || value->text.back() != '"') {
    return Fail(*value, value->text.size(), "the closing quote is missing", fault);
  }
  value->text = value->text.substr(1, value->text.size() - 2);
  ++value->column;
  return true;
}

// The value after the "=", when the line is one of `key`.
std::optional<Value> ValueInLine(std::string_view line, std::string_view key) {
  const size_t equals = line.find('=');
  const size_t start = line.find_first_not_of(kBlanks);
  if (equals == std::string_view::npos || start >= equals) return std::nullopt;
  const std::string_view name = line.substr(start, equals - start);
  if (name.substr(0, name.find_last_not_of(kBlanks) + 1) != key) return std::nullopt;
  const size_t first = line.find_first_not_of(kBlanks, equals + 1);
  if (first == std::string_view::npos) return Value{{}, 0, equals + 2};
  const size_t last = line.find_last_not_of(kBlanks);
  return Value{line.substr(first, last - first + 1), 0, first + 1};
}

// The first line of the key counts, as it does for the library.
bool FindValue(std::string_view text, const char* key, Value* found, SettingsFault* fault) {
  size_t number = 0;
  while (!text.empty()) {
    ++number;
    const size_t feed = text.find('\n');
    if (const auto value = ValueInLine(text.substr(0, feed), key)) {
      *found = *value;
      found->line = number;
      return Unquote(found, fault);
    }
    text.remove_prefix(feed == std::string_view::npos ? text.size() : feed + 1);
  }
  *fault = {0, 0, std::string("there is no line ") + key};
  return false;
}

// One field between commas. Results: -1 when it is no level.
int LevelOf(std::string_view field) {
  while (!field.empty() && field.front() == ' ') field.remove_prefix(1);
  while (!field.empty() && field.back() == ' ') field.remove_suffix(1);
  if (field.size() != 1 || field[0] < '0' || field[0] > '0' + LOG_LEVEL_DEBUG3) return -1;
  return field[0] - '0';
}

bool ParseLevels(const Value& value, std::vector<int>* levels, SettingsFault* fault) {
  size_t start = 0;
  for (;;) {
    const size_t comma = value.text.find(',', start);
    const std::string_view field = value.text.substr(
        start, comma == std::string_view::npos ? std::string_view::npos : comma - start);
    const int level = LevelOf(field);
    if (level < 0) {
      return Fail(value, start, "\"" + EscapeControls(field) + "\" is no level from 0 to 7", fault);
    }
    if (levels->size() == LOG_CATEG_COUNT) {
      return Fail(value, start, "there are more levels than categories", fault);
    }
    levels->push_back(level);
    if (comma == std::string_view::npos) return true;
    start = comma + 1;
  }
}

bool ParseTimeScale(const Value& value, bool* time_scale, SettingsFault* fault) {
  if (value.text != "yes" && value.text != "no") {
    const std::string found = "\"" + EscapeControls(value.text) + "\"";
    return Fail(value, 0, found + " is neither \"yes\" nor \"no\"", fault);
  }
  *time_scale = value.text == "yes";
  return true;
}

}  // namespace

std::string SettingsFault::Describe() const {
  std::string place = kSettingsPath;
  if (line > 0) place += ":" + std::to_string(line) + ":" + std::to_string(column);
  return place + ": " + text;
}

bool ParseSettings(std::string_view text, SavedLevels* saved, SettingsFault* fault) {
  Value levels;
  Value time_scale;
  return FindValue(text, kLevelsKey, &levels, fault) &&
         ParseLevels(levels, &saved->levels, fault) &&
         FindValue(text, kTimeScaleKey, &time_scale, fault) &&
         ParseTimeScale(time_scale, &saved->time_scale, fault);
}

SettingsState ReadSettings(SavedLevels* saved, SettingsFault* fault) {
  const tarnwick::UniqueFd fd = OpenRegularFile(kSettingsPath);
  std::string text;
  if (!fd.Valid() || !ReadAll(fd.Get(), kLongestFile, &text)) {
    const int error = errno;
    *fault = {0, 0, strerror(error)};
    return error == ENOENT ? SettingsState::kMissing : SettingsState::kUnreadable;
  }
  if (ParseSettings(text, saved, fault)) return SettingsState::kRight;
  return fault->line == 0 ? SettingsState::kNoLine : SettingsState::kBroken;
}
