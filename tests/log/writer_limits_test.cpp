// The log writer where 32 bits end: the size of the file and the seconds of the clock.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <string>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

static_assert(sizeof(off_t) == 8, "files may be larger than 2 GiB on either word size");

void Write() {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "name", 57, "Func", "message\n");
}

int64_t LogSize() {
  struct stat status = {};
  return stat(kMainLog, &status) == 0 ? status.st_size : -1;
}

// The bytes of the log from `start` on.
std::string LogFrom(int64_t start) {
  char text[256];
  const int fd = open(kMainLog, O_RDONLY | O_CLOEXEC);
  const ssize_t count = pread(fd, text, sizeof(text), start);
  close(fd);
  return std::string(text, count > 0 ? static_cast<size_t>(count) : 0);
}

class WriterLimits : public ::testing::Test {
 protected:
  WriterLimits() {
    setenv("TZ", "UTC", 1);
    tzset();
    FreeDbgCfg();
    unlink(kMainLog);
  }
  ~WriterLimits() override { unlink(kMainLog); }
};

TEST_F(WriterLimits, ALogOfMoreThanTwoGibibytesIsStillWritten) {
  constexpr int64_t kTwoGibibytes = int64_t{1} << 31;
  for (const int64_t size : {kTwoGibibytes - 10, kTwoGibibytes, 2 * kTwoGibibytes + 1}) {
    WriteFile(kMainLog, "");
    ASSERT_EQ(truncate(kMainLog, size), 0);  // a hole takes no space
    Write();
    const std::string line = LogFrom(size);
    EXPECT_EQ(line.substr(line.find(']')), "][http][warn] name:57:Func(): message\n");
    EXPECT_EQ(LogSize(), size + static_cast<int64_t>(line.size()));
  }
}

// The time of a line that is written at `seconds`.
std::string TimeAt(int64_t seconds) {
  Faults faults;
  faults.Clock([seconds] { return timeval{static_cast<time_t>(seconds), 0}; });
  unlink(kMainLog);
  Write();
  return ReadFile(kMainLog).substr(0, 15);
}

TEST_F(WriterLimits, TheClockMayPassTheEndOf32BitSeconds) {
  EXPECT_EQ(TimeAt(INT32_MAX), "Jan 19 03:14:07");
  // A clock of 32 bits starts again in 1901.
  EXPECT_EQ(TimeAt(int64_t{INT32_MAX} + 1),
            sizeof(time_t) == 8 ? "Jan 19 03:14:08" : "Dec 13 20:45:52");
}

TEST_F(WriterLimits, TheClockMayStandBeforeTheEpoch) {
  EXPECT_EQ(TimeAt(-1), "Dec 31 23:59:59");
  EXPECT_EQ(TimeAt(INT32_MIN), "Dec 13 20:45:52");
}

}  // namespace
