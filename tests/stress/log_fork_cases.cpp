// Processes that fork while their threads are logging.
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <functional>
#include <thread>

#include "tests/stress/log_team.h"
#include "tests/support/faults.h"
#include "tests/support/log_capture.h"

namespace {

constexpr int kThreads = 8;
constexpr int kLinesOfAChild = 3;
constexpr int kDescriptorLeft = 3;
constexpr double kSeconds = 20;

// Writers 0 to 7 are the threads, the others the children, in the order of their start.
struct ForkRun {
  explicit ForkRun(int most_children)
      : children_left(most_children), progress(static_cast<size_t>(kThreads + most_children)) {}

  std::atomic<int> children_left;
  std::atomic<int> next_writer{kThreads};
  Shared<WriterProgress> progress;
  std::atomic<int> stuck{0};
  std::atomic<int> left_descriptors{0};
  std::atomic<int> crashed{0};
};

// A child logs, and ends in the three ways in which children of daemons end.
[[noreturn]] void RunForkedChild(int writer, WriterProgress& progress) {
  progress.pid = getpid();
  const bool descriptor_left = DescriptorsOn(kMainLog) != 0;
  for (int i = 0; i < kLinesOfAChild; ++i) WriteNextLine(writer, progress);
  if (descriptor_left) _exit(kDescriptorLeft);
  if (writer % 3 == 0) _exit(0);
  if (writer % 3 == 1) exit(0);
  execl("/bin/true", "true", nullptr);
  _exit(127);
}

// Logs on while the child runs.
void ForkOne(int thread, ForkRun& run) {
  const int writer = run.next_writer++;
  const pid_t pid = fork();
  if (pid == 0) RunForkedChild(writer, run.progress[static_cast<size_t>(writer)]);
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(kSeconds);
  int status = 0;
  while (waitpid(pid, &status, WNOHANG) == 0) {
    WriteNextLine(thread, run.progress[static_cast<size_t>(thread)]);
    usleep(500);
    if (std::chrono::steady_clock::now() < deadline) continue;
    ++run.stuck;
    kill(pid, SIGKILL);
    waitpid(pid, &status, 0);
    return;
  }
  if (WIFEXITED(status) && WEXITSTATUS(status) == kDescriptorLeft) {
    ++run.left_descriptors;
  } else if (status != 0) {
    ++run.crashed;
  }
}

void ForkAndLog(int thread, ForkRun& run) {
  run.progress[static_cast<size_t>(thread)].pid = getpid();
  while (run.children_left-- > 0 && run.stuck == 0) {
    for (int i = 0; i < 3; ++i) WriteNextLine(thread, run.progress[static_cast<size_t>(thread)]);
    ForkOne(thread, run);
  }
}

void VerifyForks(ForkRun& run, CaseResult& result) {
  std::vector<WriterFacts> facts;
  for (size_t i = 0; i < static_cast<size_t>(run.next_writer); ++i) {
    facts.push_back({run.progress[i].pid, run.progress[i].started, 0, 0});
  }
  LogVerifier verifier(facts);
  LogFiles().Verify(verifier, result);
}

void ForkFromLoggingThreads(CaseResult& result) {
  const int children = result.Pick(6000, 600);
  ForkRun run(children);
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) threads.emplace_back(ForkAndLog, i, std::ref(run));
  for (std::thread& thread : threads) thread.join();
  result.Expect(run.stuck == 0, std::to_string(run.stuck) + " children hung");
  result.Expect(run.crashed == 0, std::to_string(run.crashed) + " children failed");
  result.Expect(run.left_descriptors == 0,
                std::to_string(run.left_descriptors) + " children had the log open");
  result.Expect(DescriptorsOn(kLogFolder) == 0, "the parent has the log open");
  VerifyForks(run, result);
  result.Done("8 threads, %d children that log and exit or exec", run.next_writer - kThreads);
}

// A process with one thread in the middle of a line; another thread forks a child that stays.
// The child's id goes into `*child`.
int ForkBesideALine(std::atomic<int>* child) {
  std::atomic<bool> in_line{false};
  std::thread writer([&] {
    Faults faults;
    faults.Before(Call::kFlock, [&](int n) {
      if (n != 2) return;  // the line is written, the lock not yet released
      in_line = true;
      for (;;) pause();
    });
    WriteLine(0, 0);
  });
  while (!in_line) usleep(100);
  const pid_t pid = fork();
  if (pid == 0) {
    for (;;) pause();
  }
  *child = pid;
  for (;;) pause();
}

void ParentKilledWithTheLock(CaseResult& result) {
  const int rounds = result.Pick(200, 20);
  for (int i = 0; i < rounds; ++i) {
    Shared<std::atomic<int>> child;
    const pid_t parent = Spawn([&] { return ForkBesideALine(&*child); });
    while (*child == 0) usleep(200);
    kill(parent, SIGKILL);
    waitpid(parent, nullptr, 0);
    const pid_t other = Spawn([] {
      WriteLine(1, 0);
      return 0;
    });
    const auto status = WaitFor(other, 5);
    result.Checked(1);
    result.Expect(status == 0, "a line after the parent's death: " + StatusText(status));
    kill(*child, SIGKILL);
    if (!status) WaitFor(other, 5);
    if (result.FailureCount() > 3) break;
  }
  result.Done("%d parents killed while a forked child stayed", rounds);
}

}  // namespace

std::vector<StressCase> LogForkCases() {
  return {
      {"log", "fork from 8 logging threads", ForkFromLoggingThreads},
      {"log", "parent killed in a line, its child stays", ParentKilledWithTheLock},
  };
}
