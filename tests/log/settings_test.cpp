// The record's way from and to the settings file.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>
#include <string>
#include <vector>

#include "tarnwick/log/log_settings.h"
#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kFolder[] = "/var/packages/Tarnwick/etc";
constexpr char kPath[] = "/var/packages/Tarnwick/etc/settings.conf";

std::string Repeat(const std::string& text, int count) {
  std::string repeated;
  for (int i = 0; i < count; ++i) repeated += text;
  return repeated;
}

std::string Joined(const std::string& number, int count) {
  return Repeat(number + ",", count - 1) + number;
}

class Settings : public ::testing::Test {
 protected:
  Settings() {
    unlink(kPath);
    unlink(kMainLog);
    memset(static_cast<void*>(&guarded_), 0x55, sizeof(guarded_));
  }
  ~Settings() override {
    unlink(kPath);
    for (const int guard : guarded_.after) EXPECT_EQ(guard, 0x55555555);
    EXPECT_FALSE(FileExists(kMainLog)) << "nothing of this logs";
  }

  static void Start(const std::string& levels, const std::string& time_scale) {
    WriteFile(kPath, "tw_dbglog_settings=\"" + levels + "\"\ntw_dbglog_time_scale=\"" + time_scale +
                         "\"\n");
  }
  TWDbgLogCfg& Record() { return guarded_.record; }
  int Level(int categ) { return Record().Level(static_cast<LOG_CATEG>(categ)); }
  void ExpectLevels(int first, int end, int level) {
    for (int categ = first; categ < end; ++categ) EXPECT_EQ(Level(categ), level) << categ;
  }

  struct {
    TWDbgLogCfg record;
    int after[64];
  } guarded_;
};

TEST_F(Settings, AnEmptyFieldIsSkipped) {
  Start("5,,7", "no");
  EXPECT_EQ(Record().Init(0), 0);
  EXPECT_EQ(Level(0), 5);
  EXPECT_EQ(Level(1), 7);
  ExpectLevels(2, 74, 3);
}

TEST_F(Settings, FewerNumbersChangeTheFirstLevelsOnly) {
  Start("1,2,4", "no");
  for (int categ = 0; categ < 74; ++categ) Record().SetLevel(static_cast<LOG_CATEG>(categ), 6);
  EXPECT_EQ(Record().LoadDbgLogSettings(), 0);
  EXPECT_EQ(Level(0), 1);
  EXPECT_EQ(Level(1), 2);
  EXPECT_EQ(Level(2), 4);
  ExpectLevels(3, 74, 6);
}

TEST_F(Settings, AFlagInUpperCaseIsFalse) {
  Start("3", "YES");
  Record().SetTimeScale(true);
  EXPECT_EQ(Record().LoadDbgLogSettings(), 0);
  EXPECT_FALSE(Record().TimeScale());
}

TEST_F(Settings, AFreshRecordIsSavedAs74ThreesAndNo) {
  EXPECT_EQ(Record().Init(0), -1);  // there is no file yet
  EXPECT_EQ(Record().SaveDbgLogSettings(), 0);
  EXPECT_EQ(ReadFile(kPath),
            "tw_dbglog_settings=\"" + Joined("3", 74) + "\"\ntw_dbglog_time_scale=\"no\"\n");
}

TEST_F(Settings, InitResetsTheRecordWhateverItsArgument) {
  for (const int argument : {0, 1, -1}) {
    Record().SetTimeScale(true);
    Record().SetLevel(LOG_CATEG_WEB, 7);
    EXPECT_EQ(Record().Init(argument), -1);
    EXPECT_FALSE(Record().TimeScale());
    ExpectLevels(0, 74, 3);
  }
}

