#include "tarnwick/platform/sigpipe_guard.h"

#include <pthread.h>

#include <ctime>

#include "tarnwick/platform/owned.h"

namespace {

bool SigpipeIsPending() {
  sigset_t pending;
  return sigpending(&pending) == 0 && sigismember(&pending, SIGPIPE) == 1;
}

}  // namespace

SigpipeGuard::SigpipeGuard() : m_pendingBefore(false) {
  const ErrnoKeeper keeper;
  sigemptyset(&m_sigpipe);
  sigaddset(&m_sigpipe, SIGPIPE);
  sigemptyset(&m_before);
  pthread_sigmask(SIG_BLOCK, &m_sigpipe, &m_before);
  // Only a thread that had blocked the signal itself can have one waiting.
  if (sigismember(&m_before, SIGPIPE) == 1) m_pendingBefore = SigpipeIsPending();
}

SigpipeGuard::~SigpipeGuard() {
  const ErrnoKeeper keeper;
  pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

void SigpipeGuard::TakeBack() {
  if (m_pendingBefore) return;
  const ErrnoKeeper keeper;
  const struct timespec now = {0, 0};
  while (sigtimedwait(&m_sigpipe, nullptr, &now) == -1 && errno == EINTR) {
  }
}
