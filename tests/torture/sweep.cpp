#include "tests/torture/sweep.h"

#include <libxml/xmlerror.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <optional>
#include <thread>

#include "tests/http/http_test_util.h"
#include "tests/support/log_capture.h"
#include "tests/torture/peer_process.h"
#include "tests/torture/sweeper.h"
#include "tests/torture/system_calls.h"
#include "tests/torture/traces.h"

namespace {

// More mistakes of one operation are counted and not printed.
constexpr long kMostPrinted = 12;

// So many crashes end a sweep.
constexpr int kMostColdCrashes = 50;

// libxml2 would print thousands of its errors.
void IgnoreMessage(void* /*unused*/, const char* /*format*/, ...) {}

// A process that tortures an operation: its peer is there, its folders are covered.
struct Setting {
  const Operation& operation;
  const Selection& selection;
  int port;
  Progress* progress;
};

// Runs `action(sweeper)` on a thread whose calls are trapped, and waits for it.
template <typename Action>
void OnTrappedThread(const Setting& setting, Action action) {
  Watchdog watchdog(setting.operation, setting.selection.limit_seconds, setting.progress);
  std::thread([&] {
    t_injection.counting_blocks = true;
    xmlSetGenericErrorFunc(nullptr, IgnoreMessage);
    SweepRunner sweeper(setting.operation, setting.port, setting.progress, &watchdog);
    if (TrapSystemCalls()) {
      action(sweeper);
    } else {
      NoteMistake(setting.operation, "the kernel does not trap system calls", setting.progress);
    }
  }).join();
}

void SweepWarm(const Setting& setting) {
  OnTrappedThread(setting, [&](SweepRunner& sweeper) {
    if (sweeper.WarmUp()) sweeper.Make(setting.selection);
  });
}

enum class ColdRun { kReached, kMissed, kCrashed };

// A point's run in a process of its own. A crash is noted.
ColdRun TryColdPoint(const Setting& setting, const FaultPoint& point) {
  constexpr int kReached = 10;
  constexpr int kMissed = 11;
  Progress* const progress = setting.progress;
  progress->current = point;
  fflush(nullptr);
  const pid_t child = fork();
  if (child == 0) {
    bool reached = false;
    OnTrappedThread(setting, [&](SweepRunner& sweeper) { reached = sweeper.TryFirstRun(point); });
    _exit(reached ? kReached : kMissed);
  }
  int status = 0;
  waitpid(child, &status, 0);
  if (WIFEXITED(status) && WEXITSTATUS(status) == kReached) return ColdRun::kReached;
  if (WIFEXITED(status) && WEXITSTATUS(status) == kMissed) return ColdRun::kMissed;
  if (!progress->timed_out) NoteMistake(setting.operation, "crashes", progress);
  progress->timed_out = false;
  return ColdRun::kCrashed;
}

void SweepCold(const Setting& setting) {
  if (setting.selection.only_first) {
    TryColdPoint(setting, setting.selection.first);
    return;
  }
  TryColdPoint(setting, kNoPoint);
  int crashes = 0;
  for (const Fault fault : kFaults) {
    int misses = 0;
    for (long number = 1; misses < kMissesToEnd && crashes < kMostColdCrashes; ++number) {
      const ColdRun run = TryColdPoint(setting, {fault, number});
      misses = run == ColdRun::kMissed ? misses + 1 : 0;
      crashes += run == ColdRun::kCrashed ? 1 : 0;
    }
  }
}

}  // namespace

void NoteMistake(const Operation& operation, const char* mistake, Progress* progress) {
  ++progress->failures;
  if (progress->message[0] == '\0') {
    snprintf(progress->message, sizeof(progress->message), "%s", mistake);
  }
  if (progress->failures > kMostPrinted) return;
  const FaultPoint& point = progress->current;
  printf("FAILED %s --fault %s --point %ld%s: %s\n", operation.name, FaultName(point.fault),
         point.number, progress->cold ? " --cold" : "", mistake);
  fflush(stdout);
}

bool FaultSweep(const Operation& operation, const Selection& selection, Progress* progress) {
  if (!IsolateProcess()) {
    NoteMistake(operation, "the folders cannot be covered", progress);
    return false;
  }
  const PeerProcess peer(operation.peer);
  std::optional<TrustedAuthority> trusted;
  if (operation.peer == PeerKind::kTls) trusted.emplace(peer.CaFile());
  const LogCapture log;
  progress->cold = selection.cold;
  const Setting setting = {operation, selection, peer.Port(), progress};
  selection.cold ? SweepCold(setting) : SweepWarm(setting);
  progress->finished = true;
  return true;
}
