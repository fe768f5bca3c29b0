// The log writer: the bytes of a line.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>
#include <string>
#include <thread>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

std::string Pid() {
  return "[" + std::to_string(getpid()) + "]";
}

// 5 March 2024, 14:03:09.417 UTC.
timeval FifthOfMarch() {
  return {1709647389, 417999};
}

// The clock stands still, in UTC, and both logs are empty.
class Writer : public ::testing::Test {
 protected:
  Writer() {
    setenv("TZ", "UTC", 1);
    tzset();
    FreeDbgCfg();
    unlink(kMainLog);
    unlink(kNotificationLog);
    faults_.Clock(FifthOfMarch);
  }
  ~Writer() override { FreeDbgCfg(); }

  static std::string Main() { return ReadFile(kMainLog); }

  Faults faults_;
};

TEST_F(Writer, WithoutACategoryOrALevelNameThereAreNoTags) {
  TWPrintf(LOG_TYPE_MAIN, nullptr, "warn", "name", 57, "Func", "one\n");
  TWPrintf(LOG_TYPE_MAIN, "http", nullptr, "name", 57, "Func", "two\n");
  TWPrintf(LOG_TYPE_MAIN, nullptr, nullptr, "name", 57, "Func", "three\n");
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + " name:57:Func(): one\n" + "Mar  5 14:03:09 " +
                        Pid() + " name:57:Func(): two\n" + "Mar  5 14:03:09 " + Pid() +
                        " name:57:Func(): three\n");
}

TEST_F(Writer, AThreadOtherThanTheMainOnePrintsProcessAndThread) {
  long tid = 0;
  std::thread([&] {
    Faults faults;
    faults.Clock(FifthOfMarch);
    tid = syscall(SYS_gettid);
    TWPrintf(LOG_TYPE_MAIN, "http", "warn", "name", 57, "Func", "message\n");
  }).join();
  EXPECT_NE(tid, getpid());
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + "[" + std::to_string(tid) +
                        "][http][warn] name:57:Func(): message\n");
}

TEST_F(Writer, ASourceNameWithBothSeparatorsPrintsJustTheName) {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "dir/sub\\name", 1, "F", "x\n");
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + "[http][warn] name:1:F(): x\n");
}

TEST_F(Writer, WritesTheLineOfTheMainThread) {
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "twhttp", 1234, "SendRequest", "%s %d%%\n", "text", 5);
  EXPECT_EQ(Main(),
            "Mar  5 14:03:09 " + Pid() + "[http][warn] twhttp:1234:SendRequest(): text 5%\n");
}

TEST_F(Writer, MillisecondsAppearWhenTheRecordAsksForThem) {
  SharedRecord record;
  InitDbgCfg();
  record.SetTimeScale(true);
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "n", 1, "F", "x\n");
  record.SetTimeScale(false);
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "n", 1, "F", "y\n");
  FreeDbgCfg();
  record.SetTimeScale(true);
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "n", 1, "F", "z\n");
  EXPECT_EQ(Main(), "Mar  5 14:03:09.417 " + Pid() + "[http][warn] n:1:F(): x\n" +
                        "Mar  5 14:03:09 " + Pid() + "[http][warn] n:1:F(): y\n" +
                        "Mar  5 14:03:09 " + Pid() + "[http][warn] n:1:F(): z\n");
}

TEST_F(Writer, MillisecondsAreCutAndHaveThreeDigits) {
  SharedRecord record;
  InitDbgCfg();
  record.SetTimeScale(true);
  faults_.Clock([] { return timeval{1709647389, 7999}; });
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x\n");
  EXPECT_EQ(Main().substr(0, 20), "Mar  5 14:03:09.007 ");
}

TEST_F(Writer, TheTimeIsLocal) {
  setenv("TZ", "XXX-5:30", 1);
  tzset();
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x\n");
  setenv("TZ", "UTC", 1);
  tzset();
  EXPECT_EQ(Main().substr(0, 16), "Mar  5 19:33:09 ");
}

TEST_F(Writer, ADayOfTwoDigitsTakesBothPlaces) {
  faults_.Clock([] { return timeval{1735689599, 0}; });
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x\n");
  EXPECT_EQ(Main().substr(0, 16), "Dec 31 23:59:59 ");
}

