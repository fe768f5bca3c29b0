// The doctor's look at the locks of the logs, and at the limits of those who write them.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <ctime>
#include <optional>
#include <sstream>
#include <thread>

#include "tarnwick/platform/unique.h"
#include "tools/common/shell.h"
#include "tools/common/units.h"
#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/file_locks.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"

namespace {

// A writer has the lock for a fraction of a millisecond.
constexpr int kWatchMilliseconds = 1000;
constexpr int kPauseMilliseconds = 20;

bool SameFile(const struct stat& a, const struct stat& b) {
  return a.st_size == b.st_size && a.st_mtim.tv_sec == b.st_mtim.tv_sec &&
         a.st_mtim.tv_nsec == b.st_mtim.tv_nsec;
}

// Results: true when the lock could not be had for the whole time and no line was written in it. A
// log with many writers may be locked whenever it is asked, and grows.
bool IsStuck(int fd) {
  struct stat before = {};
  fstat(fd, &before);
  for (int waited = 0; waited < kWatchMilliseconds; waited += kPauseMilliseconds) {
    if (flock(fd, LOCK_EX | LOCK_NB) == 0) {
      flock(fd, LOCK_UN);
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(kPauseMilliseconds));
  }
  struct stat after = {};
  fstat(fd, &after);
  return SameFile(before, after);
}

std::string SpanText(double seconds) {
  return FormatSpan(std::chrono::milliseconds(static_cast<long long>(seconds * 1000)));
}

bool IsStopped(const ProcessInfo& process) {
  return process.state == 'T' || process.state == 't';
}

std::string Describe(pid_t pid, const std::optional<ProcessInfo>& process) {
  if (pid < 1) return "a process of another PID namespace";
  if (!process) return "process " + std::to_string(pid) + ", which has ended";
  return QuoteForShell(process->name) + " (" + std::to_string(pid) + ", started " +
         SpanText(process->age_seconds) + " ago" + (IsStopped(*process) ? ", stopped" : "") + ")";
}

std::string FixFor(pid_t pid, const std::optional<ProcessInfo>& process, const std::string& path) {
  if (!process) return "fuser -v " + path;
  if (IsStopped(*process)) return "kill -CONT " + std::to_string(pid);
  return "kill " + std::to_string(pid);
}

// /proc does not tell since when a lock is held. Nobody else has written since, so the time of the
// last line is the longest that it can be without losing one.
std::string HowLong(int fd) {
  struct stat state = {};
  fstat(fd, &state);
  const double age = std::difftime(time(nullptr), state.st_mtime);
  return "for more than " + FormatSpan(std::chrono::milliseconds(kWatchMilliseconds)) +
         " (since when, /proc does not tell; the last line was written " + SpanText(age) + " ago)";
}

void TellHolders(int fd, const std::string& path, Findings* findings) {
  const std::vector<pid_t> holders = LockHolders(fd);
  if (holders.empty()) {
    findings->push_back({"lock", Verdict::kWrong,
                         path + " is locked " + HowLong(fd) + ", by a process that /proc hides",
                         "run this as root: sudo twlogctl doctor"});
  }
  for (const pid_t pid : holders) {
    const auto process = pid > 0 ? ReadProcess(pid) : std::nullopt;
    findings->push_back({"lock", Verdict::kWrong,
                         path + " is locked by " + Describe(pid, process) + " " + HowLong(fd) +
                             "; all other writers wait for it",
                         FixFor(pid, process, path)});
  }
}

void CheckLock(const char* path, Findings* findings) {
  // No more than reading is asked for, which is enough for a lock and harms no file.
  const tarnwick::UniqueFd fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW));
  if (!fd.Valid()) {
    const int error = errno;
    if (error == ENOENT) return;
    findings->push_back({"lock", Verdict::kNote,
                         std::string(path) + " cannot be opened here: " + strerror(error), ""});
  } else if (IsStuck(fd.Get())) {
    TellHolders(fd.Get(), path, findings);
  } else {
    findings->push_back({"lock", Verdict::kRight, std::string(path) + " is free for writers", ""});
  }
}

// The soft limit of "Max file size" in /proc/PID/limits. Results: nothing when there is none.
std::optional<long long> FileSizeLimit(pid_t pid) {
  const std::string limits = ReadWholeFile("/proc/" + std::to_string(pid) + "/limits");
  const std::string name = "Max file size";
  const size_t at = limits.find(name);
  if (at == std::string::npos) return std::nullopt;
  std::istringstream fields(limits.substr(at + name.size()));
  long long limit = 0;
  if (!(fields >> limit)) return std::nullopt;  // "unlimited"
  return limit;
}

// Only root's own processes get more than they have: the others may be anybody's.
void CompareLimit(const ProcessInfo& process, const char* path, Findings* findings) {
  struct stat state = {};
  const std::optional<long long> limit = FileSizeLimit(process.pid);
  if (!limit || stat(path, &state) != 0 || state.st_size < *limit) return;
  const uid_t user = UserOf(process.pid);
  const std::string who = user == 0 ? "" : " of " + UserName(user);
  findings->push_back({"limit", Verdict::kWrong,
                       NameAndPid(process) + who + " may write files of " +
                           FormatBytes(static_cast<double>(*limit)) + ", and " + path + " has " +
                           FormatBytes(static_cast<double>(state.st_size)) + ": its lines are lost",
                       user == 0
                           ? "prlimit --pid " + std::to_string(process.pid) + " --fsize=unlimited"
                           : LookAtProcess(process.pid)});
}

}  // namespace

void CheckLocks(Findings* findings) {
  CheckLock(kMainLogPath, findings);
  CheckLock(kNotificationLogPath, findings);
}

void CheckFileSizeLimits(Findings* findings) {
  for (const LibraryUser& user : LibraryUsers(-1)) {
    CompareLimit(user.process, kMainLogPath, findings);
    CompareLimit(user.process, kNotificationLogPath, findings);
  }
}
