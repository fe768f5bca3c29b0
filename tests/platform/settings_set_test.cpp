// Writing a key of a settings file.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

namespace {

constexpr char kFormat[] = "%s=\"%s\"\n";

// A file "conf" in a directory of its own.
class SetKeyValue : public ::testing::Test {
 protected:
  int Set(const char* key, const char* value, const char* format = kFormat) {
    return QLIBCFileSetKeyValue(Path().c_str(), key, value, format);
  }
  std::string Path() const { return directory_.File("conf"); }
  std::string Text() const { return ReadFile(Path()); }
  void Start(const std::string& text) { WriteFile(Path(), text); }
  mode_t Mode() const {
    struct stat status = {};
    EXPECT_EQ(stat(Path().c_str(), &status), 0);
    return status.st_mode & 07777;
  }

  TempDir directory_;
};

TEST_F(SetKeyValue, ReplacesTheKeysLineWhereItIs) {
  Start("a=\"1\"\nname=\"old\"\nb=\"2\"\n");
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "a=\"1\"\nname=\"new\"\nb=\"2\"\n");
}

TEST_F(SetKeyValue, AppendsAKeyThatIsNotThere) {
  Start("a=\"1\"\n");
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "a=\"1\"\nname=\"new\"\n");
}

TEST_F(SetKeyValue, CommentsBlankLinesAndUnknownLinesSurviveByteForByte) {
  const std::string before =
      "# name=\"comment\"\n\n  \t\n[section]\r\njunk without a sign\n\x01\xff=z\n";
  Start(before + "name=\"old\"\n" + before);
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), before + "name=\"new\"\n" + before);
}

TEST_F(SetKeyValue, OfSeveralLinesTheFirstIsReplaced) {
  Start("name=\"1\"\nname=\"2\"\n");
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "name=\"new\"\nname=\"2\"\n");
}

TEST_F(SetKeyValue, ALastLineWithoutItsEndKeepsItsText) {
  Start("a=\"1\"");
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "a=\"1\"\nname=\"new\"\n");
}

TEST_F(SetKeyValue, AKeysLastLineWithoutItsEndIsReplaced) {
  Start("a=\"1\"\nname=\"old\"");
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "a=\"1\"\nname=\"new\"\n");
}

TEST_F(SetKeyValue, AZeroByteInTheFileDoesNotEndIt) {
  const std::string tail("b\0c\n", 4);
  Start("name=\"old\"\n" + tail);
  EXPECT_EQ(Set("name", "new"), 0);
  EXPECT_EQ(Text(), "name=\"new\"\n" + tail);
}

TEST_F(SetKeyValue, AnEmptyValueIsWritten) {
  EXPECT_EQ(Set("name", ""), 0);
  EXPECT_EQ(Text(), "name=\"\"\n");
}

TEST_F(SetKeyValue, WhatWasSetIsRead) {
  for (const char* value :
       {"plain", " blanks ", "a\"b", "\"", "\"\"", "a=b", "100%", "%s%n", "#x"}) {
    EXPECT_EQ(Set("name", value), 0);
    char read[32];
    EXPECT_EQ(QLIBCFileGetKeyValue(Path().c_str(), "name", read, sizeof(read), 0),
              static_cast<int>(strlen(value)));
    EXPECT_STREQ(read, value);
  }
}

TEST_F(SetKeyValue, TheLineFollowsTheFormat) {
  EXPECT_EQ(Set("name", "v", "%s = %s # 100%%\n"), 0);
  EXPECT_EQ(Text(), "name = v # 100%\n");
}

TEST_F(SetKeyValue, AFormatOfAnyOtherShapeIsRefused) {
  Start("a=\"1\"\n");
  for (const char* format :
       {"", "%s\n", "%s=%s%s\n", "%s=%d\n", "%s=%n%s\n", "%s=%s%", "%5s=%s\n"}) {
    SCOPED_TRACE(format);
    errno = 0;
    EXPECT_EQ(Set("name", "v", format), -1);
    EXPECT_EQ(errno, EINVAL);
  }
  EXPECT_EQ(Text(), "a=\"1\"\n");
}

TEST_F(SetKeyValue, AKeyOrValueThatCouldNotBeReadBackIsRefused) {
  Start("a=\"1\"\n");
  for (const char* key : {"", "two words", "a=b", "#name", "line\nend"}) {
    EXPECT_EQ(Set(key, "v"), -1) << key;
  }
  EXPECT_EQ(Set("name", "line\nend"), -1);
  EXPECT_EQ(Text(), "a=\"1\"\n");
}

TEST_F(SetKeyValue, NullArgumentsAreRefused) {
  Start("a=\"1\"\n");
  errno = 0;
  EXPECT_EQ(QLIBCFileSetKeyValue(nullptr, "name", "v", kFormat), -1);
  EXPECT_EQ(errno, EINVAL);
  EXPECT_EQ(Set(nullptr, "v"), -1);
  EXPECT_EQ(Set("name", nullptr), -1);
  EXPECT_EQ(Set("name", "v", nullptr), -1);
  EXPECT_EQ(Text(), "a=\"1\"\n");
}

