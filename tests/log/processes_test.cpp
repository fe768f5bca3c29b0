// What processes share: the log files and the record.
#include <gtest/gtest.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <chrono>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

constexpr int kProcesses = 8;
constexpr int kThreads = 2;
constexpr int kLines = 60;

// The message of one line: its writer and number, and up to 20 KB of a letter that tells the
// writer.
std::string MessageOf(int writer, int number) {
  const int length = (writer * 7919 + number * 104729) % 20000;
  return std::to_string(writer) + "/" + std::to_string(number) + " " +
         std::string(static_cast<size_t>(length), static_cast<char>('a' + writer)) + "\n";
}

void WriteLines(int writer) {
  for (int number = 0; number < kLines; ++number) {
    TWPrintf(LOG_TYPE_MAIN, "http", "warn", "writer", number, "WriteLines", "%s",
             MessageOf(writer, number).c_str());
  }
}

int WriteFromTwoThreads(int process) {
  std::thread other([=] { WriteLines(process * kThreads + 1); });
  WriteLines(process * kThreads);
  other.join();
  return 0;
}

TEST(Processes, LinesOfEightProcessesWithTwoThreadsAreNeitherTornNorLost) {
  const LogCapture log;
  std::vector<std::unique_ptr<Child>> writers;
  for (int process = 0; process < kProcesses; ++process) {
    writers.push_back(std::make_unique<Child>([=] { return WriteFromTwoThreads(process); }));
  }
  for (const auto& writer : writers) EXPECT_EQ(writer->Wait().code, 0);
  std::vector<int> next(kProcesses * kThreads, 0);
  for (const LogLine& line : log.Lines()) {
    const size_t writer = static_cast<size_t>(std::stoi(line.message));
    ASSERT_LT(writer, next.size());
    ASSERT_EQ(line.message, MessageOf(static_cast<int>(writer), next[writer]));
    EXPECT_EQ(line.line, next[writer]++);
    EXPECT_EQ(line.tid != 0, writer % kThreads == 1);
  }
  for (const int lines : next) EXPECT_EQ(lines, kLines);
}

// Waits until a level is on, as a daemon would see it.
int AwaitLevel(LOG_CATEG categ, LOG_LEVEL level) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  while (!TWLogEnabled(categ, level)) {
    if (std::chrono::steady_clock::now() > deadline) return 1;
    usleep(1000);
  }
  TW_LOG(categ, level, "seen\n");
  return 0;
}

TEST(Processes, ALevelThatOneProcessChangesIsSeenByTheOthers) {
  LogCapture log(3);
  Child first([] {
    FreeDbgCfg();
    InitDbgCfg();  // an attachment of its own, as a daemon has it
    return AwaitLevel(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG3);
  });
  Child second([] { return AwaitLevel(LOG_CATEG_HTTP, LOG_LEVEL_INFO); });
  log.SetLevel(LOG_CATEG_HTTP, 7);
  EXPECT_EQ(first.Wait().code, 0);
  EXPECT_EQ(second.Wait().code, 0);
  EXPECT_EQ(log.Lines().size(), 2u);
}

TEST(Processes, ADaemonMayChangeTheLevelsItself) {
  LogCapture log(3);
  const ChildResult result = RunInChild([] {
    g_pDbgLogCfg->SetLevel(LOG_CATEG_SOCKET, LOG_LEVEL_DEBUG);
    g_pDbgLogCfg->SetTimeScale(true);
    return 0;
  });
  EXPECT_EQ(result.code, 0);
  EXPECT_EQ(log.Record().Level(57), 5);
  EXPECT_TRUE(g_pDbgLogCfg->TimeScale());
}

TEST(Processes, AForkedChildsMainThreadPrintsItsOwnIdOnce) {
  const LogCapture log;
  Child child([] {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "child\n");
    return 0;
  });
  const pid_t pid = child.Pid();
  EXPECT_EQ(child.Wait().code, 0);
  ASSERT_EQ(log.Lines().size(), 1u);
  EXPECT_EQ(log.Lines()[0].pid, pid);
  EXPECT_EQ(log.Lines()[0].tid, 0);
}

TEST(Processes, ThreadsChangeAndReadLevelsAtTheSameTime) {
  LogCapture log(3);
  std::thread changer([] {
    for (int i = 0; i < 20000; ++i) g_pDbgLogCfg->SetLevel(LOG_CATEG_HTTP, i % 2 == 0 ? 3 : 7);
  });
  for (int i = 0; i < 20000; ++i) {
    const int level = g_pDbgLogCfg->Level(LOG_CATEG_HTTP);
    ASSERT_TRUE(level == 3 || level == 7);
  }
  changer.join();
}

}  // namespace
