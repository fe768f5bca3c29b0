// Loopback ports that do not answer as a server does.
#ifndef TARNWICK_TESTS_SUPPORT_PORTS_H_
#define TARNWICK_TESTS_SUPPORT_PORTS_H_

#include <vector>

// A port of 127.0.0.1 that refuses connections: it is taken, and nobody listens.
class ClosedPort {
 public:
  ClosedPort();
  ~ClosedPort();
  ClosedPort(const ClosedPort&) = delete;
  ClosedPort& operator=(const ClosedPort&) = delete;

  int Port() const { return port_; }

 private:
  int fd_;
  int port_;
};

// A port of 127.0.0.1 on which connecting neither succeeds nor fails: its accept queue is full, so
// the kernel drops each attempt.
class BlackHolePort {
 public:
  BlackHolePort();
  ~BlackHolePort();
  BlackHolePort(const BlackHolePort&) = delete;
  BlackHolePort& operator=(const BlackHolePort&) = delete;

  int Port() const { return port_; }

 private:
  int fd_;
  int port_;
  std::vector<int> fillers_;
};

// A TCP socket bound to a free port of 127.0.0.1, which goes into `*port`; -1 and a failed test
// when there is none.
int BindLoopback(int* port);

#endif  // TARNWICK_TESTS_SUPPORT_PORTS_H_
