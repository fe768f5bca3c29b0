// The keep-alive options.
#include <netinet/in.h>
#include <netinet/tcp.h>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// A TCP socket that is not connected: options can be set on it as well.
class TcpSocket : public ExposedSocket {
 public:
  TcpSocket() { m_sockFd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0); }
};

TEST(SetKeepAliveOpt, SetsAllFourOptions) {
  LogCapture log;
  TcpSocket socket;
  EXPECT_EQ(socket.SetKeepAliveOpt(1, 31, 32, 33), 0);
  EXPECT_EQ(SocketOption(socket.m_sockFd, SOL_SOCKET, SO_KEEPALIVE), 1);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPIDLE), 31);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPINTVL), 32);
  EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPCNT), 33);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(SetKeepAliveOpt, EachRefusedOptionHasItsLineAndEndsTheCall) {
  const char* const messages[] = {"keepalive", "keepidle", "keepintvl", "keepcnt"};
  for (int n = 1; n <= 4; ++n) {
    LogCapture log;
    TcpSocket socket;
    Faults faults;
    faults.FailNth(Call::kSetsockopt, n);
    EXPECT_EQ(socket.SetKeepAliveOpt(1, 31, 32, 33), -1);
    EXPECT_EQ(faults.Count(Call::kSetsockopt), n);
    EXPECT_THAT(log.Lines(), ElementsAre(SocketLine(
                                 "info", "SetKeepAliveOpt",
                                 std::string("Failed to set ") + messages[n - 1] + " option.\n")));
    EXPECT_EQ(SocketOption(socket.m_sockFd, SOL_SOCKET, SO_KEEPALIVE), n > 1 ? 1 : 0);
    EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPIDLE) == 31, n > 2);
    EXPECT_EQ(SocketOption(socket.m_sockFd, IPPROTO_TCP, TCP_KEEPINTVL) == 32, n > 3);
  }
}

TEST(SetKeepAliveOpt, ValuesThatTheSystemRefusesEndTheCall) {
  LogCapture log;
  TcpSocket socket;
  EXPECT_EQ(socket.SetKeepAliveOpt(1, 0, 32, 33), -1);
  EXPECT_EQ(socket.SetKeepAliveOpt(1, 31, 0, 33), -1);
  EXPECT_EQ(socket.SetKeepAliveOpt(1, 31, 32, 0), -1);
  EXPECT_THAT(log.Messages(),
              ElementsAre("Failed to set keepidle option.\n", "Failed to set keepintvl option.\n",
                          "Failed to set keepcnt option.\n"));
}

TEST(SetKeepAliveOpt, WithoutASocketIsRefused) {
  LogCapture log;
  ExposedSocket socket;
  EXPECT_EQ(socket.SetKeepAliveOpt(1, 31, 32, 33), -1);
  EXPECT_EQ(socket.SetKeepAliveOpt(0, 0, 0, 0), -1);
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to set keepalive option.\n",
                                          "Failed to set keepalive option.\n"));
}

}  // namespace
