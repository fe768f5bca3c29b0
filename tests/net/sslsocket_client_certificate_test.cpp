// A TLS peer that wants a certificate of the client, which has none to show.
#include <openssl/ssl.h>

#include "tests/net/net_test_util.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

// The peer ends the handshake with an alert.
Step RefuseHandshake() {
  return {"RefuseHandshake()",
          [](PeerConnection& peer, std::string* error) {
            std::string reason;
            const bool refused = !peer.Handshake(&reason);
            if (!refused) *error = "the client had a certificate";
            return refused;
          },
          false};
}

TlsOptions WithVersion(int version) {
  TlsOptions tls;
  tls.client_certificate = true;
  tls.max_version = version;
  return tls;
}

}  // namespace

TEST(TlsClientCertificate, WithTls12TheConnectFails) {
  TlsScriptedPeer peer({{RefuseHandshake(), StallUntilFinish()}}, WithVersion(TLS1_2_VERSION));
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
}

TEST(TlsClientCertificate, WithTls13TheConnectSucceedsAndTheFirstReadMeetsTheEnd) {
  TlsScriptedPeer peer({{RefuseHandshake(), StallUntilFinish()}}, WithVersion(TLS1_3_VERSION));
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
  socket.Disconnect();
}
