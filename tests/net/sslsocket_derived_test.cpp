// What a class derived from the TLS socket sees of its own operations.
#include <openssl/ssl.h>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;

constexpr char kLoopback[] = "127.0.0.1";

class WatchedTlsSocket : public ExposedTlsSocket {
 public:
  using ExposedTlsSocket::ExposedTlsSocket;

  int PostConnect() override {
    steps.emplace_back("PostConnect");
    ExposedTlsSocket::PostConnect();
    return -5;
  }
  void Disconnect() override {
    steps.emplace_back("Disconnect");
    ExposedTlsSocket::Disconnect();
  }
  int DoSelect(SELECT_TYPE type) override {
    steps.emplace_back(type == SELECT_READ ? "wait to read" : "wait to write");
    return ExposedTlsSocket::DoSelect(type);
  }

  std::vector<std::string> steps;
};

TEST(DerivedTlsSocket, IsDisconnectedFirstAndPostConnectsResultIsIgnored) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  WatchedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_THAT(socket.steps, ElementsAre("Disconnect", "PostConnect"));
  socket.Disconnect();
}

TEST(DerivedTlsSocket, IsDisconnectedAfterAFailedHandshakeToo) {
  ScriptedPeer peer({{ExpectEof()}});
  WatchedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  Faults faults;
  faults.FailNth(Call::kSslConnect, 1, 0, -1);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(socket.steps, ElementsAre("Disconnect", "Disconnect"));
}

TEST(DerivedTlsSocket, IsNotAskedForAHandshakeAfterAFailedTcpConnection) {
  const ClosedPort port;
  WatchedTlsSocket socket(kLoopback, port.Port(), 5, true);
  Faults faults;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kSslConnect), 0);
  EXPECT_THAT(socket.steps, ElementsAre("Disconnect"));
}

TEST(DerivedTlsSocket, WaitsInItsOwnWayBeforeAndInsideEachWrite) {
  TlsScriptedPeer peer({{ExpectExactly("hi"), DiscardUntilEnd()}});
  WatchedTlsSocket socket(kLoopback, peer.Port(), 5, false);
  ASSERT_EQ(socket.Connect(), 0);
  socket.steps.clear();
  EXPECT_EQ(socket.WriteData("hi", 2), 2);
  EXPECT_THAT(socket.steps, ElementsAre("wait to write", "wait to write"));
  socket.Disconnect();
}

TEST(DerivedTlsSocket, WaitsInItsOwnWayForTheRestOfARecord) {
  TlsScriptedPeer peer({{Send("answer"), DiscardUntilEnd()}});
  WatchedTlsSocket socket(kLoopback, peer.Port(), 5, false);
  ASSERT_EQ(socket.Connect(), 0);
  socket.steps.clear();
  Faults faults;
  faults.Return(Call::kSslRead, 1, 1, -1);
  faults.Return(Call::kSslGetError, 1, 1, SSL_ERROR_WANT_READ);
  EXPECT_EQ(ReadSome(socket, 6), (Delivered{6, "answer"}));
  EXPECT_GE(socket.steps.size(), 2U);
  EXPECT_THAT(socket.steps, ::testing::Each("wait to read"));
  socket.Disconnect();
}

}  // namespace
