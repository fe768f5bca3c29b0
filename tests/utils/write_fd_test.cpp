// Writing a whole buffer to a descriptor.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <functional>
#include <string>
#include <thread>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Le;

// A pipe; the test closes an end by Close.
class Pipe {
 public:
  Pipe() { EXPECT_EQ(pipe2(ends_, O_CLOEXEC), 0); }
  ~Pipe() {
    CloseReader();
    close(ends_[1]);
  }
  Pipe(const Pipe&) = delete;
  Pipe& operator=(const Pipe&) = delete;

  int Writer() const { return ends_[1]; }
  void CloseReader() {
    if (ends_[0] >= 0) close(ends_[0]);
    ends_[0] = -1;
  }
  void SetNonBlocking() const { fcntl(ends_[1], F_SETFL, O_NONBLOCK); }

  std::string Read(size_t count) const {
    std::string text;
    while (text.size() < count) {
      char buf[65536];
      const ssize_t n = read(ends_[0], buf, sizeof(buf));
      if (n <= 0) break;
      text.append(buf, static_cast<size_t>(n));
    }
    return text;
  }

 private:
  int ends_[2];
};

std::string ErrorMessage(int fd, int error) {
  return "Write fd[" + std::to_string(fd) + "] error[" + std::to_string(error) + "]\n";
}

TEST(WriteFd, ALengthOfZeroOrLessReturnsZeroWithoutAWrite) {
  Faults faults;
  for (const int length : {0, -1, INT_MIN}) EXPECT_EQ(WriteFd(1, "x", length), 0);
  EXPECT_EQ(WriteFd(-1, nullptr, 0), 0);
  EXPECT_EQ(faults.Count(Call::kWrite), 0);
}

