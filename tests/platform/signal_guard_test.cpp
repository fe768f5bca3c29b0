// A write to a closed connection, and the caller's own dealings with SIGPIPE.
#include "tarnwick/platform/signal_guard.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <unistd.h>

#include <cerrno>

#include "tests/support/process.h"

using namespace tarnwick;

namespace {

bool Blocked() {
  sigset_t mask;
  pthread_sigmask(SIG_SETMASK, nullptr, &mask);
  return sigismember(&mask, SIGPIPE) == 1;
}

bool Pending() {
  sigset_t pending;
  sigpending(&pending);
  return sigismember(&pending, SIGPIPE) == 1;
}

void BlockSigpipe() {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &set, nullptr);
}

// Writes to a pipe without a reader, as a guarded function does.
bool GuardedWriteBreaks() {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) return false;
  close(ends[0]);
  SignalGuard guard(SIGPIPE);
  const bool broken = write(ends[1], "x", 1) == -1 && errno == EPIPE;
  guard.DiscardPending();
  const bool errno_kept = errno == EPIPE;
  close(ends[1]);
  return broken && errno_kept;
}

// Each in a child: the signal's state belongs to the process, and a failing guard would end it.
void ExpectInChild(const std::function<bool()>& body) {
  const ChildResult result = RunInChild([&] {
    signal(SIGPIPE, SIG_DFL);
    return body() ? 0 : 1;
  });
  EXPECT_EQ(result.signal, 0);
  EXPECT_EQ(result.code, 0);
}

TEST(SignalGuard, ABrokenPipeIsAnErrorAndDoesNotEndTheProcess) {
  ExpectInChild([] { return GuardedWriteBreaks() && !Blocked() && !Pending(); });
}

TEST(SignalGuard, ACallersBlockStaysAndNothingIsLeftPending) {
  ExpectInChild([] {
    BlockSigpipe();
    return GuardedWriteBreaks() && Blocked() && !Pending();
  });
}

TEST(SignalGuard, ASignalThatWasPendingBeforeStaysPending) {
  ExpectInChild([] {
    BlockSigpipe();
    raise(SIGPIPE);
    return GuardedWriteBreaks() && Blocked() && Pending();
  });
}

TEST(SignalGuard, ACallersHandlerStaysAndIsNotCalled) {
  ExpectInChild([] {
    static volatile sig_atomic_t calls;
    calls = 0;
    const auto handler = [](int) { calls = calls + 1; };
    signal(SIGPIPE, handler);
    return GuardedWriteBreaks() && calls == 0 && signal(SIGPIPE, SIG_DFL) == +handler;
  });
}

TEST(SignalGuard, AnIgnoredSignalIsFineToo) {
  ExpectInChild([] {
    signal(SIGPIPE, SIG_IGN);
    return GuardedWriteBreaks() && !Pending();
  });
}

TEST(SignalGuard, OtherSignalsAreDeliveredInsideIt) {
  ExpectInChild([] {
    static volatile sig_atomic_t calls;
    calls = 0;
    signal(SIGUSR1, [](int) { calls = calls + 1; });
    SignalGuard guard(SIGPIPE);
    raise(SIGUSR1);
    return calls == 1;
  });
}

}  // namespace
