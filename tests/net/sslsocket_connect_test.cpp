// The TLS handshake.
#include <openssl/err.h>
#include <openssl/ssl.h>

#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/net/tls_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

class TlsBothWays : public ::testing::TestWithParam<int> {};

// The line with the error code and the text that OpenSSL has for an empty queue.
std::string WithoutReason(const std::string& start, int code) {
  char text[256];
  ERR_error_string_n(0, text, sizeof(text));
  return start + " [" + std::to_string(code) + "] [" + text + "].\n";
}

INSTANTIATE_TEST_SUITE_P(Tls, TlsBothWays, ::testing::Values(5, -1));

TEST_P(TlsBothWays, ConnectsWithoutALogLine) {
  LogCapture log;
  TlsScriptedPeer peer({{ExpectExactly("hello"), Send("world"), ExpectCloseNotice()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_EQ(socket.WriteData("hello", 5), 5);
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{5, "world"}));
  socket.Disconnect();
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_EQ(socket.m_sockFd, -1);
  peer.Finish();
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST_P(TlsBothWays, MakesTheHandshakeOnABlockingDescriptorAndThenSetsTheMode) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), GetParam(), true);
  Faults faults;
  bool blocking = false;
  faults.Before(Call::kSslConnect, [&](int) { blocking = !IsNonBlocking(socket.m_sockFd); });
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(blocking);
  EXPECT_EQ(IsNonBlocking(socket.m_sockFd), GetParam() >= 0);
  socket.Disconnect();
}

TEST(TlsConnect, TheHandshakeHasNoTimeOut) {
  const Flag go;
  TlsScriptedPeer peer({{WaitFor(go), Handshake(), DiscardUntilEnd()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 0, true);
  std::thread later([&] {
    usleep(300000);
    go.Set();
  });
  EXPECT_EQ(socket.Connect(), 0);
  later.join();
  socket.Disconnect();
}

TEST(TlsConnect, DoesNotVerifyTheServer) {
  for (const TlsOptions& tls : {TlsOptions{true, false, 0}, TlsOptions{false, true, 0}}) {
    TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}}, tls);
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    EXPECT_EQ(socket.Connect(), 0);
    socket.Disconnect();
  }
}

TEST(TlsConnect, DoesNotNameTheServerItWants) {
  ScriptedPeer peer({{ExpectBytes(200), Reset()}});
  ExposedTlsSocket socket("localhost", peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  const std::string hello = peer.Received(0);
  EXPECT_EQ(hello.substr(0, 2), "\x16\x03");  // it is the client's first message
  EXPECT_EQ(hello.find("localhost"), std::string::npos);
}

TEST(TlsConnect, NegotiatesTheProtocol) {
  TlsScriptedPeer peer({{Send("old"), ExpectEof()}}, {false, false, TLS1_2_VERSION});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(ReadSome(socket, 3), (Delivered{3, "old"}));
  socket.Disconnect();
}

TEST(TlsConnect, AFailedTcpConnectionIsReturnedWithoutAHandshake) {
  LogCapture log;
  const ClosedPort port;
  ExposedTlsSocket socket(kLoopback, port.Port(), -1, true);
  Faults faults;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kSslConnect), 0);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectSocket", "Socket connect failed.\n")));
}

TEST(TlsConnect, GarbageInsteadOfAHandshakeIsLoggedWithItsReason) {
  LogCapture log;
  TlsScriptedPeer peer({{SendRaw("this is not TLS\r\n"), StallUntilFinish()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  ExpectHandshakeLine(log.Lines());
  EXPECT_THAT(log.Text(), ::testing::HasSubstr("with error [1] [error:0A00010B:SSL routines::wrong "
                                               "version number].\n"));
}

TEST(TlsConnect, AHandshakeThatThePeerBreaksOffFails) {
  for (const Step& end : {Close(), Reset()}) {
    LogCapture log;
    TlsScriptedPeer peer({{ExpectRawBytes(1), end}});
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    EXPECT_EQ(socket.Connect(), -1) << end.name;
    EXPECT_FALSE(socket.IsConnected());
    EXPECT_EQ(socket.m_sockFd, -1);
    ExpectHandshakeLine(log.Lines());
  }
}

TEST(TlsConnect, APeerThatClosesAtOnceFailsTheHandshake) {
  LogCapture log;
  ScriptedPeer peer({{Reset()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), -1, true);
  Faults faults;
  faults.Before(Call::kSslConnect, [](int) { usleep(50000); });
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(socket.m_sockFd, -1);
  ExpectHandshakeLine(log.Lines());
}

TEST(TlsConnect, LogsTheErrorCodeAndTheTextOfTheQueue) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  {
    Faults faults;
    faults.FailNth(Call::kSslConnect, 1, ECONNRESET);
    EXPECT_EQ(socket.Connect(), -1);
  }
  EXPECT_THAT(log.Lines(),
              ElementsAre(TlsLine(
                  "error", "Connect",
                  WithoutReason("Failed to established SSL conn. with error", SSL_ERROR_SYSCALL))));
}

TEST(TlsConnect, AnyResultBut1IsAFailure) {
  for (const int result : {0, -1, 2}) {
    ScriptedPeer peer({{ExpectEof()}});
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    Faults faults;
    faults.FailNth(Call::kSslConnect, 1, 0, result);
    EXPECT_EQ(socket.Connect(), -1) << result;
    EXPECT_FALSE(socket.IsConnected());
  }
}

TEST(TlsConnect, ADescriptorThatTlsDoesNotTakeIsAFailure) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  Faults faults;
  faults.FailNth(Call::kSslSetFd, 1);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_THAT(log.Lines(), ::testing::Not(IsEmpty()));
}

TEST(TlsConnect, AnOldErrorInTheQueueDoesNotDisturbIt) {
  LogCapture log;
  TlsScriptedPeer peer({{Handshake(), ExpectCloseNotice()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ERR_raise(ERR_LIB_USER, 7);
  EXPECT_EQ(socket.Connect(), 0);
  socket.Disconnect();
  ERR_clear_error();
  peer.Finish();
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(TlsConnect, AnOldErrorInTheQueueIsNotTheReasonOfAFailure) {
  LogCapture log;
  TlsScriptedPeer peer({{SendRaw("this is not TLS\r\n"), StallUntilFinish()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ERR_raise(ERR_LIB_USER, 7);
  EXPECT_EQ(socket.Connect(), -1);
  ERR_clear_error();
  EXPECT_THAT(log.Text(), ::testing::HasSubstr("wrong version number"));
}

}  // namespace
