// The soak's server: a process of its own, so that its memory and descriptors are not the client's.
#ifndef TARNWICK_TESTS_SOAK_SERVER_H_
#define TARNWICK_TESTS_SOAK_SERVER_H_

#include <sys/types.h>

#include <string>

#include "tests/soak/plan.h"

// The ports of 127.0.0.1 at which the server answers.
struct ServerPorts {
  int plain = 0;
  int tls = 0;
  int bad_certificate = 0;
  int hang_up = 0;
  int noise = 0;
  int silence = 0;
};

// Starts the process. It answers until EndServer, or until its parent ends.
// REQUIRES: no other thread runs yet.
class Server {
 public:
  Server();
  ~Server();
  Server(const Server&) = delete;
  Server& operator=(const Server&) = delete;

  const ServerPorts& Ports() const { return ports_; }

  // A PEM file with the authority that the certificate of the TLS port comes from.
  const std::string& CaFile() const { return ca_file_; }

 private:
  pid_t pid_ = -1;
  ServerPorts ports_;
  std::string ca_file_;
};

#endif  // TARNWICK_TESTS_SOAK_SERVER_H_
