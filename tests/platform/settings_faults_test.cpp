// The settings file when calls fail, processes crash, and others read or write it at the same time.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "tarnwick/log/log_settings.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

using ::testing::AnyOf;
using ::testing::ElementsAre;
using ::testing::Eq;

constexpr char kFormat[] = "%s=\"%s\"\n";
constexpr char kOld[] = "# settings\nname=\"old\"\nother=\"x\"\n";
constexpr char kNew[] = "# settings\nname=\"new\"\nother=\"x\"\n";

// Inside the sandbox this directory lies in memory, so that thousands of rewrites are quick.
constexpr char kFolder[] = "/var/packages/Tarnwick/etc";
constexpr char kPath[] = "/var/packages/Tarnwick/etc/settings.conf";

class SettingsFile : public ::testing::Test {
 protected:
  SettingsFile() { WriteFile(kPath, kOld); }
  ~SettingsFile() override { unlink(kPath); }
};

int SetNew() {
  return QLIBCFileSetKeyValue(kPath, "name", "new", kFormat);
}

std::string Get(const char* key) {
  char value[4096] = "";
  const int length = QLIBCFileGetKeyValue(kPath, key, value, sizeof(value), 0);
  return length < 0 ? "unreadable" : value;
}

// Fails each call of one kind: the text is the old or the new one, as the result says, and nothing
// is left.
int ExpectAllOrNothing(Call call, bool may_succeed) {
  DescriptorGuard descriptors;
  return ForEachFailingCall(call, [&](Faults& faults) {
    WriteFile(kPath, kOld);
    errno = 0;
    const int result = SetNew();
    const int error = errno;
    EXPECT_EQ(ReadFile(kPath), result == 0 ? kNew : kOld);
    EXPECT_TRUE(result == 0 || faults.Struck());
    EXPECT_TRUE(result == -1 || !faults.Struck() || may_succeed);
    EXPECT_TRUE(result == 0 || error != 0);
    EXPECT_THAT(ListFolder(kFolder), ElementsAre("settings.conf"));
  });
}

TEST_F(SettingsFile, EachOpenMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kOpen, false), 3);
}
TEST_F(SettingsFile, TheLockMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kFlock, true), 1);
}
TEST_F(SettingsFile, EachReadMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kRead, false), 1);
}
TEST_F(SettingsFile, EachWriteMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kWrite, false), 1);
}
TEST_F(SettingsFile, TheAttributesMayBeUnreadable) {
  EXPECT_GE(ExpectAllOrNothing(Call::kFstat, false), 1);
}
TEST_F(SettingsFile, TheOwnerMayBeRefused) {
  EXPECT_GE(ExpectAllOrNothing(Call::kFchown, false), 1);
}
TEST_F(SettingsFile, TheModeMayBeRefused) {
  EXPECT_GE(ExpectAllOrNothing(Call::kFchmod, false), 1);
}
TEST_F(SettingsFile, TheRenamingMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kRename, false), 1);
}
// The directory's synchronisation comes after the renaming, which cannot be taken back.
TEST_F(SettingsFile, EachSynchronisationMayFail) {
  EXPECT_GE(ExpectAllOrNothing(Call::kFsync, true), 1);
}
TEST_F(SettingsFile, TheRemovalOfALeftoverMayFail) {
  ExpectAllOrNothing(Call::kUnlink, true);
}
TEST_F(SettingsFile, ALinkMayBeUnreadable) {
  const TempDir directory;
  const std::string link = directory.File("link");
  ASSERT_EQ(symlink(kPath, link.c_str()), 0);
  const int runs = ForEachFailingCall(Call::kReadlinkat, [&](Faults& faults) {
    WriteFile(kPath, kOld);
    const int result = QLIBCFileSetKeyValue(link.c_str(), "name", "new", kFormat);
    EXPECT_EQ(result, faults.Struck() ? -1 : 0);
    EXPECT_EQ(ReadFile(kPath), result == 0 ? kNew : kOld);
  });
  EXPECT_EQ(runs, 1);
}

TEST_F(SettingsFile, TheFilesOwnSynchronisationIsNotSkipped) {
  Faults faults;
  faults.FailNth(Call::kFsync, 1, EIO);
  EXPECT_EQ(SetNew(), -1);
  EXPECT_EQ(errno, EIO);
  EXPECT_EQ(ReadFile(kPath), kOld);
}

TEST_F(SettingsFile, TheTextIsSynchronisedBeforeItIsRenamed) {
  Faults faults;
  std::vector<std::string> order;
  faults.Before(Call::kWrite, [&](int) { order.emplace_back("write"); })
      .Before(Call::kFsync, [&](int) { order.emplace_back("fsync"); })
      .Before(Call::kRename, [&](int) { order.emplace_back("rename"); });
  EXPECT_EQ(SetNew(), 0);
  EXPECT_THAT(order, ElementsAre("write", "fsync", "rename", "fsync"));
}

TEST_F(SettingsFile, ShortWritesAndReadsAreContinued) {
  Faults faults;
  faults.Limit(Call::kWrite, 1).Limit(Call::kRead, 1);
  EXPECT_EQ(SetNew(), 0);
  EXPECT_EQ(ReadFile(kPath), kNew);
}

