// What a caller of Connect meets at the edges.
#include <arpa/inet.h>
#include <netinet/in.h>
#include <netinet/tcp.h>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST(ConnectEdges, ATimeOutOfZeroFailsUnlessTheConnectionCompletesAtOnce) {
  LogCapture log;
  const BlackHolePort hole;
  ExposedSocket socket("127.0.0.1", hole.Port(), 0, true);
  Faults faults;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ETIMEDOUT);
  EXPECT_EQ(faults.Count(Call::kSelect), 1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectWithTimeout", "Socket connect timeout.\n"),
                          SocketLine("info", "ConnectSocket", "Socket connect timeout (0)\n")));
}

TEST(ConnectEdges, ATimeOutOfZeroSetsNonBlockingModeAfterAConnectionThatCompletedAtOnce) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket("127.0.0.1", peer.Port(), 0, true);
  ASSERT_EQ(socket.Connect(), 0);  // on the loopback interface it does
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_TRUE(IsNonBlocking(socket.m_sockFd));
  EXPECT_THAT(log.Lines(), IsEmpty());
  socket.Disconnect();
}

TEST(ConnectEdges, ASourceAddressThatCannotBeBoundIsLoggedAndTheConnectionProceeds) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket("127.0.0.1", peer.Port(), 5, true);
  const in_addr_t foreign = inet_addr("192.0.2.1");
  socket.SetRemoteAddr(foreign);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_THAT(
      log.Lines(),
      ElementsAre(SocketLine("info", "BindRemoteAddr",
                             "bind(SockFd=" + Fd(socket) +
                                 ", SrcSock.sin_addr.s_addr = " + std::to_string(foreign) +
                                 ") error!! errno=99, err_str=[Cannot assign requested address]\n"),
                  SocketLine("info", "ConnectSocket", "Failed to bind src ip, ignore it.\n")));
  socket.Disconnect();
}

TEST(ConnectEdges, AnUnresolvableHostReturnsMinusOneAndIsNotConnected) {
  LogCapture log;
  ExposedSocket socket("no-such-host.invalid", 80, 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectSocket", "Scoket getaddrinfo incomplete.\n")));
}

TEST(ConnectEdges, ARefusedConnectionWithATimeOutLogsTheErrorAndThenTheTimeOut) {
  LogCapture log;
  const ClosedPort port;
  ExposedSocket socket("127.0.0.1", port.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectWithTimeout",
                                     "Socket connection failed with error [111].\n"),
                          SocketLine("info", "ConnectSocket", "Socket connect timeout (5)\n")));
}

TEST(ConnectEdges, AConnectionThatIsRefusedAtOnceIsLoggedAsConnected) {
  LogCapture log;
  const ClosedPort port;
  ExposedSocket socket("127.0.0.1", port.Port(), 5, true);
  Faults faults;
  faults.FailNth(Call::kConnect, 1, ECONNREFUSED);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kSelect), 0);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectWithTimeout", "Socket connected.\n"),
                          SocketLine("info", "ConnectSocket", "Socket connect timeout (5)\n")));
}

TEST(ConnectEdges, KeepAliveWithEnableZeroIsSwitchedOffWithoutTouchingTheThreeOptions) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket("127.0.0.1", peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  ASSERT_EQ(socket.SetKeepAliveOpt(1, 11, 12, 13), 0);
  {
    Faults faults;
    EXPECT_EQ(socket.SetKeepAliveOpt(0, 21, 22, 23), 0);
    EXPECT_EQ(faults.Count(Call::kSetsockopt), 1);
  }
  EXPECT_EQ(SocketOption(socket.m_sockFd, SOL_SOCKET, SO_KEEPALIVE), 0);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPIDLE), 11);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPINTVL), 12);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPCNT), 13);
  socket.Disconnect();
}

TEST(ConnectEdges, ConnectingTwiceClosesTheFirstSocketBeforeOpeningTheSecond) {
  ScriptedPeer peer({{ExpectEof()}, {ExpectEof()}});
  ExposedSocket socket("127.0.0.1", peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  std::vector<std::string> order;
  Faults faults;
  faults.Before(Call::kClose, [&](int) { order.emplace_back("close"); });
  faults.Before(Call::kSocket, [&](int) { order.emplace_back("socket"); });
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(peer.Received(0), "");  // its script ends when the first connection is closed
  ASSERT_GE(order.size(), 2u);
  EXPECT_EQ(order[0], "close");
  EXPECT_EQ(order[1], "socket");
  socket.Disconnect();
}

}  // namespace
