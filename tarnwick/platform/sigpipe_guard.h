// Keeps a write to a closed connection from killing the process, for the calling thread alone.
#ifndef TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
#define TARNWICK_PLATFORM_SIGPIPE_GUARD_H_

#include "tarnwick/platform/signal_guard.h"

class SigpipeGuard : public SignalGuard {
 public:
  SigpipeGuard() : SignalGuard(SIGPIPE) {}
};

#endif  // TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
