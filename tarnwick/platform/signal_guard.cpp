#include "tarnwick/platform/signal_guard.h"

#include <pthread.h>

#include <ctime>

#include "tarnwick/platform/unique.h"

namespace tarnwick {

SignalGuard::SignalGuard(int signal) : m_signal(signal), m_pendingBefore(false) {
  const ErrnoSaver keeper;
  sigemptyset(&m_set);
  sigaddset(&m_set, signal);
  sigemptyset(&m_before);
  pthread_sigmask(SIG_BLOCK, &m_set, &m_before);
  // Only a thread that had blocked the signal itself can have one waiting.
  if (sigismember(&m_before, signal) == 1) m_pendingBefore = IsPending();
}

SignalGuard::~SignalGuard() {
  const ErrnoSaver keeper;
  pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

void SignalGuard::DiscardPending() {
  if (m_pendingBefore) return;
  const ErrnoSaver keeper;
  const struct timespec now = {0, 0};
  while (sigtimedwait(&m_set, nullptr, &now) == -1 && errno == EINTR) {
  }
}

bool SignalGuard::IsPending() const {
  sigset_t pending;
  return sigpending(&pending) == 0 && sigismember(&pending, m_signal) == 1;
}

}  // namespace tarnwick
