// The owners that release what a function acquired.
#include "tarnwick/platform/file_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>

#include <cerrno>
#include <utility>

#include "tarnwick/platform/unique.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"

using namespace tarnwick;

namespace {

int OpenFile(const TempDir& directory) {
  return open(directory.File("lock").c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
}

bool CanLock(const TempDir& directory) {
  const UniqueFd other(OpenFile(directory));
  return flock(other.Get(), LOCK_EX | LOCK_NB) == 0;
}

TEST(FileLock, ExcludesOthersUntilTheScopeEnds) {
  TempDir directory;
  const UniqueFd fd(OpenFile(directory));
  {
    const FileLock lock(fd.Get());
    EXPECT_TRUE(lock.Held());
    EXPECT_FALSE(CanLock(directory));
  }
  EXPECT_TRUE(CanLock(directory));
}

TEST(FileLock, AnInterruptedWaitGoesOn) {
  TempDir directory;
  const UniqueFd fd(OpenFile(directory));
  Faults faults;
  faults.FailRange(Call::kFlock, 1, 3, EINTR);
  const FileLock lock(fd.Get());
  EXPECT_TRUE(lock.Held());
  EXPECT_EQ(faults.Count(Call::kFlock), 4);
}

TEST(FileLock, ALockThatCannotBeHadIsNotReleased) {
  TempDir directory;
  const UniqueFd fd(OpenFile(directory));
  Faults faults;
  faults.FailNth(Call::kFlock, 1, ENOLCK);
  {
    const FileLock lock(fd.Get());
    EXPECT_FALSE(lock.Held());
  }
  EXPECT_EQ(faults.Count(Call::kFlock), 1);
}

TEST(FileLock, ReleasingLeavesErrno) {
  TempDir directory;
  const UniqueFd fd(OpenFile(directory));
  FileLock lock(fd.Get());
  Faults faults;
  faults.FailNth(Call::kFlock, 1, ENOLCK);
  errno = ETIMEDOUT;
  lock.Unlock();
  EXPECT_EQ(errno, ETIMEDOUT);
}

TEST(UniqueFd, ClosesOnceAndLeavesErrno) {
  TempDir directory;
  const int fd = OpenFile(directory);
  Faults faults;
  faults.FailNth(Call::kClose, 1, EIO);
  errno = ETIMEDOUT;
  {
    UniqueFd first(fd);
    const UniqueFd second(std::move(first));
    EXPECT_TRUE(second.Valid());
  }
  EXPECT_EQ(faults.Count(Call::kClose), 1);
  EXPECT_EQ(errno, ETIMEDOUT);
  close(fd);  // the failed close was not a real one
}

TEST(UniqueFd, NoDescriptorIsNotClosed) {
  Faults faults;
  { const UniqueFd none(-1); }
  EXPECT_EQ(faults.Count(Call::kClose), 0);
}

}  // namespace
