// Writing over TLS, also to a peer that has gone.
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <unistd.h>

#include <csignal>
#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/net/tls_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/flag.h"
#include "tests/support/process.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::SizeIs;

// A peer that has gone does not end the process: SIGPIPE is at its default in these children.

void DefaultSigpipe() {
  signal(SIGPIPE, SIG_DFL);
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, SIGPIPE);
  pthread_sigmask(SIG_UNBLOCK, &set, nullptr);
}

void ExpectDefaultSigpipe() {
  sigset_t mask;
  pthread_sigmask(SIG_SETMASK, nullptr, &mask);
  EXPECT_EQ(sigismember(&mask, SIGPIPE), 0);
  struct sigaction now = {};
  sigaction(SIGPIPE, nullptr, &now);
  EXPECT_EQ(now.sa_handler, SIG_DFL);
}

// Writing.

TEST(TlsWrite, NoBytesGiveZero) {
  TlsPair tls({ExpectEof()}, 5, true);
  Faults faults;
  EXPECT_EQ(tls.socket._Write("x", 0), 0);
  EXPECT_EQ(faults.Count(Call::kSslWrite), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
}

TEST(TlsWrite, APieceHoldsAtMost32000Bytes) {
  const std::string bytes = Pattern(32001);
  TlsPair tls({ExpectExactly(bytes), ExpectEof()}, -1, true);
  Faults faults;
  EXPECT_EQ(tls.socket.WriteData(bytes.data(), 32001), 32001);
  EXPECT_THAT(faults.Sizes(Call::kSslWrite), ElementsAre(32000, 1));
  EXPECT_THAT(faults.Count(Call::kSelect), 0);
}

TEST(TlsWrite, WaitsBeforeEachPiece) {
  const std::string bytes = Pattern(64000);
  TlsPair tls({ExpectExactly(bytes), ExpectEof()}, 5, true);
  Faults faults;
  EXPECT_EQ(tls.socket._Write(bytes.data(), 64000), 64000);
  EXPECT_GE(faults.Count(Call::kSelect), 2);
  EXPECT_EQ(faults.Count(Call::kSelect), faults.Count(Call::kSslWrite));
}

TEST(TlsWrite, GoesOnWhenThePeerTakesTheBytesLate) {
  for (const int timeout : {5, -1}) {
    const Flag go;
    const std::string bytes = Pattern(6000000);
    PeerOptions options;
    options.receive_buffer = 4096;
    TlsPair tls({WaitFor(go), ExpectExactly(bytes), ExpectEof()}, timeout, true, options);
    std::thread later([&] {
      usleep(100000);
      go.Set();
    });
    ERR_raise(ERR_LIB_USER, 7);  // must not turn "not now" into an error
    EXPECT_EQ(tls.socket.WriteData(bytes.data(), 6000000), 6000000);
    ERR_clear_error();
    later.join();
    EXPECT_TRUE(tls.socket.IsConnected());
  }
}

TEST(TlsWrite, TriesTheSamePieceAgain) {
  for (const int code : {SSL_ERROR_WANT_READ, SSL_ERROR_WANT_WRITE}) {
    LogCapture log;
    const std::string bytes = Pattern(40000);
    TlsPair tls({ExpectExactly(bytes), ExpectEof()}, 5, true);
    Faults faults;
    faults.FailRange(Call::kSslWrite, 1, 2, EAGAIN);
    faults.Return(Call::kSslGetError, 1, 2, code);
    EXPECT_EQ(tls.socket.WriteData(bytes.data(), 40000), 40000);
    const auto& sizes = faults.Sizes(Call::kSslWrite);
    ASSERT_GE(sizes.size(), 4u);
    EXPECT_EQ(sizes[0], 32000u);
    EXPECT_EQ(sizes[1], 32000u);
    EXPECT_EQ(sizes[2], 32000u);
    EXPECT_EQ(sizes.back(), 8000u);
    EXPECT_THAT(log.Lines(), IsEmpty());
  }
}

TEST(TlsWrite, CountsWhatAPartialWriteTook) {
  const std::string bytes = Pattern(1000);
  TlsPair tls({ExpectExactly(bytes), ExpectEof()}, -1, true);
  Faults faults;
  faults.Limit(Call::kSslWrite, 300);
  EXPECT_EQ(tls.socket.WriteData(bytes.data(), 1000), 1000);
  EXPECT_THAT(faults.Sizes(Call::kSslWrite), ElementsAre(1000, 700, 400, 100));
}

TEST(TlsWrite, AFailedWaitIsLoggedAndFails) {
  LogCapture log;
  TlsPair tls({DiscardUntilEnd()}, 5, true);
  {
    Faults faults;
    faults.FailFrom(Call::kSelect, 1, ENOMEM);
    EXPECT_EQ(tls.socket._Write("hello", 5), -1);
    EXPECT_EQ(faults.Count(Call::kSslWrite), 0);
  }
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("error", "DoSelect",
                                     "Select Fd [" + Fd(tls.socket) + "] failed with errno [12]\n"),
                          TlsLine("error", "_Write", "Select write op error.\n")));
}