TEST_F(SetKeyValue, AMissingFileIsMadeWithMode0644) {
  const mode_t before = umask(0);
  EXPECT_EQ(Set("name", "v"), 0);
  umask(before);
  EXPECT_EQ(Text(), "name=\"v\"\n");
  EXPECT_EQ(Mode(), 0644u);
}

TEST_F(SetKeyValue, TheUmaskAppliesToAMissingFile) {
  const mode_t before = umask(077);
  EXPECT_EQ(Set("name", "v"), 0);
  umask(before);
  EXPECT_EQ(Mode(), 0600u);
}

TEST_F(SetKeyValue, TheModeStaysWhateverTheUmask) {
  for (const mode_t mode : {0600u, 0640u, 0666u, 0755u, 0444u}) {
    Start("name=\"old\"\n");
    ASSERT_EQ(chmod(Path().c_str(), mode), 0);
    const mode_t before = umask(077);
    EXPECT_EQ(Set("name", "new"), 0);
    umask(before);
    EXPECT_EQ(Mode(), mode);
    EXPECT_EQ(Text(), "name=\"new\"\n");
  }
}

TEST_F(SetKeyValue, TheOwnerStays) {
  Start("name=\"old\"\n");
  if (chown(Path().c_str(), 1234, 4321) != 0) GTEST_SKIP() << "only one user in this namespace";
  ASSERT_EQ(chmod(Path().c_str(), 02664), 0);
  EXPECT_EQ(Set("name", "new"), 0);
  struct stat status = {};
  ASSERT_EQ(stat(Path().c_str(), &status), 0);
  EXPECT_EQ(status.st_uid, 1234u);
  EXPECT_EQ(status.st_gid, 4321u);
  EXPECT_EQ(Mode(), 02664u);
}

TEST_F(SetKeyValue, ASymbolicLinkStaysALink) {
  WriteFile(directory_.File("real"), "name=\"old\"\n");
  ASSERT_EQ(symlink("real", Path().c_str()), 0);
  EXPECT_EQ(Set("name", "new"), 0);
  struct stat status = {};
  ASSERT_EQ(lstat(Path().c_str(), &status), 0);
  EXPECT_TRUE(S_ISLNK(status.st_mode));
  EXPECT_EQ(ReadFile(directory_.File("real")), "name=\"new\"\n");
}

TEST_F(SetKeyValue, ALinkToNowhereIsRefusedAndStays) {
  ASSERT_EQ(symlink("nowhere", Path().c_str()), 0);
  errno = 0;
  EXPECT_EQ(Set("name", "new"), -1);
  EXPECT_EQ(errno, ENOENT);
  struct stat status = {};
  ASSERT_EQ(lstat(Path().c_str(), &status), 0);
  EXPECT_TRUE(S_ISLNK(status.st_mode));
}

TEST_F(SetKeyValue, AMissingDirectoryReturnsMinusOne) {
  errno = 0;
  EXPECT_EQ(QLIBCFileSetKeyValue(directory_.File("none/conf").c_str(), "name", "v", kFormat), -1);
  EXPECT_EQ(errno, ENOENT);
}

TEST_F(SetKeyValue, ADirectoryInPlaceOfTheFileReturnsMinusOneAndStays) {
  EXPECT_EQ(QLIBCFileSetKeyValue(directory_.Path().c_str(), "name", "v", kFormat), -1);
  EXPECT_TRUE(ListFolder(directory_.Path()).empty());
}

TEST_F(SetKeyValue, APathWithoutADirectoryIsInTheCurrentOne) {
  const ChildResult result = RunInChild([&] {
    if (chdir(directory_.Path().c_str()) != 0) return 1;
    return -QLIBCFileSetKeyValue("conf", "name", "v", kFormat);
  });
  EXPECT_EQ(result.code, 0);
  EXPECT_EQ(Text(), "name=\"v\"\n");
}

TEST_F(SetKeyValue, NothingButTheFileIsLeftInTheDirectory) {
  EXPECT_EQ(Set("name", "1"), 0);
  EXPECT_EQ(Set("name", "2"), 0);
  EXPECT_EQ(ListFolder(directory_.Path()), std::vector<std::string>{"conf"});
}

TEST_F(SetKeyValue, NoDescriptorIsLeftOpen) {
  DescriptorGuard descriptors;
  EXPECT_EQ(Set("name", "v"), 0);
  EXPECT_EQ(Set("", "v"), -1);
}

TEST_F(SetKeyValue, ALargeFileAndALongValueAreKeptWhole) {
  std::string filler;
  for (int i = 0; i < 20000; ++i) filler += "key" + std::to_string(i) + "=\"value\"\n";
  const std::string value(100000, 'v');
  Start(filler + "name=\"old\"\n" + filler);
  EXPECT_EQ(Set("name", value.c_str()), 0);
  EXPECT_EQ(Text(), filler + "name=\"" + value + "\"\n" + filler);
}

}  // namespace
