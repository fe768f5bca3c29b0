// Line reading and push-back.
#include <climits>
#include <memory>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// Lines are read the same way in both modes; `Both` runs a test in each.
class ReadToLineEnd : public ::testing::TestWithParam<bool> {
 protected:
  PairedSocket socket_{0, GetParam()};

  std::string Rest() {
    socket_.ClosePeer();
    return ReadSome(socket_, 1000).bytes;
  }
};
INSTANTIATE_TEST_SUITE_P(Both, ReadToLineEnd, ::testing::Bool());

TEST_P(ReadToLineEnd, ALineFeedEndsTheLine) {
  socket_.PeerSends("ab\ncd\n");
  EXPECT_EQ(ReadLine(socket_), (Delivered{2, "ab"}));
  EXPECT_EQ(ReadLine(socket_), (Delivered{2, "cd"}));
}

TEST_P(ReadToLineEnd, ACarriageReturnDropsTheNextByteWhateverItIs) {
  socket_.PeerSends("a\r\rb\r\nc\rdend\n");
  EXPECT_EQ(ReadLine(socket_), (Delivered{1, "a"}));
  EXPECT_EQ(ReadLine(socket_), (Delivered{1, "b"}));
  EXPECT_EQ(ReadLine(socket_), (Delivered{1, "c"}));
  EXPECT_EQ(ReadLine(socket_), (Delivered{3, "end"}));
}

TEST_P(ReadToLineEnd, AnEmptyLineReturnsZeroAndAnEmptyString) {
  socket_.PeerSends("\n\r\nx");
  EXPECT_EQ(ReadLine(socket_), (Delivered{0, ""}));
  EXPECT_EQ(ReadLine(socket_), (Delivered{0, ""}));
  EXPECT_FALSE(socket_.IsEOF());
  EXPECT_EQ(Rest(), "x");
}

TEST_P(ReadToLineEnd, TheEndOfTheStreamEndsTheLine) {
  socket_.PeerSends("ab");
  socket_.ClosePeer();
  EXPECT_EQ(ReadLine(socket_), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket_.IsEOF());
  EXPECT_EQ(ReadLine(socket_), (Delivered{0, ""}));
  EXPECT_TRUE(socket_.IsEOF());
}

TEST_P(ReadToLineEnd, AFailedReadReturnsMinusOneAndDoesNotTerminate) {
  socket_.PeerSends("ab");
  char buf[] = "#######";
  EXPECT_EQ(socket_.ReadToLineEnd(buf, sizeof(buf)), -1);
  EXPECT_EQ(std::string(buf, sizeof(buf) - 1).find('\0'), std::string::npos);
}

TEST_P(ReadToLineEnd, AFailedReadAfterACarriageReturnReturnsMinusOne) {
  socket_.PeerSends("ab\r");
  EXPECT_EQ(ReadLine(socket_).result, -1);
}

TEST_P(ReadToLineEnd, ALineThatJustFitsIsNotCut) {
  LogCapture log;
  socket_.PeerSends("abc\nnext");
  EXPECT_EQ(ReadLine(socket_, 4), (Delivered{3, "abc"}));
  EXPECT_THAT(log.Lines(), IsEmpty());
  EXPECT_EQ(Rest(), "next");
}

TEST_P(ReadToLineEnd, ALineOfTheBuffersLengthLosesItsLastByteAndNotItsEnd) {
  LogCapture log;
  socket_.PeerSends("abcd\n");
  EXPECT_EQ(ReadLine(socket_, 4), (Delivered{3, "abc"}));
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ReadToLineEnd",
                                     "BufLen [4] reached before line ending when read Fd [" +
                                         Fd(socket_) + "],terminate buffer explicitly.\n")));
  EXPECT_EQ(Rest(), "\n");
}

TEST_P(ReadToLineEnd, ABufferOfOneByteLosesEachCharacter) {
  socket_.PeerSends("ab\n");
  EXPECT_EQ(ReadLine(socket_, 1), (Delivered{0, ""}));
  EXPECT_EQ(ReadLine(socket_, 1), (Delivered{0, ""}));
  EXPECT_EQ(Rest(), "\n");
}