TEST_F(Writer, WithoutALocalTimeTheTimeIsEmpty) {
  SharedRecord record;
  InitDbgCfg();
  record.SetTimeScale(true);
  faults_.FailNth(Call::kLocaltimeR, 1);
  TWPrintf(LOG_TYPE_MAIN, "http", "warn", "n", 1, "F", "x\n");
  EXPECT_EQ(Main(), " " + Pid() + "[http][warn] n:1:F(): x\n");
}

TEST_F(Writer, Type1GoesToTheNotificationLogAlone) {
  TWPrintf(LOG_TYPE_NOTIFICATION, "http", "warn", "n", 1, "F", "x\n");
  EXPECT_EQ(ReadFile("/var/log/tarnwick/twnotification.log"),
            "Mar  5 14:03:09 " + Pid() + "[http][warn] n:1:F(): x\n");
  EXPECT_FALSE(FileExists(kMainLog));
}

TEST_F(Writer, AppendsAndAddsNoLineFeed) {
  WriteFile(kMainLog, "before\n");
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x");
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "y\n");
  const std::string head = "Mar  5 14:03:09 " + Pid() + "[c][l] n:1:F(): ";
  EXPECT_EQ(Main(), "before\n" + head + "x" + head + "y\n");
}

TEST_F(Writer, ARotatedLogIsMadeAnew) {
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x\n");
  ASSERT_EQ(rename(kMainLog, "/var/log/tarnwick/tarnwick.log.1"), 0);
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "y\n");
  EXPECT_EQ(ParseLog(Main()).size(), 1u);
  EXPECT_EQ(ParseLog(ReadFile("/var/log/tarnwick/tarnwick.log.1")).size(), 1u);
  unlink("/var/log/tarnwick/tarnwick.log.1");
}

TEST_F(Writer, TheFileIsMadeWithMode0666LessTheUmask) {
  for (const mode_t mask : {0u, 022u, 077u}) {
    unlink(kMainLog);
    const mode_t before = umask(mask);
    TWPrintf(LOG_TYPE_MAIN, "c", "l", "n", 1, "F", "x\n");
    umask(before);
    struct stat status = {};
    ASSERT_EQ(stat(kMainLog, &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0666u & ~mask);
  }
}

TEST_F(Writer, TagsAreCutAt127Characters) {
  const std::string categ(100, 'c');
  const std::string level(100, 'l');
  TWPrintf(LOG_TYPE_MAIN, categ.c_str(), level.c_str(), "n", 1, "F", "x\n");
  const std::string tags = "[" + categ + "][" + level + "]";
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + tags.substr(0, 127) + " n:1:F(): x\n");
}

TEST_F(Writer, SourceFunctionAndMessageAreNotCut) {
  const std::string source(300, 's');
  const std::string function(300, 'f');
  const std::string message(100000, 'm');
  TWPrintf(LOG_TYPE_MAIN, "c", "l", source.c_str(), -7, function.c_str(), "%s\n", message.c_str());
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + "[c][l] " + source + ":-7:" + function +
                        "(): " + message + "\n");
}

TEST_F(Writer, PercentSignsInTheNamesAreText) {
  TWPrintf(LOG_TYPE_MAIN, "%s", "%n", "%d", 1, "%x", "%%\n");
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + "[%s][%n] %d:1:%x(): %\n");
}

TEST_F(Writer, ASourceThatEndsInASeparatorIsEmpty) {
  TWPrintf(LOG_TYPE_MAIN, "c", "l", "dir/", 1, "F", "x\n");
  EXPECT_EQ(Main(), "Mar  5 14:03:09 " + Pid() + "[c][l] :1:F(): x\n");
}

TEST(GetFileBaseName, ReturnsThePartAfterTheLastSeparatorOfEitherKind) {
  EXPECT_EQ(GetFileBaseName("name"), "name");
  EXPECT_EQ(GetFileBaseName("dir/name"), "name");
  EXPECT_EQ(GetFileBaseName("dir\\name"), "name");
  EXPECT_EQ(GetFileBaseName("dir/sub\\name"), "name");
  EXPECT_EQ(GetFileBaseName("dir\\sub/name.cpp"), "name.cpp");
  EXPECT_EQ(GetFileBaseName("/name"), "name");
}

TEST(GetFileBaseName, APathThatEndsInASeparatorReturnsAnEmptyString) {
  EXPECT_EQ(GetFileBaseName("dir/"), "");
  EXPECT_EQ(GetFileBaseName("dir\\"), "");
  EXPECT_EQ(GetFileBaseName("/"), "");
  EXPECT_EQ(GetFileBaseName(""), "");
}

}  // namespace
