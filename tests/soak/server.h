// The soak's server: a process of its own, so that its memory and descriptors are not the client's.
#ifndef TARNWICK_TESTS_SOAK_SERVER_H_
#define TARNWICK_TESTS_SOAK_SERVER_H_

#include <string>

#include "tests/support/server_process.h"

// The ports of 127.0.0.1 that the server serves.
struct ServerPorts {
  int plain = 0;
  int tls = 0;
  int bad_certificate = 0;
  int hang_up = 0;
  int noise = 0;
  int silence = 0;
};

// REQUIRES: no other thread runs yet.
class Server {
 public:
  Server();

  const ServerPorts& Ports() const { return ports_; }

  // A PEM file with the authority that the certificate of the TLS port comes from.
  const std::string& CaFile() const { return identity_.CaFile(); }

 private:
  const TlsIdentity identity_;
  const TlsIdentity stranger_;
  const ServerProcess process_;
  const ServerPorts ports_;
};

#endif  // TARNWICK_TESTS_SOAK_SERVER_H_
