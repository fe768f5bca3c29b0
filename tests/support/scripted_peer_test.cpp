// The peers themselves: a peer that let a wrong exchange pass would make every test above it pass.
#include "tests/support/scripted_peer.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "tests/support/ports.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;

// A blocking client without any code of the library.
class Client {
 public:
  explicit Client(int port) : fd_(socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    sockaddr_in address = {};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    connected_ = connect(fd_, reinterpret_cast<sockaddr*>(&address), sizeof(address)) == 0;
  }
  ~Client() { Close(); }
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;

  bool Connected() const { return connected_; }
  int Fd() const { return fd_; }
  void Write(const std::string& bytes) const {
    send(fd_, bytes.data(), bytes.size(), MSG_NOSIGNAL);
  }

  std::string ReadToEnd() const {
    std::string text;
    char buf[256];
    for (ssize_t n; (n = recv(fd_, buf, sizeof(buf), 0)) > 0;) {
      text.append(buf, static_cast<size_t>(n));
    }
    return text;
  }

  void Close() {
    if (fd_ >= 0) close(fd_);
    fd_ = -1;
  }

 private:
  int fd_;
  bool connected_;
};

PeerOptions Hasty() {
  PeerOptions options;
  options.deadline = std::chrono::milliseconds(100);
  return options;
}

TEST(ScriptedPeer, PlaysAnExchangeAndRecordsTheRequest) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\nbody")});
  Client client(peer.Port());
  client.Write("POST / HTTP/1.1\r\nContent-Length: 3\r\n\r\na=1");
  EXPECT_EQ(client.ReadToEnd(), "HTTP/1.1 200 OK\r\n\r\nbody");
  EXPECT_EQ(peer.Received(0), "POST / HTTP/1.1\r\nContent-Length: 3\r\n\r\na=1");
}

TEST(ScriptedPeer, ServesTheConnectionsOneAfterTheOther) {
  ScriptedPeer peer({{ExpectExactly("one"), Send("1"), Close()}, SendThenClose("2")});
  Client first(peer.Port());
  first.Write("one");
  EXPECT_EQ(first.ReadToEnd(), "1");
  EXPECT_EQ(Client(peer.Port()).ReadToEnd(), "2");
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(ScriptedPeer, ResetReachesTheClientAsAReset) {
  ScriptedPeer peer({{ExpectBytes(1), Reset()}});
  Client client(peer.Port());
  client.Write("x");
  char byte;
  EXPECT_EQ(recv(client.Fd(), &byte, 1, 0), -1);
  EXPECT_EQ(errno, ECONNRESET);
}

TEST(ScriptedPeer, SmallPiecesArriveAsOneText) {
  ScriptedPeer peer({SendThenClose("ab"), {SendByteByByte("cdef"), Close()}});
  EXPECT_EQ(Client(peer.Port()).ReadToEnd(), "ab");
  EXPECT_EQ(Client(peer.Port()).ReadToEnd(), "cdef");
}

TEST(ScriptedPeer, AFlagHoldsTheScriptUntilItIsSet) {
  const Flag reached;
  const Flag go_on;
  ScriptedPeer peer({{SetFlag(reached), WaitFor(go_on), Send("x"), Close()}});
  Client client(peer.Port());
  EXPECT_TRUE(reached.Wait());
  char byte;
  EXPECT_EQ(recv(client.Fd(), &byte, 1, MSG_DONTWAIT), -1);
  go_on.Set();
  EXPECT_EQ(client.ReadToEnd(), "x");
}

TEST(ScriptedPeer, FailsTheTestWhenTheClientSendsSomethingElse) {
  EXPECT_NONFATAL_FAILURE(
      {
        ScriptedPeer peer({{ExpectExactly("expected"), Close()}});
        Client client(peer.Port());
        client.Write("somewhat");
        peer.Finish();
      },
      "step ExpectExactly(\"expected\"): got \"somewhat\"");
}

TEST(ScriptedPeer, FailsTheTestWhenBytesAreLeftOver) {
  EXPECT_NONFATAL_FAILURE(
      {
        ScriptedPeer peer({{ExpectUntil("\n"), Close()}});
        Client client(peer.Port());
        client.Write("line\nrest");
        peer.Finish();
      },
      "bytes that no step expected: \"rest\"");
}

TEST(ScriptedPeer, FailsTheTestWhenAStepTakesTooLong) {
  EXPECT_NONFATAL_FAILURE(
      {
        ScriptedPeer peer({{ExpectBytes(1)}}, Hasty());
        Client client(peer.Port());
        peer.Finish();
      },
      "deadline passed");
}

TEST(ScriptedPeer, FailsTheTestWhenAConnectionNeverComes) {
  EXPECT_NONFATAL_FAILURE(ScriptedPeer({SendThenClose("x")}).Finish(), "connection 0 never came");
}

TEST(ScriptedPeer, FailsTheTestWhenAConnectionComesThatHasNoScript) {
  EXPECT_NONFATAL_FAILURE(
      {
        ScriptedPeer peer({});
        Client client(peer.Port());
        peer.Finish();
      },
      "there is no script");
}

TEST(RepeatingPeer, ServesAnyNumberOfClientsOfWhichSomeBreakOff) {
  RepeatingPeer peer({ExpectUntil("\n"), Send("pong\n"), Close()});
  for (int i = 0; i < 3; ++i) {
    const Client client(peer.Port());
    client.Write("ping\n");
    EXPECT_EQ(client.ReadToEnd(), "pong\n");
    Client(peer.Port()).Write("pi");
  }
}

TEST(Ports, AClosedPortRefuses) {
  ClosedPort port;
  Client client(port.Port());
  EXPECT_FALSE(client.Connected());
}

TEST(Ports, ABlackHoleNeitherConnectsNorRefuses) {
  BlackHolePort port;
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port.Port()));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  EXPECT_EQ(connect(fd, reinterpret_cast<sockaddr*>(&address), sizeof(address)), -1);
  usleep(200000);
  sockaddr_in other = {};
  socklen_t length = sizeof(other);
  EXPECT_EQ(getpeername(fd, reinterpret_cast<sockaddr*>(&other), &length), -1);
  int error = -1;
  socklen_t error_length = sizeof(error);
  EXPECT_EQ(getsockopt(fd, SOL_SOCKET, SO_ERROR, &error, &error_length), 0);
  EXPECT_EQ(error, 0);
  close(fd);
}

