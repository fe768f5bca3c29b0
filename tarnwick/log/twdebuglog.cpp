// The log writer: one line, appended under the lock of the file.
#include "tarnwick/log/twdebuglog.h"

#include <fcntl.h>
#include <langinfo.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <optional>
#include <string_view>

#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/file_lock.h"
#include "tarnwick/platform/fork_guard.h"
#include "tarnwick/platform/signal_guard.h"
#include "tarnwick/platform/unique.h"

using namespace tarnwick;

namespace {

// Longer tags are cut there.
constexpr size_t kTagsLength = 127;

// A line of this length goes out by one write. The buffer is the caller's stack, which saves the
// stream an allocation.
constexpr size_t kStreamSize = 4096;

const char* LogPath(LOG_TYPE type) {
  switch (type) {
    case LOG_TYPE_MAIN:
      return "/var/log/tarnwick/tarnwick.log";
    case LOG_TYPE_NOTIFICATION:
      return "/var/log/tarnwick/twnotification.log";
  }
  return nullptr;
}

// The beginning of a line, put together without a format, which costs as much as writing it.
class Head {
 public:
  Head() : m_length(0) { m_text[0] = '\0'; }

  // Adds what fits.
  void Add(std::string_view text) { m_length += text.copy(m_text + m_length, kSize - m_length); }

  void Add(char c) { Add(std::string_view(&c, 1)); }

  // With zeros in front up to that many places.
  void Add(int number, int places = 1) {
    char digits[16];
    char* const end = digits + sizeof(digits);
    char* at = end;
    auto rest = static_cast<unsigned>(number);
    if (number < 0) rest = 0 - rest;
    for (; rest != 0 || end - at < places; rest /= 10) *--at = static_cast<char>('0' + rest % 10);
    if (number < 0) *--at = '-';
    Add(std::string_view(at, static_cast<size_t>(end - at)));
  }

  // Adds all of a text of any length: what does not fit goes to the stream, after the rest.
  void AddWhole(std::string_view text, FILE* stream) {
    if (text.size() + kReserve <= kSize - m_length) {
      Add(text);
      return;
    }
    WriteTo(stream);
    fwrite(text.data(), 1, text.size(), stream);
    m_length = 0;
  }

  void WriteTo(FILE* stream) const { fwrite(m_text, 1, m_length, stream); }

  size_t Length() const { return m_length; }
  void Cut(size_t length) { m_length = std::min(m_length, length); }
  std::string_view View() const { return std::string_view(m_text, m_length); }

