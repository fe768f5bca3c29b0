// The runs of one operation: one for each of its allocations and system calls and each fault.
#ifndef TARNWICK_TESTS_TORTURE_SWEEP_H_
#define TARNWICK_TESTS_TORTURE_SWEEP_H_

#include "tests/torture/injection.h"
#include "tests/torture/test_run.h"

// How far a sweep has come, in memory that the process which makes it shares with its parent.
struct Progress {
  long allocations;  // of a run without a fault
  long calls;
  long points;    // runs in which the fault met a call
  long failures;  // runs with a mistake
  FaultPoint current;
  char message[512];  // the first mistake
  bool cold;
  bool timed_out;  // the process has ended itself
  bool finished;
};

// Which runs to make: from `first` on, in the order of the faults, or `first` alone.
struct Selection {
  FaultPoint first = {Fault::kAllocation, 1};
  bool only_first = false;
  bool cold = false;       // each run is the first of a process of its own, with all caches empty
  int limit_seconds = 10;  // that one run may take
};

// Makes the runs of `operation` and counts them in `progress`; a mistake is printed with the
// arguments that repeat its run. REQUIRES: a process of its own, made by fork from one with a
// single thread, with nothing but this to do: it traps the calls of a thread, covers folders, and
// ends itself when a run takes too long.
// Results: false when it could not begin.
bool FaultSweep(const Operation& operation, const Selection& selection, Progress* progress);

// Notes a mistake of the run at `progress->current`.
void NoteMistake(const Operation& operation, const char* mistake, Progress* progress);

#endif  // TARNWICK_TESTS_TORTURE_SWEEP_H_
