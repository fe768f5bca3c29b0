// Reading over TLS.
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <memory>
#include <random>
#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/net/tls_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/flag.h"
#include "tests/support/process.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

class TlsBothModes : public ::testing::TestWithParam<bool> {};

// A read of the library that OpenSSL answers with `code`, `times` times.
void AnswerReads(Faults& faults, int times, int code) {
  faults.FailRange(Call::kSslRead, 1, times, EAGAIN);
  faults.Return(Call::kSslGetError, 1, times, code);
}

INSTANTIATE_TEST_SUITE_P(Tls, TlsBothModes, ::testing::Bool());

TEST_P(TlsBothModes, ReadsLines) {
  TlsPair tls({Send("first\r\nsecond\n"), ExpectEof()}, 5, GetParam());
  EXPECT_EQ(ReadLine(tls.socket), (Delivered{5, "first"}));
  EXPECT_EQ(ReadLine(tls.socket), (Delivered{6, "second"}));
}

TEST_P(TlsBothModes, ReadsTheWholeStreamToTheCloseNotice) {
  const std::string stream = Pattern(150000);
  TlsPair tls({Send(stream), Close()}, 5, GetParam());
  std::mt19937 random(1);
  std::string got;
  for (Delivered read = {1, ""}; read.result > 0; got += read.bytes) {
    read = ReadSome(tls.socket, 1 + random() % 5000);
  }
  EXPECT_TRUE(tls.socket.IsEOF());
  EXPECT_TRUE(got == stream);
}

TEST_P(TlsBothModes, ReadsPiecesOfAnySize) {
  std::vector<std::string> pieces;
  std::string stream;
  std::mt19937 random(2);
  for (int i = 0; i < 100; ++i) {
    pieces.push_back(Pattern(1 + random() % 3000, stream.size()));
    stream += pieces.back();
  }
  TlsPair tls({SendPieces(pieces), CloseWithoutNotice()}, 5, GetParam());
  std::string got;
  for (Delivered read = {1, ""}; read.result > 0; got += read.bytes) {
    read = ReadSome(tls.socket, 1 + random() % 4000);
  }
  EXPECT_TRUE(got == stream);
}

TEST_P(TlsBothModes, ACloseWithANoticeIsTheEndOfTheStreamAgainAndAgain) {
  LogCapture log;
  TlsPair tls({Send("bye"), Close()}, 5, GetParam());
  EXPECT_EQ(ReadSome(tls.socket, 3), (Delivered{3, "bye"}));
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{0, ""}));
    EXPECT_TRUE(tls.socket.IsEOF());
    EXPECT_TRUE(tls.socket.IsConnected());
  }
  const auto line = SocketLine("info", "ReadData", "Reach end of file!\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line, line));
}

TEST_P(TlsBothModes, AfterACloseNoticeNoReadWaitsForThePeerToClose) {
  // A wait would outlast the test's own time.
  TlsPair tls({Send("bye"), SendCloseNotice(), StallUntilFinish()}, 3600, GetParam());
  EXPECT_EQ(ReadSome(tls.socket, 3), (Delivered{3, "bye"}));
  EXPECT_EQ(ReadSome(tls.socket, 2000), (Delivered{0, ""}));
  EXPECT_EQ(ReadSome(tls.socket, 2000), (Delivered{0, ""}));
}

TEST(TlsRead, AfterACloseNoticeAProbeWaitsAsOnTcp) {
  TlsPair tls({Send("bye"), SendCloseNotice(), StallUntilFinish()}, 1, true);
  EXPECT_EQ(ReadSome(tls.socket, 2000), (Delivered{3, "bye"}));
  EXPECT_TRUE(tls.socket.IsEOF());
  const auto start = std::chrono::steady_clock::now();
  EXPECT_FALSE(tls.socket.HasDataToRead(1));
  EXPECT_EQ(tls.socket.DoSelect(TWSocket::SELECT_READ), 0);
  EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(1900));
}

TEST(TlsRead, AConnectionAfterOneWithACloseNoticeIsWaitedForAgain) {
  TlsPair tls({Send("bye"), SendCloseNotice(), StallUntilFinish()}, 5, true);
  EXPECT_EQ(ReadSome(tls.socket, 2000), (Delivered{3, "bye"}));
  const Flag asked;
  TlsScriptedPeer other({{Handshake(), WaitFor(asked), Send("late"), Close()}});
  tls.socket.SetSocketInfo("127.0.0.1", other.Port(), 5, true);
  ASSERT_EQ(tls.socket.Connect(), 0);
  std::thread sender([&] {
    usleep(50000);
    asked.Set();
  });
  EXPECT_EQ(ReadSome(tls.socket, 4), (Delivered{4, "late"}));
  sender.join();
}

