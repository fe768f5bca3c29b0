// Connecting: the sequence, its two ways, and what each failure leaves.
#include <arpa/inet.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/mount.h>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kLoopback[] = "127.0.0.1";

// The two ways to connect: with and without a time-out.
class BothWays : public ::testing::TestWithParam<int> {};

// Gives the process a hosts file of its own.
class HostsFile {
 public:
  explicit HostsFile(const std::string& content) {
    WriteFile(directory_.File("hosts"), content);
    EXPECT_EQ(mount(directory_.File("hosts").c_str(), "/etc/hosts", nullptr, MS_BIND, nullptr), 0);
  }
  ~HostsFile() { umount("/etc/hosts"); }

 private:
  TempDir directory_;
};

size_t CountAddresses(const char* name) {
  addrinfo hints = {};
  hints.ai_family = AF_INET;
  hints.ai_socktype = SOCK_STREAM;
  addrinfo* list = nullptr;
  if (getaddrinfo(name, "80", &hints, &list) != 0) return 0;
  size_t count = 0;
  for (const addrinfo* entry = list; entry != nullptr; entry = entry->ai_next) ++count;
  freeaddrinfo(list);
  return count;
}

// The steps that a derived socket sees.
class WatchedSocket : public ExposedSocket {
 public:
  using ExposedSocket::ExposedSocket;
  int PostConnect() override {
    steps.emplace_back("PostConnect");
    return -5;
  }
  void Disconnect() override {
    steps.emplace_back("Disconnect");
    ExposedSocket::Disconnect();
  }
  std::vector<std::string> steps;
};

INSTANTIATE_TEST_SUITE_P(Connect, BothWays, ::testing::Values(5, -1));

TEST_P(BothWays, ReachesTheHostAndThePort) {
  LogCapture log;
  ScriptedPeer peer({{ExpectExactly("hello"), ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_EQ(socket.WriteData("hello", 5), 5);
  socket.Disconnect();
  EXPECT_EQ(peer.Received(0), "hello");
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST_P(BothWays, ResolvesAName) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket("localhost", peer.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), 0);
  socket.Disconnect();
}

TEST_P(BothWays, SetsTheModeOfTheTimeOut) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_EQ(IsNonBlocking(socket.m_sockFd), GetParam() >= 0);
  socket.Disconnect();
}

TEST_P(BothWays, ConnectSocketAloneLeavesTheDescriptorBlocking) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  Faults faults;
  ASSERT_EQ(socket.ConnectSocket(), 0);
  EXPECT_EQ(faults.Count(Call::kIoctl), 0);
  EXPECT_TRUE(socket.IsConnected());
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
  socket.Disconnect();
}

TEST_P(BothWays, OpensADescriptorThatExecCloses) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_NE(fcntl(socket.m_sockFd, F_GETFD) & FD_CLOEXEC, 0);
  socket.Disconnect();
}

TEST_P(BothWays, FailsWithoutASocket) {
  LogCapture log;
  ExposedSocket socket(kLoopback, 80, GetParam(), true);
  Faults faults;
  faults.FailNth(Call::kSocket, 1, EMFILE);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, EMFILE);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_LT(socket.m_sockFd, 0);
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectSocket", "Socket initialization failed!\n")));
}

TEST_P(BothWays, ANameThatIsNotResolvedLeavesTheDescriptorOpenUntilDisconnect) {
  LogCapture log;
  ExposedSocket socket(kLoopback, 80, GetParam(), true);
  {
    Faults faults;
    faults.FailNth(Call::kGetaddrinfo, 1, Faults::kUsual, EAI_AGAIN);
    EXPECT_EQ(socket.Connect(), -1);
    EXPECT_EQ(faults.Count(Call::kConnect), 0);
  }
  EXPECT_FALSE(socket.IsConnected());
  const int fd = socket.m_sockFd;
  EXPECT_TRUE(IsOpenFd(fd));
  socket.Disconnect();
  EXPECT_FALSE(IsOpenFd(fd));
  EXPECT_THAT(log.Lines(),
              ElementsAre(SocketLine("info", "ConnectSocket", "Scoket getaddrinfo incomplete.\n")));
}

