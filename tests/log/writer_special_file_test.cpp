// What stands at the log's path and is no regular file is neither waited for nor written.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/ioctl.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"
#include "tests/support/syslog_capture.h"

using namespace tarnwick;

namespace {

using std::chrono::seconds;
using ::testing::EndsWith;
using ::testing::SizeIs;

void Write(LOG_TYPE type = LOG_TYPE_MAIN) {
  TWPrintf(type, "http", "warn", "name", 57, "Func", "message\n");
}

class SpecialLog : public ::testing::TestWithParam<LOG_TYPE> {
 protected:
  SpecialLog() : path_(GetParam() == LOG_TYPE_MAIN ? kMainLog : kNotificationLog) {
    FreeDbgCfg();
    RemoveLog();
    Write(static_cast<LOG_TYPE>(2));  // opens the connection to the system log, which stays
    syslog_.Take();
  }
  ~SpecialLog() override { RemoveLog(); }

  const char* Path() const { return path_; }

  // Writes a line in a child, which is ended when it waits; it leaves no descriptor open.
  void WriteInChild() const {
    const ChildResult result = RunInChild(
        [] {
          DescriptorGuard descriptors;
          Write(GetParam());
          return 0;
        },
        seconds(10));
    EXPECT_FALSE(result.timed_out) << "the line waits";
    EXPECT_EQ(result.code, 0);
  }

  // Expects a line to fail as if the file could not be opened, with `error`.
  void ExpectRefused(int error) {
    WriteInChild();
    const std::vector<SyslogMessage> messages = syslog_.Take();
    ASSERT_THAT(messages, SizeIs(1));
    EXPECT_THAT(messages[0].text,
                EndsWith("open twlog file failed with errno [" + std::to_string(error) + "]."));
  }

 private:
  void RemoveLog() const {
    unlink(path_);
    rmdir(path_);
  }

  const char* path_;
  SyslogCapture syslog_;
};

TEST_P(SpecialLog, AFifoWithoutAReaderIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(Path(), 0600), 0);
  ExpectRefused(ENXIO);
}

