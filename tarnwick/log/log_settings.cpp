// The record's way from and to the settings file.
#include "tarnwick/log/log_settings.h"

#include <fcntl.h>

#include <cstring>
#include <exception>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/file_lock.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tarnwick/platform/settings_file.h"
#include "tarnwick/platform/text_view.h"
#include "tarnwick/platform/unique.h"

using namespace tarnwick;

namespace {

constexpr char kSettingsFile[] = "/var/packages/Tarnwick/etc/settings.conf";
constexpr char kLevelsKey[] = "tw_dbglog_settings";
constexpr char kTimeScaleKey[] = "tw_dbglog_time_scale";
constexpr char kLineFormat[] = "%s=\"%s\"\n";

}  // namespace

namespace tarnwick {

std::vector<int> SplitToIntList(const std::string& text, const std::string& delimiters) {
  std::vector<int> list;
  if (text.empty() || delimiters.empty()) return list;
  const UniqueMalloc<char> copy(strdup(text.c_str()));
  if (!copy) return list;
  char* rest = nullptr;
  for (char* token = strtok_r(copy.get(), delimiters.c_str(), &rest); token != nullptr;
       token = strtok_r(nullptr, delimiters.c_str(), &rest)) {
    list.push_back(ToInt(token));
  }
  return list;
}

int ReadSettingValue(const char* path, const char* key, char* value, int size) {
  return QLIBCFileGetKeyValue(path, key, value, size, 0);
}

int WriteSettingValue(const char* path, const char* key, const char* value,
                      const char* format) try {
  std::string file;
  struct stat attributes;
  if (!FollowSettingsLinks(path, &file)) return -1;
  const UniqueFd fd(OpenSettings(file.c_str(), O_CREAT | O_NOFOLLOW, 0644, &attributes));
  if (!fd.Valid()) return -1;
  const FileLock lock(fd.Get());
  if (!lock.Held()) return -1;
  return QLIBCFileSetKeyValue(path, key, value, format);
} catch (const std::exception&) {  // memory ran out
  return -1;
}

}  // namespace tarnwick

int TWDbgLogCfg::Init(int /*unused*/) {
  SetTimeScale(false);
  for (int categ = 0; categ < LOG_CATEG_COUNT; ++categ) {
    SetLevel(static_cast<LOG_CATEG>(categ), LOG_LEVEL_NOTICE);
  }
  return LoadDbgLogSettings();
}

int TWDbgLogCfg::LoadDbgLogSettings() try {
  const NoCancel no_cancel;
  char levels[1024];
  const int levelsRead = ReadSettingValue(kSettingsFile, kLevelsKey, levels, sizeof(levels));
  if (levelsRead >= 1) {
    int categ = 0;
    // SetLevel ignores what a longer list holds beyond the last category.
    for (const int level : SplitToIntList(levels, ",")) {
      SetLevel(static_cast<LOG_CATEG>(categ++), level);
    }
  }
  char timeScale[8];
  if (ReadSettingValue(kSettingsFile, kTimeScaleKey, timeScale, sizeof(timeScale)) < 1) return -1;
  SetTimeScale(std::strcmp(timeScale, "yes") == 0);
  return levelsRead < 1 ? -1 : 0;
} catch (const std::exception&) {  // memory ran out
  return -1;
}

int TWDbgLogCfg::SaveDbgLogSettings() try {
  const NoCancel no_cancel;
  std::string levels;
  for (int categ = 0; categ < LOG_CATEG_COUNT; ++categ) {
    if (categ > 0) levels += ',';
    levels += std::to_string(Level(static_cast<LOG_CATEG>(categ)));
  }
  const int levelsResult =
      WriteSettingValue(kSettingsFile, kLevelsKey, levels.c_str(), kLineFormat);
  // Written also when the levels were not; pinned by
  // Settings.TheFlagIsSavedAlsoWhenTheLevelsWereNot.
  const int timeScaleResult =
      WriteSettingValue(kSettingsFile, kTimeScaleKey, TimeScale() ? "yes" : "no", kLineFormat);
  return levelsResult == -1 || timeScaleResult == -1 ? -1 : 0;
} catch (const std::exception&) {  // memory ran out
  return -1;
}
