// What stands in the place of the log's directory, and files that others have put at its path.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/planted.h"
#include "tests/support/process.h"
#include "tests/support/syslog_capture.h"

namespace {

using std::chrono::seconds;
using ::testing::EndsWith;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr char kAbove[] = "/var/log";
constexpr char kFolder[] = "/var/log/tarnwick";
constexpr char kTarget[] = "/var/log/target";
constexpr char kTargetText[] = "of another program\n";
constexpr uid_t kOther = 65534;
constexpr int kSkipped = 2;

void Write(LOG_TYPE type = LOG_TYPE_MAIN) {
  TWPrintf(type, "http", "warn", "name", 57, "Func", "message\n");
}

// Both files, with errno kept.
void WriteBoth() {
  DescriptorGuard descriptors;
  errno = ETIMEDOUT;
  Write();
  Write(LOG_TYPE_NOTIFICATION);
  EXPECT_EQ(errno, ETIMEDOUT);
}

class LogOfOthers : public ::testing::Test {
 protected:
  LogOfOthers() {
    FreeDbgCfg();
    Clear();
    Write(static_cast<LOG_TYPE>(2));  // opens the connection to the system log, which stays
    syslog_.Take();
  }
  ~LogOfOthers() override { Clear(); }

  static void Clear() {
    for (const std::string& name : ListFolder(kFolder)) {
      unlink((std::string(kFolder) + "/" + name).c_str());
    }
  }

  void ExpectReports(size_t count, int error) {
    const std::vector<SyslogMessage> messages = syslog_.Take();
    ASSERT_THAT(messages, SizeIs(count));
    for (const SyslogMessage& message : messages) {
      EXPECT_THAT(message.text,
                  EndsWith("open twlog file failed with errno [" + std::to_string(error) + "]."));
    }
  }

  SyslogCapture syslog_;
};

class PlantedLog : public LogOfOthers, public ::testing::WithParamInterface<PlantedKind> {};

// An empty directory above the logs' one, in which this process alone sees what it makes.
bool CoverTheFolderAbove() {
  return unshare(CLONE_NEWNS) == 0 &&
         mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount("tmpfs", kAbove, "tmpfs", 0, "mode=755") == 0;
}

int WriteBelow(const PlantedKind& kind) {
  if (!CoverTheFolderAbove()) return kSkipped;
  WriteFile(kTarget, kTargetText);
  if (!kind.plant(kFolder, kTarget)) return kSkipped;
  WriteBoth();
  EXPECT_EQ(ReadFile(kTarget), kTargetText);
  EXPECT_THAT(ListFolder(kAbove), SizeIs(2));
  return 0;
}

TEST_P(PlantedLog, InThePlaceOfTheDirectoryItIsReportedAndNeitherWaitedForNorWritten) {
  const ChildResult result = RunInChild([] { return WriteBelow(GetParam()); }, seconds(10));
  ASSERT_FALSE(result.timed_out) << "a line waits";
  if (result.code == kSkipped) GTEST_SKIP() << "it cannot be made here";
  EXPECT_EQ(result.code, 0);
  ExpectReports(2, GetParam().below);
}

INSTANTIATE_TEST_SUITE_P(Kinds, PlantedLog, ::testing::ValuesIn(PlantedKinds()));

TEST_F(LogOfOthers, AMissingDirectoryIsReportedAndNotMade) {
  const ChildResult result = RunInChild([] {
    if (!CoverTheFolderAbove()) return kSkipped;
    WriteBoth();
    EXPECT_THAT(ListFolder(kAbove), IsEmpty());
    return 0;
  });
  if (result.code == kSkipped) GTEST_SKIP() << "nothing can be mounted here";
  EXPECT_EQ(result.code, 0);
  ExpectReports(2, ENOENT);
}

TEST_F(LogOfOthers, LinksInACircleAreReported) {
  ASSERT_EQ(symlink(kMainLog, kMainLog), 0);
  Write();
  ExpectReports(1, ELOOP);
}

TEST_F(LogOfOthers, ALinkIntoAMissingDirectoryIsReported) {
  ASSERT_EQ(symlink("/no/such/folder/file", kMainLog), 0);
  Write();
  ExpectReports(1, ENOENT);
}

TEST_F(LogOfOthers, AFileWithoutRightsIsReportedByAnotherUser) {
  WriteFile(kMainLog, "");
  ASSERT_EQ(chmod(kMainLog, 0), 0);
  const ChildResult result = RunInChild([] {
    if (setgid(kOther) != 0 || setuid(kOther) != 0) return kSkipped;
    Write();
    return 0;
  });
  if (result.code == kSkipped) GTEST_SKIP() << "only one user in this namespace";
  EXPECT_EQ(ReadFile(kMainLog), "");
  ExpectReports(1, EACCES);
}

TEST_F(LogOfOthers, AHugeSparseFileGetsTheLineAtItsEndAndNothingElse) {
  constexpr off_t kSize = off_t{1} << 40;
  WriteFile(kMainLog, "");
  if (truncate(kMainLog, kSize) != 0) GTEST_SKIP() << "this file system has no such files";
  Write();
  EXPECT_THAT(syslog_.Take(), IsEmpty());
  struct stat state = {};
  ASSERT_EQ(stat(kMainLog, &state), 0);
  EXPECT_GT(state.st_size, kSize);
  EXPECT_LT(state.st_size, kSize + 200);
  EXPECT_LT(state.st_blocks, 64);  // of 512 bytes
}

}  // namespace
