// Calls that wait for who holds a lock.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <thread>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/longest_call/cases.h"

namespace {

constexpr char kLog[] = "/var/log/tarnwick/tarnwick.log";
constexpr char kSettingsFolder[] = "/var/packages/Tarnwick/etc";
constexpr char kSettings[] = "/var/packages/Tarnwick/etc/settings.conf";

// Runs a call while another open file holds the lock at `path`, for kHold.
template <typename Call>
int WhileLocked(const char* path, int flags, Call call) {
  const int fd = open(path, flags | O_CLOEXEC, 0600);
  if (fd == -1 || flock(fd, LOCK_EX) != 0) return -2;
  std::thread holder([fd] {
    std::this_thread::sleep_for(std::chrono::duration<double>(kHold));
    close(fd);
  });
  const int result = call();
  holder.join();
  return result;
}

int WriteLine(int /*port*/) {
  return WhileLocked(kLog, O_WRONLY | O_CREAT, [] {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ALARM, "waits\n");
    struct stat file = {};
    return stat(kLog, &file) == 0 && file.st_size > 0 ? 0 : -1;
  });
}

int SetKey(int /*port*/) {
  return WhileLocked(kSettingsFolder, O_RDONLY | O_DIRECTORY,
                     [] { return QLIBCFileSetKeyValue(kSettings, "key", "value", "%s=\"%s\"\n"); });
}

}  // namespace

std::vector<Case> LockCases() {
  return {
      {"TW_LOG, another process holds the log's lock", "none", 0, {}, WriteLine, 0},
      {"QLIBCFileSetKeyValue, another process holds the folder's lock", "none", 0, {}, SetKey, 0},
  };
}
