// The n-th call fails: whatever goes wrong in a dialog, the result says so, no descriptor is left,
// and the same object serves the next dialog.
#include "tests/net/net_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/process.h"
#include "tests/support/server_process.h"

namespace {

using ::testing::MatchesRegex;

// Responds "pong" to the first line of each connection.
void Pong(ServerConnection& connection, unsigned /*number*/) {
  std::string line;
  if (connection.ReadUntil("\n", &line) && connection.Write("pong\n")) connection.Close();
}

class PongServer : public ServerProcess {
 public:
  PongServer() : ServerProcess({{Pong}}) {}
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
