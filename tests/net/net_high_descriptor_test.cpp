// Descriptors beyond the 1,024 that a plain fd_set holds.
#include <sys/resource.h>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/scripted_peer.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr int kHighest = 1100;

// Takes every descriptor up to kHighest, so that the next ones lie above.
class TakenDescriptors {
 public:
  TakenDescriptors() {
    getrlimit(RLIMIT_NOFILE, &before_);
    struct rlimit more = before_;
    more.rlim_cur = 4096;
    EXPECT_EQ(setrlimit(RLIMIT_NOFILE, &more), 0);
    for (int fd = 0; fd >= 0 && fd < kHighest;) {
      fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
      if (fd >= 0) taken_.push_back(fd);
    }
  }
  ~TakenDescriptors() {
    for (const int fd : taken_) close(fd);
    setrlimit(RLIMIT_NOFILE, &before_);
  }
  TakenDescriptors(const TakenDescriptors&) = delete;
  TakenDescriptors& operator=(const TakenDescriptors&) = delete;

 private:
  std::vector<int> taken_;
  struct rlimit before_ = {};
};

class HighDescriptor : public ::testing::Test {
 protected:
  void SetUp() override {
    if (IsEmulated()) GTEST_SKIP() << kNoHighSelect;
  }

  TakenDescriptors taken_;
};

TEST_F(HighDescriptor, ConnectsWritesAndReads) {
  LogCapture log;
  ScriptedPeer peer({{ExpectExactly("ping\n"), Send("pong\n"), ExpectEof()}});
  ExposedSocket socket("127.0.0.1", peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_GT(socket.m_sockFd, 1024);
  EXPECT_EQ(socket.WriteData("ping\n", 5), 5);
  EXPECT_EQ(ReadLine(socket), (Delivered{4, "pong"}));
  EXPECT_FALSE(socket.HasDataToRead(0));
  socket.Disconnect();
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST_F(HighDescriptor, ConnectsWritesAndReadsOverTls) {
  TlsScriptedPeer peer({{ExpectExactly("ping\n"), Send("pong\n"), ExpectEof()}});
  ExposedTlsSocket socket("127.0.0.1", peer.Port(), 5, true);
  ASSERT_EQ(socket.Connect(), 0);
  EXPECT_GT(socket.m_sockFd, 1024);
  EXPECT_EQ(socket.WriteData("ping\n", 5), 5);
  EXPECT_EQ(ReadLine(socket), (Delivered{4, "pong"}));
  socket.Disconnect();
}

TEST_F(HighDescriptor, TheConnectTimeOutIsFound) {
  const BlackHolePort hole;
  ExposedSocket socket("127.0.0.1", hole.Port(), 0, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_EQ(errno, ETIMEDOUT);
}

TEST_F(HighDescriptor, ARefusalIsFound) {
  LogCapture log;
  const ClosedPort port;
  ExposedSocket socket("127.0.0.1", port.Port(), 5, true);
  EXPECT_EQ(socket.Connect(), -1);
  EXPECT_THAT(log.Messages(), ElementsAre("Socket connection failed with error [111].\n",
                                          "Socket connect timeout (5)\n"));
}

TEST_F(HighDescriptor, WaitsForTheKindThatIsAskedFor) {
  PairedSocket socket(0, true);
  ASSERT_GT(socket.m_sockFd, 1024);
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_READ), 0);
  EXPECT_GT(socket.DoSelect(TWSocket::SELECT_WRITE), 0);
  socket.PeerSends("x");
  EXPECT_GT(socket.DoSelect(TWSocket::SELECT_READ), 0);
  socket.FillUp();
  EXPECT_EQ(socket.DoSelect(TWSocket::SELECT_WRITE), 0);
}

TEST_F(HighDescriptor, ARepeatedWaitHasItsSetsAnew) {
  LogCapture log;
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  Faults faults;
  faults.Return(Call::kSelect, 1, 1, 1);
  EXPECT_GT(socket.DoSelect(TWSocket::SELECT_READ), 0);
  EXPECT_THAT(log.Messages(), ElementsAre("Strange thing happens, try to select again!\n"));
}

TEST_F(HighDescriptor, NoMemoryForTheSetsFailsAWait) {
  PairedSocket socket(5, true);
  socket.PeerSends("x");
  int failures = 0;
  for (const Call call : {Call::kMalloc, Call::kCalloc}) {
    failures += ForEachFailingCall(call, [&](Faults& faults) {
      const int result = socket.DoSelect(TWSocket::SELECT_READ);
      EXPECT_EQ(result < 0, faults.Struck());
    });
  }
  EXPECT_EQ(failures, 2);  // one for each of the two sets
}

TEST_F(HighDescriptor, NoMemoryForTheSetsFailsAConnect) {
  int failures = 0;
  for (const Call call : {Call::kMalloc, Call::kCalloc}) {
    failures += ForEachFailingCall(call, [&](Faults& faults) {
      int port = 0;
      const int listener = BindLoopback(&port);
      listen(listener, 1);
      ExposedSocket socket("127.0.0.1", port, 5, true);
      const int result = socket.Connect();
      EXPECT_EQ(result, faults.Struck() ? -1 : 0);
      EXPECT_EQ(socket.IsConnected(), !faults.Struck());
      close(listener);
    });
  }
  EXPECT_EQ(failures, 2);  // one for each of the two sets
}

}  // namespace