TEST_F(Settings, All74LevelsAreLoadedInTheirOrder) {
  std::string levels = "0";
  for (int categ = 1; categ < 74; ++categ) levels += "," + std::to_string(categ);
  Start(levels, "yes");
  EXPECT_EQ(Record().Init(0), 0);
  for (int categ = 0; categ < 74; ++categ) EXPECT_EQ(Level(categ), categ);
  EXPECT_TRUE(Record().TimeScale());
}

TEST_F(Settings, NumbersAfterThe74thAreIgnored) {
  Start(Joined("4", 74) + "," + Joined("9", 60), "no");
  EXPECT_EQ(Record().Init(0), 0);
  ExpectLevels(0, 74, 4);  // and the memory after the record is checked at the end
}

TEST_F(Settings, TextThatIsNoNumberIsZeroAndTrailingTextIsIgnored) {
  Start("x, 5,6z,-2,+4,", "no");
  EXPECT_EQ(Record().Init(0), 0);
  const int expected[] = {0, 5, 6, -2, 4, 3};
  for (int categ = 0; categ < 6; ++categ) EXPECT_EQ(Level(categ), expected[categ]);
}

TEST_F(Settings, AValueLongerThan1023BytesIsCutThere) {
  Start(Joined("00000000000000000005", 74), "no");
  EXPECT_EQ(Record().Init(0), 0);
  ExpectLevels(0, 48, 5);   // 48 times 21 bytes
  ExpectLevels(48, 49, 0);  // the 49th number lost its end
  ExpectLevels(49, 74, 3);
}

TEST_F(Settings, OnlyYesSetsTheFlag) {
  for (const char* text : {"yes", "Yes", "yes ", "y", "1", "true", "no", "yesyesyes"}) {
    Start("3", text);
    Record().SetTimeScale(false);
    EXPECT_EQ(Record().LoadDbgLogSettings(), 0);
    EXPECT_EQ(Record().TimeScale(), std::string(text) == "yes") << text;
  }
}

TEST_F(Settings, WithoutTheLevelsKeyTheLevelsStayAndTheFlagIsLoaded) {
  WriteFile(kPath, "tw_dbglog_time_scale=\"yes\"\n");
  EXPECT_EQ(Record().Init(0), -1);
  ExpectLevels(0, 74, 3);
  EXPECT_TRUE(Record().TimeScale());
}

TEST_F(Settings, WithoutTheFlagsKeyTheLevelsAreLoadedAndTheFlagStays) {
  WriteFile(kPath, "tw_dbglog_settings=\"7\"\n");
  Record().SetTimeScale(true);
  EXPECT_EQ(Record().LoadDbgLogSettings(), -1);
  EXPECT_EQ(Level(0), 7);
  EXPECT_TRUE(Record().TimeScale());
}

TEST_F(Settings, EmptyValuesCountAsMissing) {
  Start("", "yes");
  EXPECT_EQ(Record().Init(0), -1);
  ExpectLevels(0, 74, 3);
  Start("5", "");
  EXPECT_EQ(Record().Init(0), -1);
  EXPECT_EQ(Level(0), 5);
}

TEST_F(Settings, AFileThatCannotBeReadReturnsMinusOneAndLeavesTheRecord) {
  Start("5", "yes");
  EXPECT_EQ(
      ForEachFailingCall(Call::kOpen,
                         [this](Faults& faults) {
                           memset(static_cast<void*>(&Record()), 0, sizeof(Record()));
                           const int result = Record().LoadDbgLogSettings();
                           EXPECT_EQ(result, faults.Struck() ? -1 : 0);
                           EXPECT_TRUE(Record().Level(LOG_CATEG_ACCOUNT) == 5 || faults.Struck());
                         }),
      2);
}

TEST_F(Settings, WhatWasSavedIsLoaded) {
  for (int categ = 0; categ < 74; ++categ) {
    Record().SetLevel(static_cast<LOG_CATEG>(categ), categ % 9 - 1);
  }
  Record().SetTimeScale(true);
  EXPECT_EQ(Record().SaveDbgLogSettings(), 0);
  TWDbgLogCfg loaded;
  EXPECT_EQ(loaded.Init(0), 0);
  for (int categ = 0; categ < 74; ++categ) {
    EXPECT_EQ(loaded.Level(static_cast<LOG_CATEG>(categ)), categ % 9 - 1);
  }
  EXPECT_TRUE(loaded.TimeScale());
}

