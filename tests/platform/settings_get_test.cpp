// Reading a key of a settings file.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <ostream>
#include <string>
#include <vector>

#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

namespace {

// What a read of `key` from a file with this text returns.
struct Got {
  int result;
  std::string value;
};

Got Get(const std::string& text, const char* key, int size = 64) {
  TempDir directory;
  WriteFile(directory.File("conf"), text);
  char value[64];
  memset(value, '#', sizeof(value));
  const int result = QLIBCFileGetKeyValue(directory.File("conf").c_str(), key, value, size, 0);
  return {result, result < 0 ? "" : value};
}

void ExpectGot(const std::string& text, const char* key, const std::string& expected) {
  SCOPED_TRACE(text);
  const Got got = Get(text, key);
  EXPECT_EQ(got.result, static_cast<int>(expected.size()));
  EXPECT_EQ(got.value, expected);
}

// A file, and what it has for the key "name". The first column says why.
struct NameCase {
  const char* why;
  const char* text;
  const char* value;
};

std::ostream& operator<<(std::ostream& out, const NameCase& test) {
  return out << test.why;
}

class GetName : public ::testing::TestWithParam<NameCase> {};

TEST_P(GetName, HasTheValueOfTheTable) {
  ExpectGot(GetParam().text, "name", GetParam().value);
}

INSTANTIATE_TEST_SUITE_P(
    Platform, GetName,
    ::testing::ValuesIn(std::vector<NameCase>{
        {"TheValueIsBetweenTheQuotes", "first=\"1\"\nname=\"value\"\nlast=\"2\"\n", "value"},
        {"AMissingKeyIsEmpty", "other=\"x\"\n", ""},
        {"AnEmptyFileHasNoKey", "", ""},
        {"AnEmptyValueIsEmpty", "name=\"\"\n", ""},
        {"NoValueIsEmpty", "name=\n", ""},
        {"AKeyThatBeginsOrEndsAnotherIsNotThatKey", "names=\"x\"\nmy_name=\"y\"\nname=\"z\"\n",
         "z"},
        {"KeysHaveTheirCase", "Name=\"x\"\n", ""},
        {"TheFirstOfSeveralLinesIsTaken", "name=\"1\"\nname=\"2\"\n", "1"},
        {"BlanksAroundTheKeyAndTheValueAreIgnored", " \tname \t= \"value\" \n", "value"},
        {"BlanksInsideTheQuotesAreKept", "name=\" a b \"\n", " a b "},
        {"AValueWithoutQuotesIsAccepted", "name=value\n", "value"},
        {"ACarriageReturnBeforeTheLineFeedIsIgnored", "name=\"value\"\r\n", "value"},
        {"AValueMayHoldQuotesAndEqualsSigns", "name=\"a\"b=c\"\n", "a\"b=c"},
        {"ALastLineWithoutALineFeedIsReadToo", "other=\"x\"\nname=\"value\"", "value"},
        {"ACommentIsNotAKey", "#name=\"x\"\n# name=\"y\"\nname=\"z\"\n", "z"},
        {"LinesOfAnyOtherShapeAreSkipped", "name\n\n[section]\n=\"x\"\nname: y\nname=\"z\"\n", "z"},
    }),
    [](const auto& test) { return std::string(test.param.why); });

TEST(GetKeyValue, ASmallBufferGetsTheStartAndTheWholeLengthIsToldToTheCaller) {
  const Got got = Get("name=\"value\"\n", "name", 4);
  EXPECT_EQ(got.result, 5);
  EXPECT_EQ(got.value, "val");
}

TEST(GetKeyValue, ABufferOfOneByteGetsTheZeroByteAlone) {
  const Got got = Get("name=\"value\"\n", "name", 1);
  EXPECT_EQ(got.result, 5);
  EXPECT_EQ(got.value, "");
}

TEST(GetKeyValue, NothingIsStoredAfterTheBuffer) {
  TempDir directory;
  WriteFile(directory.File("conf"), "name=\"value\"\n");
  char value[8] = "#######";
  QLIBCFileGetKeyValue(directory.File("conf").c_str(), "name", value, 4, 0);
  EXPECT_EQ(std::string(value, sizeof(value)), std::string("val\0###\0", 8));
}

TEST(GetKeyValue, TheFlagsChangeNothing) {
  TempDir directory;
  WriteFile(directory.File("conf"), "name=\"value\"\n");
  for (const int flags : {0, 1, -1}) {
    char value[8];
    EXPECT_EQ(QLIBCFileGetKeyValue(directory.File("conf").c_str(), "name", value, 8, flags), 5);
  }
}

TEST(GetKeyValue, AMissingFileReturnsMinusOneAndLeavesTheBufferAlone) {
  TempDir directory;
  char value[8] = "before";
  errno = 0;
  EXPECT_EQ(QLIBCFileGetKeyValue(directory.File("none").c_str(), "name", value, 8, 0), -1);
  EXPECT_EQ(errno, ENOENT);
  EXPECT_STREQ(value, "before");
}

TEST(GetKeyValue, ADirectoryInPlaceOfTheFileReturnsMinusOne) {
  TempDir directory;
  char value[8] = "before";
  EXPECT_EQ(QLIBCFileGetKeyValue(directory.Path().c_str(), "name", value, 8, 0), -1);
  EXPECT_STREQ(value, "before");
}

TEST(GetKeyValue, ArgumentsThatAreNullEmptyOrNotPositiveAreRefused) {
  TempDir directory;
  WriteFile(directory.File("conf"), "name=\"value\"\n");
  const std::string path = directory.File("conf");
  char value[8] = "before";
  errno = 0;
  EXPECT_EQ(QLIBCFileGetKeyValue(nullptr, "name", value, 8, 0), -1);
  EXPECT_EQ(errno, EINVAL);
  EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), nullptr, value, 8, 0), -1);
  EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), "", value, 8, 0), -1);
  EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), "name", nullptr, 8, 0), -1);
  EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), "name", value, 0, 0), -1);
  EXPECT_EQ(QLIBCFileGetKeyValue(path.c_str(), "name", value, -1, 0), -1);
  EXPECT_STREQ(value, "before");
}

