// Reading in the buffered mode, step by step.
#include <algorithm>
#include <random>
#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

const char kEof[] = "Reach end of file!\n";
const char kWaitFailed[] = "Failed to select socket [7777]\n";

// Whatever the pieces and the read sizes, the bytes are those of the stream.

void SendInRandomPieces(int fd, const std::string& stream, unsigned seed) {
  std::mt19937 random(seed);
  for (size_t sent = 0; sent < stream.size();) {
    const size_t most = (random() % 4 == 0) ? 70000 : 1500;
    const size_t piece = std::min<size_t>(1 + random() % most, stream.size() - sent);
    const ssize_t n = send(fd, stream.data() + sent, piece, MSG_NOSIGNAL);
    if (n <= 0) break;
    sent += static_cast<size_t>(n);
    if (random() % 8 == 0) usleep(100);
  }
  shutdown(fd, SHUT_WR);
}

size_t RandomSize(std::mt19937& random) {
  constexpr size_t kEdges[] = {1, 2, 1023, 1024, 1025, 64511, 64512, 64513, 65536};
  if (random() % 4 == 0) return kEdges[random() % 9];
  return 1 + random() % (random() % 3 == 0 ? 20000 : 300);
}

class RandomStream : public ::testing::TestWithParam<bool> {};

INSTANTIATE_TEST_SUITE_P(Read, RandomStream, ::testing::Bool());

// The buffered mode: what the buffer holds is delivered without a read.

TEST(ReadBuffered, IsServedFromTheBufferWhenItHoldsEnough) {
  ScriptedSocket socket(true, {});
  socket.Buffer(Pattern(3000), 10);
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{5, Pattern(5)}));
  EXPECT_EQ(socket.m_readPos, 15);
  EXPECT_EQ(socket.m_readLen, 2995);
  EXPECT_EQ(ReadSome(socket, 2995), (Delivered{2995, Pattern(2995, 5)}));
  EXPECT_EQ(socket.m_readLen, 0);
  EXPECT_THAT(socket.calls, IsEmpty());
}

TEST(ReadBuffered, ASmallReadFillsTheBuffer) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns(Pattern(100))});
  EXPECT_EQ(ReadSome(socket, 30), (Delivered{30, Pattern(30)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 64512"));
  EXPECT_EQ(socket.m_readPos, 30);
  EXPECT_EQ(socket.Unread(), Pattern(70, 30));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(ReadBuffered, AFullFillIsKeptWhole) {
  ScriptedSocket socket(true, {Returns(Pattern(64512))});
  EXPECT_EQ(ReadSome(socket, 1), (Delivered{1, Pattern(1)}));
  EXPECT_EQ(ReadSome(socket, 64511), (Delivered{64511, Pattern(64511, 1)}));
  EXPECT_TRUE(socket.ScriptEnded());
}

TEST(ReadBuffered, AReadOf1023BytesGoesThroughTheBuffer) {
  ScriptedSocket socket(true, {Returns(Pattern(1023))});
  EXPECT_EQ(ReadSome(socket, 1023), (Delivered{1023, Pattern(1023)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 64512"));
}

TEST(ReadBuffered, AReadOf1024BytesGoesStraightToTheCaller) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns(Pattern(1024))});
  EXPECT_EQ(ReadSome(socket, 1024), (Delivered{1024, Pattern(1024)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 1024"));
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("debug3", "ReadData", "Have read 1024 bytes.\n")));
}

TEST(ReadBuffered, WhatIsBufferedComesFirstAndDecidesAboutTheWay) {
  ScriptedSocket small(true, {Returns(Pattern(1023, 1))});
  small.Buffer(Pattern(1), 9);
  EXPECT_EQ(ReadSome(small, 1024), (Delivered{1024, Pattern(1024)}));
  EXPECT_THAT(small.calls, ElementsAre("wait to read", "read 64512"));
  ScriptedSocket large(true, {Returns(Pattern(1024, 1))});
  large.Buffer(Pattern(1), 9);
  EXPECT_EQ(ReadSome(large, 1025), (Delivered{1025, Pattern(1025)}));
  EXPECT_THAT(large.calls, ElementsAre("wait to read", "read 1024"));
  EXPECT_EQ(large.m_readPos, 0);
  EXPECT_EQ(large.m_readLen, 0);
}

TEST(ReadBuffered, ALargeReadGoesOnUntilFewerThan1024BytesAreMissing) {
  LogCapture log;
  ScriptedSocket socket(
      true, {Returns(Pattern(500)), Returns(Pattern(477, 500)), Returns(Pattern(1500, 977))});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{2000, Pattern(2000)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 2000", "wait to read", "read 1500",
                                        "wait to read", "read 64512"));
  EXPECT_EQ(socket.Unread(), Pattern(477, 2000));
  EXPECT_THAT(log.Messages(), ElementsAre("Have read 500 bytes.\n", "Have read 477 bytes.\n"));
}

TEST(ReadBuffered, SmallPiecesAreCollected) {
  ScriptedSocket socket(true, {Returns("ab"), Returns("c"), Returns("defgh")});
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{5, "abcde"}));
  EXPECT_EQ(socket.Unread(), "fgh");
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 64512", "wait to read", "read 64512",
                                        "wait to read", "read 64512"));
}

