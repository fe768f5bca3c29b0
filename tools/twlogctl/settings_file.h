// The settings file read strictly: the library takes what it can use, and a person wants to know
// what it cannot.
#ifndef TARNWICK_TOOLS_TWLOGCTL_SETTINGS_FILE_H_
#define TARNWICK_TOOLS_TWLOGCTL_SETTINGS_FILE_H_

#include <string>
#include <string_view>
#include <vector>

constexpr char kSettingsPath[] = "/var/packages/Tarnwick/etc/settings.conf";
constexpr char kLevelsKey[] = "tw_dbglog_settings";
constexpr char kTimeScaleKey[] = "tw_dbglog_time_scale";

struct SavedLevels {
  std::vector<int> levels;  // of the first categories; all 74 in a file that was saved whole
  bool time_scale = false;
};

// What is wrong with a file, with line and column from 1 on; a line of 0 is the file as a whole.
struct SettingsFault {
  size_t line = 0;
  size_t column = 0;
  std::string text;

  // "PATH:3:27: text"
  std::string Describe() const;
};

// How a settings file was found. The file is the whole product's: before the first save it may be
// there without the lines of the levels.
enum class SettingsState { kRight, kMissing, kNoLine, kUnreadable, kBroken };

// Reads what the text of a settings file says about levels. Results: false with a fault.
bool ParseSettings(std::string_view text, SavedLevels* saved, SettingsFault* fault);

// The same for the product's file.
SettingsState ReadSettings(SavedLevels* saved, SettingsFault* fault);

#endif  // TARNWICK_TOOLS_TWLOGCTL_SETTINGS_FILE_H_
