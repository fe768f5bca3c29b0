// A server in a process of its own, for the operations under torture: its descriptors, allocations
// and calls are not those of the process that is looked at.
#ifndef TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_
#define TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_

#include <openssl/ssl.h>

#include <memory>
#include <string>

#include "tests/support/tls_identity.h"
#include "tests/torture/test_run.h"

// What the peer sends as a body, whole or in chunks.
const std::string& Body();
extern const char kJsonBody[];
extern const char kXmlBody[];

// What ends an upload.
inline constexpr char kUploadEnd[] = "END OF UPLOAD";

// The whole response at the path "length".
std::string LengthResponse();

// Takes any number of connections, one after the other, each of which may break off anywhere. A
// whole request gets the reply that the first word of its path names: "body" a body that ends with
// the connection, "length" one with a length, "chunked", "json", "xml", or "upload" once the
// upload's end has come. With "digest" or "basic" in front, as in "digest/body", a request without
// such a login is refused with a challenge; with "whole" in front, one whose document has no end
// is.
class PeerProcess {
 public:
  // REQUIRES: the calling process has no other thread.
  explicit PeerProcess(Peer kind);
  ~PeerProcess();
  PeerProcess(const PeerProcess&) = delete;
  PeerProcess& operator=(const PeerProcess&) = delete;

  int Port() const { return port_; }

  // A PEM file with the authority that signed the TLS peer's certificate.
  const std::string& CaFile() const { return identity_->CaFile(); }

 private:
  [[noreturn]] void Serve(int listener) const;

  std::unique_ptr<TlsIdentity> identity_;
  int port_ = 0;
  int pid_ = -1;
};

#endif  // TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_
