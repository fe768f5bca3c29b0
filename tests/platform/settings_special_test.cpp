// What stands at the settings' path and is no plain file of the product: links, FIFOs, devices,
// directories, files of any length.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "tarnwick/log/log_settings.h"
#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

constexpr char kFormat[] = "%s=\"%s\"\n";
constexpr char kText[] = "name=\"old\"\n";
constexpr char kNewText[] = "name=\"new\"\n";
constexpr uid_t kOther = 65534;

// What a call returned and the errno after it.
struct Outcome {
  int result;
  int error;
};

Outcome Get(const std::string& path) {
  char value[16] = "untouched";
  errno = 0;
  const int result = QLIBCFileGetKeyValue(path.c_str(), "name", value, sizeof(value), 0);
  const int error = errno;
  if (result < 0) {
    EXPECT_STREQ(value, "untouched");
  }
  return {result, error};
}

Outcome Set(const std::string& path) {
  errno = 0;
  const int result = QLIBCFileSetKeyValue(path.c_str(), "name", "new", kFormat);
  return {result, errno};
}

Outcome Write(const std::string& path) {
  errno = 0;
  const int result = WriteSettingValue(path.c_str(), "name", "new", kFormat);
  return {result, errno};
}

void ExpectRefused(const Outcome& outcome, int error) {
  EXPECT_EQ(outcome.result, -1);
  EXPECT_EQ(outcome.error, error);
}

// In a child, which is ended when a call waits.
void ExpectAllRefused(const std::string& path, int error) {
  const ChildResult result = RunInChild([&] {
    DescriptorGuard descriptors;
    ExpectRefused(Get(path), error);
    ExpectRefused(Set(path), error);
    ExpectRefused(Write(path), error);
    return 0;
  });
  EXPECT_FALSE(result.timed_out) << "a call waits";
  EXPECT_EQ(result.code, 0);
}

class SpecialSettings : public ::testing::Test {
 protected:
  std::string Path() const { return directory_.File("conf"); }
  std::string Target() const { return target_folder_.File("target"); }

  // At the path, a link of this user to `target`.
  void Link(const std::string& target) { ASSERT_EQ(symlink(target.c_str(), Path().c_str()), 0); }
  // The same of another user; false where there is none.
  bool LinkOfAnother(const std::string& target) {
    EXPECT_EQ(symlink(target.c_str(), Path().c_str()), 0);
    return lchown(Path().c_str(), kOther, kOther) == 0;
  }
  bool IsLink() const {
    struct stat attributes = {};
    return lstat(Path().c_str(), &attributes) == 0 && S_ISLNK(attributes.st_mode);
  }

  TempDir directory_;
  TempDir target_folder_;
};

TEST_F(SpecialSettings, AFifoWithoutAWriterIsRefusedAtOnceAndStays) {
  ASSERT_EQ(mkfifo(Path().c_str(), 0600), 0);
  ExpectAllRefused(Path(), EINVAL);
  struct stat attributes = {};
  ASSERT_EQ(lstat(Path().c_str(), &attributes), 0);
  EXPECT_TRUE(S_ISFIFO(attributes.st_mode));
}

TEST_F(SpecialSettings, OfAFifoNothingIsTaken) {
  ASSERT_EQ(mkfifo(Path().c_str(), 0600), 0);
  const int fd = open(Path().c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC);
  ASSERT_EQ(write(fd, kText, sizeof(kText) - 1), static_cast<ssize_t>(sizeof(kText) - 1));
  ExpectAllRefused(Path(), EINVAL);
  char bytes[32];
  EXPECT_EQ(read(fd, bytes, sizeof(bytes)), static_cast<ssize_t>(sizeof(kText) - 1));
  close(fd);
}

TEST_F(SpecialSettings, AnEndlessDeviceIsRefusedUnread) {
  Link("/dev/zero");
  ExpectAllRefused(Path(), EINVAL);
  Faults faults;
  Get(Path());
  Set(Path());
  EXPECT_EQ(faults.Count(Call::kRead), 0);
  EXPECT_TRUE(IsLink());
}

TEST_F(SpecialSettings, ADirectoryIsRefused) {
  ASSERT_EQ(mkdir(Path().c_str(), 0700), 0);
  ExpectAllRefused(Path(), EISDIR);
  EXPECT_TRUE(ListFolder(Path()).empty());
}

TEST_F(SpecialSettings, AFileOf300MegabytesIsRefusedAndTakesNoMemory) {
  WriteFile(Path(), kText);
  ASSERT_EQ(truncate(Path().c_str(), off_t{300} << 20), 0);
  rusage before = {};
  getrusage(RUSAGE_SELF, &before);
  ExpectRefused(Get(Path()), EFBIG);
  ExpectRefused(Set(Path()), EFBIG);
  ExpectRefused(Write(Path()), EFBIG);
  rusage after = {};
  getrusage(RUSAGE_SELF, &after);
  EXPECT_LT(after.ru_maxrss - before.ru_maxrss, 32 << 10);  // KiB; sanitizers add to the text
}

