#include "tools/twlogctl/settings_commands.h"

#include <json/value.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tarnwick/platform/qlibcfile.h"
#include "tools/common/json_output.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/settings_file.h"

namespace {

const char* StampText(bool time_scale) {
  return time_scale ? "milliseconds" : "seconds";
}

// One thing in which the record and the file differ.
struct Difference {
  std::string name;
  std::string record;
  std::string file;
};

std::vector<Difference> Compare(const TWDbgLogCfg& record, const SavedLevels& saved) {
  std::vector<Difference> differences;
  for (size_t i = 0; i < saved.levels.size(); ++i) {
    const auto categ = static_cast<LOG_CATEG>(i);
    if (record.Level(categ) == saved.levels[i]) continue;
    differences.push_back(
        {Enum2String(categ), LevelText(record.Level(categ)), LevelText(saved.levels[i])});
  }
  if (record.TimeScale() != saved.time_scale) {
    differences.push_back(
        {"time stamps", StampText(record.TimeScale()), StampText(saved.time_scale)});
  }
  return differences;
}

// Complains about a file that cannot be used.
std::optional<SavedLevels> ReadWholeSettings() {
  SavedLevels saved;
  SettingsFault fault;
  const SettingsState state = ReadSettings(&saved, &fault);
  if (state != SettingsState::kRight) {
    const bool unsaved = state == SettingsState::kMissing || state == SettingsState::kNoLine;
    Complain(fault.Describe() + (unsaved ? "; \"twlogctl save\" writes it" : ""));
    return std::nullopt;
  }
  if (saved.levels.size() < LOG_CATEG_COUNT) {
    Complain(std::string(kSettingsPath) + " has levels for the first " +
             std::to_string(saved.levels.size()) + " categories only");
  }
  return saved;
}

void PrintDifference(const std::string& name, const char* first_name, const std::string& first,
                     const char* second_name, const std::string& second) {
  Json::Value line;
  line[name == "time stamps" ? "setting" : "category"] =
      name == "time stamps" ? "time_stamps" : name;
  line[first_name] = first;
  line[second_name] = second;
  PrintJsonLine(line);
}

void PrintLoaded(const std::vector<Difference>& changes, bool json) {
  for (const Difference& change : changes) {
    if (json) {
      PrintDifference(change.name, "old", change.record, "new", change.file);
    } else {
      printf("%s: %s -> %s\n", change.name.c_str(), change.record.c_str(), change.file.c_str());
    }
  }
  if (changes.empty() && !json) puts("nothing changes");
}

// What the two lines of the file were, so that a save that fails between them can be undone.
class SavedLines {
 public:
  SavedLines() : levels_(Read(kLevelsKey)) {}

  // Results: false when the new levels stay beside the old flag.
  bool PutLevelsBack() const {
    if (Read(kLevelsKey) == levels_) return true;
    return !levels_.empty() &&
           QLIBCFileSetKeyValue(kSettingsPath, kLevelsKey, levels_.c_str(), "%s=\"%s\"\n") == 0;
  }

 private:
  static std::string Read(const char* key) {
    char value[1024] = "";
    QLIBCFileGetKeyValue(kSettingsPath, key, value, sizeof(value), 0);
    return value;
  }

  std::string levels_;
};

}  // namespace

int SaveRecord(bool json) {
  const AttachedRecord record = AttachRecord(Access::kRead);
  if (!record) return kExitWrong;
  const SavedLines before;
  errno = 0;
  if (record->SaveDbgLogSettings() != 0) {
    const int error = errno;
    const bool undone = before.PutLevelsBack();
    Complain(std::string("cannot write ") + kSettingsPath + ": " +
             (error != 0 ? strerror(error) : "the write failed") +
             (undone ? "; the file is as it was" : "; it has the new levels and the old flag"));
    return kExitWrong;
  }
  if (json) {
    Json::Value line;
    line["saved"] = kSettingsPath;
    PrintJsonLine(line);
  } else {
    printf("saved in %s\n", kSettingsPath);
  }
  return kExitDone;
}

int LoadRecord(bool json) {
  const std::optional<SavedLevels> saved = ReadWholeSettings();
  if (!saved) return kExitWrong;
  const AttachedRecord record = AttachRecord(Access::kWrite);
  if (!record) return kExitWrong;
  // What was checked is what is set: the library would read the file once more.
  PrintLoaded(Compare(*record, *saved), json);
  for (size_t i = 0; i < saved->levels.size(); ++i) {
    record->SetLevel(static_cast<LOG_CATEG>(i), saved->levels[i]);
  }
  record->SetTimeScale(saved->time_scale);
  return kExitDone;
}

int DiffRecord(bool json) {
  const std::optional<SavedLevels> saved = ReadWholeSettings();
  if (!saved) return kExitWrong;
  const AttachedRecord record = AttachRecord(Access::kRead);
  if (!record) return kExitWrong;
  const std::vector<Difference> differences = Compare(*record, *saved);
  for (const Difference& difference : differences) {
    if (json) {
      PrintDifference(difference.name, "record", difference.record, "file", difference.file);
    } else {
      printf("%s: record %s, file %s\n", difference.name.c_str(), difference.record.c_str(),
             difference.file.c_str());
    }
  }
  if (differences.empty() && !json) puts("record and file are the same");
  return differences.empty() ? kExitDone : kExitWrong;
}