// Such lines are no settings, so the key is one that the file does not have.
TEST(GetKeyValue, AKeyThatIsNoWordIsNotInTheFile) {
  const std::string text = "two words=\"1\"\n#name=\"2\"\na=b=\"3\"\n";
  for (const char* key : {"two words", "#name", "a=b", " ", "two\nwords"}) ExpectGot(text, key, "");
}

TEST(GetKeyValue, AFileOfSeveralReadsIsReadWhole) {
  std::string text;
  for (int i = 0; i < 5000; ++i) text += "filler" + std::to_string(i) + "=\"x\"\n";
  ExpectGot(text + "name=\"value\"\n", "name", "value");
}

TEST(GetKeyValue, ShortAndInterruptedReadsAreContinued) {
  TempDir directory;
  WriteFile(directory.File("conf"), "other=\"x\"\nname=\"value\"\n");
  Faults faults;
  faults.Limit(Call::kRead, 1).FailNth(Call::kRead, 2, EINTR);
  char value[8];
  EXPECT_EQ(QLIBCFileGetKeyValue(directory.File("conf").c_str(), "name", value, 8, 0), 5);
  EXPECT_STREQ(value, "value");
}

TEST(GetKeyValue, EachSystemCallMayFailAndNothingIsLeft) {
  TempDir directory;
  WriteFile(directory.File("conf"), "name=\"value\"\n");
  DescriptorGuard descriptors;
  for (const Call call : {Call::kOpen, Call::kRead}) {
    const int runs = ForEachFailingCall(call, [&](Faults& faults) {
      char value[8] = "before";
      errno = 0;
      const int result = QLIBCFileGetKeyValue(directory.File("conf").c_str(), "name", value, 8, 0);
      EXPECT_EQ(result, faults.Struck() ? -1 : 5);
      EXPECT_STREQ(value, faults.Struck() ? "before" : "value");
      EXPECT_NE(faults.Struck() && errno == 0, true);
    });
    EXPECT_GE(runs, 1);
  }
}

}  // namespace
