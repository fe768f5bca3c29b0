// What a forked child does not inherit.
#include "tarnwick/platform/fork_guard.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <stdio_ext.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/platform/unique.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/flag.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

int OpenIn(const std::string& directory) {
  int count = 0;
  for (const auto& [fd, target] : OpenDescriptors())
    count += target.rfind(directory, 0) == 0 ? 1 : 0;
  return count;
}

using Clock = std::chrono::steady_clock;

// A fork does not wait longer than 100 milliseconds for a hold: what took longer on a busy machine
// tells nothing.
constexpr std::chrono::milliseconds kSurelyWaitedFor(90);
constexpr int kAttempts = 100;

// Holds in a thread while `other` runs in this one. Results: whether `other` has set `done` before
// the hold's end; nothing when that took too long.
template <typename Other>
std::optional<bool> DoneDuringAHold(const Flag& done, Other other) {
  const Flag held;
  const Flag ended;
  bool done_meanwhile = false;
  Clock::duration took{};
  std::thread holder([&] {
    {
      const ForkGuard hold(ForkGuard::kDescriptor);
      const Clock::time_point start = Clock::now();
      held.Set();
      done_meanwhile = done.Wait(std::chrono::milliseconds(20));
      took = Clock::now() - start;
    }
    ended.Wait();
  });
  EXPECT_TRUE(held.Wait());
  other();
  ended.Set();
  holder.join();
  if (took > kSurelyWaitedFor) return std::nullopt;
  return done_meanwhile;
}

TEST(ForkGuard, AForkInAnotherThreadWaitsForItsEnd) {
  std::optional<bool> forked_meanwhile;
  for (int i = 0; i < kAttempts && !forked_meanwhile; ++i) {
    const Flag forked;
    forked_meanwhile = DoneDuringAHold(forked, [&forked] {
      Child child([] { return 0; });
      forked.Set();
      EXPECT_EQ(child.Wait().code, 0);
    });
  }
  if (!forked_meanwhile) GTEST_SKIP() << "the machine is too busy";
  EXPECT_FALSE(*forked_meanwhile);
}

std::atomic<bool> g_is_forking{false};

// This thread has forked before, too, which leaves nothing.
TEST(ForkGuard, AHoldThatBeginsDuringAForkOfAnotherThreadWaitsForItsEnd) {
  static const int registered = pthread_atfork([] { g_is_forking = true; }, nullptr, nullptr);
  ASSERT_EQ(registered, 0);
  std::optional<bool> began_meanwhile;
  for (int i = 0; i < kAttempts && !began_meanwhile; ++i) {
    EXPECT_EQ(RunInChild([] { return 0; }).code, 0);
    g_is_forking = false;
    const Flag began;
    began_meanwhile = DoneDuringAHold(began, [&began] {
      std::thread forker([] { EXPECT_EQ(RunInChild([] { return 0; }).code, 0); });
      while (!g_is_forking) std::this_thread::yield();
      // The handler above runs a moment before the guard's own.
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
      const ForkGuard hold(ForkGuard::kDescriptor);
      began.Set();
      forker.join();
    });
  }
  if (!began_meanwhile) GTEST_SKIP() << "the machine is too busy";
  EXPECT_FALSE(*began_meanwhile);
}

TEST(ForkGuard, AThreadMayForkInItsOwnAndTheChildMayHoldAgain) {
  const ForkGuard hold(ForkGuard::kDescriptor);
  const ChildResult result = RunInChild([] {
    const ForkGuard again(ForkGuard::kLibraryLock);
    return RunInChild([] { return 0; }).code;
  });
  EXPECT_EQ(result.code, 0);
}

// Forks while another thread is in a hold that lasts until the child has ended. Results: the
// child's, of which the exit code is what it sees of lost locks.
ChildResult ForkBesideALongHold(ForkGuard::Kind kind) {
  const Flag held;
  const Flag child_ended;
  std::thread holder([&] {
    const ForkGuard hold(kind);
    held.Set();
    child_ended.Wait();
  });
  EXPECT_TRUE(held.Wait());
  const ChildResult result = RunInChild([] {
    const ForkGuard hold(ForkGuard::kDescriptor);
    return RunInChild([] { return ForkGuard::LocksAreLost() ? 1 : 0; }).code;
  });
  child_ended.Set();
  holder.join();
  return result;
}

