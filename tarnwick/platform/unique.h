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
class ErrnoSaver {
 public:
  ErrnoSaver() : m_errno(errno) {}
  ~ErrnoSaver() { errno = m_errno; }
  ErrnoSaver(const ErrnoSaver&) = delete;
  ErrnoSaver& operator=(const ErrnoSaver&) = delete;

 private:
  int m_errno;
};

// A file descriptor, closed with errno kept.
class UniqueFd {
 public:
  explicit UniqueFd(int fd) : m_fd(fd) {}
  UniqueFd(UniqueFd&& other) noexcept : m_fd(other.Release()) {}
  UniqueFd& operator=(UniqueFd&&) = delete;
  ~UniqueFd() {
    const ErrnoSaver keeper;
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
using UniqueMalloc = std::unique_ptr<T, FreeDeleter>;

struct FileCloser {
  void operator()(FILE* file) const {
    const NoCancel no_cancel;
    std::fclose(file);
  }
};
using UniqueFile = std::unique_ptr<FILE, FileCloser>;

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_UNIQUE_H_
