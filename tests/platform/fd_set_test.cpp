// Descriptor sets beyond the system's 1,024.
#include "tarnwick/platform/fd_set.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <unistd.h>

#include "tests/support/faults.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

TEST(FdSet, HoldsItsDescriptorWhateverTheNumber) {
  for (const int fd : {0, 1, 63, 64, 1022, 1023, 1024, 1025, 4095, 4096, 100000}) {
    FdSet set(fd);
    ASSERT_TRUE(set.Valid());
    EXPECT_FALSE(set.Contains()) << fd;
    set.Fill();
    EXPECT_TRUE(set.Contains()) << fd;
    EXPECT_EQ(set.Count(), fd + 1);
  }
}

TEST(FdSet, ASmallDescriptorAllocatesNothing) {
  Faults faults;
  FdSet set(1023);
  set.Fill();
  EXPECT_EQ(faults.Count(Call::kMalloc) + faults.Count(Call::kCalloc), 0);
}

TEST(FdSet, WithoutMemoryALargeDescriptorsSetIsNotValid) {
  EXPECT_EQ(ForEachFailingCall(Call::kCalloc,
                               [](Faults& faults) {
                                 const FdSet set(1024);
                                 EXPECT_EQ(set.Valid(), !faults.Struck());
                               }),
            1);
}

// A pipe whose reading end has the number `fd`.
class PipeAt {
 public:
  explicit PipeAt(int fd) : fd_(fd) {
    rlimit limit = {};
    getrlimit(RLIMIT_NOFILE, &limit);
    if (limit.rlim_cur <= static_cast<rlim_t>(fd)) {
      limit.rlim_cur = static_cast<rlim_t>(fd) + 1;
      if (limit.rlim_max < limit.rlim_cur) limit.rlim_max = limit.rlim_cur;
      EXPECT_EQ(setrlimit(RLIMIT_NOFILE, &limit), 0);
    }
    int ends[2];
    EXPECT_EQ(pipe2(ends, O_CLOEXEC), 0);
    EXPECT_EQ(dup2(ends[0], fd), fd);
    close(ends[0]);
    writer_ = ends[1];
  }
  ~PipeAt() {
    close(fd_);
    close(writer_);
  }
  PipeAt(const PipeAt&) = delete;
  PipeAt& operator=(const PipeAt&) = delete;

  void Write() const { EXPECT_EQ(write(writer_, "x", 1), 1); }

 private:
  int fd_;
  int writer_;
};

void ExpectSelectWorks(int fd) {
  SCOPED_TRACE(fd);
  const PipeAt pipe(fd);
  FdSet set(fd);
  set.Fill();
  timeval at_once = {0, 0};
  EXPECT_EQ(select(set.Count(), set.Get(), nullptr, nullptr, &at_once), 0);
  EXPECT_FALSE(set.Contains());
  pipe.Write();
  set.Fill();
  EXPECT_EQ(select(set.Count(), set.Get(), nullptr, nullptr, &at_once), 1);
  EXPECT_TRUE(set.Contains());
}

TEST(FdSet, SelectWorksBelow1024) {
  for (const int fd : {900, 1023}) ExpectSelectWorks(fd);
}

TEST(FdSet, SelectWorksAbove1024) {
  if (IsEmulated()) GTEST_SKIP() << kNoHighSelect;
  for (const int fd : {1024, 2000}) ExpectSelectWorks(fd);
}

}  // namespace
