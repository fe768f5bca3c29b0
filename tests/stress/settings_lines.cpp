#include "tests/stress/settings_lines.h"

#include <unistd.h>

#include <cstdlib>
#include <sstream>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/files.h"

namespace {

constexpr char kHead[] = "# head\n";
constexpr char kTail[] = "# tail\n";
constexpr char kTimeScaleKey[] = "tw_dbglog_time_scale";
constexpr char kFormat[] = "%s=\"%s\"\n";

std::string LineOf(const std::string& key, const std::string& value) {
  return key + "=\"" + value + "\"\n";
}

std::string LevelsOf(int round) {
  std::string text = std::to_string(round);
  for (int i = 1; i < LOG_CATEG_COUNT; ++i) text += "," + std::to_string(round);
  return text;
}

// Takes the line's value, or an empty text when it is not this key's.
std::string ValueIn(const std::string& line, const std::string& key) {
  const std::string front = key + "=\"";
  if (line.rfind(front, 0) != 0 || line.back() != '"') return "";
  return line.substr(front.size(), line.size() - front.size() - 1);
}

int RoundIn(int writer, const std::string& value) {
  return atoi(value.c_str() + (writer == kLevelsWriter || value.empty() ? 0 : 1));
}

}  // namespace

std::string KeyOf(int writer) {
  return writer == kLevelsWriter ? "tw_dbglog_settings" : "key_" + std::to_string(writer);
}

std::string ValueOf(int writer, int round) {
  if (writer == kLevelsWriter) return LevelsOf(round);
  const auto length = static_cast<size_t>((writer * 7919 + round * 104729) % 3000);
  std::string value = "r" + std::to_string(round) + " ";
  while (value.size() < length) value += static_cast<char>('a' + (value.size() + length) % 26);
  return value;
}

std::string SettingsTextOf(const Rounds& rounds) {
  std::string text = kHead;
  for (int i = 0; i < kSettingsWriters; ++i) {
    text += LineOf(KeyOf(i), ValueOf(i, rounds[static_cast<size_t>(i)]));
  }
  return text + LineOf(kTimeScaleKey, rounds[kSettingsWriters] % 2 != 0 ? "yes" : "no") + kTail;
}

int WriteRound(int writer, int round) {
  if (writer != kLevelsWriter) {
    return QLIBCFileSetKeyValue(kSettingsFile, KeyOf(writer).c_str(),
                                ValueOf(writer, round).c_str(), kFormat);
  }
  TWDbgLogCfg record = {};
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) record.SetLevel(static_cast<LOG_CATEG>(i), round);
  record.SetTimeScale(round % 2 != 0);
  return record.SaveDbgLogSettings();
}

std::string ProblemIn(const std::string& text, Rounds* rounds) {
  std::istringstream lines(text);
  std::string line;
  std::getline(lines, line);
  for (int i = 0; i < kSettingsWriters; ++i) {
    std::getline(lines, line);
    (*rounds)[static_cast<size_t>(i)] = RoundIn(i, ValueIn(line, KeyOf(i)));
  }
  std::getline(lines, line);
  (*rounds)[kSettingsWriters] = ValueIn(line, kTimeScaleKey) == "yes" ? 1 : 0;
  if (text == SettingsTextOf(*rounds)) return "";
  return "a file of " + std::to_string(text.size()) + " bytes is not whole: " + text.substr(0, 80) +
         "...";
}

std::string ProblemInValue(int writer, const std::string& value, int least, int most) {
  const int round = RoundIn(writer, value);
  if (value != ValueOf(writer, round)) return KeyOf(writer) + " is not whole: " + value;
  if (round < least || round > most) {
    return KeyOf(writer) + " shows round " + std::to_string(round) + " of " +
           std::to_string(least) + " to " + std::to_string(most);
  }
  return "";
}

struct stat MakeSettingsFile() {
  WriteFile(kSettingsFile, SettingsTextOf({}));
  // In a user namespace of one user there is no other owner.
  const bool other_owner = chown(kSettingsFile, 1234, 2345) == 0;
  static_cast<void>(other_owner);
  chmod(kSettingsFile, 0640);
  struct stat attributes = {};
  stat(kSettingsFile, &attributes);
  return attributes;
}

bool SameAttributes(const struct stat& a, const struct stat& b) {
  return a.st_mode == b.st_mode && a.st_uid == b.st_uid && a.st_gid == b.st_gid;
}

void ExpectGoodSettings(const struct stat& before, CaseResult& result) {
  struct stat now = {};
  result.Expect(stat(kSettingsFile, &now) == 0, "the file is gone");
  result.Expect(SameAttributes(before, now), "mode or owner changed");
  result.Expect(ListFolder(kSettingsFolder).size() == 1, "something stands beside the file");
  Rounds rounds;
  const std::string problem = ProblemIn(ReadFile(kSettingsFile), &rounds);
  result.Expect(problem.empty(), problem);
}
