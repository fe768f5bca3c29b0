// What the library does without a server.
#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <map>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tarnwick/utils/utils.h"
#include "tests/soak/log_rotator.h"
#include "tests/soak/operations.h"
#include "tests/support/flag.h"

namespace {

constexpr char kSettingsFile[] = "/var/packages/Tarnwick/etc/settings.conf";

// Each thread has a key of its own; all of them rewrite the same file.
Outcome Settings(const Plan& plan, const Session& session) {
  const std::string key = "soak_" + std::to_string(session.thread);
  const std::string value = ValueOf(plan).substr(0, 20) + std::to_string(plan.id);
  if (QLIBCFileSetKeyValue(kSettingsFile, key.c_str(), value.c_str(), "%s=\"%s\"\n") != 0) {
    return Wrong("the key could not be set");
  }
  char read[64];
  const int length =
      QLIBCFileGetKeyValue(kSettingsFile, key.c_str(), read, static_cast<int>(sizeof(read)), 0);
  if (length != static_cast<int>(value.size())) return Wrong("length of the value");
  return value == read ? Outcome() : Wrong("another value");
}

// Each save has all levels alike, so that a list which is not one save's shows.
Outcome Levels(const Plan& plan) {
  TWDbgLogCfg saved;
  saved.Init(0);
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
    saved.SetLevel(static_cast<LOG_CATEG>(i), static_cast<int>(plan.id % 8));
  }
  if (saved.SaveDbgLogSettings() != 0) return Wrong("the levels could not be saved");
  TWDbgLogCfg loaded;
  if (loaded.Init(0) != 0) return Wrong("the levels could not be loaded");
  const int first = loaded.Level(LOG_CATEG_ACCOUNT);
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
    if (loaded.Level(static_cast<LOG_CATEG>(i)) != first) return Wrong("levels of two saves");
  }
  return first >= 0 && first < 8 ? Outcome() : Wrong("a level that nobody saved");
}

Outcome Log(const Plan& plan, Session* session) {
  const auto category = static_cast<LOG_CATEG>(plan.id % LOG_CATEG_COUNT);
  const auto level = static_cast<LOG_LEVEL>(plan.id / 100 % 8);
  const std::string text = ValueOf(plan);
  errno = EDOM;
  TW_LOG(category, level, "%s\n", text.c_str());
  TWPrintf(LOG_TYPE_NOTIFICATION, Enum2String(category), Enum2String(level), "soak", __LINE__,
           __func__, kNumberedLine, session->thread, ++session->log_lines,
           static_cast<unsigned>(text.size()), text.c_str());
  return errno == EDOM ? Outcome() : Wrong("errno has changed");
}

Outcome Encoding(const Plan& plan) {
  if (UrlEncode("a b\t&=+/\xE4", "+") != "a%20b%20%26%3D+%2F%E4") return Wrong("UrlEncode");
  char* const encoded = Base64Encode("any carnal pleasure.");
  const bool right = encoded != nullptr && !strcmp(encoded, "YW55IGNhcm5hbCBwbGVhc3VyZS4=");
  free(encoded);
  if (!right) return Wrong("Base64Encode");
  if (TrimString("  x y ", " ") != "x y") return Wrong("TrimString");
  std::string text = ValueOf(plan) + "\n";
  RemoveChar(text, '\n');
  if (text != ValueOf(plan)) return Wrong("RemoveChar");
  char copy[8];
  if (strcmp(StrNCopy(copy, "too long for it", sizeof(copy)), "too lon") != 0) {
    return Wrong("StrNCopy");
  }
  if (FormatUtcTimeStamp(1709647389417000) != "20240305T140309.417Z") return Wrong("time stamp");
  if (IntToString(-42) != "-42") return Wrong("IntToString");
  return GetFileBaseName("/a/b\\c.cpp") == "c.cpp" ? Outcome() : Wrong("GetFileBaseName");
}

void* SetFlag(void* flag) {
  static_cast<Flag*>(flag)->Set();
  return flag;
}

void* SetAndDeleteFlag(void* flag) {
  SetFlag(flag);
  delete static_cast<Flag*>(flag);
  return nullptr;
}

// Joined and detached ones in turns; the detached one works on a copy of the flag.
Outcome Thread(const Plan& plan) {
  Flag flag;
  pthread_t thread;
  if (plan.id % 2 == 0) {
    if (CreateThread(SetFlag, &flag, 256 * 1024, 0, &thread) != 1) return Wrong("not started");
    void* result = nullptr;
    if (pthread_join(thread, &result) != 0 || result != &flag) return Wrong("its result");
  } else if (CreateThread(SetAndDeleteFlag, new Flag(flag), 0, 1, &thread) != 1) {
    return Wrong("not started, detached");
  }
  return flag.Wait() ? Outcome() : Wrong("it never ran");
}

Outcome WriteToPipe(const Plan& plan) {
  DelayTimer timer(500);
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) return Wrong("no pipe");
  const std::string text = ValueOf(plan).substr(0, 4000);
  const int size = static_cast<int>(text.size());
  std::string got(text.size(), '\0');
  const bool passed = WriteFd(ends[1], text.data(), size) == size &&
                      read(ends[0], got.data(), got.size()) == size && got == text;
  close(ends[0]);
  const bool refused = WriteFd(ends[1], text.data(), size) == 0 && errno == EPIPE;
  close(ends[1]);
  if (!passed || !refused)
    return Wrong(passed ? "errno " + std::to_string(errno) : "what was written");
  return timer.Delay() == 0 ? Outcome() : Wrong("Delay");
}

}  // namespace

Outcome RunLocalOperation(const Plan& plan, Session* session) {
  static const std::map<std::string, std::function<Outcome(const Plan&, Session*)>> works = {
      {"settings: one key", [](const Plan& p, Session* s) { return Settings(p, *s); }},
      {"settings: levels", [](const Plan& p, Session* /*unused*/) { return Levels(p); }},
      {"TW_LOG, TWPrintf", Log},
      {"UrlEncode and the like", [](const Plan& p, Session* /*unused*/) { return Encoding(p); }},
      {"CreateThread", [](const Plan& p, Session* /*unused*/) { return Thread(p); }},
      {"WriteFd, DelayTimer", [](const Plan& p, Session* /*unused*/) { return WriteToPipe(p); }},
  };
  return works.at(OperationOf(plan).title)(plan, session);
}