TEST_P(TlsBothModes, ACloseWithoutANoticeIsTheEndOfTheStreamAgainAndAgain) {
  LogCapture log;
  TlsPair tls({Send("bye"), CloseWithoutNotice()}, 5, GetParam());
  EXPECT_EQ(ReadSome(tls.socket, 3), (Delivered{3, "bye"}));
  for (int i = 0; i < 3; ++i) {
    errno = EAGAIN;  // of another call; must not be taken for the read's
    EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{0, ""}));
    EXPECT_TRUE(tls.socket.IsEOF());
  }
  const auto line = SocketLine("info", "ReadData", "Reach end of file!\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line, line));
}

TEST_P(TlsBothModes, ACloseInTheMiddleOfARecordIsTheEndOfTheStream) {
  // The head of a record of 256 bytes, and 3 of these.
  TlsPair tls({SendRaw(std::string("\x17\x03\x03\x01\x00", 5) + "abc"), CloseWithoutNotice()}, 5,
              GetParam());
  EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{0, ""}));
  EXPECT_TRUE(tls.socket.IsEOF());
}

TEST(TlsRead, TheNextCallReturnsTheRestOfARecord) {
  TlsPair tls({Send(Pattern(1000)), ExpectEof()}, 5, false);
  std::string got;
  while (got.size() < 1000) {
    const Delivered read = ReadSome(tls.socket, 64);
    ASSERT_GT(read.result, 0);
    got += read.bytes;
  }
  EXPECT_TRUE(got == Pattern(1000));
}

TEST(TlsRead, WaitingBytesNeedNoWaitInTheBufferedModeEither) {
  TlsPair tls({Send(Pattern(5000)), ExpectEof()}, 5, true);
  ASSERT_EQ(ReadSome(tls.socket, 1100).result, 1100);
  Faults faults;
  EXPECT_EQ(tls.socket.DoSelect(TWSocket::SELECT_READ), 0);
  EXPECT_EQ(ReadSome(tls.socket, 3900), (Delivered{3900, Pattern(3900, 1100)}));
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
}

TEST(TlsRead, WaitingBytesAreNoReasonToBeWritable) {
  TlsPair tls({Send(Pattern(100)), ExpectEof()}, 5, false);
  ASSERT_EQ(ReadSome(tls.socket, 1).result, 1);
  Faults faults;
  EXPECT_GT(tls.socket.DoSelect(TWSocket::SELECT_WRITE), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 1);
}

TEST(TlsRead, WithoutASocketTheWaitReturnsMinusOneSilently) {
  LogCapture log;
  ExposedTlsSocket socket;
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_READ), -1);
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_WRITE), -1);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(TlsRead, BeforeAConnectionFails) {
  ExposedTlsSocket socket(kLoopback, 1, 5, true);
  EXPECT_EQ(ReadSome(socket, 10).result, -1);
  EXPECT_EQ(socket.WriteData("hello", 5), -1);
  EXPECT_EQ(ReadLine(socket).result, -1);
  char byte = 0;
  EXPECT_EQ(socket._Read(&byte, 1), -1);
  EXPECT_EQ(socket._Write(&byte, 1), -1);
}

TEST(TlsRead, ALargeRecordThatComesByteByByteFitsASmallStack) {
  const std::string record = Pattern(16384);
  TlsPair tls({SendRecordByteByByte(record), ExpectEof()}, 10, true);
  RunOnSmallStack(64 << 10, [&] {
    auto buf = std::make_unique<char[]>(record.size());
    EXPECT_EQ(tls.socket.ReadData(buf.get(), 16384), 16384);
    EXPECT_TRUE(std::equal(record.begin(), record.end(), buf.get()));
  });
}

TEST(TlsRead, ATimeOutReturnsMinusOneWithEagainAndIsLogged) {
  LogCapture log;
  TlsPair tls({ExpectEof()}, 0, false);
  EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{-1, ""}));
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_TRUE(tls.socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(TlsLine("error", "_Read", kReadWaitFailed)));
}

TEST(TlsRead, WaitsForTheTimeOutWhenARecordIsMissing) {
  TlsPair tls({ExpectEof()}, 1, false);
  char byte;
  const Stopwatch watch;
  EXPECT_EQ(tls.socket._Read(&byte, 1), -1);
  EXPECT_EQ(errno, EAGAIN);
  EXPECT_GE(watch.Seconds(), 0.95);
  EXPECT_LT(watch.Seconds(), 3.0);
}