TEST_F(SettingsFile, SignalsDoNotSpoilIt) {
  for (const Call call : {Call::kRead, Call::kWrite, Call::kFlock}) {
    WriteFile(kPath, kOld);
    Faults faults;
    faults.FailNth(call, 1, EINTR);
    EXPECT_EQ(SetNew(), 0) << CallName(call);
    EXPECT_TRUE(faults.Struck());
    EXPECT_EQ(ReadFile(kPath), kNew);
  }
}

TEST_F(SettingsFile, AWriterThatDiesLeavesTheOldTextAndTheNextOneCleansUp) {
  for (const Call call : {Call::kWrite, Call::kFsync, Call::kRename}) {
    WriteFile(kPath, kOld);
    const ChildResult result = RunInChild([&] {
      Faults faults;
      faults.Before(call, [](int) { raise(SIGKILL); });
      return SetNew();
    });
    EXPECT_EQ(result.signal, SIGKILL);
    EXPECT_EQ(ReadFile(kPath), kOld) << CallName(call);
    EXPECT_EQ(SetNew(), 0);
    EXPECT_EQ(ReadFile(kPath), kNew);
    EXPECT_THAT(ListFolder(kFolder), ElementsAre("settings.conf"));
  }
}

TEST_F(SettingsFile, NoDescriptorSurvivesAnExec) {
  const std::map<int, std::string> before = OpenDescriptors();
  Faults faults;
  int seen = 0;
  faults.Before(Call::kFsync, [&](int) {
    for (const auto& [fd, target] : OpenDescriptors()) {
      if (before.count(fd) != 0) continue;
      ++seen;
      EXPECT_EQ(fcntl(fd, F_GETFD), FD_CLOEXEC) << target;
    }
  });
  EXPECT_EQ(SetNew(), 0);
  EXPECT_GE(seen, 2);  // the new file and the lock
}

// Rewrites one key with a short and a long value in turn.
int RewriteInTurn(int rounds) {
  const std::string values[] = {"short", std::string(3000, 'L')};
  for (int i = 0; i < rounds; ++i) {
    if (QLIBCFileSetKeyValue(kPath, "name", values[i % 2].c_str(), kFormat) != 0) return 1;
  }
  return 0;
}

TEST_F(SettingsFile, AReaderNeverSeesAHalfWrittenFile) {
  ASSERT_EQ(RewriteInTurn(1), 0);
  Child writer([] { return RewriteInTurn(2000); });
  for (int i = 0; i < 5000; ++i) {
    ASSERT_THAT(Get("name"), AnyOf(Eq("short"), Eq(std::string(3000, 'L'))));
    ASSERT_EQ(Get("other"), "x");
  }
  EXPECT_EQ(writer.Wait().code, 0);
}

// A writer process with a key of its own, counting up.
int CountUp(int key, int rounds, bool locks) {
  const std::string name = "key" + std::to_string(key);
  for (int i = 1; i <= rounds; ++i) {
    const std::string value = std::to_string(i);
    const int result = locks ? WriteSettingValue(kPath, name.c_str(), value.c_str(), kFormat)
                             : QLIBCFileSetKeyValue(kPath, name.c_str(), value.c_str(), kFormat);
    if (result != 0 || Get(name.c_str()) != value) return 1;
  }
  return 0;
}

void ExpectNoKeyLost(bool (*locks)(int writer)) {
  constexpr int kWriters = 6;
  constexpr int kRounds = 150;
  std::vector<std::unique_ptr<Child>> writers;
  for (int key = 0; key < kWriters; ++key) {
    writers.push_back(std::make_unique<Child>([=] { return CountUp(key, kRounds, locks(key)); }));
  }
  for (const auto& writer : writers) EXPECT_EQ(writer->Wait().code, 0);
  for (int key = 0; key < kWriters; ++key) {
    EXPECT_EQ(Get(("key" + std::to_string(key)).c_str()), std::to_string(kRounds));
  }
  EXPECT_EQ(Get("other"), "x");
  EXPECT_THAT(ListFolder(kFolder), ElementsAre("settings.conf"));
}

TEST_F(SettingsFile, ConcurrentWritersThatLockLoseNoKey) {
  ExpectNoKeyLost([](int) { return true; });
}

TEST_F(SettingsFile, ConcurrentWritersThatDoNotLockLoseNoKey) {
  ExpectNoKeyLost([](int) { return false; });
}

TEST_F(SettingsFile, WritersThatLockAndWritersThatDoNotLoseNoKey) {
  ExpectNoKeyLost([](int writer) { return writer % 2 == 0; });
}

TEST_F(SettingsFile, AMissingFileAndConcurrentWritersLoseNoKey) {
  unlink(kPath);
  std::vector<std::unique_ptr<Child>> writers;
  for (int key = 0; key < 4; ++key) {
    writers.push_back(std::make_unique<Child>([=] { return CountUp(key, 20, key % 2 == 0); }));
  }
  for (const auto& writer : writers) EXPECT_EQ(writer->Wait().code, 0);
  for (int key = 0; key < 4; ++key) EXPECT_EQ(Get(("key" + std::to_string(key)).c_str()), "20");
}

TEST_F(SettingsFile, AReaderDoesNotWaitForAWriter) {
  const int fd = open(kPath, O_RDONLY | O_CLOEXEC);
  const int directory = open(kFolder, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  ASSERT_EQ(flock(fd, LOCK_EX), 0);
  ASSERT_EQ(flock(directory, LOCK_EX), 0);
  EXPECT_EQ(Get("name"), "old");
  close(directory);
  close(fd);
}

}  // namespace
