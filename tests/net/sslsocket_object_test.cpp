// The TLS socket as an object: the end of a connection, the next one, and no objects from OpenSSL.
#include <openssl/ssl.h>

#include <memory>

#include "tests/net/net_test_util.h"
#include "tests/net/tls_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::StartsWith;

// The same object connects again, however the last connection ended.

void ExpectDialog(ExposedTlsSocket& socket) {
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_EQ(socket.WriteData("ping\n", 5), 5);
  EXPECT_EQ(ReadLine(socket), (Delivered{4, "pong"}));
  socket.Disconnect();
}

const Script& Dialog() {
  static const Script script = {ExpectExactly("ping\n"), Send("pong\r\n"), ExpectEof()};
  return script;
}

class TlsReconnect : public ::testing::TestWithParam<bool> {};

// When OpenSSL has no objects to give.

class TlsWithoutObjects : public ::testing::TestWithParam<Call> {
 protected:
  TlsWithoutObjects() {
    Faults faults;
    faults.FailNth(GetParam(), 1);
    listener_ = BindLoopback(&port_);
    listen(listener_, 8);
    socket_ = std::make_unique<ExposedTlsSocket>(kLoopback, port_, 1, true);
  }
  ~TlsWithoutObjects() override { close(listener_); }

  LogCapture log_;
  std::unique_ptr<ExposedTlsSocket> socket_;

 private:
  int listener_;
  int port_ = 0;
};

INSTANTIATE_TEST_SUITE_P(Tls, TlsWithoutObjects, ::testing::Values(Call::kSslCtxNew, Call::kSslNew),
                         [](const auto& instance) {
                           return std::string(CallName(instance.param)) + "Failed";
                         });

INSTANTIATE_TEST_SUITE_P(Tls, TlsReconnect, ::testing::Bool());

// The end of a connection.

TEST(TlsDisconnect, SendsTheCloseNoticeAndDoesNotWaitForThePeers) {
  TlsScriptedPeer peer({{Handshake(), ExpectCloseNotice(), StallUntilFinish()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  Faults faults;
  const Stopwatch watch;
  socket.Disconnect();
  EXPECT_LT(watch.Seconds(), 2.0);
  EXPECT_EQ(faults.Count(Call::kSslShutdown), 1);
  EXPECT_EQ(faults.Count(Call::kSslClear), 1);
  EXPECT_EQ(faults.Count(Call::kClose), 1);
}

TEST(TlsDisconnect, WithoutAConnectionTheBaseAloneRuns) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  socket.m_bConnected = false;
  socket.Buffer("old", 3);
  Faults faults;
  socket.Disconnect();
  EXPECT_EQ(faults.Count(Call::kSslShutdown), 0);
  EXPECT_EQ(faults.Count(Call::kClose), 1);
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_EQ(socket.m_readLen, 0);
}

TEST(TlsDisconnect, TheDestructorClosesWithoutANotice) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  auto socket = std::make_unique<ExposedTlsSocket>(kLoopback, peer.Port(), 5, true);
  ASSERT_EQ(socket->Connect(), 0);
  const int fd = socket->m_sockFd;
  Faults faults;
  socket.reset();
  EXPECT_EQ(faults.Count(Call::kSslShutdown), 0);
  EXPECT_EQ(faults.Count(Call::kClose), 1);
  EXPECT_FALSE(IsOpenFd(fd));
}

TEST_P(TlsReconnect, WorksAfterADisconnect) {
  TlsScriptedPeer peer({Dialog(), Dialog(), Dialog()});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, GetParam());
  for (int i = 0; i < 3; ++i) ExpectDialog(socket);
}

TEST_P(TlsReconnect, ShutsDownAnOpenConnectionFirst) {
  TlsScriptedPeer peer({{Handshake(), ExpectCloseNotice()}, Dialog()});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, GetParam());
  ASSERT_EQ(socket.Connect(), 0);
  ExpectDialog(socket);
}

TEST_P(TlsReconnect, WorksAfterAFailedRead) {
  for (const Step& end : {SendRaw("no TLS record at all"), Reset(), CloseWithoutNotice()}) {
    SCOPED_TRACE(end.name);
    TlsScriptedPeer peer({{Handshake(), end}, Dialog()});
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, GetParam());
    ASSERT_EQ(socket.Connect(), 0);
    EXPECT_LE(ReadSome(socket, 10).result, 0);
    ExpectDialog(socket);
  }
}

TEST_P(TlsReconnect, WorksAfterAFailedHandshake) {
  TlsScriptedPeer peer({{SendRaw("this is not TLS\r\n")}, Dialog()});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, GetParam());
  EXPECT_EQ(socket.Connect(), -1);
  ExpectDialog(socket);
}

