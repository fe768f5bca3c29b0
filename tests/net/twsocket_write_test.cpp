// Writing, and what happens when the peer has gone.
#include <csignal>
#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/process.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST(WriteData, WaitsAndThenWrites) {
  LogCapture log;
  ScriptedSocket socket(true, {});
  socket.AnswerWrite({5, 0, ""});
  EXPECT_EQ(socket.WriteData("hello", 5), 5);
  EXPECT_THAT(socket.calls, ElementsAre("wait to write", "write hello"));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(WriteData, WritesAllBytes) {
  PairedSocket socket(5, true);
  EXPECT_EQ(socket.WriteData("hello", 5), 5);
  EXPECT_EQ(socket.PeerReceives(), "hello");
}

TEST(WriteData, NothingToWriteIsRefused) {
  LogCapture log;
  ScriptedSocket socket(true, {});
  EXPECT_EQ(socket.WriteData(nullptr, 5), -1);
  EXPECT_EQ(socket.WriteData("hello", 0), -1);
  EXPECT_EQ(socket.WriteData("hello", -1), -1);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(socket.calls, IsEmpty());
  const auto line = SocketLine("info", "WriteData", "Invalid parameter!\n");
  EXPECT_THAT(log.Lines(), ElementsAre(line, line, line));
}

TEST(WriteData, WithoutASocketIsRefused) {
  LogCapture log;
  ExposedSocket socket("host", 1, 5, true);
  EXPECT_EQ(socket.WriteData("hello", 5), -1);
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("info", "WriteData", "Invalid socket fd!\n")));
}

TEST(WriteData, AFailedWaitIsLoggedAndTheWriteIsMadeAllTheSame) {
  LogCapture log;
  ScriptedSocket socket(true, {});
  socket.AnswerWait(1, -1);
  socket.AnswerWrite({5, 0, ""});
  EXPECT_EQ(socket.WriteData("hello", 5), 5);
  EXPECT_THAT(socket.calls, ElementsAre("wait to write", "write hello"));
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("error", "WriteData", "Failed to select socket [7777]\n")));
}

TEST(WriteData, ANegativeResultClearsConnected) {
  ScriptedSocket socket(true, {});
  socket.AnswerWrite(Fails(EPIPE));
  EXPECT_EQ(socket.WriteData("hello", 5), -1);
  EXPECT_EQ(errno, EPIPE);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_EQ(socket.m_sockFd, ScriptedSocket::kFd);
}

TEST(WriteData, AShortCountIsReturnedAsItIs) {
  ScriptedSocket socket(true, {});
  socket.AnswerWrite({3, 0, ""});
  EXPECT_EQ(socket.WriteData("hello", 5), 3);
  EXPECT_TRUE(socket.IsConnected());
}

TEST(WriteData, GoesOnWhileThePeerTakesTheBytesSlowly) {
  for (const int timeout : {5, -1}) {
    PairedSocket socket(timeout, true);
    const std::string bytes = Pattern(1000000);
    std::string got;
    std::thread peer([&] {
      char buf[30000];
      for (ssize_t n;
           got.size() < bytes.size() && (n = recv(socket.Peer(), buf, sizeof(buf), 0)) > 0;) {
        got.append(buf, static_cast<size_t>(n));
      }
    });
    EXPECT_EQ(socket.WriteData(bytes.data(), 1000000), 1000000);
    socket.Disconnect();
    peer.join();
    EXPECT_TRUE(got == bytes);
  }
}

TEST(WriteData, AFailedWriteReturnsTheBytesWrittenSoFarAndIsLogged) {
  LogCapture log;
  PairedSocket socket(5, true);
  Faults faults;
  faults.Limit(Call::kWrite, 4);
  faults.FailNth(Call::kWrite, 3, ECONNRESET);
  EXPECT_EQ(socket.WriteData("0123456789", 10), 8);
  EXPECT_THAT(log.Lines(), ElementsAre(IsLog("utils", "notice", "utils", "WriteFd",
                                             "Write fd[" + Fd(socket) + "] error[104]\n")));
}

TEST(RawWrite, IsTheWholeBufferWrite) {
  PairedSocket socket(5, true);
  Faults faults;
  faults.Limit(Call::kWrite, 3);
  EXPECT_EQ(socket._Write("0123456789", 10), 10);
  EXPECT_EQ(faults.Count(Call::kWrite), 4);
  EXPECT_EQ(socket.PeerReceives(), "0123456789");
  EXPECT_EQ(socket._Write("x", 0), 0);
}

TEST(RawWrite, TriesAgainAfterEagainAndEintr) {
  LogCapture log;
  PairedSocket socket(5, true);
  Faults faults;
  faults.FailNth(Call::kWrite, 1, EAGAIN);
  faults.FailNth(Call::kWrite, 2, EINTR);
  EXPECT_EQ(socket._Write("hello", 5), 5);
  EXPECT_EQ(socket.PeerReceives(), "hello");
  EXPECT_THAT(log.Lines(), IsEmpty());
}