TEST_F(Settings, SavingKeepsOtherKeysAndWritesYesAndNegativeLevels) {
  WriteFile(kPath, "# product\nvolume=\"/volume1\"\n");
  Record().Init(0);
  Record().SetLevel(LOG_CATEG_ACCOUNT, -1);
  Record().SetTimeScale(true);
  EXPECT_EQ(Record().SaveDbgLogSettings(), 0);
  EXPECT_EQ(ReadFile(kPath), "# product\nvolume=\"/volume1\"\ntw_dbglog_settings=\"-1," +
                                 Joined("3", 73) + "\"\ntw_dbglog_time_scale=\"yes\"\n");
}

TEST_F(Settings, TheFlagIsSavedAlsoWhenTheLevelsWereNot) {
  Record().Init(0);
  Faults faults;
  faults.FailNth(Call::kOpen, 1, EACCES);
  EXPECT_EQ(Record().SaveDbgLogSettings(), -1);
  EXPECT_EQ(ReadFile(kPath), "tw_dbglog_time_scale=\"no\"\n");
}

TEST_F(Settings, EachFailingCallOfSavingReturnsMinusOneAndKeepsTheRecord) {
  Record().Init(0);
  Record().SetLevel(LOG_CATEG_HTTP, 6);
  DescriptorGuard descriptors;
  for (const Call call : {Call::kOpen, Call::kFlock, Call::kWrite, Call::kRename}) {
    const int runs = ForEachFailingCall(call, [this](Faults& faults) {
      WriteFile(kPath, "other=\"x\"\n");
      const int result = Record().SaveDbgLogSettings();
      const std::string text = ReadFile(kPath);
      const bool saved =
          text.find("scale=\"no\"") != std::string::npos && text.find("3,6,3") != std::string::npos;
      EXPECT_EQ(result, saved ? 0 : -1);
      EXPECT_EQ(Level(26), 6);
      EXPECT_TRUE(result == 0 || faults.Struck());
    });
    EXPECT_GE(runs, 2) << CallName(call);
  }
}

TEST(SplitToIntList, CutsAtEachOfTheDelimiters) {
  EXPECT_THAT(SplitToIntList("1,2;3", ",;"), ElementsAre(1, 2, 3));
  EXPECT_THAT(SplitToIntList("1,2;3", ","), ElementsAre(1, 2));
  EXPECT_THAT(SplitToIntList("12", ","), ElementsAre(12));
}

TEST(SplitToIntList, SkipsEmptyFields) {
  EXPECT_THAT(SplitToIntList(",,5,,7,,", ","), ElementsAre(5, 7));
  EXPECT_THAT(SplitToIntList(",,,", ","), IsEmpty());
}

TEST(SplitToIntList, AnEmptyStringOrNoDelimitersReturnAnEmptyList) {
  EXPECT_THAT(SplitToIntList("", ","), IsEmpty());
  EXPECT_THAT(SplitToIntList("1,2", ""), IsEmpty());
}

TEST(SplitToIntList, ReadsSignedDecimalNumbersLeniently) {
  EXPECT_THAT(SplitToIntList("-1,+2, 3,4x,x5,0x10,010", ","), ElementsAre(-1, 2, 3, 4, 0, 0, 10));
  EXPECT_THAT(SplitToIntList("2147483647,-2147483648", ","), ElementsAre(INT_MAX, INT_MIN));
}

TEST(SplitToIntList, WithoutMemoryReturnsAnEmptyList) {
  EXPECT_EQ(ForEachFailingCall(Call::kStrdup,
                               [](Faults& faults) {
                                 const std::vector<int> list = SplitToIntList("1,2", ",");
                                 EXPECT_EQ(list.empty(), faults.Struck());
                               }),
            1);
}

