// A line of the log. Line 1: words and numbers; line 2: seconds and microseconds since 1970; lines
// 3 to 6: category, level, source file and function; the rest is the message.
//
// Words of line 1: "thread" logs from a thread; "nocategory" and "nolevel" pass none; "scale" wants
// milliseconds; "notification" and "undefined" choose another file; "mixed" passes a format with
// more than the message; "noopen" and "nolock" let the call fail. The first number is the line's.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/mman.h>
#include <sys/time.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <regex>
#include <string>
#include <string_view>
#include <thread>

#include "fuzz/oracle/log_prefix.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "tarnwick/log/twdebuglog.h"

namespace {

constexpr int kEastOfUtc = 19800;  // seconds
constexpr int kErrno = 4711;       // what the caller had in errno

// The system as the writer meets it.
struct System {
  int file = -1;  // the log, in memory
  timeval now = {};
  bool opens = true;
  bool locks = true;
  std::string path;          // of the last open
  bool locked = false;       // the lock is held
  off_t when_unlocked = -1;  // the log's size at the time
  std::string complaint;     // what went to the system log
};

System g_system;

int Open(const char* path, int flags, mode_t mode);

}  // namespace

extern "C" {

int __real_open64(const char* path, int flags, ...);

int __wrap_open64(const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = (flags & O_CREAT) != 0 ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  return Open(path, flags, mode);
}

int __wrap_flock(int, int operation) {
  if (!g_system.locks) return errno = ENOLCK, -1;
  g_system.locked = operation == LOCK_EX;
  if (operation == LOCK_UN) g_system.when_unlocked = lseek(g_system.file, 0, SEEK_END);
  return 0;
}

int __wrap_gettimeofday(timeval* now, void*) {
  *now = g_system.now;
  return 0;
}

__attribute__((format(printf, 2, 3))) void __wrap_syslog(int priority, const char* format, ...) {
  Expect("the complaint is an error", priority == LOG_ERR);
  char text[512];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(text, sizeof(text), format, arguments);
  va_end(arguments);
  g_system.complaint += text;
}

// The library's own function; calls of its usual name reach a stand-in in the fuzz programs.
void RealTWPrintf(LOG_TYPE type, const char* categ, const char* level, const char* file, int line,
                  const char* func, const char* format,
                  ...) __asm__("__real__Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z");

}  // extern "C"