// A peer that has gone does not end the process. Each of these runs in a child, which sets SIGPIPE
// up for itself.

bool Blocked(int signal) {
  sigset_t mask;
  pthread_sigmask(SIG_SETMASK, nullptr, &mask);
  return sigismember(&mask, signal) == 1;
}

bool Pending(int signal) {
  sigset_t pending;
  sigpending(&pending);
  return sigismember(&pending, signal) == 1;
}

void SetBlocked(int signal, bool blocked) {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, signal);
  pthread_sigmask(blocked ? SIG_BLOCK : SIG_UNBLOCK, &set, nullptr);
}

void WriteToAGonePeer() {
  PairedSocket socket(5, true);
  socket.ClosePeer();
  EXPECT_EQ(socket.WriteData("hello", 5), 0);
  EXPECT_EQ(errno, EPIPE);
}

TEST(GonePeer, AWriteReturnsWithSigpipeAtItsDefault) {
  LogCapture log;
  const ChildResult child = RunInChild([] {
    signal(SIGPIPE, SIG_DFL);
    SetBlocked(SIGPIPE, false);
    for (int i = 0; i < 3; ++i) WriteToAGonePeer();
    return 7;
  });
  EXPECT_TRUE(child.exited) << "signal " << child.signal;
  EXPECT_EQ(child.code, 7);
  const auto lines = log.Lines();
  ASSERT_EQ(lines.size(), 3u);
  EXPECT_THAT(lines[0].message, ::testing::MatchesRegex("Write fd.[0-9]+. error.32.\n"));
  EXPECT_EQ(lines[0].function, "WriteFd");
}

TEST(GonePeer, LeavesMaskAndDispositionAsTheyWere) {
  const ChildResult child = RunInChild([] {
    signal(SIGPIPE, SIG_DFL);
    SetBlocked(SIGPIPE, false);
    WriteToAGonePeer();
    EXPECT_FALSE(Blocked(SIGPIPE));
    EXPECT_FALSE(Pending(SIGPIPE));
    struct sigaction now = {};
    sigaction(SIGPIPE, nullptr, &now);
    EXPECT_EQ(now.sa_handler, SIG_DFL);
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

volatile sig_atomic_t handled = 0;

TEST(GonePeer, LeavesTheCallersHandlerAloneAndDoesNotCallIt) {
  const ChildResult child = RunInChild([] {
    struct sigaction action = {};
    action.sa_handler = [](int) { handled = 1; };
    sigaction(SIGPIPE, &action, nullptr);
    SetBlocked(SIGPIPE, false);
    WriteToAGonePeer();
    EXPECT_EQ(handled, 0);
    struct sigaction now = {};
    sigaction(SIGPIPE, nullptr, &now);
    EXPECT_EQ(now.sa_handler, action.sa_handler);
    raise(SIGPIPE);
    EXPECT_EQ(handled, 1);
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

TEST(GonePeer, ABlockedSigpipeStaysBlockedAndDoesNotBecomePending) {
  const ChildResult child = RunInChild([] {
    signal(SIGPIPE, SIG_DFL);
    SetBlocked(SIGPIPE, true);
    WriteToAGonePeer();
    EXPECT_TRUE(Blocked(SIGPIPE));
    EXPECT_FALSE(Pending(SIGPIPE));
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

TEST(GonePeer, APendingSigpipeStaysPending) {
  const ChildResult child = RunInChild([] {
    signal(SIGPIPE, SIG_DFL);
    SetBlocked(SIGPIPE, true);
    raise(SIGPIPE);
    WriteToAGonePeer();
    EXPECT_TRUE(Blocked(SIGPIPE));
    EXPECT_TRUE(Pending(SIGPIPE));
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

TEST(GonePeer, OtherSignalsKeepTheirPlaceInTheMask) {
  const ChildResult child = RunInChild([] {
    signal(SIGPIPE, SIG_DFL);
    SetBlocked(SIGPIPE, false);
    SetBlocked(SIGUSR1, true);
    WriteToAGonePeer();
    EXPECT_TRUE(Blocked(SIGUSR1));
    EXPECT_FALSE(Blocked(SIGUSR2));
    return 0;
  });
  EXPECT_EQ(child.code, 0);
}

TEST(GonePeer, AReadIsTheEndOfTheStreamOrAReset) {
  PairedSocket socket(5, true);
  socket.ClosePeer();
  EXPECT_EQ(ReadSome(socket, 10), (Delivered{0, ""}));
  EXPECT_TRUE(socket.IsEOF());
}

}  // namespace
