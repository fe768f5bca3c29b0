// The n-th call fails: whatever goes wrong in a dialog, the result says so, no descriptor is left
// behind, and the same object serves the next dialog.
#include <poll.h>

#include <atomic>
#include <thread>

#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"

namespace {

using ::testing::MatchesRegex;

// Answers "pong\n" to the first bytes of each connection, any number of connections.
class PongServer {
 public:
  PongServer() : port_(0), listener_(BindLoopback(&port_)) {
    listen(listener_, 64);
    thread_ = std::thread([this] { Run(); });
  }
  ~PongServer() {
    stop_ = true;
    thread_.join();
    close(listener_);
  }
  int Port() const { return port_; }

 private:
  static bool Readable(int fd, int milliseconds) {
    pollfd waiting = {fd, POLLIN, 0};
    return poll(&waiting, 1, milliseconds) > 0;
  }

  void Run() {
    while (!stop_) {
      if (!Readable(listener_, 5)) continue;
      const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      Serve(fd);
      close(fd);
    }
  }

  void Serve(int fd) {
    char buf[64];
    if (!Readable(fd, 5000) || recv(fd, buf, sizeof(buf), 0) <= 0) return;
    send(fd, "pong\n", 5, MSG_NOSIGNAL);
    if (Readable(fd, 5000)) recv(fd, buf, sizeof(buf), 0);
  }

  int port_;
  int listener_;
  std::atomic<bool> stop_{false};
  std::thread thread_;
};

bool Dialog(TWSocket& socket) {
  if (socket.Connect() != 0) return false;
  const bool sent = socket.WriteData("ping\n", 5) == 5;
  const bool answered = sent && ReadLine(socket) == Delivered{4, "pong"};
  socket.Disconnect();
  return answered;
}

struct FailingCall {
  Call call;
  int error;      // in errno, or the result of a call that reports by its result
  bool forgiven;  // the dialog succeeds all the same
};

class FailingDialog : public ::testing::TestWithParam<FailingCall> {
 protected:
  const DescriptorGuard guard_;  // looks when the server has gone again
  PongServer server_;
};
INSTANTIATE_TEST_SUITE_P(Net, FailingDialog,
                         ::testing::Values(FailingCall{Call::kSocket, EMFILE, false},
                                           FailingCall{Call::kConnect, ENETUNREACH, false},
                                           FailingCall{Call::kGetsockopt, ENOPROTOOPT, false},
                                           FailingCall{Call::kRead, ECONNRESET, false},
                                           FailingCall{Call::kWrite, EPIPE, false},
                                           FailingCall{Call::kRead, EAGAIN, true},
                                           FailingCall{Call::kRead, EINTR, true},
                                           FailingCall{Call::kWrite, EAGAIN, true},
                                           FailingCall{Call::kWrite, EINTR, true},
                                           FailingCall{Call::kSelect, EINTR, true},
                                           FailingCall{Call::kFcntl, EBADF, true},
                                           FailingCall{Call::kIoctl, EBADF, true}),
                         [](const auto& instance) {
                           return std::string(CallName(instance.param.call)) + "Error" +
                                  std::to_string(instance.param.error);
                         });

TEST_P(FailingDialog, IsReportedAndTheNextOneWorks) {
  const FailingCall& failing = GetParam();
  ExposedSocket socket("127.0.0.1", server_.Port(), 5, true);
  const int runs = ForEachFailingCall(
      failing.call,
      [&](Faults& faults) {
        const bool done = Dialog(socket);
        EXPECT_EQ(done, failing.forgiven || !faults.Struck());
      },
      failing.error);
  EXPECT_GE(runs, 1);
  EXPECT_TRUE(Dialog(socket));
}

TEST(FailingSelect, OfAnyStepIsLogged) {
  LogCapture log;
  PongServer server;
  ExposedSocket socket("127.0.0.1", server.Port(), 5, true);
  const int runs = ForEachFailingCall(
      Call::kSelect,
      [&](Faults& faults) {
        log.Clear();
        Dialog(socket);
        if (!faults.Struck()) return;
        ASSERT_FALSE(log.Lines().empty());
        EXPECT_THAT(log.Lines()[0].message,
                    MatchesRegex("Select (failed|Fd .[0-9]+. failed) with errno .12..?\n"));
      },
      ENOMEM);
  EXPECT_EQ(runs, 3);  // connect, write, read
  EXPECT_TRUE(Dialog(socket));
}

TEST(FailingMemory, DoesNotTouchADialogOverASmallDescriptor) {
  PongServer server;
  ExposedSocket socket("127.0.0.1", server.Port(), 5, true);
  for (const Call call : {Call::kMalloc, Call::kCalloc, Call::kRealloc}) {
    Faults faults;
    EXPECT_TRUE(Dialog(socket));
    EXPECT_EQ(faults.Count(call), 0) << CallName(call);
  }
}

}  // namespace