 private:
  static constexpr size_t kSize = 512;
  static constexpr size_t kReserve = 32;  // for the line's number and the marks around it
  char m_text[kSize];
  size_t m_length;
};

template <typename T>
void AddBracketed(T value, Head* head) {
  head->Add('[');
  head->Add(value);
  head->Add(']');
}

// The main thread's id is the process's and is not printed twice.
void AddProcess(Head* head) {
  const pid_t process = getpid();
  const pid_t thread = static_cast<pid_t>(syscall(SYS_gettid));
  AddBracketed(process, head);
  if (process != thread) AddBracketed(thread, head);
}

void AddTags(const char* categ, const char* level, Head* head) {
  if (categ == nullptr || level == nullptr) return;
  const size_t start = head->Length();
  AddBracketed(categ, head);
  AddBracketed(level, head);
  head->Cut(start + kTagsLength);
}

// The C library has a lock for the time zone.
bool ToLocalTime(time_t seconds, struct tm* local) {
  if (ForkGuard::LocksAreLost()) return false;
  const ForkGuard hold(ForkGuard::kLibraryLock);
  return localtime_r(&seconds, local) != nullptr;
}

// As "%b %e %T" of strftime, without the price of a format. Milliseconds only when the
// administrator asked for them; no time at all when the clock's value cannot be converted.
void AddTime(Head* head) {
  struct timeval now = {};
  struct tm local;
  gettimeofday(&now, nullptr);
  if (!ToLocalTime(now.tv_sec, &local)) return;
  head->Add(nl_langinfo(ABMON_1 + local.tm_mon));
  head->Add(local.tm_mday < 10 ? "  " : " ");
  head->Add(local.tm_mday);
  char mark = ' ';
  for (const int part : {local.tm_hour, local.tm_min, local.tm_sec}) {
    head->Add(mark);
    head->Add(part, 2);
    mark = ':';
  }
  if (g_pDbgLogCfg != nullptr && g_pDbgLogCfg->TimeScale()) {
    head->Add('.');
    head->Add(static_cast<int>(now.tv_usec / 1000), 3);
  }
}

size_t BaseNameStart(std::string_view path) {
  const size_t separator = path.find_last_of("/\\");
  return separator == std::string_view::npos ? 0 : separator + 1;
}

// Where a line was logged.
struct CallSite {
  const char* file;
  int line;
  const char* func;
};

void WritePrefix(FILE* stream, const Head& names, const CallSite& site) {
  Head head;
  AddTime(&head);
  head.Add(' ');
  head.Add(names.View());
  head.Add(' ');
  const std::string_view path = site.file;
  head.AddWhole(path.substr(BaseNameStart(path)), stream);
  head.Add(':');
  head.Add(site.line);
  head.Add(':');
  head.AddWhole(site.func, stream);
  head.Add("(): ");
  head.WriteTo(stream);
}

// A write beyond the process's file size limit ends the process, unless the signal is held off. Few
// processes have such a limit, and to ask is cheaper than to hold it off for nothing.
bool HasFileSizeLimit() {
  struct rlimit limit;
#if defined(__LP64__) && defined(SYS_getrlimit)
  // The C library asks in a way that looks the process up first, which takes twice as long.
  const long result = syscall(SYS_getrlimit, RLIMIT_FSIZE, &limit);
#else
  const int result = getrlimit(RLIMIT_FSIZE, &limit);
#endif
  return result != 0 || limit.rlim_cur != RLIM_INFINITY;
}

// To the system log, which has a lock too; the line number is that of the failure.
void ReportFailure(const char* call, int line) {
  const int error = errno;
  if (ForkGuard::LocksAreLost()) return;
  const ForkGuard hold(ForkGuard::kLibraryLock);
  syslog(LOG_ERR, "twdebuglog:%d:TWPrintf(): %s twlog file failed with errno [%d].", line, call,
         error);
}

}  // namespace

std::string GetFileBaseName(std::string path) {
  return path.substr(BaseNameStart(path));
}

void TWPrintf(LOG_TYPE type, const char* categ, const char* level, const char* file, int line,
              const char* func, const char* format, ...) {
  // Callers read errno after they have logged.
  const ErrnoSaver keeper;
  const NoCancel no_cancel;
  char buffer[kStreamSize];
  ForkClosedFile log(LogPath(type), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  if (!log.Valid()) {
    ReportFailure("open", __LINE__);
    return;
  }
  if (!log.MakeStream(buffer, sizeof(buffer))) {
    ReportFailure("fdopen", __LINE__);
    return;
  }
  // All but the time is known before the lock, for which other processes wait.
  Head names;
  AddProcess(&names);
  AddTags(categ, level, &names);
  const FileLock lock(log.Get());
  if (!lock.Held()) return;
  std::optional<SignalGuard> sizeLimit;
  if (HasFileSizeLimit()) sizeLimit.emplace(SIGXFSZ);
  WritePrefix(log.Stream(), names,
              {file != nullptr ? file : "", line, func != nullptr ? func : ""});
  va_list arguments;
  va_start(arguments, format);
  if (format != nullptr) vfprintf(log.Stream(), format, arguments);
  va_end(arguments);
  if (!log.Flush() && sizeLimit) sizeLimit->DiscardPending();
}