TEST_P(ReadToLineEnd, ACarriageReturnInTheLastPlaceStillEndsTheLine) {
  socket_.PeerSends("abc\r\nnext");
  EXPECT_EQ(ReadLine(socket_, 4), (Delivered{3, "abc"}));
  EXPECT_EQ(Rest(), "next");
}

TEST_P(ReadToLineEnd, ZeroBytesAreOrdinaryCharacters) {
  socket_.PeerSends(std::string("a\0b\n", 4));
  char buf[8];
  EXPECT_EQ(socket_.ReadToLineEnd(buf, sizeof(buf)), 3);
  EXPECT_EQ(std::string(buf, 4), std::string("a\0b\0", 4));
}

TEST_P(ReadToLineEnd, NeverWritesBeyondTheBuffer) {
  socket_.PeerSends("abcdefgh\n");
  char buf[6] = {'#', '#', '#', '#', '#', '#'};
  EXPECT_EQ(socket_.ReadToLineEnd(buf, 4), 3);
  EXPECT_EQ(buf[4], '#');
  EXPECT_EQ(buf[5], '#');
}

TEST_P(ReadToLineEnd, ANullBufferOrALengthWithoutRoomIsRefused) {
  socket_.PeerSends("ab\n");
  char byte = '#';
  EXPECT_EQ(socket_.ReadToLineEnd(nullptr, 10), -1);
  EXPECT_EQ(socket_.ReadToLineEnd(&byte, 0), -1);
  EXPECT_EQ(socket_.ReadToLineEnd(&byte, -1), -1);
  EXPECT_EQ(byte, '#');
  EXPECT_EQ(ReadLine(socket_), (Delivered{2, "ab"}));
}

