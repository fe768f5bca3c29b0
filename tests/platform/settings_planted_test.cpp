// What others put at the name of the settings' new text, and in the place of their directory.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "tarnwick/log/log_settings.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/files.h"
#include "tests/support/planted.h"
#include "tests/support/process.h"

namespace {

using std::chrono::seconds;
using tarnwick::WriteSettingValue;
using ::testing::ElementsAre;

constexpr char kFormat[] = "%s=\"%s\"\n";
constexpr char kText[] = "name=\"old\"\n";
constexpr char kNewText[] = "name=\"new\"\n";
constexpr char kTarget[] = "of another program\n";

class PlantedSettings : public ::testing::TestWithParam<PlantedKind> {
 protected:
  PlantedSettings() { WriteFile(Target(), kTarget); }

  std::string Target() const { return directory_.File("target"); }
  std::string Conf() const { return directory_.File("conf"); }
  std::string NewConf() const { return Conf() + ".tarnwick-new"; }

  // At `path`; false where it cannot be made.
  bool Plant(const std::string& path) const { return GetParam().plant(path, Target()); }

  TempDir directory_;
};

// In a child, which is ended when the call waits.
void ExpectWritten(const std::string& path) {
  const ChildResult result = RunInChild(
      [&] {
        DescriptorGuard descriptors;
        EXPECT_EQ(QLIBCFileSetKeyValue(path.c_str(), "name", "new", kFormat), 0);
        return 0;
      },
      seconds(10));
  EXPECT_FALSE(result.timed_out) << "the call waits";
  EXPECT_EQ(result.code, 0);
}

void ExpectRefused(const std::string& path, int error) {
  const ChildResult result = RunInChild(
      [&] {
        DescriptorGuard descriptors;
        char value[16] = "";
        EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), "name", value, sizeof(value), 0), -1);
        EXPECT_EQ(errno, error);
        EXPECT_EQ(QLIBCFileSetKeyValue(path.c_str(), "name", "new", kFormat), -1);
        EXPECT_EQ(errno, error);
        EXPECT_EQ(WriteSettingValue(path.c_str(), "name", "new", kFormat), -1);
        EXPECT_EQ(errno, error);
        return 0;
      },
      seconds(10));
  EXPECT_FALSE(result.timed_out) << "a call waits";
  EXPECT_EQ(result.code, 0);
}

TEST_P(PlantedSettings, WhatHasTheNewTextsNameIsPutAwayUnwritten) {
  WriteFile(Conf(), kText);
  if (!Plant(NewConf())) GTEST_SKIP() << "it cannot be made here";
  ExpectWritten(Conf());
  EXPECT_EQ(ReadFile(Conf()), kNewText);
  EXPECT_EQ(ReadFile(Target()), kTarget);
  EXPECT_THAT(ListFolder(directory_.Path()), ElementsAre("conf", "target"));
}

TEST_P(PlantedSettings, NewSettingsAreMadeBesideIt) {
  if (!Plant(NewConf())) GTEST_SKIP() << "it cannot be made here";
  ExpectWritten(Conf());
  EXPECT_EQ(ReadFile(Conf()), kNewText);
  EXPECT_EQ(ReadFile(Target()), kTarget);
}

TEST_P(PlantedSettings, InThePlaceOfTheirDirectoryItIsRefused) {
  if (!Plant(directory_.File("etc"))) GTEST_SKIP() << "it cannot be made here";
  ExpectRefused(directory_.File("etc/conf"), GetParam().below);
  EXPECT_EQ(ReadFile(Target()), kTarget);
}

INSTANTIATE_TEST_SUITE_P(Kinds, PlantedSettings, ::testing::ValuesIn(PlantedKinds()));

class OddSettings : public ::testing::Test {
 protected:
  std::string Conf() const { return directory_.File("conf"); }
  std::string NewConf() const { return Conf() + ".tarnwick-new"; }

  TempDir directory_;
};

TEST_F(OddSettings, ADirectoryOfTheNewTextsNameKeepsTheOldText) {
  WriteFile(Conf(), kText);
  ASSERT_EQ(mkdir(NewConf().c_str(), 0700), 0);
  EXPECT_EQ(QLIBCFileSetKeyValue(Conf().c_str(), "name", "new", kFormat), -1);
  EXPECT_EQ(errno, EEXIST);
  EXPECT_EQ(ReadFile(Conf()), kText);
}

TEST_F(OddSettings, ASecondNameOfTheFileKeepsTheOldText) {
  WriteFile(Conf(), kText);
  ASSERT_EQ(link(Conf().c_str(), directory_.File("second").c_str()), 0);
  ExpectWritten(Conf());
  EXPECT_EQ(ReadFile(Conf()), kNewText);
  EXPECT_EQ(ReadFile(directory_.File("second")), kText);
}

}  // namespace
