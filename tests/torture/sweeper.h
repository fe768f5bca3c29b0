// The runs of one operation within a process.
#ifndef TARNWICK_TESTS_TORTURE_SWEEPER_H_
#define TARNWICK_TESTS_TORTURE_SWEEPER_H_

#include <atomic>
#include <chrono>
#include <set>
#include <string>
#include <thread>

#include "tests/torture/injection.h"
#include "tests/torture/sweep.h"
#include "tests/torture/test_run.h"

// Ends the process, with a mistake noted, when a run takes too long.
class Watchdog {
 public:
  Watchdog(const Operation& operation, int limit_seconds, Progress* progress);
  ~Watchdog();
  Watchdog(const Watchdog&) = delete;
  Watchdog& operator=(const Watchdog&) = delete;

  void StartRun();

 private:
  using Clock = std::chrono::steady_clock;

  void Watch();

  const Operation& operation_;
  const std::chrono::seconds limit_;
  Progress* const progress_;
  std::atomic<Clock::rep> started_{Clock::now().time_since_epoch().count()};
  std::atomic<bool> stopped_{false};
  std::thread thread_;
};

// REQUIRES: the calling thread's calls are trapped, and it is the one that made the object.
class SweepRunner {
 public:
  SweepRunner(const Operation& operation, int port, Progress* progress, Watchdog* watchdog)
      : operation_(operation), port_(port), progress_(progress), watchdog_(watchdog) {}

  // The runs without a fault, which fill the caches and count the calls. Results: false after a
  // mistake, which is noted.
  bool WarmUp();

  // A point's run as the first of the process. Results: those of RunPoint.
  bool TryFirstRun(const FaultPoint& point);

  void Make(const Selection& selection);

 private:
  // What one run has given.
  struct RunResult {
    bool reached = false;  // the run made as many calls as its point has
    bool struck = false;
    long blocks_left = 0;
    std::string mistakes;
  };

  void NoteCounts();
  void SweepFault(Fault fault, long first);

  // `checks` has a run without a fault follow in any case. Results: false when the run came to its
  // end before the point.
  bool RunPoint(const FaultPoint& point, bool checks);

  // The same operation without a fault must succeed after those that had one.
  std::string MistakesOfHealthyRun();

  bool RepeatsWithoutLoss(const FaultPoint& point);
  RunResult RunOnce(const FaultPoint& point);

  const Operation& operation_;
  const int port_;
  Progress* const progress_;
  Watchdog* const watchdog_;
  const std::set<std::string> first_files_ = FilesThere();
  std::string struck_name_;

  static std::set<std::string> FilesThere();
};

// The number of calls of a run varies a little where keys and random numbers are involved: the
// sweep of a fault ends after so many runs in a row that came to their end before the point.
constexpr int kMissesToEnd = 3;

// The point of a run without a fault.
constexpr FaultPoint kNoPoint = {Fault::kNone, 0};

#endif  // TARNWICK_TESTS_TORTURE_SWEEPER_H_
