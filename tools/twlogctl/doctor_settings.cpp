// The doctor's look at the settings file and at the rotation of the logs.
#include <fnmatch.h>

#include <algorithm>
#include <sstream>
#include <vector>

#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/doctor_paths.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/owned_directory.h"
#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/settings_file.h"

namespace {

constexpr char kRotationDirectory[] = "/etc/logrotate.d";

// Those that logrotate leaves out are what editors and package managers leave.
bool IsLeftOver(const std::string& name) {
  for (const std::string ending : {"~", ".bak", ".dpkg-old", ".dpkg-new", ".dpkg-dist", ".disabled",
                                   ".rpmsave", ".rpmorig", ".rpmnew", ".swp"}) {
    if (name.size() > ending.size() &&
        name.compare(name.size() - ending.size(), ending.size(), ending) == 0) {
      return true;
    }
  }
  return name.front() == '.';
}

std::vector<std::string> RotationFiles() {
  std::vector<std::string> files = {"/etc/logrotate.conf"};
  const OwnedDirectory directory(opendir(kRotationDirectory));
  if (!directory) return files;
  while (const struct dirent* const entry = readdir(directory.get())) {
    const std::string name = entry->d_name;
    if (!IsLeftOver(name)) files.push_back(std::string(kRotationDirectory) + "/" + name);
  }
  std::sort(files.begin() + 1, files.end());
  return files;
}

// A file names logs by patterns, with or without quotes, in front of a brace.
bool Names(const std::string& text, const char* path) {
  std::istringstream lines(text);
  for (std::string line; std::getline(lines, line);) {
    line.resize(std::min(line.find('#'), line.size()));
    for (char& letter : line) {
      if (letter == '"' || letter == '\'' || letter == '{') letter = ' ';
    }
    std::istringstream words(line);
    for (std::string word; words >> word;) {
      if (word.front() == '/' && fnmatch(word.c_str(), path, FNM_PATHNAME) == 0) return true;
    }
  }
  return false;
}

// Results: empty when nothing rotates the log.
std::string RotatedBy(const char* path) {
  for (const std::string& file : RotationFiles()) {
    if (Names(ReadWholeFile(file), path)) return file;
  }
  return "";
}

// Results: nothing when the file is there, or none, and nobody else chooses what it says.
std::optional<Finding> ForeignSettings(const std::string& path) {
  const std::string directory = path.substr(0, path.rfind('/'));
  const auto above = StateAt(directory);
  if (above && S_ISDIR(above->st_mode)) {
    if (auto open = OpenDirectory("settings", directory, *above)) return open;
  }
  const auto state = StateAt(path);
  if (!state) return std::nullopt;
  if (auto odd = OddFile("settings", path, *state)) return odd;
  if (!IsRootOrCaller(state->st_uid)) {
    return Finding{"settings", Verdict::kWrong,
                   path + " belongs to " + UserName(state->st_uid) +
                       ", who can choose the levels of the next start: " + DescribeState(*state),
                   "chown -h root:root " + path};
  }
  if ((state->st_mode & S_IWOTH) == 0) return std::nullopt;
  return Finding{
      "settings", Verdict::kWrong,
      path + ": anybody can choose the levels of the next start: " + DescribeState(*state),
      "chmod o-w " + path};
}

}  // namespace

void CheckSettings(Findings* findings) {
  if (const auto foreign = ForeignSettings(kSettingsPath)) {
    findings->push_back(*foreign);
    return;
  }
  SavedLevels saved;
  SettingsFault fault;
  const std::string path = kSettingsPath;
  switch (ReadSettings(&saved, &fault)) {
    case SettingsState::kRight:
      findings->push_back({"settings", Verdict::kRight, path, ""});
      return;
    case SettingsState::kMissing:
    case SettingsState::kNoLine:
      findings->push_back(
          {"settings", Verdict::kNote, "no levels are saved: " + fault.Describe(), ""});
      return;
    case SettingsState::kUnreadable:
      findings->push_back({"settings", Verdict::kWrong, fault.Describe(), "chmod u+r " + path});
      return;
    case SettingsState::kBroken:
      findings->push_back({"settings", Verdict::kWrong, fault.Describe(),
                           "twlogctl save, or correct the line by hand"});
      return;
  }
}

void CheckRotation(Findings* findings) {
  std::string missing;
  for (const char* path : {kMainLogPath, kNotificationLogPath}) {
    const std::string file = RotatedBy(path);
    if (file.empty()) {
      missing += (missing.empty() ? "" : " and ") + std::string(path);
    } else {
      findings->push_back({"rotation", Verdict::kRight, std::string(path) + ", by " + file, ""});
    }
  }
  if (missing.empty()) return;
  const std::string directory = kLogDirectory;
  findings->push_back({"rotation", Verdict::kWrong,
                       "nothing rotates " + missing + ", which grows until the disk is full",
                       "printf '" + directory +
                           "/*.log {\\n  size 10M\\n  rotate 5\\n  missingok\\n  nocreate\\n  "
                           "compress\\n  delaycompress\\n}\\n' >" +
                           kRotationDirectory + "/tarnwick"});
}
