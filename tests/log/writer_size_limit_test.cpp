// A log that has reached the process's file size limit.
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/resource.h>
#include <unistd.h>

#include <cerrno>
#include <functional>
#include <string>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

constexpr rlim_t kLimit = 100;

void Write() {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "name", 57, "Func", "message\n");
}

bool IsPendingOrBlocked() {
  sigset_t set;
  sigpending(&set);
  if (sigismember(&set, SIGXFSZ) == 1) return true;
  pthread_sigmask(SIG_SETMASK, nullptr, &set);
  return sigismember(&set, SIGXFSZ) == 1;
}

// A log that has room for a part of a line. The limit is a child's, in which `body` runs.
class WriterSizeLimit : public ::testing::Test {
 protected:
  WriterSizeLimit() {
    FreeDbgCfg();
    WriteFile(kMainLog, std::string(kLimit - 10, 'x'));
  }
  ~WriterSizeLimit() override { unlink(kMainLog); }

  void ExpectInChild(const std::function<bool()>& body) {
    const ChildResult result = RunInChild([&] {
      const struct rlimit limit = {kLimit, RLIM_INFINITY};
      setrlimit(RLIMIT_FSIZE, &limit);
      signal(SIGXFSZ, SIG_DFL);
      const bool good = body();
      // What counts lines writes a file when the child ends.
      const struct rlimit none = {RLIM_INFINITY, RLIM_INFINITY};
      setrlimit(RLIMIT_FSIZE, &none);
      return good ? 0 : 1;
    });
    EXPECT_EQ(result.signal, 0);
    EXPECT_EQ(result.code, 0);
  }
};

TEST_F(WriterSizeLimit, CutsTheLineAndDoesNotEndTheProcess) {
  ExpectInChild([] {
    Write();
    Write();
    return true;
  });
  EXPECT_EQ(ReadFile(kMainLog).size(), kLimit);
}

TEST_F(WriterSizeLimit, LeavesErrnoAndTheSignalAsTheyWere) {
  ExpectInChild([] {
    errno = ETIMEDOUT;
    Write();
    return errno == ETIMEDOUT && !IsPendingOrBlocked();
  });
}

TEST_F(WriterSizeLimit, CutsALineThatGoesOutInSeveralWrites) {
  const std::string longer(10000, 'm');
  ExpectInChild([&] {
    TWPrintf(LOG_TYPE_MAIN, "http", "warn", "name", 57, "Func", "%s\n", longer.c_str());
    return !IsPendingOrBlocked();
  });
  EXPECT_EQ(ReadFile(kMainLog).size(), kLimit);
}

TEST_F(WriterSizeLimit, LinesGoOnInANewFile) {
  ExpectInChild([] {
    Write();
    unlink(kMainLog);
    Write();
    return true;
  });
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).size(), 1u);
}

}  // namespace