TEST_F(SpecialSettings, OneMebibyteIsReadAndWrittenAndAByteMoreIsNot) {
  const std::string most = kText + std::string((1 << 20) - sizeof(kText) + 1, '#');
  WriteFile(Path(), most);
  EXPECT_EQ(Get(Path()).result, 3);
  EXPECT_EQ(Set(Path()).result, 0);
  ExpectRefused({QLIBCFileSetKeyValue(Path().c_str(), "name", "longer", kFormat), errno}, EFBIG);
  EXPECT_EQ(ReadFile(Path()), kNewText + most.substr(sizeof(kText) - 1));
  WriteFile(Path(), most + "#");
  ExpectRefused(Get(Path()), EFBIG);
}

TEST_F(SpecialSettings, AnotherUsersLinkToAFileElsewhereIsRefusedAndTheFileStays) {
  WriteFile(Target(), kText);
  if (!LinkOfAnother(Target())) GTEST_SKIP() << "only one user in this namespace";
  ExpectRefused(Set(Path()), ELOOP);
  ExpectRefused(Write(Path()), ELOOP);
  EXPECT_EQ(ReadFile(Target()), kText);
  EXPECT_TRUE(IsLink());
}

TEST_F(SpecialSettings, AnotherUsersLinkMakesNoFile) {
  if (!LinkOfAnother(Target())) GTEST_SKIP() << "only one user in this namespace";
  ExpectRefused(Write(Path()), ELOOP);
  EXPECT_FALSE(FileExists(Target()));
}

TEST_F(SpecialSettings, AnotherUsersLinkAfterAnOwnOneIsRefused) {
  WriteFile(Target(), kText);
  if (!LinkOfAnother(Target())) GTEST_SKIP() << "only one user in this namespace";
  ASSERT_EQ(symlink("conf", directory_.File("own").c_str()), 0);
  ExpectRefused(Set(directory_.File("own")), ELOOP);
  EXPECT_EQ(ReadFile(Target()), kText);
}

TEST_F(SpecialSettings, ReadingFollowsALinkWhoeverMadeIt) {
  WriteFile(Target(), kText);
  if (!LinkOfAnother(Target())) GTEST_SKIP() << "only one user in this namespace";
  EXPECT_EQ(Get(Path()).result, 3);
}

TEST_F(SpecialSettings, RootsLinkIsFollowedForAnotherUser) {
  WriteFile(Target(), kText);
  Link(Target());
  for (const std::string& path : {directory_.Path(), target_folder_.Path(), Target()}) {
    if (chown(path.c_str(), kOther, kOther) != 0) GTEST_SKIP() << "only one user here";
  }
  const ChildResult result = RunInChild([&] {
    if (setgid(kOther) != 0 || setuid(kOther) != 0) return 2;
    return Write(Path()).result == 0 ? 0 : 1;
  });
  EXPECT_EQ(result.code, 0);
  EXPECT_EQ(ReadFile(Target()), kNewText);
}

TEST_F(SpecialSettings, AnOwnLinkToAnotherDirectoryStaysALink) {
  WriteFile(Target(), kText);
  Link(Target());
  EXPECT_EQ(Set(Path()).result, 0);
  EXPECT_EQ(ReadFile(Target()), kNewText);
  EXPECT_TRUE(IsLink());
}

TEST_F(SpecialSettings, LinksInACircleAreRefused) {
  Link("conf");
  ExpectAllRefused(Path(), ELOOP);
}

// A chain of links from the path, of which the last one refers to the target.
TEST_F(SpecialSettings, FortyLinksAreFollowedAndOneMoreIsRefused) {
  WriteFile(Target(), kText);
  std::string last = Path();
  for (int links = 1; links <= 40; ++links) {
    const std::string next = links < 40 ? directory_.File(std::to_string(links)) : Target();
    ASSERT_EQ(symlink(next.c_str(), last.c_str()), 0);
    last = next;
  }
  EXPECT_EQ(Set(Path()).result, 0);
  EXPECT_EQ(ReadFile(Target()), kNewText);
  const std::string longer = directory_.File("longer");
  ASSERT_EQ(symlink(Path().c_str(), longer.c_str()), 0);
  ExpectRefused(Set(longer), ELOOP);
}

// The place of the file is taken by a link after the path was followed.
TEST_F(SpecialSettings, ALinkThatTakesTheFilesPlaceIsNotFollowed) {
  WriteFile(Path(), kText);
  WriteFile(Target(), kText);
  Faults faults;
  faults.Before(Call::kFlock, [&](int) {
    unlink(Path().c_str());
    Link(Target());
  });
  ExpectRefused(Set(Path()), ELOOP);
  EXPECT_EQ(ReadFile(Target()), kText);
}

TEST_F(SpecialSettings, AnOwnLinkToAMissingFileIsWrittenThroughByTheLogsSettingsAlone) {
  Link(Target());
  ExpectRefused(Set(Path()), ENOENT);
  EXPECT_FALSE(FileExists(Target()));
  EXPECT_EQ(Write(Path()).result, 0);
  EXPECT_EQ(ReadFile(Target()), kNewText);
}

}  // namespace
