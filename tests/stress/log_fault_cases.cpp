// What happens to the log's file system, or to the process that holds the lock, while others write.
#include <fcntl.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <csignal>

#include "tests/stress/log_team.h"
#include "tests/support/faults.h"
#include "tests/support/log_capture.h"
#include "tests/support/syslog_capture.h"

namespace {

constexpr int kProcesses = 4;
constexpr double kSeconds = 30;

// A file that takes the space of a file system.
class DiskFiller {
 public:
  DiskFiller() : fd_(open(kPath, O_WRONLY | O_CREAT | O_CLOEXEC, 0600)) {}
  ~DiskFiller() { close(fd_); }
  DiskFiller(const DiskFiller&) = delete;
  DiskFiller& operator=(const DiskFiller&) = delete;

  // Takes all that is free.
  void Fill() {
    const std::vector<char> piece(4096, 'b');
    while (pwrite(fd_, piece.data(), piece.size(), size_) > 0) size_ += 4096;
  }

  void Release(off_t bytes) {
    size_ = std::max<off_t>(size_ - bytes, 0);
    if (ftruncate(fd_, size_) != 0) perror("ftruncate");
  }

  void Remove() { Release(size_); }

 private:
  static constexpr char kPath[] = "/var/log/tarnwick/filler";
  int fd_;
  off_t size_ = 0;
};

void Conclude(WriterPool& team, CaseResult& result) {
  team.Stop(result);
  LogVerifier verifier(team.Facts());
  LogFiles().Verify(verifier, result);
  result.Expect(verifier.WholeLines() < team.Lines(), "the fault cost no line");
}

// Space comes and goes, so that writers meet the end of it at every point of a line.
void FullDisk(CaseResult& result) {
  const int refills = result.Pick(200, 40);
  if (mount("tmpfs", kLogFolder, "tmpfs", 0, "size=256m,mode=755") != 0) {
    return result.Fail("no file system");
  }
  WriterPool team(kProcesses);
  team.AwaitLines(20, result);
  team.FaultBegins();
  DiskFiller filler;
  for (int i = 0; i < refills; ++i) {
    filler.Fill();
    usleep(10000);
    filler.Release(4096 * (1 + i % 64));
    usleep(2000);
  }
  filler.Remove();
  team.FaultEnds();
  team.AwaitLines(50, result);
  Conclude(team, result);
  result.Done("4 processes x 2 threads, %ld lines begun, %d times full", team.Lines(), refills);
}

// Counts what the system log is told while files cannot be opened.
class ReportCounter {
 public:
  void Wait(int milliseconds, CaseResult& result) {
    for (int i = 0; i < milliseconds; ++i) {
      Count(result);
      usleep(1000);
    }
  }

  void Count(CaseResult& result) {
    for (const SyslogMessage& message : syslog_.Take()) {
      ++reports_;
      if (message.text.find(": open twlog file failed with errno [") == std::string::npos) {
        result.Fail("reported: " + message.text);
      }
    }
  }

  long Reports() const { return reports_; }