TEST_P(TlsReconnect, WorksAfterNewSettings) {
  TlsScriptedPeer first({{Handshake(), DiscardUntilEnd()}});
  TlsScriptedPeer second({Dialog()});
  ExposedTlsSocket socket(kLoopback, first.Port(), 5, GetParam());
  ASSERT_EQ(socket.Connect(), 0);
  socket.SetSocketInfo(kLoopback, second.Port(), 5, GetParam());
  ExpectDialog(socket);
}

TEST_P(TlsReconnect, WorksAfterARefusedConnection) {
  const ClosedPort port;
  TlsScriptedPeer peer({Dialog()});
  ExposedTlsSocket socket(kLoopback, port.Port(), 5, GetParam());
  EXPECT_EQ(socket.Connect(), -1);
  socket.SetSocketInfo(kLoopback, peer.Port(), 5, GetParam());
  ExpectDialog(socket);
}

TEST_P(TlsReconnect, WorksAfterATimeOut) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}, Dialog()});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 0, GetParam());
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_EQ(ReadSome(socket, 10).result, -1);
  socket.m_timeout = 5;
  ExpectDialog(socket);
}

TEST_P(TlsWithoutObjects, TheConstructorLogsIt) {
  const auto no_object = TlsLine("error", "InitSSL", "Failed to create SSL object.\n");
  if (GetParam() == Call::kSslNew) {
    EXPECT_THAT(log_.Lines(), ElementsAre(no_object));
    return;
  }
  EXPECT_THAT(log_.Lines(),
              ElementsAre(TlsLine("error", "InitSSL", "Failed to create SSL context object.\n"),
                          no_object));
}

TEST_P(TlsWithoutObjects, ConnectFailsAndIsLogged) {
  for (int i = 0; i < 2; ++i) {
    log_.Clear();
    EXPECT_EQ(socket_->Connect(), -1);
    EXPECT_FALSE(socket_->IsConnected());
    EXPECT_EQ(socket_->m_sockFd, -1);
    ExpectHandshakeLine(log_.Lines());
  }
}

TEST_P(TlsWithoutObjects, RawReadsAndWritesFailAndAreLogged) {
  const PairedSocket pair(1, true);
  socket_->m_sockFd = dup(pair.m_sockFd);
  log_.Clear();
  char buf[4] = {};
  EXPECT_EQ(socket_->_Read(buf, sizeof(buf)), -1);
  EXPECT_EQ(socket_->_Write(buf, sizeof(buf)), -1);
  const auto lines = log_.Lines();
  ASSERT_EQ(lines.size(), 2u);
  EXPECT_THAT(lines[0], TlsLine("error", "_Read", lines[0].message));
  EXPECT_THAT(lines[0].message, StartsWith("Read error ["));
  EXPECT_THAT(lines[1], TlsLine("error", "_Write", lines[1].message));
  EXPECT_THAT(lines[1].message, StartsWith("Write error ["));
  EXPECT_EQ(socket_->_Write(buf, 0), 0);
}

TEST_P(TlsWithoutObjects, EveryOtherCallFailsWithoutACrash) {
  const PairedSocket pair(0, true);
  socket_->m_timeout = 0;
  for (const bool buffered : {false, true}) {
    socket_->m_sockFd = dup(pair.m_sockFd);
    socket_->m_bConnected = true;
    socket_->m_bBuffered = buffered;
    EXPECT_EQ(socket_->DoSelect(TWSocket::SELECT_READ), 0);
    EXPECT_FALSE(socket_->HasDataToRead(0));
    EXPECT_EQ(ReadSome(*socket_, 10).result, -1);
    EXPECT_EQ(ReadSome(*socket_, 2000).result, -1);
    EXPECT_EQ(ReadLine(*socket_).result, -1);
    EXPECT_EQ(socket_->WriteData("hello", 5), -1);
    socket_->m_bConnected = true;
    socket_->Disconnect();
    EXPECT_EQ(socket_->m_sockFd, -1);
    EXPECT_FALSE(socket_->IsConnected());
  }
}

TEST(TlsObject, StartsAsThePlainSocketDoes) {
  ExposedTlsSocket socket("host", 443, 9, true);
  EXPECT_EQ(socket.m_sockFd, -1);
  EXPECT_EQ(socket.m_strHost, "host");
  EXPECT_EQ(socket.m_port, 443);
  EXPECT_EQ(socket.m_timeout, 9);
  EXPECT_TRUE(socket.m_bBuffered);
  ExposedTlsSocket bare;
  EXPECT_EQ(bare.m_port, -1);
  EXPECT_EQ(bare.m_timeout, -1);
}

TEST(TlsObject, LeavesNoDescriptorOpen) {
  const DescriptorGuard guard;
  TlsScriptedPeer peer({Dialog(), {SendRaw("garbage, not TLS")}, Dialog()});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ExpectDialog(socket);
  EXPECT_EQ(socket.Connect(), -1);
  ExpectDialog(socket);
}

TEST(TlsObject, ItsDescriptorIsClosedByExec) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_NE(fcntl(socket.m_sockFd, F_GETFD) & FD_CLOEXEC, 0);
  socket.Disconnect();
}

}  // namespace
