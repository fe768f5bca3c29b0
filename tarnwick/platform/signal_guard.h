// Keeps a signal that a failing write raises from ending the process, for the calling thread alone.
#ifndef TARNWICK_PLATFORM_SIGNAL_GUARD_H_
#define TARNWICK_PLATFORM_SIGNAL_GUARD_H_

#include <csignal>

namespace tarnwick {

// SIGPIPE and SIGXFSZ are raised in the thread that writes. The guard blocks one of them there, and
// takes it back when a write has raised it; the disposition of the process is not touched, and the
// thread's mask is as before afterwards. A signal that was pending before stays pending. errno is
// kept.
class SignalGuard {
 public:
  explicit SignalGuard(int signal);
  ~SignalGuard();
  SignalGuard(const SignalGuard&) = delete;
  SignalGuard& operator=(const SignalGuard&) = delete;

  // Call it after each failed write in the guard's scope: takes back what the write raised.
  void DiscardPending();

 private:
  bool IsPending() const;

  int m_signal;
  sigset_t m_set;
  sigset_t m_before;
  bool m_pendingBefore;
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_SIGNAL_GUARD_H_
