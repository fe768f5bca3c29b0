// Processes that fork at any moment, and that end while their threads log.
#include <spawn.h>
#include <sys/mount.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdlib>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/stress/log_team.h"
#include "tests/stress/processes.h"
#include "tests/stress/stress.h"
#include "tests/support/log_capture.h"

namespace {

constexpr int kThreads = 8;
constexpr double kHungAfterSeconds = 10;

// What a process of the first-line form ends with when its child hung.
constexpr int kChildHung = 17;

void LogOnce() {
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "a line of %d\n", getpid());
}

// Forks a child that logs and exits. Results: false when it hung.
bool ForkAChildThatLogs() {
  const pid_t pid = fork();
  if (pid == 0) {
    LogOnce();
    exit(0);
  }
  if (WaitFor(pid, kHungAfterSeconds)) return true;
  kill(pid, SIGKILL);
  waitpid(pid, nullptr, 0);
  return false;
}

// Forks beside threads that log without a pause, until one child has hung.
void ForkBesideLoggingThreads(int forks, CaseResult& result) {
  std::atomic<bool> stop{false};
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&stop] {
      while (!stop) LogOnce();
    });
  }
  int hung = 0;
  for (int i = 0; i < forks && hung == 0; ++i) {
    hung += ForkAChildThatLogs() ? 0 : 1;
    result.Checked(1);
    // The log would fill the memory that it lies in.
    if (i % 1000 == 0) unlink(kMainLog);
  }
  stop = true;
  for (std::thread& thread : threads) thread.join();
  result.Expect(hung == 0, "a child hung");
  result.Done("%d forks beside 8 logging threads", forks);
}

void ForkWithAFolder(CaseResult& result) {
  ForkBesideLoggingThreads(result.Pick(20000, 1000), result);
}

void ForkWithoutAFolder(CaseResult& result) {
  if (mount("tmpfs", "/var/log", "tmpfs", 0, "mode=755") != 0) result.Fail("the folder is there");
  ForkBesideLoggingThreads(result.Pick(20000, 1000), result);
}

// A process whose threads log their first lines while it forks, at a moment that differs.
int ForkAtTheFirstLine(int round) {
  std::atomic<bool> start{false};
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&start] {
      while (!start) std::this_thread::yield();
      LogOnce();
    });
  }
  start = true;
  for (volatile int i = 0; i < round % 50 * 400; ++i) {
  }
  const bool good = ForkAChildThatLogs();
  for (std::thread& thread : threads) thread.join();
  return good ? 0 : kChildHung;
}

void ForkDuringTheFirstLine(CaseResult& result) {
  const int processes = result.Pick(20000, 500);
  for (int i = 0; i < processes && result.FailureCount() == 0; ++i) {
    const pid_t pid = Spawn([i] { return ForkAtTheFirstLine(i); });
    const auto status = WaitFor(pid, 2 * kHungAfterSeconds);
    result.Expect(status == 0, StatusText(status));
    if (!status) kill(pid, SIGKILL);
    result.Checked(1);
    if (i % 1000 == 0) unlink(kMainLog);
  }
  result.Done("%d processes that fork while 8 threads log first", processes);
}

// Runs an ending process many times. `setting` goes into its environment.
void RunEndings(const char* program, const char* form, const char* setting, CaseResult& result) {
  const int processes = result.Pick(3000, 100);
  for (int i = 0; i < processes && result.FailureCount() < 3; ++i) {
    char* const arguments[] = {const_cast<char*>(program), const_cast<char*>(form), nullptr};
    char* const environment[] = {const_cast<char*>(setting), nullptr};
    pid_t pid = -1;
    if (posix_spawn(&pid, program, nullptr, nullptr, arguments, environment) != 0) abort();
    const auto status = WaitFor(pid, kHungAfterSeconds);
    result.Expect(status == 0, std::string(form) + ", " + setting + ": " + StatusText(status));
    if (!status) kill(pid, SIGKILL);
    result.Checked(1);
    if (i % 500 == 0) unlink(kMainLog);
  }
}

// Each with the shared library and with the archive, and with memory that is spoilt when it is
// freed.
void EndInForm(const char* form, CaseResult& result) {
  const SharedRecord record;
  for (const char* program : {TARNWICK_ENDING_SHARED, TARNWICK_ENDING_STATIC}) {
    for (const char* setting : {"MALLOC_PERTURB_=0", "MALLOC_PERTURB_=165"}) {
      RunEndings(program, form, setting, result);
    }
  }
  result.Done("%ld processes that exit", result.CheckedCount());
}

void EndWhileThreadsLog(CaseResult& result) {
  EndInForm("lines", result);
}
void EndWhileThreadsAskTheLevel(CaseResult& result) {
  EndInForm("gate", result);
}
void EndWithAStaticObjectThatLogs(CaseResult& result) {
  EndInForm("static", result);
}

}  // namespace

std::vector<StressCase> LifeCases() {
  return {
      {"life", "fork beside logging threads", ForkWithAFolder},
      {"life", "fork beside threads that report to syslog", ForkWithoutAFolder},
      {"life", "fork during the first line", ForkDuringTheFirstLine},
      {"life", "exit while detached threads log", EndWhileThreadsLog},
      {"life", "exit while detached threads ask the level", EndWhileThreadsAskTheLevel},
      {"life", "exit with a static object that logs", EndWithAStaticObjectThatLogs},
  };
}