TEST(ReadBuffered, AVeryLargeReadIsNotCutToTheBuffer) {
  ScriptedSocket socket(true, {Returns(Pattern(200000))});
  EXPECT_EQ(ReadSome(socket, 200000), (Delivered{200000, Pattern(200000)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 200000"));
}

// Its failures.

TEST(ReadBuffered, TriesASmallReadAgainAfterEagainAndEintr) {
  LogCapture log;
  ScriptedSocket socket(true, {Fails(EAGAIN), Fails(EINTR), Fails(EAGAIN), Fails(EINTR),
                               Fails(EAGAIN), Fails(EAGAIN), Returns("abc")});
  EXPECT_EQ(ReadSome(socket, 3), (Delivered{3, "abc"}));
  EXPECT_EQ(socket.calls.size(), 14u);  // a wait before each of the seven reads
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(ReadBuffered, TheSeventhInterruptedAttemptIsTheLastToo) {
  LogCapture log;
  ScriptedSocket socket(true, Times(7, Fails(EINTR)));
  EXPECT_EQ(ReadSome(socket, 3), (Delivered{-1, ""}));
  EXPECT_EQ(errno, EINTR);
  EXPECT_EQ(socket.calls.size(), 14u);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Messages(),
              ElementsAre("Read socket [7777] failed with errno [4], retry [6].\n"));
}

TEST(ReadBuffered, AnyOtherErrorOfASmallReadFailsAtOnce) {
  LogCapture log;
  ScriptedSocket socket(true, {Fails(EAGAIN), Fails(ECONNRESET)});
  EXPECT_EQ(ReadSome(socket, 3), (Delivered{-1, ""}));
  EXPECT_EQ(errno, ECONNRESET);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_EQ(socket.m_sockFd, ScriptedSocket::kFd);
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ReadData",
                                     "Read socket [7777] failed with errno [104], retry [1].\n")));
}

TEST(ReadBuffered, TheAttemptsOfTheNextReadAreCountedAnew) {
  std::vector<IoResult> reads = Times(6, Fails(EAGAIN));
  reads.push_back(Returns("a"));
  for (const IoResult& again : Times(6, Fails(EAGAIN))) reads.push_back(again);
  reads.push_back(Returns("b"));
  ScriptedSocket socket(true, reads);
  EXPECT_EQ(ReadSome(socket, 1), (Delivered{1, "a"}));
  EXPECT_EQ(ReadSome(socket, 1), (Delivered{1, "b"}));
}

TEST(ReadBuffered, AnErrorAfterSomeBytesReturnsTheShortCountAndStaysConnected) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns("ab"), Fails(ECONNRESET)});
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_FALSE(socket.IsEOF());
  EXPECT_THAT(
      log.Lines(),
      ElementsAre(SocketLine("info", "ReadData", "Read socket [7777] failed with errno [104].\n")));
}

TEST(ReadBuffered, EagainAfterSomeBytesIsNotTriedAgain) {
  ScriptedSocket socket(true, {Fails(EAGAIN)});
  socket.Buffer("ab");
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket.ScriptEnded());
}

TEST(ReadBuffered, TheEndOfTheStreamAfterSomeBytesReturnsTheShortCount) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns("ab"), Ends()});
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "ReadData", kEof)));
}

TEST(ReadBuffered, TheEndOfTheStreamBeforeAnyByteReturnsZero) {
  ScriptedSocket socket(true, {Ends(), Ends()});
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
}

TEST(ReadBuffered, ALargeReadThatMeetsTheEndLooksOnceMore) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns(Pattern(300)), Ends(), Ends()});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{300, Pattern(300)}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 2000", "wait to read", "read 1700",
                                        "wait to read", "read 64512"));
  EXPECT_THAT(log.Messages(), ElementsAre("Have read 300 bytes.\n", kEof, kEof));
}

TEST(ReadBuffered, ALargeReadThatMeetsTheEndAtOnceReturnsZero) {
  ScriptedSocket socket(true, {Ends(), Ends()});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
  EXPECT_TRUE(socket.IsConnected());
}

TEST(ReadBuffered, ALargeReadThatFailsAfterSomeBytesLooksOnceMoreThroughTheBuffer) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns(Pattern(300)), Fails(EAGAIN), Fails(ECONNRESET)});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{300, Pattern(300)}));
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 2000", "wait to read", "read 1700",
                                        "wait to read", "read 64512"));
  EXPECT_THAT(log.Messages(),
              ElementsAre("Have read 300 bytes.\n", "Read socket [7777] failed with errno [11].\n",
                          "Read socket [7777] failed with errno [104].\n"));
}