constexpr char kFormat[] = "%s=\"%s\"\n";

class WriteSetting : public ::testing::Test {
 protected:
  ~WriteSetting() override { unlink(kPath); }
};

TEST_F(WriteSetting, MakesAMissingFileWithMode0644) {
  const mode_t before = umask(0);
  EXPECT_EQ(WriteSettingValue(kPath, "name", "v", kFormat), 0);
  umask(before);
  struct stat status = {};
  ASSERT_EQ(stat(kPath, &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0644u);
  EXPECT_EQ(ReadFile(kPath), "name=\"v\"\n");
}

TEST_F(WriteSetting, HoldsTheFilesLockWhileItIsRewritten) {
  WriteFile(kPath, "");
  Faults faults;
  bool checked = false;
  faults.Before(Call::kRename, [&](int) {
    const int fd = open(kPath, O_RDONLY | O_CLOEXEC);
    EXPECT_EQ(flock(fd, LOCK_EX | LOCK_NB), -1);
    EXPECT_EQ(errno, EWOULDBLOCK);
    close(fd);
    checked = true;
  });
  EXPECT_EQ(WriteSettingValue(kPath, "name", "v", kFormat), 0);
  EXPECT_TRUE(checked);
}

TEST_F(WriteSetting, ReleasesTheLock) {
  EXPECT_EQ(WriteSettingValue(kPath, "name", "v", kFormat), 0);
  const int fd = open(kPath, O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(flock(fd, LOCK_EX | LOCK_NB), 0);
  close(fd);
}

TEST_F(WriteSetting, WaitsForAnotherHolder) {
  WriteFile(kPath, "");
  const int fd = open(kPath, O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(flock(fd, LOCK_EX), 0);
  Child writer([=] {
    close(fd);
    return -WriteSettingValue(kPath, "name", "v", kFormat);
  });
  usleep(50000);
  EXPECT_EQ(ReadFile(kPath), "");
  flock(fd, LOCK_UN);
  EXPECT_EQ(writer.Wait().code, 0);
  EXPECT_EQ(ReadFile(kPath), "name=\"v\"\n");
  close(fd);
}

TEST_F(WriteSetting, WithoutTheLockNothingIsWritten) {
  WriteFile(kPath, "a=\"1\"\n");
  DescriptorGuard descriptors;
  Faults faults;
  faults.FailNth(Call::kFlock, 1, ENOLCK);
  EXPECT_EQ(WriteSettingValue(kPath, "name", "v", kFormat), -1);
  EXPECT_EQ(faults.Count(Call::kRename), 0);
  EXPECT_EQ(ReadFile(kPath), "a=\"1\"\n");
}

TEST_F(WriteSetting, AnUnwritableDirectoryReturnsMinusOne) {
  EXPECT_EQ(WriteSettingValue("/var/packages/none/settings.conf", "name", "v", kFormat), -1);
}

TEST_F(WriteSetting, ReturnsWhatThePlatformsFunctionReturns) {
  EXPECT_EQ(WriteSettingValue(kPath, "not a key", "v", kFormat), -1);
}

TEST(ReadSetting, ReturnsTheLengthZeroOrMinusOne) {
  char value[16];
  EXPECT_EQ(ReadSettingValue(kPath, "name", value, sizeof(value)), -1);
  WriteFile(kPath, "name=\"value\"\n");
  EXPECT_EQ(ReadSettingValue(kPath, "name", value, sizeof(value)), 5);
  EXPECT_STREQ(value, "value");
  EXPECT_EQ(ReadSettingValue(kPath, "other", value, sizeof(value)), 0);
  unlink(kPath);
  EXPECT_THAT(ListFolder(kFolder), IsEmpty());
}

}  // namespace