TEST(WriteFd, ADescriptorThatTakesNothingIsTriedAgainEveryTenMilliseconds) {
  const LogCapture log;
  const Pipe pipe;
  Faults faults;
  int64_t now = 5000000;
  faults.Clock([&] {
    return timeval{static_cast<time_t>(now / 1000000), static_cast<suseconds_t>(now % 1000000)};
  });
  faults.FailRange(Call::kWrite, 1, 500, EAGAIN).Return(Call::kUsleep, 1, INT_MAX, 0);
  faults.Before(Call::kUsleep,
                [&](int) { now += static_cast<int64_t>(faults.Sizes(Call::kUsleep).back()); });
  EXPECT_EQ(WriteFd(pipe.Writer(), "text", 4), 4);
  EXPECT_EQ(faults.Count(Call::kWrite), 501);
  EXPECT_EQ(now, 5000000 + 500 * 10000);
  EXPECT_THAT(faults.Sizes(Call::kUsleep), Each(Le(10000u)));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(WriteFd, SixEmptyWritesEndTheCallWithAShortCount) {
  const LogCapture log;
  const Pipe pipe;
  Faults faults;
  faults.Limit(Call::kWrite, 2).Return(Call::kWrite, 3, INT_MAX, 0);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abcdefgh", 8), 4);
  EXPECT_EQ(faults.Count(Call::kWrite), 8);
  EXPECT_EQ(faults.Count(Call::kUsleep), 0);
  EXPECT_EQ(pipe.Read(4), "abcd");
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(WriteFd, BelowNoticeAWriteErrorIsNotLogged) {
  LogCapture log;
  log.SetLevel(LOG_CATEG_UTILS, 2);
  EXPECT_EQ(WriteFd(-1, "x", 1), 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
  log.SetLevel(LOG_CATEG_UTILS, 3);
  EXPECT_EQ(WriteFd(-1, "x", 1), 0);
  EXPECT_THAT(log.Messages(), ElementsAre(ErrorMessage(-1, EBADF)));
}

TEST(WriteFd, LogsAnErrorWithDescriptorAndErrno) {
  const LogCapture log;
  EXPECT_EQ(WriteFd(-1, "x", 1), 0);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsLog("utils", "notice", "utils", "WriteFd", ErrorMessage(-1, EBADF))));
}

TEST(WriteFd, WritesTheWholeBuffer) {
  const LogCapture log;
  const Pipe pipe;
  EXPECT_EQ(WriteFd(pipe.Writer(), "a\0b", 3), 3);
  EXPECT_EQ(pipe.Read(3), std::string("a\0b", 3));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(WriteFd, ShortWritesGoOnWhereTheyEnded) {
  const Pipe pipe;
  Faults faults;
  faults.Limit(Call::kWrite, 3);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abcdefgh", 8), 8);
  EXPECT_THAT(faults.Sizes(Call::kWrite), ElementsAre(8, 5, 2));
  EXPECT_EQ(pipe.Read(8), "abcdefgh");
}

TEST(WriteFd, EmptyWritesAreCountedForTheWholeCall) {
  const Pipe pipe;
  Faults faults;
  faults.Limit(Call::kWrite, 1)
      .Return(Call::kWrite, 1, 3, 0)
      .Return(Call::kWrite, 5, 6, 0)
      .Return(Call::kWrite, 8, 8, 0);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abcdefgh", 8), 2);
  EXPECT_EQ(faults.Count(Call::kWrite), 8);
}

TEST(WriteFd, FiveEmptyWritesAreForgiven) {
  const Pipe pipe;
  Faults faults;
  faults.Return(Call::kWrite, 1, 5, 0);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abc", 3), 3);
}

TEST(WriteFd, AnInterruptedWriteIsPacedAndTriedAgain) {
  const Pipe pipe;
  Faults faults;
  faults.FailRange(Call::kWrite, 1, 2, EINTR);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abc", 3), 3);
  EXPECT_EQ(faults.Count(Call::kUsleep) + faults.Count(Call::kSchedYield), 2);
}

TEST(WriteFd, AnErrorAfterSomeBytesReturnsTheirCount) {
  const LogCapture log;
  const Pipe pipe;
  Faults faults;
  faults.Limit(Call::kWrite, 2).FailNth(Call::kWrite, 3, EIO);
  EXPECT_EQ(WriteFd(pipe.Writer(), "abcdefgh", 8), 4);
  EXPECT_EQ(errno, EIO);
  EXPECT_THAT(log.Messages(), ElementsAre(ErrorMessage(pipe.Writer(), EIO)));
}

TEST(WriteFd, EachWriteMayFail) {
  const LogCapture log;
  const Pipe pipe;
  int written_before = 0;
  ForEachFailingCall(
      Call::kWrite,
      [&](Faults& faults) {
        faults.Limit(Call::kWrite, 2);
        EXPECT_EQ(WriteFd(pipe.Writer(), "abcdef", 6), written_before);
        written_before += 2;
      },
      ENOSPC);
  EXPECT_EQ(written_before, 8);
  EXPECT_EQ(log.Lines().size(), 3u);
}

TEST(WriteFd, AFullPipeIsWaitedForUntilTheReaderTakesMore) {
  const Pipe pipe;
  pipe.SetNonBlocking();
  const std::string text(1 << 20, 'x');
  std::string read;
  std::thread reader([&] {
    usleep(30000);  // the pipe is full by then
    read = pipe.Read(text.size());
  });
  EXPECT_EQ(WriteFd(pipe.Writer(), text.data(), static_cast<int>(text.size())), 1 << 20);
  reader.join();
  EXPECT_EQ(read, text);
}

TEST(WriteFd, ErrnoOutlivesTheLogLine) {
  const LogCapture log;
  errno = 0;
  EXPECT_EQ(WriteFd(-1, "x", 1), 0);
  EXPECT_EQ(errno, EBADF);
}

// Each in a child, because a failure would end the process.
void ExpectInChild(const std::function<bool()>& body) {
  const ChildResult result = RunInChild([&] {
    signal(SIGPIPE, SIG_DFL);
    return body() ? 0 : 1;
  });
  EXPECT_EQ(result.signal, 0);
  EXPECT_EQ(result.code, 0);
}

bool BrokenPipeIsAnError() {
  Pipe pipe;
  pipe.CloseReader();
  errno = 0;
  return WriteFd(pipe.Writer(), "x", 1) == 0 && errno == EPIPE;
}

bool IsMember(int (*read)(sigset_t*)) {
  sigset_t set;
  read(&set);
  return sigismember(&set, SIGPIPE) == 1;
}

bool Blocked() {
  return IsMember([](sigset_t* set) { return pthread_sigmask(SIG_BLOCK, nullptr, set); });
}

bool Pending() {
  return IsMember(sigpending);
}

void BlockSigpipe() {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, SIGPIPE);
  pthread_sigmask(SIG_BLOCK, &set, nullptr);
}

TEST(WriteFd, AClosedPeerIsLoggedAndDoesNotEndTheProcess) {
  const LogCapture log;
  ExpectInChild([] { return BrokenPipeIsAnError() && !Blocked() && !Pending(); });
  ASSERT_EQ(log.Lines().size(), 1u);
  EXPECT_NE(log.Messages()[0].find("error[32]\n"), std::string::npos);
}

TEST(WriteFd, AClosedConnectionIsTheSame) {
  ExpectInChild([] {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) return false;
    close(ends[1]);
    return WriteFd(ends[0], "x", 1) == 0 && errno == EPIPE;
  });
}

TEST(WriteFd, ACallersBlockedSignalStaysBlockedAndIsNotLeftPending) {
  ExpectInChild([] {
    BlockSigpipe();
    return BrokenPipeIsAnError() && Blocked() && !Pending();
  });
}

TEST(WriteFd, ASignalThatWasPendingBeforeIsStillPending) {
  ExpectInChild([] {
    BlockSigpipe();
    raise(SIGPIPE);
    return BrokenPipeIsAnError() && Blocked() && Pending();
  });
}

TEST(WriteFd, ACallersHandlerStaysAndIsNotCalled) {
  ExpectInChild([] {
    static volatile sig_atomic_t calls;
    calls = 0;
    const auto handler = [](int) { calls = calls + 1; };
    signal(SIGPIPE, handler);
    return BrokenPipeIsAnError() && calls == 0 && signal(SIGPIPE, SIG_DFL) == +handler;
  });
}

TEST(WriteFd, AfterASuccessMaskAndHandlerAreAsBefore) {
  ExpectInChild([] {
    const Pipe pipe;
    return WriteFd(pipe.Writer(), "x", 1) == 1 && !Blocked() && !Pending() &&
           signal(SIGPIPE, SIG_DFL) == SIG_DFL;
  });
}

}  // namespace
