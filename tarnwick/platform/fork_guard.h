// What a forked child must not inherit half done: locks of the C library and open descriptors.
#ifndef TARNWICK_PLATFORM_FORK_GUARD_H_
#define TARNWICK_PLATFORM_FORK_GUARD_H_

#include <sys/types.h>

#include <cstdio>

namespace tarnwick {

// While one exists, fork() waits in every other thread, for 100 milliseconds at most: a disk or a
// system log that hangs must not stop a process that forks. Holds do not wait for each other. A
// thread may fork in its own hold, as a signal handler does.
class ForkGuard {
 public:
  enum Kind {
    kDescriptor,   // opens or closes a file
    kLibraryLock,  // calls a function of the C library that has a lock which fork() does not reset
  };

  explicit ForkGuard(Kind kind);
  ~ForkGuard();
  ForkGuard(const ForkGuard&) = delete;
  ForkGuard& operator=(const ForkGuard&) = delete;

  // True in a child whose fork() did not wait for the end of every kLibraryLock: these locks may
  // stay held for ever, so the child must not call such functions.
  static bool LocksAreLost();

 private:
  Kind m_kind;
};

// An open regular file of which a forked child keeps nothing: what its stream holds is dropped and
// its descriptor closed before fork() returns there. A child that stays would otherwise keep the
// file's lock when the parent dies, and one that ends would write the stream's contents again.
// A thread that forks while it has one must not use it in the child.
// REQUIRES: a NoCancel around it.
class ForkClosedFile {
 public:
  // Opens it for writing as open(2) does; a null `path` fails with EFAULT. A FIFO or a device fails
  // with ENXIO: it is neither waited for nor written, and becomes no controlling terminal.
  ForkClosedFile(const char* path, int flags, mode_t mode);

  // Closes it; errno is kept.
  ~ForkClosedFile();
  ForkClosedFile(const ForkClosedFile&) = delete;
  ForkClosedFile& operator=(const ForkClosedFile&) = delete;

  bool Valid() const { return m_fd >= 0; }
  int Get() const { return m_fd; }

  // Makes a stream that appends to it, with a buffer of `size` bytes that outlives this object, and
  // returns true; or false with errno. REQUIRES: no stream yet.
  bool MakeStream(char* buffer, size_t size);
  FILE* Stream() const { return m_stream; }

  // Writes what the stream holds. When this or an earlier write has failed, the rest is dropped,
  // and false is the result: closing would write it without the file's lock.
  bool Flush();

 private:
  friend void CloseFilesInChild();

  void Register();
  void Unregister();

  int m_fd;
  FILE* m_stream = nullptr;
  ForkClosedFile* m_next = nullptr;
  ForkClosedFile** m_link = nullptr;  // what points to this object
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_FORK_GUARD_H_