TEST(ReadBuffered, ALargeReadGoesOnWhenTheLookThroughTheBufferFindsBytes) {
  ScriptedSocket socket(true, {Returns(Pattern(300)), Fails(EAGAIN), Returns(Pattern(400, 300)),
                               Returns(Pattern(1300, 700))});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{2000, Pattern(2000)}));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "read 2000", "wait to read", "read 1700",
                                        "wait to read", "read 64512", "wait to read", "read 1300"));
}

TEST(ReadBuffered, BufferedBytesCountAsDeliveredWhenALargeReadFails) {
  ScriptedSocket socket(true, {Fails(ECONNRESET), Fails(ECONNRESET)});
  socket.Buffer("ab");
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket.IsConnected());
}

TEST(ReadBuffered, ALargeReadThatFailsBeforeAnyByteLosesTheConnection) {
  LogCapture log;
  ScriptedSocket socket(true, {Fails(ECONNRESET)});
  EXPECT_EQ(ReadSome(socket, 2000), (Delivered{-1, ""}));
  EXPECT_EQ(errno, ECONNRESET);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(
      log.Lines(),
      ElementsAre(SocketLine("info", "ReadData", "Read socket [7777] failed with errno [104].\n")));
}

TEST(ReadBuffered, AFailedWaitEndsASmallReadAndLeavesConnected) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns("ab")});
  socket.AnswerWait(2, -1);
  EXPECT_EQ(ReadSome(socket, 5), (Delivered{-1, ""}));
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("error", "ReadData", kWaitFailed)));
}

TEST(ReadBuffered, AFailedWaitEndsALargeReadAndLeavesConnected) {
  LogCapture log;
  ScriptedSocket socket(true, {Returns(Pattern(10))});
  socket.AnswerWait(2, -1);
  EXPECT_EQ(ReadSome(socket, 5000), (Delivered{-1, ""}));
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("debug3", "ReadData", "Have read 10 bytes.\n"),
                                       SocketLine("error", "ReadData", kWaitFailed)));
}

TEST(ReadBuffered, AConnectionThatStaysSilentEndsAfterSevenWaits) {
  LogCapture log;
  PairedSocket socket(0, true);
  Faults faults;
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{-1, ""}));
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_EQ(faults.Count(Call::kSelect), 7);
  EXPECT_EQ(faults.Count(Call::kRead), 7);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_TRUE(IsOpenFd(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "ReadData",
                                                  "Read socket [" + Fd(socket) +
                                                      "] failed with errno [11], retry [6].\n")));
}

TEST(ReadBuffered, EachOfTheSevenAttemptsWaitsForTheTimeOut) {
  PairedSocket socket(1, true);
  const Stopwatch watch;
  EXPECT_EQ(ReadSome(socket, 10).result, -1);
  EXPECT_GE(watch.Seconds(), 6.8);
  EXPECT_LT(watch.Seconds(), 15.0);
}

TEST(ReadBuffered, AllocatesNothing) {
  PairedSocket socket(5, true);
  socket.PeerSends(Pattern(5000));
  char buf[2000];
  Faults faults;
  EXPECT_EQ(socket.ReadData(buf, 1), 1);
  EXPECT_EQ(socket.ReadData(buf, 2000), 2000);
  EXPECT_EQ(faults.Count(Call::kMalloc) + faults.Count(Call::kCalloc), 0);
}

TEST_P(RandomStream, ReturnsTheBytesOfTheStream) {
  for (unsigned seed = 1; seed <= 5; ++seed) {
    SCOPED_TRACE(seed);
    const std::string stream = Pattern(300000 + seed);
    PairedSocket socket(20, GetParam());
    std::thread peer([&] { SendInRandomPieces(socket.Peer(), stream, seed); });
    std::mt19937 random(seed + 100);
    std::string got;
    for (Delivered read = {1, ""}; read.result > 0; got += read.bytes) {
      const size_t size = RandomSize(random);
      read = ReadSome(socket, size);
      EXPECT_TRUE(!GetParam() || read.result == static_cast<int>(size) || socket.IsEOF());
    }
    peer.join();
    EXPECT_TRUE(socket.IsEOF());
    EXPECT_TRUE(got == stream);
  }
}

TEST(ReadBuffered, RandomPushBackReturnsTheBytesOfTheStream) {
  for (unsigned seed = 1; seed <= 5; ++seed) {
    SCOPED_TRACE(seed);
    const std::string stream = Pattern(200000 + seed);
    PairedSocket socket(20, true);
    std::thread peer([&] { SendInRandomPieces(socket.Peer(), stream, seed); });
    std::mt19937 random(seed + 200);
    std::string got;
    for (Delivered read = {1, ""}; read.result > 0;) {
      read = ReadSome(socket, RandomSize(random));
      got += read.bytes;
      const size_t back = std::min<size_t>(random() % 1025, read.bytes.size());
      if (random() % 2 == 0 || back == read.bytes.size()) continue;
      std::string tail = got.substr(got.size() - back);
      if (socket.RestoreData(tail.data(), static_cast<int>(back)) == 0) {
        got.resize(got.size() - back);
      }
    }
    peer.join();
    EXPECT_TRUE(got == stream);
  }
}

}  // namespace
