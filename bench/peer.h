// A server in a child process, for operations that need one.
#ifndef TARNWICK_BENCH_PEER_H_
#define TARNWICK_BENCH_PEER_H_

#include <sys/types.h>

#include <string>
#include <vector>

// Listens on 127.0.0.1. It reads one request a connection, sends the next of `replies`, in turn,
// with one write, and closes. A process of its own, so that its work is not counted.
class Peer {
 public:
  explicit Peer(const std::vector<std::string>& replies);
  ~Peer();
  Peer(const Peer&) = delete;
  Peer& operator=(const Peer&) = delete;

  int Port() const { return m_port; }

 private:
  int m_port;
  pid_t m_child;
};

#endif  // TARNWICK_BENCH_PEER_H_
