// The servers of 127.0.0.1 that the calls with hostile arguments reach.
#ifndef TARNWICK_TESTS_ATTACK_ARGUMENTS_PEER_H_
#define TARNWICK_TESTS_ATTACK_ARGUMENTS_PEER_H_

#include <memory>
#include <vector>

#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/tls_identity.h"

// A process with a port for each response that it knows, over TCP and over TLS. It reads once,
// sends the response and closes, and does not wait for a client that sends nothing: so no call
// waits for it, whatever its time limit.
class ArgumentsPeer {
 public:
  ArgumentsPeer();
  ArgumentsPeer(const ArgumentsPeer&) = delete;
  ArgumentsPeer& operator=(const ArgumentsPeer&) = delete;

  // The port of a response; any number is one. Those of TLS are for each response, too.
  int PlainPort(unsigned number) const { return listeners_[number % (listeners_.size() / 2)].port; }
  int TlsPort(unsigned number) const;
  // Nobody listens on it.
  int ClosedPortNumber() const { return closed_.Port(); }

  // False when the process has ended.
  bool Runs() const;

 private:
  struct Listener {
    int fd;
    int port;
  };

  int Serve();
  void ServeOne(size_t number);

  ClosedPort closed_;
  TlsIdentity identity_;
  std::vector<Listener> listeners_;
  std::unique_ptr<Child> child_;
};

#endif  // TARNWICK_TESTS_ATTACK_ARGUMENTS_PEER_H_
