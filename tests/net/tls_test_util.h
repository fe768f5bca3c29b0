// What the tests of the TLS socket share.
#ifndef TARNWICK_TESTS_NET_TLS_TEST_UTIL_H_
#define TARNWICK_TESTS_NET_TLS_TEST_UTIL_H_

#include <openssl/err.h>

#include "tests/net/net_test_util.h"
#include "tests/support/tls_scripted_peer.h"

inline constexpr char kLoopback[] = "127.0.0.1";
inline const char kReadWaitFailed[] = "Select read op error.\n";

inline constexpr char kHandshakeFailed[] =
    "Failed to established SSL conn. with error \\[[0-9]+\\] \\[error:[0-9A-F]+:.*\\].\n";

// One line about a failed handshake.
inline void ExpectHandshakeLine(const std::vector<LogLine>& lines) {
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_THAT(lines[0], TlsLine("error", "Connect", lines[0].message));
  EXPECT_THAT(lines[0].message, ::testing::MatchesRegex(kHandshakeFailed));
}

// A connected TLS socket and its peer. The peer has sent a byte and the socket has read it, so
// that the session tickets, which no test asks about, are out of the way when the script begins.
struct TlsPair {
  TlsPair(Script script, int timeout, bool buffered, PeerOptions options = {})
      : peer({Greeted(std::move(script))}, {}, options),
        socket(kLoopback, peer.Port(), timeout < 0 ? timeout : 5, buffered) {
    EXPECT_EQ(socket.Connect(), 0);
    EXPECT_EQ(ReadSome(socket, 1), (Delivered{1, "+"}));
    socket.m_timeout = timeout;
  }
  ~TlsPair() { socket.Disconnect(); }

  static Script Greeted(Script script) {
    script.insert(script.begin(), Send("+"));
    return script;
  }

  TlsScriptedPeer peer;
  ExposedTlsSocket socket;
};

inline std::string EmptyQueueText() {
  char text[256];
  ERR_error_string_n(0, text, sizeof(text));
  return text;
}

#endif  // TARNWICK_TESTS_NET_TLS_TEST_UTIL_H_
