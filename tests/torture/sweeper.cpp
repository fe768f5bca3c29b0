#include "tests/torture/sweeper.h"

#include <pthread.h>
#include <unistd.h>

#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/torture/traces.h"

namespace {

// So many runs without a fault come first.
constexpr int kWarmUpRuns = 4;

// A cache that a fault has made larger is full after so many more runs; a leak grows with each.
// OpenSSL keeps the texts of a thread's last sixteen errors.
constexpr int kRunsToSettle = 24;

// A run without a fault follows after so many with one: what a fault has broken for good shows.
constexpr long kPointsBetweenChecks = 8;

// Lines are written whole, and the file ends with one. A failed write is not made good.
std::string LogMistake() {
  const std::string text = t_injection.write_failed ? "" : ReadFile(kMainLog);
  return text.empty() || text.back() == '\n' ? "" : "the log ends in the middle of a line; ";
}

std::string RunHere(const Operation& operation, const FaultPoint& point, TestRun& test) {
  StartRun(point);
  operation.run(test);
  return "";
}

// A run in a thread of its own, whose counts outlive it.
struct CancelledRun {
  const Operation& operation;
  const FaultPoint& point;
  TestRun& test;
  Injection counts;
};

// What other libraries keep for a thread goes when it ends, in the first round of such destructors;
// by setting its value again this one is called in the last round too.
pthread_key_t MakeReportKey() {
  static pthread_key_t key;
  pthread_key_create(&key, [](void* argument) {
    static_cast<CancelledRun*>(argument)->counts = t_injection;
    pthread_setspecific(key, argument);
  });
  return key;
}

void* RunInThread(void* argument) {
  static const pthread_key_t key = MakeReportKey();
  pthread_setspecific(key, argument);
  auto* const run = static_cast<CancelledRun*>(argument);
  t_injection.counting_blocks = true;
  RunHere(run->operation, run->point, run->test);
  return nullptr;
}

// Results: a mistake when the thread does not end as a cancelled one, or by itself.
std::string RunCancelled(const Operation& operation, const FaultPoint& point, TestRun& test) {
  CancelledRun run = {operation, point, test, {}};
  pthread_t thread;
  if (pthread_create(&thread, nullptr, RunInThread, &run) != 0) return "there is no thread; ";
  void* end = nullptr;
  pthread_join(thread, &end);
  run.counts.blocks += t_injection.blocks;
  t_injection = run.counts;
  return end == nullptr || end == PTHREAD_CANCELED ? "" : "the thread ends otherwise; ";
}

}  // namespace

Watchdog::Watchdog(const Operation& operation, int limit_seconds, Progress* progress)
    : operation_(operation),
      limit_(limit_seconds),
      progress_(progress),
      thread_([this] { Watch(); }) {}

Watchdog::~Watchdog() {
  stopped_ = true;
  thread_.join();
}

void Watchdog::StartRun() {
  started_ = Clock::now().time_since_epoch().count();
}

void Watchdog::Watch() {
  while (!stopped_) {
    usleep(20000);
    const Clock::time_point started{Clock::duration(started_)};
    if (Clock::now() - started < limit_) continue;
    NoteMistake(operation_, "takes longer than its limit", progress_);
    progress_->timed_out = true;
    _exit(1);
  }
}

std::set<std::string> SweepRunner::FilesThere() {
  return TakeTraces().files;
}

bool SweepRunner::WarmUp() {
  for (int i = 0; i < kWarmUpRuns; ++i) {
    const RunResult result = RunOnce(kNoPoint);
    if (result.mistakes.empty()) continue;
    NoteMistake(operation_, result.mistakes.c_str(), progress_);
    return false;
  }
  NoteCounts();
  return true;
}

bool SweepRunner::TryFirstRun(const FaultPoint& point) {
  if (point.fault != Fault::kNone) return RunPoint(point, true);
  const RunResult result = RunOnce(point);
  NoteCounts();
  if (!result.mistakes.empty()) NoteMistake(operation_, result.mistakes.c_str(), progress_);
  return true;
}

void SweepRunner::Make(const Selection& selection) {
  if (selection.only_first) {
    RunPoint(selection.first, true);
    return;
  }
  if (selection.first.fault == Fault::kCancelled) {
    SweepFault(Fault::kCancelled, selection.first.number);
  }
  for (const Fault fault : kFaults) {
    if (fault < selection.first.fault) continue;
    const bool resumes = fault == selection.first.fault;
    SweepFault(fault, resumes ? selection.first.number : 1);
  }
  const std::string mistakes = MistakesOfHealthyRun();
  if (!mistakes.empty()) NoteMistake(operation_, mistakes.c_str(), progress_);
}

void SweepRunner::NoteCounts() {
  progress_->allocations = t_injection.allocations;
  progress_->calls = t_injection.calls;
}

void SweepRunner::SweepFault(Fault fault, long first) {
  int misses = 0;
  for (long number = first; misses < kMissesToEnd; ++number) {
    misses = RunPoint({fault, number}, false) ? 0 : misses + 1;
  }
}

bool SweepRunner::RunPoint(const FaultPoint& point, bool checks) {
  progress_->current = point;
  RunResult result = RunOnce(point);
  if (result.blocks_left > 0 && !RepeatsWithoutLoss(point)) {
    result.mistakes += std::to_string(result.blocks_left) + " blocks of memory are left; ";
  }
  if (!result.struck) return result.reached;
  if (++progress_->points % kPointsBetweenChecks == 0) checks = true;
  if (checks && result.mistakes.empty()) result.mistakes = MistakesOfHealthyRun();
  if (!result.mistakes.empty()) {
    NoteMistake(operation_, (result.mistakes + "after " + struck_name_).c_str(), progress_);
  }
  return true;
}

bool SweepRunner::RepeatsWithoutLoss(const FaultPoint& point) {
  for (int i = 0; i < kRunsToSettle; ++i) {
    if (RunOnce(point).blocks_left <= 0) return true;
  }
  return false;
}

std::string SweepRunner::MistakesOfHealthyRun() {
  const std::string mistakes = RunOnce(kNoPoint).mistakes;
  return mistakes.empty() ? "" : "the next run without a fault: " + mistakes;
}

SweepRunner::RunResult SweepRunner::RunOnce(const FaultPoint& point) {
  watchdog_->StartRun();
  unlink(kMainLog);
  RunResult result;
  TestRun test(port_);
  Traces before = TakeTraces();
  // What an earlier run could not remove is gone after one without a fault.
  if (point.fault == Fault::kNone) before.files = first_files_;
  const long blocks = t_injection.blocks;
  result.mistakes = point.fault == Fault::kCancelled ? RunCancelled(operation_, point, test)
                                                     : RunHere(operation_, point, test);
  result.blocks_left = t_injection.blocks - blocks - (test.Mistakes().empty() ? 0 : 1);
  const bool with_files = !t_injection.unlink_failed;
  result.struck = t_injection.struck;
  if (result.struck) struck_name_ = t_injection.struck_name;
  const long made = CountsAllocations(point.fault) ? t_injection.allocations : t_injection.calls;
  result.reached = made >= point.number;
  result.mistakes +=
      test.Mistakes() + DifferenceOf(before, TakeTraces(), with_files) + HeldLock() + LogMistake();
  return result;
}
