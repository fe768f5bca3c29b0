// The text of a settings file: finding and replacing the value of a key. Pure functions.
#ifndef TARNWICK_PLATFORM_SETTINGS_TEXT_H_
#define TARNWICK_PLATFORM_SETTINGS_TEXT_H_

#include <string>
#include <string_view>

namespace tarnwick {

// Where a key's line is in a text.
struct SettingsLine {
  bool found = false;
  size_t begin = 0;        // first byte of the line
  size_t end = 0;          // one past its line feed, or the end of the text
  std::string_view value;  // without its quotes; points into the text
};

// The first line of `text` that gives `key` a value.
SettingsLine FindSettingsLine(std::string_view text, std::string_view key);

// Puts key and value into a line format with two "%s" (key, then value) and "%%" for a percent
// sign.
// Results: false when the format is anything else; `line` is then unspecified.
bool FormatSettingsLine(std::string_view format, std::string_view key, std::string_view value,
                        std::string* line);

// `text` with `line` in the place of the key's first line, or at its end when the key has none.
// REQUIRES: `line` is not empty.
std::string ReplaceSettingsLine(std::string_view text, std::string_view key, std::string_view line);

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_SETTINGS_TEXT_H_
