// The exclusive flock of a descriptor, released at the end of the scope.
#ifndef TARNWICK_PLATFORM_FILE_LOCK_H_
#define TARNWICK_PLATFORM_FILE_LOCK_H_

#include <sys/file.h>

#include "tarnwick/platform/unique.h"

namespace tarnwick {

class FileLock {
 public:
  // Waits for the lock. A signal handler that runs meanwhile does not end the wait.
  explicit FileLock(int fd) : m_fd(fd), m_held(Take(fd)) {}
  ~FileLock() { Unlock(); }
  FileLock(const FileLock&) = delete;
  FileLock& operator=(const FileLock&) = delete;

  bool Held() const { return m_held; }

  void Unlock() {
    const ErrnoSaver keeper;
    if (m_held) flock(m_fd, LOCK_UN);
    m_held = false;
  }

 private:
  static bool Take(int fd) {
    int result = flock(fd, LOCK_EX);
    while (result == -1 && errno == EINTR) result = flock(fd, LOCK_EX);
    return result == 0;
  }

  int m_fd;
  bool m_held;
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_FILE_LOCK_H_
