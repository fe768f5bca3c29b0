// The log writer, the record of levels and the settings file.
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <string>

#include "tarnwick/log/log_settings.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/request_settings.h"
#include "tarnwick/net/twrequestscope.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/torture/operations.h"

using namespace tarnwick;

namespace {

constexpr char kSettings[] = "/var/packages/Tarnwick/etc/settings.conf";

bool EndsWith(const std::string& text, const std::string& end) {
  return text.size() >= end.size() && text.compare(text.size() - end.size(), end.size(), end) == 0;
}

// After a failed write there may be the front part of a line.
bool IsCut(const std::string& text) {
  return text.empty() || (t_injection.write_failed && text.find('\n') == std::string::npos);
}

// The line is in the file, whole and once, or after a fault not at all.
void ExpectLine(TestRun& test, const std::string& path) {
  const std::string text = ReadFile(path);
  const bool whole = EndsWith(text, " file:7:func(): message 5\n") &&
                     text.find('\n') == text.size() - 1 &&
                     text.find("[http][warn]") != std::string::npos;
  test.ExpectEither(whole, IsCut(text), "the line is not whole: " + text);
}

void LogLineTo(TestRun& test, LOG_TYPE type, const char* path) {
  unlink(path);
  test.Run([&] {
    errno = ETIMEDOUT;
    TWPrintf(type, "http", "warn", "a/file", 7, "func", "message %d\n", 5);
    if (errno != ETIMEDOUT) errno = 0;
  });
  test.Expect(errno == ETIMEDOUT, "errno has changed");
  ExpectLine(test, path);
  unlink(path);
}

void MainLogLine(TestRun& test) {
  LogLineTo(test, LOG_TYPE_MAIN, kMainLog);
}

void NotificationLine(TestRun& test) {
  LogLineTo(test, LOG_TYPE_NOTIFICATION, kNotificationLog);
}

// Through the gate, with the names of category and level.
void GatedLine(TestRun& test) {
  unlink(kMainLog);
  test.Run([] { TW_LOG_AS("func", LOG_CATEG_HTTP, LOG_LEVEL_WARN, "message %d\n", 5); });
  const std::string text = ReadFile(kMainLog);
  const bool named = text.find("[http][warn]") != std::string::npos;
  // Without memory for the names the line says so.
  const bool unnamed = test.Struck() && text.find("[unknown]") != std::string::npos;
  test.ExpectEither(EndsWith(text, "(): message 5\n"), IsCut(text),
                    "the line is not whole: " + text);
  test.Expect(named || unnamed || text.empty(), "the names are wrong: " + text);
  unlink(kMainLog);
}

// Without memory for the scope the text stands as it is, without memory for the text the line says
// so.
void EscapedLine(TestRun& test) {
  unlink(kMainLog);
  const std::string tail(40, 'b');
  const std::string text = "a\n" + tail;
  bool valid = false;
  test.Run([&] {
    TWRequestScope scope;
    valid = scope.Valid();
    scope.SetEscapedLog(true);
    TWPrintf(LOG_TYPE_MAIN, "http", "warn", "file", 7, "func", "%s\n",
             tarnwick::PeerText(text.c_str()).Get());
  });
  const std::string log = ReadFile(kMainLog);
  const bool lost =
      valid ? EndsWith(log, "(): (no memory)\n") : EndsWith(log, "(): " + text + "\n");
  test.ExpectEither(valid && EndsWith(log, "(): a\\x0A" + tail + "\n"), lost || IsCut(log),
                    "the line is wrong: " + log);
  unlink(kMainLog);
}

void UndefinedLog(TestRun& test) {
  test.Run([] {
    TWPrintf(static_cast<LOG_TYPE>(2), "http", "warn", "file", 7, "func", "message %d\n", 5);
  });
}

// The record that the process has attached stays out of it.
// The process's own attachment, which is put aside meanwhile.
struct OtherRecord {
  OtherRecord() : before(g_pDbgLogCfg) { g_pDbgLogCfg = nullptr; }
  ~OtherRecord() {
    FreeDbgCfg();
    g_pDbgLogCfg = before;
  }
  TWDbgLogCfg* before;
};

void RecordAttach(TestRun& test) {
  const OtherRecord other;
  test.Run([] { InitDbgCfg(); });
  TWDbgLogCfg* const attached = g_pDbgLogCfg;
  const bool is_record = attached != nullptr && attached->Level(LOG_CATEG_HTTP) == 7;
  test.ExpectEither(is_record, attached == nullptr, "the record is not attached");
  test.Run([] { FreeDbgCfg(); });
  test.Expect(g_pDbgLogCfg == nullptr, "the record is still attached");
}

std::string LevelsText(int level) {
  std::string text = std::to_string(level);
  for (int i = 1; i < LOG_CATEG_COUNT; ++i) text += "," + std::to_string(level);
  return text;
}

std::string SettingsText(int level, const char* time_scale) {
  return "other=\"kept\"\ntw_dbglog_settings=\"" + LevelsText(level) +
         "\"\ntw_dbglog_time_scale=\"" + time_scale + "\"\n";
}

// All levels of the record, when they are the same; -1 otherwise.
int CommonLevel(const TWDbgLogCfg& record) {
  for (int i = 1; i < LOG_CATEG_COUNT; ++i) {
    const auto category = static_cast<LOG_CATEG>(i);
    if (record.Level(category) != record.Level(LOG_CATEG_ACCOUNT)) return -1;
  }
  return record.Level(LOG_CATEG_ACCOUNT);
}

void SettingsLoad(TestRun& test) {
  WriteFile(kSettings, SettingsText(5, "yes"));
  TWDbgLogCfg record = {};
  int result = 1;
  test.Run([&] { result = record.Init(0); });
  const int level = CommonLevel(record);
  test.ExpectEither(result == 0, result == -1, "the result is wrong");
  test.ExpectEither(level == 5, level == 3, "the levels are neither loaded nor the default");
  // Levels for whose text there is no memory stay as they are, without a failure.
  if (result == 0) test.Expect(record.TimeScale(), "the flag is not loaded");
  unlink(kSettings);
}

bool IsOldOrNew(const std::string& text, int level, const char* time_scale) {
  return text == SettingsText(level, "yes") || text == SettingsText(level, time_scale);
}

// Each key has its old or its new value; the mode, and what else is in the file, stay.
void ExpectSaved(TestRun& test, int result) {
  const std::string text = ReadFile(kSettings);
  test.ExpectEither(result == 0 && text == SettingsText(6, "no"),
                    result == -1 && (IsOldOrNew(text, 5, "no") || IsOldOrNew(text, 6, "no")),
                    "the settings are neither old nor new: " + text);
  struct stat status = {};
  test.Expect(stat(kSettings, &status) == 0 && (status.st_mode & 07777) == 0640,
              "the settings' mode has changed");
}

void SettingsSave(TestRun& test) {
  WriteFile(kSettings, SettingsText(5, "yes"));
  chmod(kSettings, 0640);
  TWDbgLogCfg record = {};
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) record.SetLevel(static_cast<LOG_CATEG>(i), 6);
  int result = 1;
  test.Run([&] { result = record.SaveDbgLogSettings(); });
  ExpectSaved(test, result);
  unlink(kSettings);
}

