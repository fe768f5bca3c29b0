// What a forked child does not inherit.
#include "tarnwick/platform/fork_guard.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <stdio_ext.h>
#include <sys/file.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>
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

TEST(ForkGuard, AForkInAnotherThreadWaitsForItsEnd) {
  const Flag held;
  const Flag forked;
  const Flag child_ended;
  bool forked_meanwhile = false;
  std::thread holder([&] {
    {
      const ForkGuard hold(ForkGuard::kDescriptor);
      held.Set();
      forked_meanwhile = forked.Wait(std::chrono::milliseconds(20));
    }
    child_ended.Wait();
  });
  EXPECT_TRUE(held.Wait());
  Child child([] { return 0; });
  forked.Set();
  EXPECT_EQ(child.Wait().code, 0);
  child_ended.Set();
  holder.join();
  EXPECT_FALSE(forked_meanwhile);
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
        good += RunInChild([] { return ForkGuard::LocksAreLost() ? 1 : 0; }).code == 0 ? 1 : 0;
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
