#include "tools/twlogctl/log_watch.h"

#include <sys/inotify.h>
#include <unistd.h>

LogWatch::LogWatch() : fd_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {}

void LogWatch::AddDirectory(const std::string& path) {
  inotify_add_watch(fd_.Get(), path.c_str(),
                    IN_CREATE | IN_DELETE | IN_MOVED_FROM | IN_MOVED_TO | IN_ONLYDIR);
}

int LogWatch::AddFile(int fd) {
  // By its path it might be another file by now.
  const std::string path = "/proc/self/fd/" + std::to_string(fd);
  return inotify_add_watch(fd_.Get(), path.c_str(), IN_MODIFY);
}

void LogWatch::Remove(int watch) {
  if (watch >= 0) inotify_rm_watch(fd_.Get(), watch);
}

void LogWatch::Drain() {
  char events[4096];
  // A writer that is faster than this loop must not keep the reader from reading.
  for (int round = 0; round < 64; ++round) {
    if (read(fd_.Get(), events, sizeof(events)) <= 0) return;
  }
}
