// Processes that fork while another of their threads writes a line.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/fork_guard.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/flag.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"
#include "tests/support/syslog_capture.h"

using namespace tarnwick;

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::MatchesRegex;

void Write() {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "name", 57, "Func", "message\n");
}

// A thread that writes a line and runs `action` before the n-th call of one kind in it. It ends
// when `end` is set, so that it is alive when the test forks.
std::thread WriterThatStopsAt(Call call, int n, const std::function<void()>& action,
                              const Flag& end) {
  return std::thread([=] {
    Faults faults;
    faults.Before(call, [=](int count) {
      if (count == n) action();
    });
    Write();
    end.Wait();
  });
}

class WriterFork : public ::testing::Test {
 protected:
  WriterFork() {
    FreeDbgCfg();
    unlink(kMainLog);
  }
  ~WriterFork() override { unlink(kMainLog); }
};

TEST_F(WriterFork, AChildDoesNotHaveTheLogOpen) {
  const Flag in_line;
  const Flag go_on;
  const auto stop = [=] {
    in_line.Set();
    go_on.Wait();
  };
  std::thread writer = WriterThatStopsAt(Call::kFlock, 2, stop, go_on);
  EXPECT_TRUE(in_line.Wait());
  const ChildResult child = RunInChild([] {
    int open = 0;
    for (const auto& [fd, target] : OpenDescriptors()) open += target == kMainLog ? 1 : 0;
    return open;
  });
  go_on.Set();
  writer.join();
  EXPECT_EQ(child.code, 0);
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 1u);
}

// Forks a child that stays, while a line has the lock; the child's id goes into `*child`.
[[noreturn]] void ForkInALine(std::atomic<int>* child) {
  const Flag in_line;
  const auto stop = [=] {
    in_line.Set();
    for (;;) pause();
  };
  std::thread writer = WriterThatStopsAt(Call::kFlock, 2, stop, Flag());
  in_line.Wait();
  const pid_t pid = fork();
  if (pid != 0) *child = pid;
  for (;;) pause();
}

TEST_F(WriterFork, AKilledParentsLockDoesNotStayWithItsChild) {
  void* const memory =
      mmap(nullptr, 4096, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  ASSERT_NE(memory, MAP_FAILED);
  auto* grandchild = new (memory) std::atomic<int>(0);
  {
    const Child parent([=]() -> int { ForkInALine(grandchild); });
    for (int i = 0; i < 10000 && *grandchild == 0; ++i) usleep(1000);
  }  // killed
  ASSERT_NE(*grandchild, 0);
  const ChildResult writer = RunInChild(
      [] {
        Write();
        return 0;
      },
      seconds(10));
  kill(*grandchild, SIGKILL);
  munmap(memory, 4096);
  EXPECT_FALSE(writer.timed_out);
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 2u);
}

TEST_F(WriterFork, AChildThatEndsWritesNothingOfItsParentsLine) {
  const Flag before_write;
  const Flag go_on;
  const auto stop = [=] {
    before_write.Set();
    go_on.Wait();
  };
  std::thread writer = WriterThatStopsAt(Call::kAppend, 1, stop, go_on);
  EXPECT_TRUE(before_write.Wait());
  // A child flushes its streams when it ends.
  const ChildResult child = RunInChild([] { return 0; }, seconds(10));
  EXPECT_EQ(ReadFile(kMainLog), "");
  go_on.Set();
  writer.join();
  EXPECT_FALSE(child.timed_out);
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 1u);
}

// The C library's lock of the time zone would stay held in the child, whose own line would then
// have no time.
TEST_F(WriterFork, AForkWaitsWhileALineReadsTheTimeZone) {
  const Flag in_line;
  const Flag forked;
  bool forked_meanwhile = false;
  const Flag child_ended;
  const auto stop = [&] {
    in_line.Set();
    forked_meanwhile = forked.Wait(milliseconds(20));
  };
  std::thread writer = WriterThatStopsAt(Call::kLocaltimeR, 1, stop, child_ended);
  EXPECT_TRUE(in_line.Wait());
  Child child([] {
    Write();
    return 0;
  });
  forked.Set();
  EXPECT_EQ(child.Wait().code, 0);
  child_ended.Set();
  writer.join();
  EXPECT_FALSE(forked_meanwhile);
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 2u);
}

// Forks in this thread while another one is before its first call of one kind in a line. Results:
// the child's, which writes a line to the notification log.
ChildResult ForkBesideAStuckLine(Call call) {
  const Flag stuck;
  const Flag go_on;
  const auto stop = [=] {
    stuck.Set();
    go_on.Wait();
  };
  std::thread writer = WriterThatStopsAt(call, 1, stop, go_on);
  EXPECT_TRUE(stuck.Wait());
  const ChildResult child = RunInChild(
      [] {
        TWPrintf(LOG_TYPE_NOTIFICATION, "http", "warn", "name", 57, "Func", "message\n");
        return 0;
      },
      seconds(10));
  go_on.Set();
  writer.join();
  return child;
}

TEST_F(WriterFork, AForkDoesNotWaitForALogThatCannotBeOpenedAtOnce) {
  unlink(kNotificationLog);
  const ChildResult child = ForkBesideAStuckLine(Call::kOpen);
  EXPECT_FALSE(child.timed_out);
  const std::vector<LogLine> lines = ParseLog(ReadFile(kNotificationLog));
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_NE(lines[0].time, "");
}

TEST_F(WriterFork, AChildThatCannotAskForTheTimeZoneWritesALineWithoutATime) {
  unlink(kNotificationLog);
  const ChildResult child = ForkBesideAStuckLine(Call::kLocaltimeR);
  EXPECT_FALSE(child.timed_out);
  EXPECT_THAT(ReadFile(kNotificationLog),
              MatchesRegex(" \\[[0-9]+\\]\\[http\\]\\[warn\\] name:57:Func\\(\\): message\n"));
}

TEST_F(WriterFork, ALineDoesNotWaitForAnotherLogThatCannotBeOpenedAtOnce) {
  const Flag stuck;
  const Flag go_on;
  const auto stop = [=] {
    stuck.Set();
    go_on.Wait();
  };
  std::thread writer = WriterThatStopsAt(Call::kOpen, 1, stop, go_on);
  EXPECT_TRUE(stuck.Wait());
  Write();
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 1u);
  go_on.Set();
  writer.join();
}

TEST_F(WriterFork, AChildOfAThreadInTheSystemLogDoesNotReport) {
  const Flag stuck;
  const Flag go_on;
  std::thread holder([&] {
    const ForkGuard hold(ForkGuard::kLibraryLock);  // as a report has it
    stuck.Set();
    go_on.Wait();
  });
  EXPECT_TRUE(stuck.Wait());
  const ChildResult child = RunInChild([]() -> int {
    SyslogCapture reports;
    TWPrintf(static_cast<LOG_TYPE>(2), nullptr, nullptr, "name", 57, "Func", "message\n");
    return static_cast<int>(reports.Take().size());
  });
  go_on.Set();
  holder.join();
  EXPECT_EQ(child.code, 0);
}

}  // namespace
