#include "tests/torture/injection.h"

#include <pthread.h>

#include <cerrno>
#include <cstring>

__thread Injection t_injection;

namespace {

constexpr const char* kNames[] = {"none",  "allocation",    "no-memory",   "nothing-left",
                                  "call",  "nothing-works", "interrupted", "try-again",
                                  "short", "cancelled"};

bool Strike(const char* name) {
  if (!t_injection.struck) t_injection.struck_name = name;
  t_injection.struck = true;
  return true;
}

// The faults after which nothing works any more.
bool IsLasting(Fault fault) {
  return fault == Fault::kAllocationsFrom || fault == Fault::kAllFromAllocation ||
         fault == Fault::kAllFromCall;
}

bool TakesAllocationsAfterwards(Fault fault) {
  return fault == Fault::kAllFromCall && t_injection.struck;
}

bool TakesCallsAfterwards(Fault fault) {
  return fault == Fault::kAllFromAllocation && t_injection.struck;
}

// Whether the point is this call, by its number.
bool IsDue(long number) {
  const FaultPoint& point = t_injection.point;
  return IsLasting(point.fault) ? number >= point.number : number == point.number;
}

Verdict FailingVerdict(const CallKind& kind, int error) {
  Strike(kind.name);
  if (strcmp(kind.name, "unlink") == 0) t_injection.unlink_failed = true;
  if (strcmp(kind.name, "write") == 0) t_injection.write_failed = true;
  return {kind.done_anyway ? Verdict::kFailDone : Verdict::kFail, error};
}

}  // namespace

const char* FaultName(Fault fault) {
  return kNames[static_cast<int>(fault)];
}

Fault FaultNamed(const char* name) {
  if (strcmp(FaultName(Fault::kCancelled), name) == 0) return Fault::kCancelled;
  for (const Fault fault : kFaults) {
    if (strcmp(FaultName(fault), name) == 0) return fault;
  }
  return Fault::kNone;
}

bool CountsAllocations(Fault fault) {
  return fault == Fault::kAllocation || fault == Fault::kAllocationsFrom ||
         fault == Fault::kAllFromAllocation;
}

void StartRun(const FaultPoint& point) {
  t_injection.armed = false;
  t_injection.point = point;
  t_injection.struck = false;
  t_injection.struck_name = "";
  t_injection.allocations = 0;
  t_injection.calls = 0;
  t_injection.unlink_failed = false;
  t_injection.write_failed = false;
}

bool NextAllocationFails() {
  const long number = ++t_injection.allocations;
  const Fault fault = t_injection.point.fault;
  const bool due = CountsAllocations(fault) ? IsDue(number) : TakesAllocationsAfterwards(fault);
  return due && Strike("allocation");
}

Verdict NextCall(const CallKind& kind) {
  const long number = ++t_injection.calls;
  const Fault fault = t_injection.point.fault;
  const bool due = CountsAllocations(fault) ? TakesCallsAfterwards(fault) : IsDue(number);
  if (!due) return {Verdict::kPass, 0};
  if (fault == Fault::kCancelled) {
    Strike(kind.name);
    pthread_cancel(pthread_self());
    return {Verdict::kPass, 0};
  }
  if (fault == Fault::kShort) {
    if (kind.length < 0) return {Verdict::kPass, 0};
    Strike(kind.name);
    return {Verdict::kShort, 0};
  }
  if (fault == Fault::kInterrupted) return FailingVerdict(kind, EINTR);
  if (kind.only_signals) return {Verdict::kPass, 0};
  return FailingVerdict(kind, fault == Fault::kTryAgain ? EAGAIN : kind.error);
}
