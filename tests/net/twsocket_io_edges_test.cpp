// What a caller of the read and write calls meets at the edges.
#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST(IoEdges, ABufferedReadOfNoBytesReturnsZeroWithoutWaiting) {
  LogCapture log;
  ScriptedSocket socket(true, {});
  EXPECT_EQ(ReadSome(socket, 0), (Delivered{0, ""}));
  EXPECT_THAT(socket.calls, IsEmpty());
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(IoEdges, APeerThatClosesAfterAPartReturnsTheShortCountAndEndOfFile) {
  PairedSocket socket(5, true);
  socket.PeerSends(Pattern(700));
  socket.ClosePeer();
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{700, Pattern(700)}));
  EXPECT_TRUE(socket.IsEOF());
}

TEST(IoEdges, SevenEmptyAttemptsOfASmallReadEndInMinusOneAndNotConnected) {
  LogCapture log;
  ScriptedSocket socket(true, Times(7, Fails(EAGAIN)));
  EXPECT_EQ(ReadSome(socket, 1023), (Delivered{-1, ""}));
  EXPECT_TRUE(socket.ScriptEnded());
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ReadData",
                                     "Read socket [7777] failed with errno [11], retry [6].\n")));
}

TEST(IoEdges, ALargeReadFailsAtTheFirstEmptyAttempt) {
  LogCapture log;
  ScriptedSocket socket(true, {Fails(EAGAIN)});
  EXPECT_EQ(ReadSome(socket, 1024), (Delivered{-1, ""}));
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 1024"));
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "ReadData",
                                                  "Read socket [7777] failed with errno [11].\n")));
}

TEST(IoEdges, CarriageReturnAndLineFeedEndTheLine) {
  PairedSocket socket(5, true);
  socket.PeerSends("ab\r\nrest");
  EXPECT_EQ(ReadLine(socket), (Delivered{2, "ab"}));
  EXPECT_EQ(socket.Unread(), "rest");
}

TEST(IoEdges, CarriageReturnAndAnyOtherByteEndTheLineAndConsumeTheByte) {
  PairedSocket socket(5, true);
  socket.PeerSends("ab\rXrest");
  EXPECT_EQ(ReadLine(socket), (Delivered{2, "ab"}));
  EXPECT_EQ(socket.Unread(), "rest");
}

TEST(IoEdges, CarriageReturnAndTheEndOfTheStreamGiveMinusOne) {
  PairedSocket socket(5, true);
  socket.PeerSends("ab\r");
  socket.ClosePeer();
  EXPECT_EQ(ReadLine(socket).result, -1);
}

TEST(IoEdges, ALineLongerThanTheBufferIsCutAndLosesOneByte) {
  LogCapture log;
  PairedSocket socket(5, true);
  socket.PeerSends("abcdef\n");
  EXPECT_EQ(ReadLine(socket, 4), (Delivered{3, "abc"}));
  EXPECT_EQ(socket.Unread(), "ef\n");
  EXPECT_THAT(log.Lines("socket"),
              ElementsAre(SocketLine("info", "ReadToLineEnd",
                                     "BufLen [4] reached before line ending when read Fd [" +
                                         Fd(socket) + "],terminate buffer explicitly.\n")));
}

TEST(IoEdges, RestoredBytesAreReadBeforeTheBufferedOnes) {
  PairedSocket socket(5, true);
  socket.PeerSends("head0123456789");
  ASSERT_EQ(ReadSome(socket, 4), (Delivered{4, "head"}));
  char restored[] = "abcde";
  EXPECT_EQ(socket.RestoreData(restored, 5), 0);
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{5, "abcde"}));
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{10, "0123456789"}));
}

TEST(IoEdges, ABlockingConnectionIsNotWaitedFor) {
  PairedSocket socket(-1, true);
  socket.PeerSends("there");
  Faults faults;
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_READ), 0);
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_WRITE), 0);
  EXPECT_FALSE(socket.HasDataToRead(-1));
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_EQ(faults.Count(Call::kPoll), 0);
}

}  // namespace
