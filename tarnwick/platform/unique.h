// Small move-only owners: what a function acquires is released on every path out of it.
#ifndef TARNWICK_PLATFORM_UNIQUE_H_
#define TARNWICK_PLATFORM_UNIQUE_H_

#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "tarnwick/platform/cancel.h"

namespace tarnwick {

// Puts errno back as it was: for code that runs between a failing call and the caller who reads
// errno.
class ErrnoKeeper {
 public:
  ErrnoKeeper() : m_errno(errno) {}
  ~ErrnoKeeper() { errno = m_errno; }
  ErrnoKeeper(const ErrnoKeeper&) = delete;
  ErrnoKeeper& operator=(const ErrnoKeeper&) = delete;

 private:
  int m_errno;
};

// A file descriptor, closed with errno kept.
class OwnedFd {
 public:
  explicit OwnedFd(int fd) : m_fd(fd) {}
  OwnedFd(OwnedFd&& other) noexcept : m_fd(other.Release()) {}
  OwnedFd& operator=(OwnedFd&&) = delete;
  ~OwnedFd() {
    const ErrnoKeeper keeper;
    const NoCancel no_cancel;
    if (m_fd >= 0) close(m_fd);
  }

  int Get() const { return m_fd; }
  bool Valid() const { return m_fd >= 0; }
  int Release() {
    const int fd = m_fd;
    m_fd = -1;
    return fd;
  }

 private:
  int m_fd;
};

struct FreeDeleter {
  void operator()(void* memory) const { std::free(memory); }
};
// Memory from malloc.
template <typename T>
using OwnedMemory = std::unique_ptr<T, FreeDeleter>;

struct FileCloser {
  void operator()(FILE* file) const {
    const NoCancel no_cancel;
    std::fclose(file);
  }
};
using OwnedFile = std::unique_ptr<FILE, FileCloser>;

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_UNIQUE_H_