TEST_P(BothWays, KnowsIpv4Only) {
  LogCapture log;
  ExposedSocket socket("::1", 80, GetParam(), true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(log.Messages(), ElementsAre("Scoket getaddrinfo incomplete.\n"));
}

TEST_P(BothWays, ARefusalLeavesTheDescriptorOpenAndUnconnected) {
  const ClosedPort port;
  ExposedSocket socket(kLoopback, port.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_FALSE(socket.IsConnected());
  EXPECT_TRUE(IsOpenFd(socket.m_sockFd));
  EXPECT_FALSE(IsNonBlocking(socket.m_sockFd));
}

TEST_P(BothWays, TheDescriptorOfARefusalIsClosedByTheNextConnect) {
  const ClosedPort port;
  const DescriptorGuard guard;
  ExposedSocket socket(kLoopback, port.Port(), GetParam(), true);
  for (int i = 0; i < 5; ++i) EXPECT_EQ(socket.Connect(), -1);
  const size_t open = OpenDescriptors().size();
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(OpenDescriptors().size(), open);
  socket.SetSocketInfo(kLoopback, port.Port(), GetParam(), true);
  EXPECT_EQ(OpenDescriptors().size(), open - 1);
}

TEST_P(BothWays, TheDescriptorOfARefusalIsClosedByTheDestructor) {
  const ClosedPort port;
  const DescriptorGuard guard;
  ExposedSocket socket(kLoopback, port.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), -1);
}

TEST_P(BothWays, ConnectsAgainAfterARefusal) {
  const ClosedPort port;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, port.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), -1);
  socket.SetSocketInfo(kLoopback, peer.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsConnected());
  socket.Disconnect();
}

TEST_P(BothWays, TriesTheFirstAddressAlone) {
  const ClosedPort port;
  const HostsFile hosts("127.0.0.1 twin.test\n127.0.0.2 twin.test\n");
  ASSERT_EQ(CountAddresses("twin.test"), 2u);
  ExposedSocket socket("twin.test", port.Port(), GetParam(), true);
  Faults faults;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kConnect), 1);
}

TEST_P(BothWays, BindsTheSourceAddress) {
  LogCapture log;
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  socket.SetRemoteAddr(inet_addr("127.0.0.9"));
  ASSERT_EQ(socket.Connect(), 0);
  sockaddr_in local = {};
  socklen_t length = sizeof(local);
  ASSERT_EQ(getsockname(socket.m_sockFd, reinterpret_cast<sockaddr*>(&local), &length), 0);
  EXPECT_STREQ(inet_ntoa(local.sin_addr), "127.0.0.9");
  EXPECT_NE(local.sin_port, 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
  socket.Disconnect();
}

TEST_P(BothWays, BindsNothingForASourceAddressOfZero) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  socket.SetRemoteAddr(inet_addr("127.0.0.9"));
  socket.SetRemoteAddr(0);
  Faults faults;
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_EQ(faults.Count(Call::kBind), 0);
  socket.Disconnect();
}

TEST_P(BothWays, AnEmptyAddressListIsAFailure) {
  ExposedSocket socket(kLoopback, 80, GetParam(), true);
  Faults faults;
  faults.Return(Call::kGetaddrinfo, 1, 1, 0);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_FALSE(socket.IsConnected());
}

TEST_P(BothWays, CallsTheDerivedDisconnectFirstAndIgnoresPostConnectsResult) {
  ScriptedPeer peer({{ExpectEof()}});
  WatchedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_THAT(socket.steps, ElementsAre("Disconnect", "PostConnect"));
  socket.Disconnect();
}

TEST_P(BothWays, DoesNotCallPostConnectAfterAFailure) {
  const ClosedPort port;
  WatchedSocket socket(kLoopback, port.Port(), GetParam(), true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(socket.steps, ElementsAre("Disconnect"));
}

TEST_P(BothWays, KeepsEndOfFileOfTheConnectionBefore) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedSocket socket(kLoopback, peer.Port(), GetParam(), true);
  socket.m_bEOF = true;
  EXPECT_EQ(socket.Connect(), 0);
  EXPECT_TRUE(socket.IsEOF());
  socket.Disconnect();
}

TEST(Connect, ASocketWithoutAHostIsNotResolved) {
  LogCapture log;
  ExposedSocket socket;
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(log.Messages(), ElementsAre("Scoket getaddrinfo incomplete.\n"));
}

}  // namespace
