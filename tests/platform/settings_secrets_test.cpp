// Who may not read the settings cannot read them while they are rewritten either.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <new>
#include <string>

#include "tarnwick/platform/qlibcfile.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

namespace {

constexpr char kFormat[] = "%s=\"%s\"\n";
constexpr char kSecret[] = "admin_password=\"SECRET\"\n";
// Inside the sandbox this directory lies in memory, so that thousands of rewrites are quick.
constexpr char kPath[] = "/var/packages/Tarnwick/etc/settings.conf";
constexpr char kNewPath[] = "/var/packages/Tarnwick/etc/settings.conf.tarnwick-new";
constexpr uid_t kOther = 65534;

class SecretSettings : public ::testing::Test {
 protected:
  SecretSettings() { WriteFile(kPath, kSecret); }
  ~SecretSettings() override { unlink(kPath); }
};

// Memory that a child shares.
struct Shared {
  std::atomic<bool> polling{false};
  std::atomic<bool> done{false};
  std::atomic<int> opened{0};
};

class SharedMemory {
 public:
  SharedMemory()
      : memory_(mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS,
                     -1, 0)),
        shared_(new (memory_) Shared()) {}
  ~SharedMemory() { munmap(memory_, sizeof(Shared)); }
  SharedMemory(const SharedMemory&) = delete;
  SharedMemory& operator=(const SharedMemory&) = delete;
  Shared* operator->() const { return shared_; }

 private:
  void* memory_;
  Shared* shared_;
};

constexpr int kOneUser = 2;

// As another user: opens the new file for as long as rewrites go on.
int Poll(const SharedMemory& shared) {
  if (setgid(kOther) != 0 || setuid(kOther) != 0) return kOneUser;
  shared->polling = true;
  while (!shared->done) {
    const int fd = open(kNewPath, O_RDONLY | O_CLOEXEC);
    if (fd < 0) continue;
    ++shared->opened;
    close(fd);
  }
  return 0;
}

TEST_F(SecretSettings, AnotherUserOpensNothingIn10000Rewrites) {
  ASSERT_EQ(chmod(kPath, 0600), 0);
  const SharedMemory shared;
  Child other([&] { return Poll(shared); });
  for (int i = 0; i < 100 && !shared->polling; ++i) usleep(20000);
  for (int i = 0; shared->polling && i < 10000; ++i) {
    ASSERT_EQ(QLIBCFileSetKeyValue(kPath, "count", std::to_string(i).c_str(), kFormat), 0);
  }
  shared->done = true;
  const ChildResult result = other.Wait();
  if (result.code == kOneUser) GTEST_SKIP() << "only one user in this namespace";
  EXPECT_EQ(result.code, 0);
  EXPECT_TRUE(shared->polling);
  EXPECT_EQ(shared->opened, 0);
}

mode_t ModeOf(const char* path) {
  struct stat attributes = {};
  EXPECT_EQ(stat(path, &attributes), 0);
  return attributes.st_mode & 07777;
}

// The new file's modes right after it was made, and when its text is written.
struct Modes {
  mode_t first = 0;
  mode_t written = 0;
};

Modes ModesOfRewrite() {
  Modes modes;
  Faults faults;
  faults.Before(Call::kFchown, [&](int) { modes.first = ModeOf(kNewPath); })
      .Before(Call::kWrite, [&](int) { modes.written = ModeOf(kNewPath); });
  const mode_t before = umask(0);
  EXPECT_EQ(QLIBCFileSetKeyValue(kPath, "name", "v", kFormat), 0);
  umask(before);
  return modes;
}

TEST_F(SecretSettings, TheNewFileStartsWithTheOwnersRightsAtMost) {
  for (const mode_t mode : {0600u, 0400u, 0640u, 0660u, 0644u, 0755u, 04755u}) {
    SCOPED_TRACE(mode);
    ASSERT_EQ(chmod(kPath, mode), 0);
    const Modes modes = ModesOfRewrite();
    EXPECT_EQ(modes.first, mode & 0600);
    EXPECT_EQ(modes.written, mode);
  }
}

TEST_F(SecretSettings, OwnerAndGroupAreSetBeforeTheText) {
  if (chown(kPath, 1234, 4321) != 0) GTEST_SKIP() << "only one user in this namespace";
  struct stat attributes = {};
  Faults faults;
  faults.Before(Call::kWrite, [&](int) { EXPECT_EQ(stat(kNewPath, &attributes), 0); });
  EXPECT_EQ(QLIBCFileSetKeyValue(kPath, "name", "v", kFormat), 0);
  EXPECT_EQ(attributes.st_uid, 1234u);
  EXPECT_EQ(attributes.st_gid, 4321u);
}

TEST_F(SecretSettings, ANewFileStartsWith0644LessTheUmask) {
  unlink(kPath);
  const mode_t before = umask(027);
  mode_t written = 0;
  Faults faults;
  faults.Before(Call::kWrite, [&](int) { written = ModeOf(kNewPath); });
  EXPECT_EQ(QLIBCFileSetKeyValue(kPath, "name", "v", kFormat), 0);
  umask(before);
  EXPECT_EQ(written, 0640u);
}

}  // namespace
