// A server in a process of its own: its descriptors, memory and calls are not those of the process
// that is looked at.
#ifndef TARNWICK_TESTS_SUPPORT_SERVER_PROCESS_H_
#define TARNWICK_TESTS_SUPPORT_SERVER_PROCESS_H_

#include <sys/types.h>

#include <functional>
#include <string>
#include <vector>

#include "tests/support/server_connection.h"
#include "tests/support/tls_identity.h"

// What is done with one connection; `number` counts all of the server's.
using Serve = std::function<void(ServerConnection& connection, unsigned number)>;

struct ServedPort {
  Serve serve;
  const TlsIdentity* identity = nullptr;  // null: plain
  int limit_seconds = 40;                 // of a read or a write of the server's
};

// Serves each port until its end, or until its parent ends.
// REQUIRES: it is made while no other thread runs.
class ServerProcess {
 public:
  enum class Connections { kOneByOne, kInThreads };

  explicit ServerProcess(const std::vector<ServedPort>& served,
                         Connections connections = Connections::kOneByOne);
  ~ServerProcess();
  ServerProcess(const ServerProcess&) = delete;
  ServerProcess& operator=(const ServerProcess&) = delete;

  // Of the i-th one, on 127.0.0.1.
  int Port(size_t i = 0) const { return ports_[i]; }

 private:
  std::vector<int> ports_;
  pid_t pid_ = -1;
};

// Takes one request with the length that it announces, sends `response`, and waits for the client to
// close.
Serve RespondWith(const std::string& response);

#endif  // TARNWICK_TESTS_SUPPORT_SERVER_PROCESS_H_