// A TLS client over a Client's descriptor, which verifies the peer when it is given an authority.
class TlsClient {
 public:
  explicit TlsClient(int port, const std::string& ca_file = "")
      : client_(port), context_(SSL_CTX_new(TLS_client_method())), ssl_(nullptr) {
    if (!ca_file.empty()) {
      SSL_CTX_load_verify_locations(context_, ca_file.c_str(), nullptr);
      SSL_CTX_set_verify(context_, SSL_VERIFY_PEER, nullptr);
    }
    ssl_ = SSL_new(context_);
    SSL_set1_host(ssl_, "localhost");
    SSL_set_fd(ssl_, client_.Fd());
    connected_ = SSL_connect(ssl_) == 1;
  }
  ~TlsClient() {
    SSL_free(ssl_);
    SSL_CTX_free(context_);
  }
  TlsClient(const TlsClient&) = delete;
  TlsClient& operator=(const TlsClient&) = delete;

  bool Connected() const { return connected_; }
  int Write(const std::string& bytes) {
    return SSL_write(ssl_, bytes.data(), static_cast<int>(bytes.size()));
  }
  int Read(char* buf, int size) { return SSL_read(ssl_, buf, size); }
  int Error(int result) { return SSL_get_error(ssl_, result); }
  void Shutdown() { SSL_shutdown(ssl_); }

 private:
  Client client_;
  SSL_CTX* context_;
  SSL* ssl_;
  bool connected_;
};

TEST(TlsScriptedPeer, PlaysAnExchangeAndRecordsRecordSizes) {
  TlsScriptedPeer peer({{ExpectBytes(20000), Send("ok"), Close()}});
  TlsClient client(peer.Port(), peer.CaFile());
  ASSERT_TRUE(client.Connected());
  client.Write(std::string(20000, 'x'));
  char buf[16];
  EXPECT_EQ(client.Read(buf, sizeof(buf)), 2);
  const int end = client.Read(buf, sizeof(buf));
  EXPECT_EQ(client.Error(end), SSL_ERROR_ZERO_RETURN);
  EXPECT_THAT(peer.RecordSizes(0), ElementsAre(16384, 3616));
}

TEST(TlsScriptedPeer, ARecordMayArriveByteByByte) {
  TlsScriptedPeer peer({{SendRecordByteByByte("slow"), CloseWithoutNotice()}});
  TlsClient client(peer.Port());
  char buf[16];
  EXPECT_EQ(client.Read(buf, sizeof(buf)), 4);
  EXPECT_LE(client.Read(buf, sizeof(buf)), 0);
  EXPECT_NE(client.Error(0), SSL_ERROR_ZERO_RETURN);
}

TEST(TlsScriptedPeer, SeesTheClientsCloseNotice) {
  TlsScriptedPeer peer({{Handshake(), ExpectCloseNotice()}});
  TlsClient client(peer.Port());
  client.Shutdown();
  peer.Finish();
}

TEST(TlsScriptedPeer, SpoilsTheHandshakeInEachWay) {
  TlsScriptedPeer peer(
      {{ExpectRawBytes(1), Close()}, {ExpectRawBytes(1), SendRaw("garbage"), Close()}});
  EXPECT_FALSE(TlsClient(peer.Port()).Connected());
  EXPECT_FALSE(TlsClient(peer.Port()).Connected());
}

void ExpectHandshakeRefused(const TlsOptions& options) {
  EXPECT_NONFATAL_FAILURE(
      {
        TlsScriptedPeer peer({{Handshake(), ExpectBytes(1)}}, options, Hasty());
        EXPECT_FALSE(TlsClient(peer.Port(), peer.CaFile()).Connected());
        peer.Finish();
      },
      "connection 0, ");
}

TEST(TlsScriptedPeer, AnExpiredCertificateIsNotAccepted) {
  TlsOptions options;
  options.expired = true;
  ExpectHandshakeRefused(options);
}

TEST(TlsScriptedPeer, ACertificateForAnotherHostIsNotAccepted) {
  TlsOptions options;
  options.wrong_host = true;
  ExpectHandshakeRefused(options);
}

}  // namespace