TEST(TlsRead, SevenEmptyAttemptsEndASmallBufferedRead) {
  LogCapture log;
  TlsPair tls({ExpectEof()}, 0, true);
  EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{-1, ""}));
  EXPECT_FALSE(tls.socket.IsConnected());
  auto lines = log.Lines();
  ASSERT_THAT(lines, SizeIs(8));
  EXPECT_THAT(lines.back(), SocketLine("info", "ReadData",
                                       "Read socket [" + Fd(tls.socket) +
                                           "] failed with errno [11], retry [6].\n"));
  lines.pop_back();
  EXPECT_THAT(lines, Each(TlsLine("error", "_Read", kReadWaitFailed)));
}

TEST(TlsRead, AnOldErrorInTheQueueDoesNotTurnATimeOutIntoAnError) {
  LogCapture log;
  TlsPair tls({ExpectEof()}, 0, false);
  ERR_raise(ERR_LIB_USER, 7);
  EXPECT_EQ(ReadSome(tls.socket, 10).result, -1);
  ERR_clear_error();
  EXPECT_EQ(log.Messages(), std::vector<std::string>{kReadWaitFailed});
}

TEST(TlsRead, GarbageIsAnErrorWithItsReason) {
  LogCapture log;
  TlsPair tls({SendRaw("this is no TLS record"), StallUntilFinish()}, 5, true);
  errno = EAGAIN;  // of another call; must not make the read try again
  EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{-1, ""}));
  EXPECT_FALSE(tls.socket.IsConnected());
  EXPECT_THAT(
      log.Lines(),
      ElementsAre(
          TlsLine("error", "_Read",
                  "Read error [1] [error:0A00010B:SSL routines::wrong version number].\n"),
          SocketLine("info", "ReadData",
                     "Read socket [" + Fd(tls.socket) + "] failed with errno [0], retry [0].\n")));
}

TEST(TlsRead, AResetIsAnErrorWithItsErrno) {
  LogCapture log;
  TlsPair tls({ExpectExactly("x"), Reset()}, 5, true);
  ASSERT_EQ(tls.socket.WriteData("x", 1), 1);
  EXPECT_EQ(ReadSome(tls.socket, 10), (Delivered{-1, ""}));
  EXPECT_EQ(errno, ECONNRESET);
  EXPECT_FALSE(tls.socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(TlsLine("error", "_Read", "Read error [5] [" + EmptyQueueText() + "].\n"),
                          SocketLine("info", "ReadData",
                                     "Read socket [" + Fd(tls.socket) +
                                         "] failed with errno [104], retry [0].\n")));
}

TEST(TlsRead, WaitsForTheDescriptorAndReadsAgain) {
  for (const int code : {SSL_ERROR_WANT_READ, SSL_ERROR_WANT_WRITE}) {
    LogCapture log;
    TlsPair tls({Send("data"), ExpectEof()}, 5, false);
    Faults faults;
    AnswerReads(faults, 3, code);
    char buf[8] = {};
    EXPECT_EQ(tls.socket._Read(buf, sizeof(buf)), 4);
    EXPECT_STREQ(buf, "data");
    EXPECT_THAT(log.Lines(), IsEmpty());
  }
}

TEST(TlsRead, ABlockingConnectionEndsAfterOneAttempt) {
  LogCapture log;
  TlsPair tls({ExpectEof()}, -1, false);
  Faults faults;
  AnswerReads(faults, 1, SSL_ERROR_WANT_READ);
  char buf[8];
  EXPECT_EQ(tls.socket._Read(buf, sizeof(buf)), -1);
  EXPECT_EQ(faults.Count(Call::kSslRead), 1);
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_THAT(log.Lines(), ElementsAre(TlsLine("error", "_Read", kReadWaitFailed)));
}

TEST(TlsRead, AFailedWaitEndsTheRead) {
  LogCapture log;
  TlsPair tls({ExpectEof()}, 5, false);
  Faults faults;
  AnswerReads(faults, 1, SSL_ERROR_WANT_READ);
  faults.FailNth(Call::kSelect, 1, ENOMEM);
  char buf[8];
  EXPECT_EQ(tls.socket._Read(buf, sizeof(buf)), -1);
  EXPECT_THAT(
      log.Messages(),
      ElementsAre("Select Fd [" + Fd(tls.socket) + "] failed with errno [12]\n", kReadWaitFailed));
}

TEST(TlsRead, AfterADisconnectItFailsAndReadsFromNoOtherFile) {
  TlsPair tls({Send("bye"), StallUntilFinish()}, 5, false);
  tls.socket.Disconnect();
  LogCapture log;
  char byte = 0;
  EXPECT_EQ(tls.socket._Read(&byte, 1), -1);
  EXPECT_THAT(log.Lines(), SizeIs(1));
}

}  // namespace