TEST(ReadToLineEndDirect, ReadsOneByteAtATime) {
  ScriptedSocket socket(false, {Returns("a"), Returns("\n")});
  EXPECT_EQ(ReadLine(socket), (Delivered{1, "a"}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 1", "wait to read", "read 1"));
}

TEST(ReadToLineEndBuffered, ReadsALineWithOneRead) {
  ScriptedSocket socket(true, {Returns("first\r\nsecond\n")});
  EXPECT_EQ(ReadLine(socket), (Delivered{5, "first"}));
  EXPECT_EQ(ReadLine(socket), (Delivered{6, "second"}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 64512"));
}

TEST(ReadToLineEndBuffered, GoesOnWhenThePeerPausesInTheLine) {
  ScriptedSocket socket(
      true, {Returns("a"), Fails(EAGAIN), Returns("b\r"), Fails(EAGAIN), Returns("\nrest")});
  EXPECT_EQ(ReadLine(socket), (Delivered{2, "ab"}));
  EXPECT_EQ(socket.Unread(), "rest");
}

// Push-back.

TEST(RestoreData, IntoAnEmptyBufferStartsAtItsFirstByte) {
  ExposedSocket socket("host", 1, 0, true);
  socket.m_readPos = 77;
  char data[] = "abc";
  EXPECT_EQ(socket.RestoreData(data, 3), 0);
  EXPECT_EQ(socket.m_readPos, 0);
  EXPECT_EQ(socket.Unread(), "abc");
}

TEST(RestoreData, MovesTheUnreadBytesWhicheverWayTheyLie) {
  for (const int pos : {0, 3, 500, 5000}) {
    auto socket = std::make_unique<ExposedSocket>("host", 1, 0, true);
    socket->Buffer(Pattern(60000, 500), pos);
    std::string data = Pattern(500);
    EXPECT_EQ(socket->RestoreData(data.data(), 500), 0);
    EXPECT_EQ(socket->m_readPos, 0);
    EXPECT_TRUE(socket->Unread() == Pattern(60500)) << pos;
  }
}

TEST(RestoreData, RepeatedPushBacksComeOutInReverse) {
  ExposedSocket socket("host", 1, 0, true);
  char first[] = "first";
  char second[] = "second";
  EXPECT_EQ(socket.RestoreData(first, 5), 0);
  EXPECT_EQ(socket.RestoreData(second, 6), 0);
  EXPECT_EQ(socket.Unread(), "secondfirst");
}

TEST(RestoreData, AtLeast1024BytesFitAfterAFill) {
  ScriptedSocket socket(true, {Returns(Pattern(64512, 1023))});
  ASSERT_EQ(ReadSome(socket, 1).result, 1);
  std::string data = Pattern(1024);
  EXPECT_EQ(socket.RestoreData(data.data(), 1024), 0);
  EXPECT_TRUE(socket.Unread() == Pattern(1024) + Pattern(64511, 1024));
}

TEST(RestoreData, FillsTheBufferToItsLastByte) {
  auto socket = std::make_unique<ExposedSocket>("host", 1, 0, true);
  socket->Buffer(Pattern(65535, 1));
  char first[] = {Pattern(1)[0]};
  EXPECT_EQ(socket->RestoreData(first, 1), 0);
  EXPECT_EQ(socket->m_readLen, 65536);
  EXPECT_TRUE(ReadSome(*socket, 65536) == (Delivered{65536, Pattern(65536)}));
}

TEST(RestoreData, TakesAWholeBufferAtOnce) {
  auto socket = std::make_unique<ExposedSocket>("host", 1, 0, true);
  std::string data = Pattern(65536);
  EXPECT_EQ(socket->RestoreData(data.data(), 65536), 0);
  EXPECT_TRUE(socket->Unread() == data);
}

TEST(RestoreData, MoreThanTheBufferHoldsIsRefusedAndChangesNothing) {
  auto socket = std::make_unique<ExposedSocket>("host", 1, 0, true);
  socket->Buffer(Pattern(1000), 7);
  const std::string before(socket->m_readBuf, 65536);
  std::string data(70000, 'x');
  for (const int len : {64537, 65536, 65537, 70000}) {
    EXPECT_EQ(socket->RestoreData(data.data(), len), -1) << len;
  }
  EXPECT_EQ(socket->RestoreData(data.data(), INT_MAX), -1);
  EXPECT_TRUE(std::string(socket->m_readBuf, 65536) == before);
  EXPECT_EQ(socket->m_readPos, 7);
  EXPECT_EQ(socket->m_readLen, 1000);
  EXPECT_EQ(socket->m_srcAddr, 0u);
}

TEST(RestoreData, ANullPointerOrANegativeLengthIsRefused) {
  ExposedSocket socket("host", 1, 0, true);
  socket.Buffer("kept", 7);
  char data[] = "abc";
  EXPECT_EQ(socket.RestoreData(nullptr, 3), -1);
  EXPECT_EQ(socket.RestoreData(data, -1), -1);
  EXPECT_EQ(socket.RestoreData(data, INT_MIN), -1);
  EXPECT_EQ(socket.m_readPos, 7);
  EXPECT_EQ(socket.Unread(), "kept");
}

TEST(RestoreData, NoBytesLeaveTheUnreadOnes) {
  ExposedSocket socket("host", 1, 0, true);
  socket.Buffer("kept", 7);
  char data[] = "";
  EXPECT_EQ(socket.RestoreData(data, 0), 0);
  EXPECT_EQ(socket.Unread(), "kept");
}

TEST(RestoreData, DoesNothingInDirectMode) {
  ExposedSocket socket("host", 1, 0, false);
  socket.Buffer("kept", 7);
  char data[] = "abc";
  EXPECT_EQ(socket.RestoreData(data, 3), 0);
  EXPECT_EQ(socket.m_readPos, 7);
  EXPECT_EQ(socket.Unread(), "kept");
}

TEST(RestoreData, WorksBeforeAConnection) {
  ExposedSocket socket;
  socket.SetSocketInfo("host", 1, 0, true);
  char data[] = "line\n";
  EXPECT_EQ(socket.RestoreData(data, 5), 0);
  EXPECT_EQ(ReadLine(socket), (Delivered{4, "line"}));
}

}  // namespace
