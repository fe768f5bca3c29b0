// Observes the library's calls of the system, of OpenSSL and of libcurl. The linker puts the
// functions of hooks_*.cpp in front of the real ones; the library itself is the one that everybody
// links.
#ifndef TARNWICK_TOOLS_TWHTTP_HOOKS_H_
#define TARNWICK_TOOLS_TWHTTP_HOOKS_H_

#include <cstdint>
#include <functional>

#include "tools/twhttp/trace.h"

class FakePeer;
class TWDbgLogCfg;

struct Hooks {
  Trace* trace = nullptr;
  // With a peer, nothing leaves the process: it responds on every connection.
  FakePeer* peer = nullptr;
  int port = 0;  // the target's
  // Called after bytes went or came.
  std::function<void()> on_transfer;

  double Now() const;  // seconds since Observe
  void Moved() const;
};

// The hooks of the running operation; null outside of one.
Hooks* CurrentHooks();

// Observes the calls of `operation`, which runs at once.
void Observe(Hooks* hooks, const std::function<void()>& operation);

// While it lives, the library writes its log lines at every level; they go into the trace.
class LogAtFullDetail {
 public:
  LogAtFullDetail();
  ~LogAtFullDetail();
  LogAtFullDetail(const LogAtFullDetail&) = delete;
  LogAtFullDetail& operator=(const LogAtFullDetail&) = delete;

 private:
  TWDbgLogCfg* const previous_;
};

// For hooks_tls.cpp: the connection of a descriptor, 0 for none.
int ConnectionOf(int fd);

#endif  // TARNWICK_TOOLS_TWHTTP_HOOKS_H_
