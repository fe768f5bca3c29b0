// The TLS twin of ScriptedPeer: plays the same scripts over TLS.
//
//   TlsScriptedPeer peer({{ExpectUntil("\n"), Send("ok\n"), Close()}});
//
// The handshake comes before the first step that needs it; the steps below TLS, and Close, Reset,
// ShutdownWrite, WaitFor and the stalls, do not. So {ExpectRawBytes(1), Close()} breaks a handshake
// off, {StallUntilFinish()} lets it hang and {SendRaw("garbage")} spoils it.
#ifndef TARNWICK_TESTS_SUPPORT_TLS_SCRIPTED_PEER_H_
#define TARNWICK_TESTS_SUPPORT_TLS_SCRIPTED_PEER_H_

#include <memory>
#include <string>
#include <vector>

#include "tests/support/scripted_peer.h"
#include "tests/support/tls_identity.h"

class TlsScriptedPeer : public ScriptedPeer {
 public:
  explicit TlsScriptedPeer(std::vector<Script> connections, TlsOptions tls = {},
                           PeerOptions options = {});

  // A PEM file with the certificate of the authority that signed the peer's own.
  const std::string& CaFile() const { return identity_->CaFile(); }

  // The plain-text sizes of the application records that connection `i` sent, in order. A write of
  // more than 16,384 bytes makes several records.
  std::vector<size_t> RecordSizes(size_t i) { return Records(i); }

 private:
  TlsScriptedPeer(std::vector<Script> connections, PeerOptions options,
                  std::shared_ptr<const TlsIdentity> identity);

  std::shared_ptr<const TlsIdentity> identity_;
};

#endif  // TARNWICK_TESTS_SUPPORT_TLS_SCRIPTED_PEER_H_
