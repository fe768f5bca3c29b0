// The wait before each read and write, and the probe for readiness.
#include <arpa/inet.h>
#include <netinet/in.h>

#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"

namespace {

using ::testing::AllOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr auto kRead = TWSocket::SELECT_READ;
constexpr auto kWrite = TWSocket::SELECT_WRITE;

TEST(SelectType, HasFixedValues) {
  EXPECT_EQ(TWSocket::SELECT_READ, 0);
  EXPECT_EQ(TWSocket::SELECT_WRITE, 1);
}

TEST(DoSelect, WithoutASocketReturnsMinusOneSilently) {
  LogCapture log;
  ExposedSocket socket;
  for (const int timeout : {-1, 0, 5}) {
    socket.m_timeout = timeout;
    EXPECT_EQ(socket.DoSelect(kRead), -1);
    EXPECT_EQ(socket.DoSelect(kWrite), -1);
  }
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(DoSelect, IsPositiveWhenBytesHaveCome) {
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  EXPECT_GT(socket.DoSelect(kRead), 0);
}

TEST(DoSelect, IsPositiveWhenThePeerHasClosed) {
  PairedSocket socket(5, true);
  socket.ClosePeer();
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_GT(socket.DoSelect(kWrite), 0);
}

TEST(DoSelect, IsPositiveWhenBytesCanBeWritten) {
  PairedSocket socket(5, true);
  EXPECT_GT(socket.DoSelect(kWrite), 0);
}

TEST(DoSelect, WaitsForTheKindThatIsAskedFor) {
  PairedSocket socket(0, true);
  EXPECT_EQ(socket.DoSelect(kRead), 0);
  socket.PeerSends("x");
  socket.FillUp();
  EXPECT_EQ(socket.DoSelect(kWrite), 0);
  EXPECT_GT(socket.DoSelect(kRead), 0);
}

TEST(DoSelect, ReturnsZeroSilentlyAfterTheTimeOut) {
  LogCapture log;
  PairedSocket socket(1, true);
  const Stopwatch watch;
  EXPECT_EQ(socket.DoSelect(kRead), 0);
  EXPECT_GE(watch.Seconds(), 0.95);
  EXPECT_LT(watch.Seconds(), 3.0);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(DoSelect, EndsAsSoonAsBytesCome) {
  PairedSocket socket(30, true);
  std::thread peer([&] {
    usleep(50000);
    socket.PeerSends("x");
  });
  const Stopwatch watch;
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_LT(watch.Seconds(), 10.0);
  peer.join();
}

TEST(DoSelect, LogsEachInterruptionAndGoesOn) {
  LogCapture log;
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  Faults faults;
  faults.FailRange(Call::kSelect, 1, 2, EINTR);
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 3);
  const auto line =
      SocketLine("info", "DoSelect", "Got EINTR while select socket [" + Fd(socket) + "].\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line));
}

TEST(DoSelect, SignalsDoNotProlongTheWait) {
  if (IsEmulated()) GTEST_SKIP() << kNoCountdown;
  LogCapture log;
  PairedSocket socket(1, true);
  const Stopwatch watch;
  {
    const SignalStorm storm;
    EXPECT_EQ(socket.DoSelect(kRead), 0);
  }
  EXPECT_GE(watch.Seconds(), 0.9);
  EXPECT_LT(watch.Seconds(), 3.0);
  const auto line =
      SocketLine("info", "DoSelect", "Got EINTR while select socket [" + Fd(socket) + "].\n");
  EXPECT_THAT(log.Lines(), AllOf(Not(IsEmpty()), Each(line)));
}

TEST(DoSelect, LogsAnyOtherFailureAndReturnsMinusOne) {
  LogCapture log;
  PairedSocket socket(5, true);
  for (const auto type : {kRead, kWrite}) {
    Faults faults;
    faults.FailNth(Call::kSelect, 1, ENOMEM);
    EXPECT_EQ(socket.DoSelect(type), -1);
    EXPECT_EQ(errno, ENOMEM);
    EXPECT_EQ(faults.Count(Call::kSelect), 1);
  }
  const auto line =
      SocketLine("error", "DoSelect", "Select Fd [" + Fd(socket) + "] failed with errno [12]\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line));
}

TEST(DoSelect, AClosedDescriptorIsAFailure) {
  LogCapture log;
  PairedSocket socket(5, true);
  const std::string fd = Fd(socket);
  close(socket.m_sockFd);
  EXPECT_EQ(socket.DoSelect(kRead), -1);
  EXPECT_EQ(errno, EBADF);
  EXPECT_THAT(log.Messages(), ElementsAre("Select Fd [" + fd + "] failed with errno [9]\n"));
  socket.m_sockFd = -1;
}

TEST(DoSelect, TriesAgainWhenTheDescriptorIsInNoSet) {
  LogCapture log;
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  Faults faults;
  faults.Return(Call::kSelect, 1, 2, 1);
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 3);
  const auto line =
      SocketLine("error", "DoSelect", "Strange thing happens, try to select again!\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line));
}

// A TCP connection with an urgent byte waiting: an exceptional condition, and nothing to read.
class UrgentSocket : public ExposedSocket {
 public:
  UrgentSocket() : ExposedSocket("127.0.0.1", 0, 5, true) {
    listener_ = BindLoopback(&m_port);
    EXPECT_EQ(listen(listener_, 1), 0);
    EXPECT_EQ(Connect(), 0);
    peer_ = accept(listener_, nullptr, nullptr);
    EXPECT_EQ(send(peer_, "!", 1, MSG_OOB), 1);
  }
  ~UrgentSocket() override {
    close(peer_);
    close(listener_);
  }

 private:
  int listener_;
  int peer_;
};

TEST(DoSelect, AnExceptionalConditionIsReady) {
  LogCapture log;
  UrgentSocket socket;
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(DoSelect, AnExceptionalConditionIsReadyInARepeatedWaitToo) {
  UrgentSocket socket;
  Faults faults;
  faults.Return(Call::kSelect, 1, 1, 1);
  const Stopwatch watch;
  EXPECT_GT(socket.DoSelect(kRead), 0);
  EXPECT_LT(watch.Seconds(), 4.0);
}

TEST(DoSelect, AllocatesNothing) {
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  Faults faults;
  for (int i = 0; i < 100; ++i) {
    EXPECT_GT(socket.DoSelect(kRead), 0);
    EXPECT_GT(socket.DoSelect(kWrite), 0);
  }
  EXPECT_EQ(faults.Count(Call::kSelect), 200);
  EXPECT_EQ(faults.Count(Call::kMalloc), 0);
  EXPECT_EQ(faults.Count(Call::kCalloc), 0);
  EXPECT_EQ(faults.Count(Call::kRealloc), 0);
}

TEST(HasDataToRead, IsTrueWhenBytesHaveCome) {
  PairedSocket socket(5, true);
  EXPECT_FALSE(socket.HasDataToRead(0));
  socket.PeerSends("x");
  EXPECT_TRUE(socket.HasDataToRead(0));
  EXPECT_TRUE(socket.HasDataToRead(5));
}

TEST(HasDataToRead, IsTrueWhenThePeerHasClosed) {
  PairedSocket socket(5, true);
  socket.ClosePeer();
  EXPECT_TRUE(socket.HasDataToRead(0));
}

TEST(HasDataToRead, WaitsForItsOwnTimeOutAndPutsTheSocketsBack) {
  PairedSocket socket(30, true);
  const Stopwatch watch;
  EXPECT_FALSE(socket.HasDataToRead(1));
  EXPECT_GE(watch.Seconds(), 0.95);
  EXPECT_LT(watch.Seconds(), 10.0);
  EXPECT_EQ(socket.m_timeout, 30);
}

TEST(HasDataToRead, WaitsOnABlockingConnectionToo) {
  PairedSocket socket(-1, true);
  socket.PeerSends("x");
  EXPECT_TRUE(socket.HasDataToRead(5));
  EXPECT_EQ(socket.m_timeout, -1);
}

TEST(HasDataToRead, IgnoresTheReadAheadBuffer) {
  PairedSocket socket(5, true);
  socket.PeerSends("abc");
  ASSERT_EQ(ReadSome(socket, 1), (Delivered{1, "a"}));
  EXPECT_EQ(socket.Unread(), "bc");
  EXPECT_FALSE(socket.HasDataToRead(0));
}

TEST(HasDataToRead, IsFalseAtOnceForANegativeTimeOut) {
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  Faults faults;
  EXPECT_FALSE(socket.HasDataToRead(-1));
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_EQ(socket.m_timeout, 5);
}

TEST(HasDataToRead, IsFalseForAFailedWaitOrNoSocket) {
  PairedSocket socket(5, true);
  Faults faults;
  faults.FailNth(Call::kSelect, 1, ENOMEM);
  EXPECT_FALSE(socket.HasDataToRead(1));
  EXPECT_EQ(socket.m_timeout, 5);
  EXPECT_FALSE(ExposedSocket().HasDataToRead(1));
}

TEST(HasDataToRead, AsksTheDerivedWait) {
  ScriptedSocket socket(true, {});
  EXPECT_TRUE(socket.HasDataToRead(1));
  socket.AnswerWait(2, 0);
  EXPECT_FALSE(socket.HasDataToRead(1));
  EXPECT_THAT(socket.calls, ElementsAre("wait to read", "wait to read"));
}

}  // namespace