namespace {

int Open(const char* path, int flags, mode_t mode) {
  g_system.path = path;
  if (!g_system.opens) return errno = EMFILE, -1;
  constexpr int kWanted = O_WRONLY | O_CREAT | O_APPEND | O_NONBLOCK | O_NOCTTY;
  Expect("the log is opened for appending, without a wait",
         (flags & ~O_CLOEXEC) == kWanted && mode == 0666);
  const std::string real = "/proc/self/fd/" + std::to_string(g_system.file);
  return __real_open64(real.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC);
}

struct Line {
  LOG_TYPE type;
  oracle::LogCall call;
  bool mixed;
};

std::string TakeText(std::string_view* input) {
  return std::string(TakeLine(input)).c_str();
}

timeval TakeTime(std::string_view* input) {
  const std::string text = TakeText(input);
  char* end = nullptr;
  timeval time = {};
  time.tv_sec = std::strtol(text.c_str(), &end, 10);
  time.tv_sec = std::clamp(time.tv_sec, -(INT64_MAX / 2), INT64_MAX / 2);
  time.tv_usec = std::strtol(end, nullptr, 10) % 1000000;
  if (time.tv_usec < 0) time.tv_usec = -time.tv_usec;
  return time;
}

Line Parse(const Options& options, std::string_view input) {
  Line line = {LOG_TYPE_MAIN, {}, options.Has("mixed")};
  if (options.Has("notification")) line.type = LOG_TYPE_NOTIFICATION;
  if (options.Has("undefined")) line.type = static_cast<LOG_TYPE>(2);
  oracle::LogCall& call = line.call;
  g_system.now = TakeTime(&input);
  call.seconds = g_system.now.tv_sec + kEastOfUtc;
  call.microseconds = static_cast<int>(g_system.now.tv_usec);
  call.milliseconds = options.Has("scale");
  call.category = TakeText(&input);
  call.level = TakeText(&input);
  if (options.Has("nocategory")) call.category.reset();
  if (options.Has("nolevel")) call.level.reset();
  call.file = TakeText(&input);
  call.function = TakeText(&input);
  call.line = options.Numbers().empty() ? -1 : static_cast<int>(options.Numbers()[0]);
  call.message = std::string(input).c_str();
  return line;
}

void Write(const Line& line) {
  const oracle::LogCall& c = line.call;
  const char* category = c.category ? c.category->c_str() : nullptr;
  const char* level = c.level ? c.level->c_str() : nullptr;
  errno = kErrno;
  if (line.mixed) {
    RealTWPrintf(line.type, category, level, c.file.c_str(), c.line, c.function.c_str(),
                 "%d%% of %-4s %s\n", c.line, "it", c.message.c_str());
  } else {
    RealTWPrintf(line.type, category, level, c.file.c_str(), c.line, c.function.c_str(), "%s",
                 c.message.c_str());
  }
  ExpectSame("errno after the call", errno, kErrno);
}

void WriteFrom(bool thread, Line* line) {
  line->call.pid = getpid();
  const auto write = [line] {
    line->call.tid = gettid();
    Write(*line);
  };
  thread ? std::thread(write).join() : write();
}

std::string TakeLog() {
  const off_t size = lseek(g_system.file, 0, SEEK_END);
  std::string text(static_cast<size_t>(size), '\0');
  Expect("the log can be read", pread(g_system.file, text.data(), text.size(), 0) == size);
  Expect("the log can be emptied", ftruncate(g_system.file, 0) == 0);
  return text;
}

void CheckComplaint(bool expected) {
  static const std::regex kOpenFailed(
      R"(twdebuglog:\d+:TWPrintf\(\): open twlog file failed with errno \[(14|24)\]\.)");
  if (!expected) return ExpectSame("the complaint", g_system.complaint, "");
  Expect("the complaint of a failed open", std::regex_match(g_system.complaint, kOpenFailed));
}

void Check(Line line) {
  const bool opens = g_system.opens && line.type != 2;
  if (line.mixed) {
    line.call.message = std::to_string(line.call.line) + "% of it   " + line.call.message + "\n";
  }
  const std::string expected = opens && g_system.locks ? oracle::LogLineOf(line.call) : "";
  ExpectSame("the line", TakeLog(), expected);
  CheckComplaint(!opens);
  Expect("the lock is released", !g_system.locked);
  if (!expected.empty()) {
    ExpectSame("what the next writer finds", g_system.when_unlocked,
               static_cast<int64_t>(expected.size()));
  }
  const char* const paths[] = {"/var/log/tarnwick/tarnwick.log",
                               "/var/log/tarnwick/twnotification.log"};
  if (opens) ExpectSame("the log's path", g_system.path, paths[line.type]);
}

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  setenv("TZ", "FUZZ-05:30", 1);
  tzset();
  g_system.file = memfd_create("log", MFD_CLOEXEC);
  Expect("a log in memory is made", g_system.file >= 0);
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&input));
  g_system = {g_system.file, {}, !options.Has("noopen"), !options.Has("nolock"), "", false, -1, ""};
  static TWDbgLogCfg record;
  record.SetTimeScale(options.Has("scale"));
  g_pDbgLogCfg = &record;
  Line line = Parse(options, input);
  WriteFrom(options.Has("thread"), &line);
  Check(line);
  ExpectSame("GetFileBaseName", GetFileBaseName(line.call.file), oracle::BaseName(line.call.file));
  return 0;
}
