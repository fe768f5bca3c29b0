// The log writer: one line, appended under the lock of the file.
#include "tarnwick/log/twdebuglog.h"

#include <fcntl.h>
#include <langinfo.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstdarg>
#include <cstdio>
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

// Longer tags are cut there.
constexpr size_t kTagsLength = 127;

// A short text, put together without printf and strftime: these would take 3,700 instructions more
// for a line, which takes 5,000 (./dev cost, amd64). What does not fit is cut.
class ShortText {
 public:
  ShortText() : m_length(0) { m_text[0] = '\0'; }

  void Add(std::string_view text) {
    m_length += text.copy(m_text + m_length, sizeof(m_text) - m_length);
  }

  // With `pad` in front up to that width.
  void Add(int number, size_t width = 1, char pad = '0') {
    char digits[16];
    const char* const end = std::to_chars(digits, digits + sizeof(digits), number).ptr;
    const std::string_view text(digits, static_cast<size_t>(end - digits));
    for (size_t length = text.size(); length < width; ++length) Add({&pad, 1});
    Add(text);
  }

  template <typename T>
  void AddBracketed(T value) {
    Add("[");
    Add(value);
    Add("]");
  }

  std::string_view View() const { return {m_text, m_length}; }

 private:
  char m_text[256];
  size_t m_length;
};

// The main thread's id is the process's and is not printed twice.
void AddProcess(ShortText* text) {
  const pid_t process = getpid();
  const pid_t thread = static_cast<pid_t>(syscall(SYS_gettid));
  text->AddBracketed(process);
  if (process != thread) text->AddBracketed(thread);
}

void AddTags(const char* categ, const char* level, ShortText* text) {
  if (categ == nullptr || level == nullptr) return;
  ShortText tags;
  tags.AddBracketed(std::string_view(categ));
  tags.AddBracketed(std::string_view(level));
  text->Add(tags.View().substr(0, kTagsLength));
}

// The C library has a lock for the time zone.
bool ToLocalTime(time_t seconds, struct tm* local) {
  if (ForkGuard::LocksAreLost()) return false;
  const ForkGuard hold(ForkGuard::kLibraryLock);
  return localtime_r(&seconds, local) != nullptr;
}

// As "%b %e %T" of strftime. Milliseconds only when the administrator asked for them; no time at
// all when the clock's value cannot be converted.
void AddTime(ShortText* text) {
  struct timeval now = {};
  struct tm local;
  gettimeofday(&now, nullptr);
  if (!ToLocalTime(now.tv_sec, &local)) return;
  text->Add(std::string_view(nl_langinfo(ABMON_1 + local.tm_mon)));
  text->Add(" ");
  text->Add(local.tm_mday, 2, ' ');
  const char* separator = " ";
  for (const int part : {local.tm_hour, local.tm_min, local.tm_sec}) {
    text->Add(separator);
    text->Add(part, 2);
    separator = ":";
  }
  if (g_pDbgLogCfg == nullptr || !g_pDbgLogCfg->TimeScale()) return;
  text->Add(".");
  text->Add(static_cast<int>(now.tv_usec / 1000), 3);
}

size_t BaseNameStart(std::string_view path) {
  const size_t separator = path.find_last_of("/\\");
  return separator == std::string_view::npos ? 0 : separator + 1;
}

void Write(std::string_view text, FILE* stream) {
  fwrite(text.data(), 1, text.size(), stream);
}

void WritePrefix(FILE* stream, const ShortText& names, const char* file, int line,
                 const char* func) {
  ShortText begin;
  AddTime(&begin);
  begin.Add(" ");
  begin.Add(names.View());
  begin.Add(" ");
  ShortText place;
  place.Add(":");
  place.Add(line);
  place.Add(":");
  Write(begin.View(), stream);
  Write(std::string_view(file).substr(BaseNameStart(file)), stream);
  Write(place.View(), stream);
  Write(func, stream);
  Write("(): ", stream);
}

// A write beyond the process's file size limit ends the process, unless the signal is held off. Few
// processes have such a limit, and to ask is cheaper than to hold it off for nothing.
bool HasFileSizeLimit() {
  struct rlimit limit;
  return getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur != RLIM_INFINITY;
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
  ShortText names;
  AddProcess(&names);
  AddTags(categ, level, &names);
  const FileLock lock(log.Get());
  if (!lock.Held()) return;
  std::optional<SignalGuard> sizeLimit;
  if (HasFileSizeLimit()) sizeLimit.emplace(SIGXFSZ);
  WritePrefix(log.Stream(), names, file != nullptr ? file : "", line, func != nullptr ? func : "");
  va_list arguments;
  va_start(arguments, format);
  if (format != nullptr) vfprintf(log.Stream(), format, arguments);
  va_end(arguments);
  if (!log.Flush() && sizeLimit) sizeLimit->DiscardPending();
}
