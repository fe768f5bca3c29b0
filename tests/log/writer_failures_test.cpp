// The log writer when something fails, and what it leaves untouched.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <ctime>
#include <map>
#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"
#include "tests/support/syslog_capture.h"

namespace {

using ::testing::EndsWith;
using ::testing::IsEmpty;
using ::testing::MatchesRegex;
using ::testing::SizeIs;

constexpr int kErrorPriority = 3;
constexpr char kLogFolder[] = "/var/log/tarnwick";

void Write(LOG_TYPE type = LOG_TYPE_MAIN) {
  TWPrintf(type, "http", "warn", "name", 57, "Func", "message %d\n", 1);
}

// Empty logs, a system log of the test's own.
class WriterFailure : public ::testing::Test {
 protected:
  WriterFailure() {
    FreeDbgCfg();
    unlink(kMainLog);
    unlink(kNotificationLog);
  }
  ~WriterFailure() override {
    unlink(kMainLog);
    unlink(kNotificationLog);
  }

  void ExpectOneReport(const std::string& regex) {
    const std::vector<SyslogMessage> messages = syslog_.Take();
    ASSERT_THAT(messages, SizeIs(1));
    EXPECT_EQ(messages[0].priority, kErrorPriority);
    EXPECT_THAT(messages[0].text, MatchesRegex(regex));
  }

  SyslogCapture syslog_;
};

TEST_F(WriterFailure, Type2HasJustTheOpenMessageAndNoFileAccess) {
  Faults faults;
  Write(static_cast<LOG_TYPE>(2));
  EXPECT_EQ(faults.Count(Call::kOpen) + faults.Count(Call::kFopencookie), 0);
  EXPECT_THAT(ListFolder(kLogFolder), IsEmpty());
  ExpectOneReport(
      "twdebuglog:[0-9]+:TWPrintf\\(\\): open twlog file failed with errno \\[14\\]\\.");
}

TEST_F(WriterFailure, AnyOtherUndefinedTypeDoesTheSame) {
  for (const int type : {-1, 3, 2147483647, -2147483647 - 1}) {
    Write(static_cast<LOG_TYPE>(type));
    ExpectOneReport(
        "twdebuglog:[0-9]+:TWPrintf\\(\\): open twlog file failed with errno \\[14\\]\\.");
  }
  EXPECT_THAT(ListFolder(kLogFolder), IsEmpty());
}

TEST_F(WriterFailure, AFileThatCannotBeOpenedIsReportedToTheSystemLog) {
  Faults faults;
  faults.FailNth(Call::kOpen, 1, EACCES);
  Write();
  ExpectOneReport(
      "twdebuglog:[0-9]+:TWPrintf\\(\\): open twlog file failed with errno \\[13\\]\\.");
  EXPECT_EQ(faults.Count(Call::kFopencookie) + faults.Count(Call::kFlock), 0);
}

TEST_F(WriterFailure, AMissingDirectoryIsReportedWithItsErrno) {
  ASSERT_EQ(mkdir(kMainLog, 0700), 0);  // a directory where the file should be
  Write();
  ExpectOneReport(
      "twdebuglog:[0-9]+:TWPrintf\\(\\): open twlog file failed with errno \\[21\\]\\.");
  rmdir(kMainLog);
}

TEST_F(WriterFailure, AStreamThatCannotBeMadeIsReportedAndTheDescriptorClosed) {
  Write(static_cast<LOG_TYPE>(2));  // opens the connection to the system log
  syslog_.Take();
  DescriptorGuard descriptors;
  Faults faults;
  faults.FailNth(Call::kFopencookie, 1, ENOMEM);
  Write();
  ExpectOneReport(
      "twdebuglog:[0-9]+:TWPrintf\\(\\): fdopen twlog file failed with errno \\[12\\]\\.");
  EXPECT_EQ(ReadFile(kMainLog), "");
}

TEST_F(WriterFailure, WithoutTheLockTheLineIsLostInSilence) {
  DescriptorGuard descriptors;
  Faults faults;
  faults.FailNth(Call::kFlock, 1, ENOLCK);
  Write();
  EXPECT_EQ(ReadFile(kMainLog), "");
  EXPECT_THAT(syslog_.Take(), IsEmpty());
  EXPECT_EQ(faults.Count(Call::kFlock), 1);
}

TEST_F(WriterFailure, WriteErrorsAreIgnored) {
  DescriptorGuard descriptors;
  Faults faults;
  faults.FailFrom(Call::kAppend, 1);
  Write();
  EXPECT_THAT(syslog_.Take(), IsEmpty());
  EXPECT_EQ(ReadFile(kMainLog), "");
}

TEST_F(WriterFailure, AShortWriteIsGoneOnWith) {
  Faults faults;
  faults.Limit(Call::kAppend, 7);
  Write();
  EXPECT_THAT(ReadFile(kMainLog), EndsWith("message 1\n"));
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)), SizeIs(1));
}

