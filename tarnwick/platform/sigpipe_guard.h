// Keeps a write to a closed connection from killing the process, for the calling thread alone.
#ifndef TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
#define TARNWICK_PLATFORM_SIGPIPE_GUARD_H_

#include <csignal>

// SIGPIPE is raised in the thread that writes. The guard blocks it there, and takes it back when a
// write has raised it; the disposition of the process is not touched, and the thread's mask is as
// before afterwards. A SIGPIPE that was pending before stays pending. errno is kept.
class SigpipeGuard {
 public:
  SigpipeGuard();
  ~SigpipeGuard();
  SigpipeGuard(const SigpipeGuard&) = delete;
  SigpipeGuard& operator=(const SigpipeGuard&) = delete;

  // Call it after each failed write in the guard's scope: takes back what the write raised.
  void TakeBack();

 private:
  sigset_t m_sigpipe;
  sigset_t m_before;
  bool m_pendingBefore;
};

#endif  // TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
