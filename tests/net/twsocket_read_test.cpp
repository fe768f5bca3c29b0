// Reading: the direct mode, and what both modes share.
#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

const char kEof[] = "Reach end of file!\n";
const char kWaitFailed[] = "Failed to select socket [7777]\n";

class BothModes : public ::testing::TestWithParam<bool> {};

INSTANTIATE_TEST_SUITE_P(Read, BothModes, ::testing::Bool());

TEST(RawRead, IsOneReadWithItsResultUnchanged) {
  PairedSocket socket(0, true);
  char buf[8] = {};
  EXPECT_EQ(socket._Read(buf, sizeof(buf)), -1);
  EXPECT_EQ(errno, EAGAIN);
  socket.PeerSends("abc");
  EXPECT_EQ(socket._Read(buf, sizeof(buf)), 3);
  EXPECT_STREQ(buf, "abc");
  socket.ClosePeer();
  Faults faults;
  EXPECT_EQ(socket._Read(buf, sizeof(buf)), 0);
  EXPECT_EQ(faults.Count(Call::kRead), 1);
}

TEST(RawRead, DoesNotRepeatAnInterruptedRead) {
  PairedSocket socket(5, true);
  socket.PeerSends("abc");
  Faults faults;
  faults.FailNth(Call::kRead, 1, EINTR);
  char buf[8];
  EXPECT_EQ(socket._Read(buf, sizeof(buf)), -1);
  EXPECT_EQ(errno, EINTR);
}

// The direct mode.

TEST(ReadDirect, WaitsAndThenReadsOnce) {
  LogCapture log;
  ScriptedSocket socket(false, {Returns("abc")});
  EXPECT_EQ(ReadSome(socket, 4096), (Delivered{3, "abc"}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 4096"));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(ReadDirect, ReadsAfterATimeOutToo) {
  ScriptedSocket socket(false, {Fails(EAGAIN)});
  socket.AnswerWait(1, 0);
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{-1, ""}));
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 10"));
}

TEST(ReadDirect, AnErrorIsReturnedSilentlyAndLeavesConnected) {
  LogCapture log;
  ScriptedSocket socket(false, {Fails(ECONNRESET)});
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{-1, ""}));
  EXPECT_EQ(errno, ECONNRESET);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_FALSE(socket.IsEOF());
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(ReadDirect, TheEndOfTheStreamSetsEndOfFile) {
  LogCapture log;
  ScriptedSocket socket(false, {Ends()});
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "ReadData", kEof)));
}

TEST(ReadDirect, AFailedWaitEndsTheRead) {
  LogCapture log;
  ScriptedSocket socket(false, {});
  socket.AnswerWait(1, -1);
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{-1, ""}));
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(socket.calls, ElementsAre("wait to read"));
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("error", "ReadData", kWaitFailed)));
}

TEST(ReadDirect, WithoutASocketFails) {
  LogCapture log;
  ExposedSocket socket("host", 1, 5, false);
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{-1, ""}));
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("error", "ReadData", "Failed to select socket [-1]\n")));
}

TEST(ReadDirect, DoesNotTouchTheReadAheadBuffer) {
  ScriptedSocket socket(false, {Returns("new")});
  socket.Buffer("old");
  EXPECT_EQ(ReadSome(socket, 3), (Delivered{3, "new"}));
  EXPECT_EQ(socket.Unread(), "old");
}

TEST_P(BothModes, ClearsEndOfFileFirst) {
  ScriptedSocket socket(GetParam(), {Returns("abc")});
  socket.m_bEOF = true;
  EXPECT_EQ(ReadSome(socket, 3).result, 3);
  EXPECT_FALSE(socket.IsEOF());
}

TEST_P(BothModes, ANullBufferOrANegativeLengthIsRefused) {
  ScriptedSocket socket(GetParam(), {});
  char byte = '#';
  EXPECT_EQ(socket.ReadData(nullptr, 10), -1);
  EXPECT_EQ(socket.ReadData(&byte, -1), -1);
  EXPECT_EQ(socket.ReadData(nullptr, -1), -1);
  EXPECT_EQ(byte, '#');
}

TEST(ReadData, OfNothingIntoANullBufferIsNothing) {
  ExposedSocket socket("127.0.0.1", 9, 1, true);
  EXPECT_EQ(socket.ReadData(nullptr, 0), 0);
}

TEST_P(BothModes, WithoutASocketReadingAndLineReadingFail) {
  ExposedSocket socket("host", 1, GetParam() ? 5 : -1, GetParam());
  EXPECT_EQ(ReadSome(socket, 10).result, -1);
  EXPECT_EQ(ReadSome(socket, 4096).result, -1);
  EXPECT_EQ(ReadLine(socket).result, -1);
}

}  // namespace
