// Connecting with a time-out and without one: the wait, and what each failure logs.
#include <netdb.h>

#include "tarnwick/log/twdebuglog.h"
#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kLoopback[] = "127.0.0.1";

// The failures of the way with a time-out: the step's own line, and the summary after it.
auto StepAndSummary(const char* level, const std::string& message, int timeout) {
  return ElementsAre(SocketLine(level, "ConnectWithTimeout", message),
                     SocketLine("info", "ConnectSocket",
                                "Socket connect timeout (" + std::to_string(timeout) + ")\n"));
}

TEST(ConnectBlocking, WaitsInConnectAndNotInSelect) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), -1, true);
  Faults faults;
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_EQ(faults.Count(Call::kFcntl), 0);
  socket.Disconnect();
}

TEST(ConnectBlocking, LogsOneLineForARefusal) {
  LogCapture log;
  const ClosedPort port;
  ExposedSocket socket(kLoopback, port.Port(), -1, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ECONNREFUSED);
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectSocket", "Socket connect failed.\n")));
}

TEST(ConnectWithTimeout, GivesUpAfterTheTimeOut) {
  LogCapture log;
  const BlackHolePort hole;
  ExposedSocket socket(kLoopback, hole.Port(), 1, true);
  const Stopwatch watch;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ETIMEDOUT);
  EXPECT_GE(watch.Seconds(), 0.95);
  EXPECT_LT(watch.Seconds(), 3.0);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_TRUE(IsOpenFd(socket.m_sockFd));
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "Socket connect timeout.\n", 1));
}

TEST(ConnectWithTimeout, SignalsNeitherEndNorProlongTheWait) {
  if (IsEmulated()) GTEST_SKIP() << kNoCountdown;
  LogCapture log;
  const BlackHolePort hole;
  ExposedSocket socket(kLoopback, hole.Port(), 1, true);
  Faults faults;
  const SignalStorm storm;
  const Stopwatch watch;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ETIMEDOUT);
  EXPECT_GE(watch.Seconds(), 0.9);
  EXPECT_LT(watch.Seconds(), 3.0);
  EXPECT_GT(faults.Count(Call::kSelect), 3);
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "Socket connect timeout.\n", 1));
}

TEST(ConnectWithTimeout, AnInterruptedWaitIsRepeatedSilently) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  Faults faults;
  faults.FailRange(Call::kSelect, 1, 3, EINTR);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(faults.Count(Call::kSelect), 4);
  EXPECT_THAT(log.Lines(), IsEmpty());
  socket.Disconnect();
}

TEST(ConnectWithTimeout, AConnectionThatSucceedsAtOnceNeedsNoWait) {
  LogCapture log;
  ExposedSocket socket(kLoopback, 80, 5, true);
  Faults faults;
  faults.Return(Call::kConnect, 1, 1, 0);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_EQ(faults.Count(Call::kGetsockopt), 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(ConnectWithTimeout, AnUnreachableNetworkIsLoggedAsConnected) {
  LogCapture log;
  ExposedSocket socket("192.0.2.1", 80, 3, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "Socket connected.\n", 3));
}

TEST(ConnectWithTimeout, AFailedSelectIsAFailure) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  {
    Faults faults;
    faults.FailNth(Call::kSelect, 1, ENOMEM);
    EXPECT_EQ(socket.Connect(), -1);
  }
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "Select failed with errno [12].\n", 5));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, ASelectWithoutAReadyDescriptorIsAFailure) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  {
    Faults faults;
    faults.Return(Call::kSelect, 1, 1, 1);
    EXPECT_EQ(socket.Connect(), -1);
  }
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "Socket strange bug.\n", 5));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, AnErrorThatCannotBeAskedForIsAFailure) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  {
    Faults faults;
    faults.FailNth(Call::kGetsockopt, 1);
    EXPECT_EQ(socket.Connect(), -1);
  }
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), StepAndSummary("info", "getsockopt error!\n", 5));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, APendingErrorIsAFailure) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  {
    Faults faults;
    faults.SocketError(EHOSTUNREACH);
    EXPECT_EQ(socket.Connect(), -1);
  }
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(),
              StepAndSummary("info", "Socket connection failed with error [113].\n", 5));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, AnEmptyAddressListIsAnInvalidParameter) {
  LogCapture log;
  ExposedSocket socket(kLoopback, 80, 5, true);
  Faults faults;
  faults.Return(Call::kGetaddrinfo, 1, 1, 0);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kFcntl), 0);
  EXPECT_THAT(log.Lines(), StepAndSummary("error", "Invalid parameters!\n", 5));
}

TEST(ConnectWithTimeout, CarriesOnWhenNonBlockingModeCannotBeSet) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  Faults faults;
  faults.FailNth(Call::kFcntl, 2);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("error", "ConnectWithTimeout",
                                                  "Set nonblock flag failed.\n")));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, CarriesOnWhenBlockingModeCannotBeSetBack) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), 5, true);
  Faults faults;
  faults.FailNth(Call::kFcntl, 3);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(log.Lines(), ElementsAre(SocketLine("error", "ConnectWithTimeout",
                                                  "Set back blocking flag failed.\n")));
  socket.Disconnect();
}

TEST(ConnectWithTimeout, TimesOutWithTheErrnoOfATimeOutWhenBlockingModeCannotBeSetBack) {
  LogCapture log;
  const BlackHolePort hole;
  ExposedSocket socket(kLoopback, hole.Port(), 0, true);
  Faults faults;
  faults.FailNth(Call::kFcntl, 3);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ETIMEDOUT);
  EXPECT_THAT(log.Messages(),
              ElementsAre("Socket connect timeout.\n", "Set back blocking flag failed.\n",
                          "Socket connect timeout (0)\n"));
}

TEST(ConnectWithTimeout, LogsErrorsButNoInformationAtTheDefaultLevel) {
  LogCapture log(LOG_LEVEL_NOTICE);
  ExposedSocket socket(kLoopback, 80, 5, true);
  Faults faults;
  faults.Return(Call::kGetaddrinfo, 1, 1, 0);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(log.Messages(), ElementsAre("Invalid parameters!\n"));
}

}  // namespace