void SettingsFirstSave(TestRun& test) {
  unlink(kSettings);
  TWDbgLogCfg record = {};
  int result = 1;
  test.Run([&] { result = record.SaveDbgLogSettings(); });
  const std::string text = ReadFile(kSettings);
  const std::string levels = "tw_dbglog_settings=\"" + LevelsText(0) + "\"\n";
  const std::string flag = "tw_dbglog_time_scale=\"no\"\n";
  test.ExpectEither(result == 0 && text == levels + flag,
                    result == -1 && (text.empty() || text == levels || text == flag),
                    "the settings are wrong: " + text);
  unlink(kSettings);
}

void SettingsKey(TestRun& test) {
  WriteFile(kSettings, SettingsText(5, "yes"));
  char value[16] = "untouched";
  int result = -2;
  test.Run([&] { result = QLIBCFileGetKeyValue(kSettings, "other", value, sizeof(value), 0); });
  test.ExpectEither(result == 4 && strcmp(value, "kept") == 0,
                    result == -1 && strcmp(value, "untouched") == 0, "the value is wrong");
  unlink(kSettings);
}

void IntList(TestRun& test) {
  std::vector<int> list;
  const std::string text = "1,2,,3 and more, a text that is longer than a short string";
  const std::string delimiters = ",";
  test.RunMayThrow<std::bad_alloc>([&] { list = SplitToIntList(text, delimiters); });
  test.ExpectEither(list == std::vector<int>({1, 2, 3, 0}), list.empty(), "the list is wrong");
}

}  // namespace

std::vector<Operation> LogOperations() {
  return {
      {"log_line", PeerKind::kNone, MainLogLine},
      {"log_notification", PeerKind::kNone, NotificationLine},
      {"log_gate", PeerKind::kNone, GatedLine, true},
      {"log_escaped", PeerKind::kNone, EscapedLine},
      {"log_undefined", PeerKind::kNone, UndefinedLog},
      {"record_attach", PeerKind::kNone, RecordAttach},
      {"settings_load", PeerKind::kNone, SettingsLoad, true},
      {"settings_save", PeerKind::kNone, SettingsSave},
      {"settings_first_save", PeerKind::kNone, SettingsFirstSave},
      {"settings_key", PeerKind::kNone, SettingsKey},
      {"int_list", PeerKind::kNone, IntList},
  };
}
