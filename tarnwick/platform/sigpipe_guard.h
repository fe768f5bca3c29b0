// Keeps a write to a closed connection from killing the process, for the calling thread alone.
#ifndef TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
#define TARNWICK_PLATFORM_SIGPIPE_GUARD_H_

#include "tarnwick/platform/signal_guard.h"

namespace tarnwick {

class SigpipeGuard : public SignalGuard {
 public:
  SigpipeGuard() : SignalGuard(SIGPIPE) {}
};

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_SIGPIPE_GUARD_H_
