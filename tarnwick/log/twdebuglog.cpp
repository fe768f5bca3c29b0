// The log writer: one line, appended under the lock of the file.
#include "tarnwick/log/twdebuglog.h"

#include <fcntl.h>
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
#include <cstring>
#include <ctime>
#include <optional>
#include <string_view>

#include "tarnwick/platform/file_lock.h"
#include "tarnwick/platform/fork_hold.h"
#include "tarnwick/platform/owned.h"
#include "tarnwick/platform/signal_guard.h"

namespace {

constexpr char kSourceName[] = "twdebuglog";

// Longer texts are cut there.
constexpr size_t kPartSize = 128;

// A line of this length goes out by one write. The buffer is the caller's stack, which saves the
// stream an allocation.
constexpr size_t kStreamSize = 4096;

const char* PathOf(LOG_TYPE type) {
  switch (type) {
    case LOG_TYPE_MAIN:
      return "/var/log/tarnwick/tarnwick.log";
    case LOG_TYPE_NOTIFICATION:
      return "/var/log/tarnwick/twnotification.log";
  }
  return nullptr;
}

// A part of a line, put together without a format, which costs as much as writing it.
class Part {
 public:
  Part() : m_length(0) { m_text[0] = '\0'; }

  // Adds what fits.
  void Add(const char* text) {
    const size_t size = strnlen(text, kPartSize - 1 - m_length);
    std::memcpy(m_text + m_length, text, size);
    m_length += size;
    m_text[m_length] = '\0';
  }

  void Add(pid_t number) {
    char digits[16];
    *std::to_chars(digits, digits + sizeof(digits) - 1, number).ptr = '\0';
    Add(digits);
  }

  const char* Text() const { return m_text; }

 private:
  char m_text[kPartSize];
  size_t m_length;
};

template <typename T>
void AddBracketed(T value, Part* part) {
  part->Add("[");
  part->Add(value);
  part->Add("]");
}

// The main thread's id is the process's and is not printed twice.
void FormatProcess(Part* part) {
  const pid_t process = getpid();
  const pid_t thread = static_cast<pid_t>(syscall(SYS_gettid));
  AddBracketed(process, part);
  if (process != thread) AddBracketed(thread, part);
}

void FormatTags(const char* categ, const char* level, Part* part) {
  if (categ == nullptr || level == nullptr) return;
  AddBracketed(categ, part);
  AddBracketed(level, part);
}

// Milliseconds only when the administrator asked for them; no time at all when the clock's value
// cannot be converted.
void FormatTime(char* text) {
  struct timeval now = {};
  struct tm local;
  text[0] = '\0';
  gettimeofday(&now, nullptr);
  // The C library has a lock for the time zone, which a fork in the middle of it would leave held
  // in the child.
  const ForkHold hold;
  if (localtime_r(&now.tv_sec, &local) == nullptr) return;
  const size_t length = strftime(text, kPartSize, "%b %e %T", &local);
  if (g_pDbgLogCfg != nullptr && g_pDbgLogCfg->TimeScale()) {
    snprintf(text + length, kPartSize - length, ".%03ld", static_cast<long>(now.tv_usec / 1000));
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

void WritePrefix(FILE* stream, const char* categ, const char* level, const CallSite& site) {
  Part process;
  Part tags;
  char time[kPartSize];
  FormatProcess(&process);
  FormatTags(categ, level, &tags);
  FormatTime(time);
  fprintf(stream, "%s %s%s %s:%d:%s(): ", time, process.Text(), tags.Text(),
          site.file + BaseNameStart(site.file), site.line, site.func);
}

// A write beyond the process's file size limit ends the process, unless the signal is held off. Few
// processes have such a limit, and to ask is cheaper than to hold it off for nothing.
bool HasFileSizeLimit() {
  struct rlimit limit;
  return getrlimit(RLIMIT_FSIZE, &limit) != 0 || limit.rlim_cur != RLIM_INFINITY;
}

}  // namespace

std::string GetFileBaseName(std::string path) {
  return path.substr(BaseNameStart(path));
}

void TWPrintf(LOG_TYPE type, const char* categ, const char* level, const char* file, int line,
              const char* func, const char* format, ...) {
  // Callers read errno after they have logged.
  const ErrnoKeeper keeper;
  char buffer[kStreamSize];
  UninheritedFile log(PathOf(type), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  if (!log.Valid()) {
    syslog(LOG_ERR, "%s:%d:%s(): open twlog file failed with errno [%d].", kSourceName, __LINE__,
           __func__, errno);
    return;
  }
  if (!log.MakeStream("a", buffer, sizeof(buffer))) {
    syslog(LOG_ERR, "%s:%d:%s(): fdopen twlog file failed with errno [%d].", kSourceName, __LINE__,
           __func__, errno);
    return;
  }
  const FileLock lock(log.Get());
  if (!lock.Held()) return;
  std::optional<SignalGuard> sizeLimit;
  if (HasFileSizeLimit()) sizeLimit.emplace(SIGXFSZ);
  WritePrefix(log.Stream(), categ, level,
              {file != nullptr ? file : "", line, func != nullptr ? func : ""});
  va_list arguments;
  va_start(arguments, format);
  if (format != nullptr) vfprintf(log.Stream(), format, arguments);
  va_end(arguments);
  if (!log.Flush() && sizeLimit) sizeLimit->TakeBack();
}