TEST_P(SpecialLog, AFifoWithAReaderIsNotWritten) {
  ASSERT_EQ(mkfifo(Path(), 0600), 0);
  const UniqueFd reader(open(Path(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
  ASSERT_TRUE(reader.Valid());
  ExpectRefused(ENXIO);
  char byte = 0;
  EXPECT_EQ(read(reader.Get(), &byte, 1), 0);
}

TEST_P(SpecialLog, AFullFifoIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(Path(), 0600), 0);
  const UniqueFd pipe(open(Path(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
  const std::string page(4096, 'x');
  while (write(pipe.Get(), page.data(), page.size()) > 0) {
  }
  ExpectRefused(ENXIO);
}

TEST_P(SpecialLog, ADirectoryIsRefused) {
  ASSERT_EQ(mkdir(Path(), 0700), 0);
  ExpectRefused(EISDIR);
}

TEST_P(SpecialLog, ASocketIsRefused) {
  sockaddr_un address = {};
  address.sun_family = AF_UNIX;
  std::string(Path()).copy(address.sun_path, sizeof(address.sun_path) - 1);
  const UniqueFd socket_fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  ASSERT_EQ(bind(socket_fd.Get(), reinterpret_cast<sockaddr*>(&address), sizeof(address)), 0);
  ExpectRefused(ENXIO);
}

TEST_P(SpecialLog, ALinkToADeviceIsNotWritten) {
  ASSERT_EQ(symlink("/dev/null", Path()), 0);
  ExpectRefused(ENXIO);
}

// A directory with a pseudo-terminal of its own, made when the directory's ptmx is opened.
class Terminals {
 public:
  Terminals()
      : mounted_(mount("devpts", Folder(), "devpts", 0, "newinstance,ptmxmode=0600") == 0),
        leader_(open(directory_.File("ptmx").c_str(), O_RDWR | O_NOCTTY | O_NONBLOCK | O_CLOEXEC)) {
    int lock = 0;
    EXPECT_TRUE(mounted_ && ioctl(leader_.Get(), TIOCSPTLCK, &lock) == 0);
  }
  ~Terminals() {
    if (mounted_) umount2(Folder(), MNT_DETACH);
  }
  Terminals(const Terminals&) = delete;
  Terminals& operator=(const Terminals&) = delete;

  std::string Path() const { return directory_.File("0"); }

  // What was written to the terminal.
  std::string Written() const {
    char text[64];
    const ssize_t count = read(leader_.Get(), text, sizeof(text));
    return std::string(text, count > 0 ? static_cast<size_t>(count) : 0);
  }

 private:
  const char* Folder() const { return directory_.Path().c_str(); }

  TempDir directory_;
  bool mounted_;
  UniqueFd leader_;
};

// In a session of its own: the first terminal that a process of it opens without O_NOCTTY becomes
// the session's.
bool HasTerminalAfterALine() {
  setsid();
  Write();
  return open("/dev/tty", O_RDWR | O_CLOEXEC) != -1;
}

TEST(SpecialLogTerminal, IsNeitherWrittenNorTaken) {
  SyslogCapture syslog;
  const Terminals terminals;
  unlink(kMainLog);
  ASSERT_EQ(symlink(terminals.Path().c_str(), kMainLog), 0);
  EXPECT_EQ(RunInChild([] { return HasTerminalAfterALine() ? 1 : 0; }).code, 0);
  EXPECT_EQ(terminals.Written(), "");
  EXPECT_THAT(syslog.Take(), SizeIs(1));
  unlink(kMainLog);
}

TEST_P(SpecialLog, ALinkToARegularFileIsWritten) {
  const TempDir directory;
  ASSERT_EQ(symlink(directory.File("log").c_str(), Path()), 0);
  WriteInChild();
  EXPECT_THAT(ParseLog(ReadFile(directory.File("log"))), SizeIs(1));
}

// Opens the log and leases it; then tells through `ready` and gives the lease back when the kernel
// says that somebody wants to write.
int HoldALease(const char* path, int ready) {
  const UniqueFd fd(open(path, O_RDONLY | O_CLOEXEC));
  sigset_t io;
  sigemptyset(&io);
  sigaddset(&io, SIGIO);
  sigprocmask(SIG_BLOCK, &io, nullptr);
  const bool leased = fcntl(fd.Get(), F_SETLEASE, F_RDLCK) == 0;
  if (write(ready, leased ? "y" : "n", 1) != 1 || !leased) return 1;
  const struct timespec limit = {10, 0};
  if (sigtimedwait(&io, nullptr, &limit) != SIGIO) return 2;
  usleep(50000);  // the writer waits meanwhile
  return fcntl(fd.Get(), F_SETLEASE, F_UNLCK) == 0 ? 0 : 3;
}

TEST_P(SpecialLog, ALeasedFileIsWaitedForAndWritten) {
  WriteInChild();
  int ready[2];
  ASSERT_EQ(pipe2(ready, O_CLOEXEC), 0);
  const UniqueFd told(ready[0]);
  const UniqueFd tell(ready[1]);
  Child holder([&] { return HoldALease(Path(), tell.Get()); });
  char leased = 'n';
  ASSERT_EQ(read(told.Get(), &leased, 1), 1);
  if (leased != 'y') GTEST_SKIP() << "this file system has no leases";
  WriteInChild();
  EXPECT_EQ(holder.Wait().code, 0);
  EXPECT_THAT(ParseLog(ReadFile(Path())), SizeIs(2));
}

TEST_P(SpecialLog, AFileWhoseTypeCannotBeReadIsNotWritten) {
  Faults faults;
  faults.FailNth(Call::kFstat, 1, EIO);
  DescriptorGuard descriptors;
  Write(GetParam());
  EXPECT_EQ(ReadFile(Path()), "");
}

INSTANTIATE_TEST_SUITE_P(Logs, SpecialLog, ::testing::Values(LOG_TYPE_MAIN, LOG_TYPE_NOTIFICATION));

}  // namespace
