// What a caller of the TLS socket meets at the edges.
#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;

TEST(TlsEdges, PendingBytesAreNotDataToReadAndAreReadWithoutAWait) {
  TlsScriptedPeer peer({{Send("hello world"), ExpectEof()}});
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, false);
  ASSERT_EQ(socket.Connect(), 0);
  ASSERT_EQ(ReadSome(socket, 5), (Delivered{5, "hello"}));
  {
    Faults faults;
    EXPECT_FALSE(socket.HasDataToRead(5));
    EXPECT_EQ(ReadSome(socket, 100), (Delivered{6, " world"}));
    EXPECT_EQ(faults.Count(Call::kSelect), 0);
  }
  socket.Disconnect();
}

TEST(TlsEdges, ACleanCloseReturnsZeroAndIsTheEndOfTheStream) {
  LogCapture log;
  TlsScriptedPeer peer({{Handshake(), Close()}});
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, false);
  ASSERT_EQ(socket.Connect(), 0);
  char byte;
  EXPECT_EQ(socket._Read(&byte, 1), 0);
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "ReadData", "Reach end of file!\n")));
}

TEST(TlsEdges, ALargeWriteGoesOutInPiecesOf32000Bytes) {
  const std::string bytes = Pattern(100000);
  const Flag arrived;
  TlsScriptedPeer peer({{ExpectExactly(bytes), SetFlag(arrived), DiscardUntilEnd()}});
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), -1, true);
  ASSERT_EQ(socket.Connect(), 0);
  Faults faults;
  EXPECT_EQ(socket.WriteData(bytes.data(), 100000), 100000);
  EXPECT_THAT(faults.Sizes(Call::kSslWrite), ElementsAre(32000, 32000, 32000, 4000));
  EXPECT_TRUE(arrived.Wait());
  socket.Disconnect();
}

TEST(TlsEdges, AFailedHandshakeDisconnects) {
  TlsScriptedPeer peer({{SendRaw("this is not TLS\r\n"), StallUntilFinish()}});
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_EQ(socket.m_sockFd, -1);
}

}  // namespace