 private:
  SyslogCapture syslog_;
  long reports_ = 0;
};

// Calls `begin` and `end` around a time in which the log cannot be opened. Each line that this
// costs has its report, and no other.
void WithoutAFile(CaseResult& result, bool (*begin)(), bool (*end)()) {
  ReportCounter reports;
  WriterPool team(kProcesses);
  team.AwaitLines(20, result);
  team.FaultBegins();
  result.Expect(begin(), "the fault could not be made");
  reports.Wait(result.Pick(3000, 300), result);
  result.Expect(end(), "the fault could not be mended");
  reports.Wait(50, result);
  team.FaultEnds();
  team.AwaitLines(50, result);
  team.Stop(result);
  reports.Count(result);
  LogVerifier verifier(team.Facts());
  LogFiles().Verify(verifier, result);
  result.Done("4 processes x 2 threads, %ld lines begun, %ld reported lost", team.Lines(),
              reports.Reports());
  result.Expect(reports.Reports() > 0, "the fault cost no line");
  result.Expect(reports.Reports() == verifier.MissingLines(),
                std::to_string(verifier.MissingLines()) + " lines are missing");
  result.Expect(verifier.CutLines() == 0, "lines are cut");
}

void MissingFolder(CaseResult& result) {
  WithoutAFile(
      result, [] { return mount("tmpfs", "/var/log", "tmpfs", 0, nullptr) == 0; },
      [] { return umount2("/var/log", MNT_DETACH) == 0; });
}

bool Remount(unsigned long flags) {
  // Busy as long as a writer has the file open.
  for (int i = 0; i < 100000; ++i) {
    if (mount(nullptr, kLogFolder, nullptr, MS_REMOUNT | MS_BIND | flags, nullptr) == 0)
      return true;
    usleep(50);
  }
  return false;
}

void ReadOnlyFileSystem(CaseResult& result) {
  WithoutAFile(
      result, [] { return Remount(MS_RDONLY); }, [] { return Remount(0); });
}

void LimitFileSize() {
  constexpr rlim_t kLimit = 4 << 20;
  const struct rlimit limit = {kLimit, kLimit};
  setrlimit(RLIMIT_FSIZE, &limit);
}

bool LogHasReached(off_t size) {
  for (int i = 0; i < 20000; ++i) {
    struct stat status = {};
    if (stat(kMainLog, &status) == 0 && status.st_size >= size) return true;
    usleep(1000);
  }
  return false;
}

// The processes keep the default for SIGXFSZ, which ends the one that writes past the limit.
void FileSizeLimit(CaseResult& result) {
  const int rounds = result.Pick(5, 1);
  long lines = 0;
  for (int i = 0; i < rounds; ++i) {
    unlink(kMainLog);
    LogFiles files;
    WriterPool team(kProcesses, LimitFileSize);
    team.FaultBegins();
    result.Expect(LogHasReached(4 << 20), "the limit was not reached");
    usleep(200000);
    files.Rotate();
    usleep(10000);  // those who had it open before
    team.FaultEnds();
    team.AwaitLines(10, result);
    team.Stop(result);
    LogVerifier verifier(team.Facts());
    files.Verify(verifier, result);
    result.Expect(verifier.MissingLines() > 0, "the limit cost no line");
    lines += team.Lines();
  }
  result.Done("4 processes x 2 threads, %ld lines begun, %d times at 4 MiB", lines, rounds);
}

// A process that stops with the lock in its hands, before it has written anything.
pid_t StartHolder(WriterProgress& progress) {
  const pid_t pid = Spawn([&progress] {
    progress.pid = getpid();
    Faults faults;
    faults.Before(Call::kLocaltimeR, [](int) { raise(SIGSTOP); });
    WriteNextLine(0, progress);
    return 0;
  });
  int status = 0;
  waitpid(pid, &status, WUNTRACED);
  return pid;
}

pid_t StartWaiter(int writer, WriterProgress& progress) {
  return Spawn([=, &progress] {
    progress.pid = getpid();
    WriteNextLine(writer, progress);
    return DescriptorsOn(kLogFolder);
  });
}

// Writers wait while the holder is stopped; then `signal` lets it go on or ends it.
void StopHolder(int signal, CaseResult& result) {
  constexpr int kWriters = 9;  // with the holder
  unlink(kMainLog);
  Shared<WriterProgress> progress(kWriters);
  std::vector<pid_t> pids = {StartHolder(progress[0])};
  for (int i = 1; i < kWriters; ++i) {
    pids.push_back(StartWaiter(i, progress[static_cast<size_t>(i)]));
  }
  usleep(50000);
  struct stat status = {};
  result.Expect(stat(kMainLog, &status) == 0 && status.st_size == 0, "somebody did not wait");
  kill(pids[0], signal);
  std::vector<WriterFacts> facts;
  for (size_t i = 0; i < kWriters; ++i) {
    const auto ended = WaitFor(pids[i], kSeconds);
    if (!ended) kill(pids[i], SIGKILL);
    const bool good = i == 0 && signal == SIGKILL ? ended == SIGKILL : ended == 0;
    result.Expect(good, "writer " + std::to_string(i) + ": " + StatusText(ended));
    facts.push_back({progress[i].pid, 1, 0, progress[i].finished == 1 ? 0 : 1});
  }
  LogVerifier verifier(facts);
  LogFiles().Verify(verifier, result);
}

void StoppedLockHolder(CaseResult& result) {
  const int rounds = result.Pick(50, 5);
  for (int i = 0; i < rounds; ++i) {
    StopHolder(SIGCONT, result);
    StopHolder(SIGKILL, result);
  }
  result.Done("8 waiting writers; %d holders went on, %d were killed", rounds, rounds);
}

}  // namespace

std::vector<StressCase> LogFaultCases() {
  return {
      {"log", "full disk", FullDisk},
      {"log", "missing folder", MissingFolder},
      {"log", "read-only file system", ReadOnlyFileSystem},
      {"log", "file size limit", FileSizeLimit},
      {"log", "stopped lock holder", StoppedLockHolder},
  };
}