TEST_F(WriterFailure, NoDescriptorIsLeftOpen) {
  DescriptorGuard descriptors;
  Write();
  Write(LOG_TYPE_NOTIFICATION);
}

TEST_F(WriterFailure, ErrnoStaysOnEveryPath) {
  for (const Call call :
       {Call::kOpen, Call::kFstat, Call::kFopencookie, Call::kFlock, Call::kGettimeofday,
        Call::kLocaltimeR, Call::kMalloc, Call::kClose, Call::kFclose}) {
    ForEachFailingCall(call, [](Faults&) {
      for (const int error : {0, ETIMEDOUT, EAGAIN}) {
        errno = error;
        Write();
        EXPECT_EQ(errno, error);
      }
    });
  }
}

TEST_F(WriterFailure, WithoutAClockTheLineHasTheEpoch) {
  Faults faults;
  faults.FailNth(Call::kGettimeofday, 1);
  Write();
  const time_t start = 0;
  char wanted[32];
  strftime(wanted, sizeof(wanted), "%b %e %T", localtime(&start));
  EXPECT_EQ(ParseLog(ReadFile(kMainLog)).at(0).time, wanted);
}

TEST_F(WriterFailure, ErrnoStaysForAnUndefinedTypeAndAFullDisk) {
  Faults faults;
  faults.FailFrom(Call::kAppend, 1);
  errno = ETIMEDOUT;
  Write();
  EXPECT_EQ(errno, ETIMEDOUT);
  Write(static_cast<LOG_TYPE>(2));
  EXPECT_EQ(errno, ETIMEDOUT);
}

TEST_F(WriterFailure, ErrnoStaysWithoutASystemLog) {
  unlink("/dev/log");
  errno = ETIMEDOUT;
  Write(static_cast<LOG_TYPE>(2));
  EXPECT_EQ(errno, ETIMEDOUT);
}

TEST_F(WriterFailure, TheLockIsHeldWhileTheLineIsWritten) {
  Faults faults;
  bool held = false;
  faults.Before(Call::kLocaltimeR, [&](int) {
    const int fd = open(kMainLog, O_WRONLY | O_CLOEXEC);
    held = flock(fd, LOCK_EX | LOCK_NB) == -1;
    close(fd);
  });
  Write();
  EXPECT_TRUE(held);
  EXPECT_EQ(faults.Count(Call::kFlock), 2);  // and released
}

TEST_F(WriterFailure, ALineWaitsForAnotherHolderOfTheLock) {
  WriteFile(kMainLog, "");
  const int fd = open(kMainLog, O_WRONLY | O_CLOEXEC);
  ASSERT_EQ(flock(fd, LOCK_EX), 0);
  Child writer([=] {
    close(fd);
    Write();
    return 0;
  });
  usleep(50000);
  EXPECT_EQ(ReadFile(kMainLog), "");
  flock(fd, LOCK_UN);
  EXPECT_EQ(writer.Wait().code, 0);
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)), SizeIs(1));
  close(fd);
}

// What a program lists that is started without a fork, of which the library would hear.
std::string ListDescriptorsOfASpawnedProgram() {
  FILE* program = popen("ls -l /proc/self/fd", "re");
  std::string listed;
  char piece[256];
  while (fgets(piece, sizeof(piece), program) != nullptr) listed += piece;
  EXPECT_EQ(pclose(program), 0);
  return listed;
}

TEST_F(WriterFailure, TheDescriptorDoesNotSurviveAnExec) {
  Faults faults;
  std::string listed;
  faults.Before(Call::kLocaltimeR, [&](int) { listed = ListDescriptorsOfASpawnedProgram(); });
  Write();
  EXPECT_NE(listed, "");
  EXPECT_EQ(listed.find("tarnwick.log"), std::string::npos) << listed;
}

}  // namespace
