// A server in a process of its own, for the operations under torture: its descriptors, allocations
// and calls are not those of the process that is looked at.
#ifndef TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_
#define TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_

#include <memory>
#include <string>

#include "tests/support/server_process.h"
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
// whole request gets the response that the first word of its path names: "body" a body that ends
// with the connection, "length" one with a length, "chunked", "json", "xml", or "upload" once the
// upload's end has come. With "digest" or "basic" in front, as in "digest/body", a request without
// such credentials is refused with a challenge; with "whole" in front, one whose document has no
// end is.
class PeerProcess {
 public:
  // REQUIRES: the calling process has no other thread.
  explicit PeerProcess(PeerKind kind);

  int Port() const { return server_ ? server_->Port() : 0; }

  // A PEM file with the authority that signed the TLS peer's certificate.
  const std::string& CaFile() const { return identity_->CaFile(); }

 private:
  std::unique_ptr<TlsIdentity> identity_;
  std::unique_ptr<ServerProcess> server_;
};

#endif  // TARNWICK_TESTS_TORTURE_PEER_PROCESS_H_