TEST(TlsWrite, AnErrorIsLoggedAndClearsConnected) {
  LogCapture log;
  TlsPair tls({DiscardUntilEnd()}, 5, true);
  Faults faults;
  faults.FailNth(Call::kSslWrite, 1, ECONNRESET);
  EXPECT_EQ(tls.socket.WriteData("hello", 5), -1);
  EXPECT_FALSE(tls.socket.IsConnected());
  EXPECT_TRUE(IsOpenFd(tls.socket.m_sockFd));
  EXPECT_THAT(log.Lines(), ElementsAre(TlsLine("error", "_Write",
                                               "Write error [5] [" + EmptyQueueText() + "].\n")));
}

TEST(TlsWrite, AnErrorAfterTheFirstPieceReturnsMinusOneToo) {
  const std::string bytes = Pattern(40000);
  TlsPair tls({DiscardUntilEnd()}, -1, true);
  Faults faults;
  faults.FailNth(Call::kSslWrite, 2, ECONNRESET);
  EXPECT_EQ(tls.socket.WriteData(bytes.data(), 40000), -1);
}

TEST(TlsGonePeer, AWriteFails) {
  LogCapture log;
  TlsScriptedPeer peer({{Handshake(), CloseWithoutNotice()}});
  const ChildResult child = RunInChild([&] {
    DefaultSigpipe();
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    EXPECT_EQ(socket.Connect(), 0);
    EXPECT_EQ(ReadSome(socket, 1).result, 0);  // the peer has closed now
    int result = 5;
    for (int i = 0; i < 100 && result == 5; ++i) {
      usleep(5000);
      result = socket.WriteData("hello", 5);
    }
    EXPECT_EQ(result, -1);
    EXPECT_FALSE(socket.IsConnected());
    ExpectDefaultSigpipe();
    return 7;
  });
  EXPECT_EQ(child.code, 7) << "signal " << child.signal;
  const auto lines = log.Lines();
  ASSERT_THAT(lines, SizeIs(2));
  EXPECT_THAT(lines[0], SocketLine("info", "ReadData", "Reach end of file!\n"));
  EXPECT_THAT(lines[1], TlsLine("error", "_Write", lines[1].message));
  EXPECT_THAT(lines[1].message, MatchesRegex("Write error .[0-9]. .error:.*.\\.\n"));
}

TEST(TlsGonePeer, ADisconnectReturns) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  const ChildResult child = RunInChild([&] {
    DefaultSigpipe();
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    EXPECT_EQ(socket.Connect(), 0);
    shutdown(socket.m_sockFd, SHUT_RDWR);  // the close notice meets a broken pipe
    socket.Disconnect();
    ExpectDefaultSigpipe();
    return 7;
  });
  EXPECT_EQ(child.code, 7) << "signal " << child.signal;
}

TEST(TlsGonePeer, AHandshakeFails) {
  ScriptedPeer peer({{ExpectEof()}});
  const ChildResult child = RunInChild([&] {
    DefaultSigpipe();
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, true);
    Faults faults;
    faults.Before(Call::kSslConnect, [&](int) { shutdown(socket.m_sockFd, SHUT_RDWR); });
    EXPECT_EQ(socket.Connect(), -1);
    ExpectDefaultSigpipe();
    return 7;
  });
  EXPECT_EQ(child.code, 7) << "signal " << child.signal;
}

TEST(TlsGonePeer, AReadFailsOrEnds) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  const ChildResult child = RunInChild([&] {
    DefaultSigpipe();
    ExposedTlsSocket socket(kLoopback, peer.Port(), 5, false);
    EXPECT_EQ(socket.Connect(), 0);
    shutdown(socket.m_sockFd, SHUT_RDWR);
    EXPECT_LE(ReadSome(socket, 10).result, 0);
    ExpectDefaultSigpipe();
    return 7;
  });
  EXPECT_EQ(child.code, 7) << "signal " << child.signal;
}

}  // namespace
