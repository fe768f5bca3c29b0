// How a client lets its socket go: by the socket's own Disconnect, so that a TLS peer hears of it,
// and then by its destructor.
#include <memory>

#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

// Notes its end in a text that outlives it.
class WatchedSocket : public TWSocket {
 public:
  explicit WatchedSocket(std::string* steps) : steps_(steps) {}
  ~WatchedSocket() override { *steps_ += "destroyed\n"; }
  void Disconnect() override { *steps_ += "disconnected\n"; }

 private:
  std::string* const steps_;
};

TEST(ClientDestruction, TheSocketIsDisconnectedByItsOwnClassAndDestroyed) {
  std::string steps;
  {
    ExposedClient client;
    client.m_pSocket = new WatchedSocket(&steps);
  }
  EXPECT_EQ(steps, "disconnected\ndestroyed\n");
}

TEST(ClientDestruction, ATlsPeerGetsTheCloseNotice) {
  TlsScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n\r\n"), ExpectCloseNotice()}});
  ClientSettings settings;
  settings.https = true;
  auto client = std::make_unique<ExposedClient>(peer.Port(), settings);
  EXPECT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  client.reset();
  peer.Finish();
}

}  // namespace
