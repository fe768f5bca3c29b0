// The log writer: one line, appended under the lock of the file.
#include "tarnwick/log/twdebuglog.h"

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/time.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
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

using IdText = char[32];    // two numbers in brackets
using TagText = char[128];  // longer tags are cut
using TimeText = char[64];

// "[process]", and "[thread]" after it in every thread but the main one, whose id is the process's.
void FormatIds(IdText& text) {
  const pid_t process = getpid();
  const pid_t thread = static_cast<pid_t>(syscall(SYS_gettid));
  if (thread == process) {
    snprintf(text, sizeof(text), "[%d]", process);
  } else {
    snprintf(text, sizeof(text), "[%d][%d]", process, thread);
  }
}

void FormatTags(const char* categ, const char* level, TagText& text) {
  text[0] = '\0';
  if (categ == nullptr || level == nullptr) return;
  snprintf(text, sizeof(text), "[%s][%s]", categ, level);
}

// The local time, with milliseconds when the administrator asked for them. Empty when the clock's
// value cannot be converted, and when the C library's lock for the time zone is lost.
void FormatTime(TimeText& text) {
  text[0] = '\0';
  if (ForkGuard::LocksAreLost()) return;
  struct timeval now = {};
  struct tm local;
  gettimeofday(&now, nullptr);
  const ForkGuard hold(ForkGuard::kLibraryLock);
  if (localtime_r(&now.tv_sec, &local) == nullptr) return;
  const size_t length = strftime(text, sizeof(text), "%b %e %T", &local);
  if (g_pDbgLogCfg == nullptr || !g_pDbgLogCfg->TimeScale()) return;
  snprintf(text + length, sizeof(text) - length, ".%03d", static_cast<int>(now.tv_usec / 1000));
}

size_t BaseNameStart(std::string_view path) {
  const size_t separator = path.find_last_of("/\\");
  return separator == std::string_view::npos ? 0 : separator + 1;
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
  IdText ids;
  TagText tags;
  FormatIds(ids);
  FormatTags(categ, level, tags);
  const FileLock lock(log.Get());
  if (!lock.Held()) return;
  std::optional<SignalGuard> sizeLimit;
  if (HasFileSizeLimit()) sizeLimit.emplace(SIGXFSZ);
  TimeText stamp;
  FormatTime(stamp);
  const char* const path = file != nullptr ? file : "";
  fprintf(log.Stream(), "%s %s%s %s:%d:%s(): ", stamp, ids, tags, path + BaseNameStart(path), line,
          func != nullptr ? func : "");
  va_list arguments;
  va_start(arguments, format);
  if (format != nullptr) vfprintf(log.Stream(), format, arguments);
  va_end(arguments);
  if (!log.Flush() && sizeLimit) sizeLimit->DiscardPending();
}