TEST(ForkGuard, AForkDoesNotWaitForTheEndOfALongOne) {
  const ChildResult result = ForkBesideALongHold(ForkGuard::kDescriptor);
  EXPECT_FALSE(result.timed_out);
  EXPECT_EQ(result.code, 0);
}

TEST(ForkGuard, AChildOfALongOneKnowsThatLocksAreLost) {
  EXPECT_EQ(ForkBesideALongHold(ForkGuard::kLibraryLock).code, 1);
  EXPECT_FALSE(ForkGuard::LocksAreLost());
}

TEST(ForkGuard, AChildOfItsOwnThreadKnowsThatLocksAreLost) {
  const ForkGuard hold(ForkGuard::kLibraryLock);
  EXPECT_EQ(RunInChild([] { return ForkGuard::LocksAreLost() ? 1 : 0; }).code, 1);
}

TEST(ForkGuard, HoldsDoNotWaitForEachOther) {
  const ForkGuard hold(ForkGuard::kDescriptor);
  std::thread([] { const ForkGuard other(ForkGuard::kDescriptor); }).join();
}

TEST(ForkGuard, ThreadsMayForkAndHoldAtOnce) {
  std::vector<std::thread> threads;
  std::atomic<int> good{0};
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&good] {
      for (int round = 0; round < 50; ++round) {
        { const ForkGuard hold(ForkGuard::kLibraryLock); }
        const Clock::time_point start = Clock::now();
        const int lost = RunInChild([] { return ForkGuard::LocksAreLost() ? 1 : 0; }).code;
        const bool given_up = lost == 1 && Clock::now() - start > kSurelyWaitedFor;
        good += lost == 0 || given_up ? 1 : 0;
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(good, 200);
}

TEST(ForkClosedFile, OpensCreatesAndClosesAsOpenDoes) {
  const TempDir directory;
  const DescriptorGuard descriptors;
  {
    const ForkClosedFile file(directory.File("log").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    ASSERT_TRUE(file.Valid());
    EXPECT_EQ(write(file.Get(), "text", 4), 4);
  }
  EXPECT_EQ(ReadFile(directory.File("log")), "text");
}

TEST(ForkClosedFile, WithoutAPathOrADirectoryItIsNotValidAndErrnoIsSet) {
  errno = 0;
  EXPECT_FALSE(ForkClosedFile(nullptr, O_RDONLY, 0).Valid());
  EXPECT_EQ(errno, EFAULT);
  EXPECT_FALSE(ForkClosedFile("/nowhere/file", O_RDONLY, 0).Valid());
  EXPECT_EQ(errno, ENOENT);
}

TEST(ForkClosedFile, AChildHasNoneOfThoseThatAreOpen) {
  const TempDir directory;
  std::unique_ptr<ForkClosedFile> files[3];
  for (int i = 0; i < 3; ++i) {
    const std::string path = directory.File(std::to_string(i));
    files[i] = std::make_unique<ForkClosedFile>(path.c_str(), O_WRONLY | O_CREAT, 0600);
  }
  EXPECT_EQ(RunInChild([&] { return OpenIn(directory.Path()); }).code, 0);
  files[1].reset();
  EXPECT_EQ(RunInChild([&] { return OpenIn(directory.Path()); }).code, 0);
  EXPECT_EQ(OpenIn(directory.Path()), 2);
  files[2].reset();
  files[0].reset();
  EXPECT_EQ(OpenIn(directory.Path()), 0);
}

std::atomic<int> g_signals{0};
std::atomic<int> g_good_children{0};

void ForkInAHandler(int /*signal*/) {
  const int error = errno;
  const pid_t child = fork();
  if (child == 0) _exit(0);
  int status = 0;
  if (child > 0 && waitpid(child, &status, 0) == child && status == 0) ++g_good_children;
  ++g_signals;
  errno = error;
}

// The thread sanitizer sees here, too, that no two threads can wait for each other.
TEST(ForkClosedFile, ASignalHandlerMayForkAtAnyMomentOfAnOpenOrAClose) {
  const TempDir directory;
  const std::string path = directory.File("file");
  struct sigaction action = {};
  struct sigaction before = {};
  action.sa_handler = ForkInAHandler;
  ASSERT_EQ(sigaction(SIGALRM, &action, &before), 0);
  g_signals = g_good_children = 0;
  while (g_signals < 300) {
    const int signals = g_signals;
    // A pause of another length each time: an open and a close take some ten microseconds.
    ualarm(50 + static_cast<useconds_t>(signals) * 7 % 100, 0);
    while (g_signals == signals) {
      const ForkClosedFile file(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
      ASSERT_TRUE(file.Valid() || errno == EINTR);
    }
  }
  EXPECT_EQ(g_good_children, 300);
  sigaction(SIGALRM, &before, nullptr);
}

TEST(ForkClosedFile, ADescriptorThatWasClosedIsNotTakenFromAChild) {
  const TempDir directory;
  const std::string path = directory.File("file");
  { const ForkClosedFile closed(path.c_str(), O_WRONLY | O_CREAT, 0600); }
  const UniqueFd same_number(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(RunInChild([&] { return OpenIn(directory.Path()); }).code, 1);
}

TEST(ForkClosedFile, TheParentKeepsItsLockWhenAChildStarts) {
  const TempDir directory;
  const std::string path = directory.File("file");
  const ForkClosedFile file(path.c_str(), O_WRONLY | O_CREAT, 0600);
  ASSERT_EQ(flock(file.Get(), LOCK_EX), 0);
  EXPECT_EQ(RunInChild([] { return 0; }).code, 0);
  const UniqueFd other(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  EXPECT_EQ(flock(other.Get(), LOCK_EX | LOCK_NB), -1);
}

TEST(ForkClosedFile, ItsStreamWritesWhenItIsFlushedAndIsClosedWithIt) {
  const TempDir directory;
  const DescriptorGuard descriptors;
  char buffer[1024];
  ForkClosedFile file(directory.File("log").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  ASSERT_TRUE(file.MakeStream(buffer, sizeof(buffer)));
  fprintf(file.Stream(), "%s", "text");
  EXPECT_EQ(ReadFile(directory.File("log")), "");
  EXPECT_TRUE(file.Flush());
  EXPECT_EQ(ReadFile(directory.File("log")), "text");
}

TEST(ForkClosedFile, WhatCannotBeWrittenIsDropped) {
  char buffer[1024];
  ForkClosedFile file("/dev/full", O_WRONLY | O_CLOEXEC, 0);
  ASSERT_TRUE(file.MakeStream(buffer, sizeof(buffer)));
  fprintf(file.Stream(), "%s", "text");
  EXPECT_FALSE(file.Flush());
  EXPECT_EQ(__fpending(file.Stream()), 0u);
}

TEST(ForkClosedFile, AChildThatEndsWritesNothingOfItsStream) {
  const TempDir directory;
  char buffer[1024];
  ForkClosedFile file(directory.File("log").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  ASSERT_TRUE(file.MakeStream(buffer, sizeof(buffer)));
  fprintf(file.Stream(), "%s", "text");
  // The number of the closed descriptor is the next one that the child opens.
  const std::string other = directory.File("other");
  const auto open_and_exit = [&]() -> int {
    open(other.c_str(), O_WRONLY | O_CREAT, 0600);
    std::exit(0);
  };
  EXPECT_EQ(RunInChild(open_and_exit).code, 0);
  EXPECT_EQ(ReadFile(other), "");
  EXPECT_TRUE(file.Flush());
  EXPECT_EQ(ReadFile(directory.File("log")), "text");
}

TEST(ForkClosedFile, AStreamThatCannotBeMadeLeavesTheDescriptorToItsOwner) {
  const TempDir directory;
  const DescriptorGuard descriptors;
  Faults faults;
  faults.FailNth(Call::kFopencookie, 1, ENOMEM);
  char buffer[1024];
  ForkClosedFile file(directory.File("log").c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
  EXPECT_FALSE(file.MakeStream(buffer, sizeof(buffer)));
  EXPECT_EQ(errno, ENOMEM);
}

}  // namespace
