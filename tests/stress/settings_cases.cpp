// Writers of different keys of one settings file, readers without a lock, and death in between.
#include <fcntl.h>
#include <signal.h>
#include <sys/ptrace.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <cstring>
#include <random>

#include "tarnwick/platform/qlibcfile.h"
#include "tests/stress/processes.h"
#include "tests/stress/settings_lines.h"
#include "tests/support/files.h"

namespace {

constexpr int kReaders = 4;
constexpr double kSeconds = 200;

struct WriterRounds {
  std::atomic<int> started;
  std::atomic<int> finished;
};

struct ReaderReport {
  std::atomic<long> reads;
  std::atomic<long> problems;
  char first[256];
};

// The writers' and readers' processes and what they share.
class SettingsRun {
 public:
  SettingsRun() : attributes_(MakeSettingsFile()) {}

  void StartReaders();
  void StartWriter(int writer, int rounds);
  bool WriterEnded(int writer, CaseResult& result);
  void AwaitWriters(CaseResult& result);
  void KillWriter(int writer);

  // A round of the writer, whose process has ended, in this process.
  bool WriteHere(int writer);

  // Stops the readers and looks at what they found and at what there is in the end.
  void Finish(CaseResult& result);

 private:
  int RunWriter(int writer, int rounds);
  int RunReader(int reader);
  std::string ReadOneKey(int writer);
  std::string ReadWholeFile();

  struct stat attributes_;
  Shared<WriterRounds> rounds_{kSettingsWriters};
  Shared<ReaderReport> reports_{kReaders};
  Shared<std::atomic<bool>> stop_;
  std::vector<pid_t> readers_;
  pid_t writers_[kSettingsWriters] = {};
};

void SettingsRun::StartReaders() {
  for (int i = 0; i < kReaders; ++i) {
    readers_.push_back(Spawn([this, i] { return RunReader(i); }));
  }
}

void SettingsRun::StartWriter(int writer, int rounds) {
  writers_[writer] = Spawn([=] { return RunWriter(writer, rounds); });
}

// A writer that follows a killed one goes on after the round that it may have written.
int SettingsRun::RunWriter(int writer, int rounds) {
  WriterRounds& mine = rounds_[static_cast<size_t>(writer)];
  while (mine.finished < rounds) {
    const int round = ++mine.started;
    if (WriteRound(writer, round) != 0) return 1;
    mine.finished = round;
    if (!ReadOneKey(writer).empty()) return 2;
  }
  return 0;
}

int SettingsRun::RunReader(int reader) {
  ReaderReport& report = reports_[static_cast<size_t>(reader)];
  for (long i = 0; !*stop_; ++i) {
    const std::string problem = i % 4 == 3
                                    ? ReadWholeFile()
                                    : ReadOneKey(static_cast<int>((i + reader) % kSettingsWriters));
    ++report.reads;
    if (!problem.empty() && report.problems++ == 0) {
      strncpy(report.first, problem.c_str(), sizeof(report.first) - 1);
    }
  }
  return 0;
}

std::string SettingsRun::ReadOneKey(int writer) {
  const WriterRounds& rounds = rounds_[static_cast<size_t>(writer)];
  const int least = rounds.finished;
  char value[4096];
  const int length =
      QLIBCFileGetKeyValue(kSettingsFile, KeyOf(writer).c_str(), value, sizeof(value), 0);
  if (length < 1) return KeyOf(writer) + " is lost";
  return ProblemInValue(writer, value, least, rounds.started);
}

std::string SettingsRun::ReadWholeFile() {
  Rounds rounds;
  struct stat attributes = {};
  const int fd = open(kSettingsFile, O_RDONLY | O_CLOEXEC);
  fstat(fd, &attributes);
  std::string text(static_cast<size_t>(attributes.st_size), '\0');
  const ssize_t count = read(fd, text.data(), text.size());
  close(fd);
  if (count != static_cast<ssize_t>(text.size())) return "a file became shorter while it was read";
  if (!SameAttributes(attributes_, attributes)) return "mode or owner changed";
  return ProblemIn(text, &rounds);
}

bool SettingsRun::WriterEnded(int writer, CaseResult& result) {
  if (writers_[writer] == 0) return true;
  const auto status = WaitFor(writers_[writer], 0);
  if (!status) return false;
  writers_[writer] = 0;
  result.Expect(*status == 0, "writer " + std::to_string(writer) + ": " + StatusText(status));
  return true;
}

void SettingsRun::AwaitWriters(CaseResult& result) {
  for (int writer = 0; writer < kSettingsWriters; ++writer) {
    const auto status = WaitFor(writers_[writer], kSeconds);
    result.Expect(status == 0, "writer " + std::to_string(writer) + ": " + StatusText(status));
    if (!status) kill(writers_[writer], SIGKILL);
  }
}

void SettingsRun::KillWriter(int writer) {
  kill(writers_[writer], SIGKILL);
  waitpid(writers_[writer], nullptr, 0);
}

bool SettingsRun::WriteHere(int writer) {
  WriterRounds& rounds = rounds_[static_cast<size_t>(writer)];
  const int round = ++rounds.started;
  if (WriteRound(writer, round) != 0) return false;
  rounds.finished = round;
  return true;
}

void SettingsRun::Finish(CaseResult& result) {
  *stop_ = true;
  for (int i = 0; i < kReaders; ++i) {
    const auto status = WaitFor(readers_[static_cast<size_t>(i)], 10);
    result.Expect(status == 0, "a reader: " + StatusText(status));
    const ReaderReport& report = reports_[static_cast<size_t>(i)];
    result.Checked(report.reads);
    if (report.problems > 0) result.Fail(std::to_string(report.problems) + " x " + report.first);
  }
  for (int writer = 0; writer < kSettingsWriters; ++writer) {
    const std::string problem = ReadOneKey(writer);
    result.Expect(problem.empty(), problem);
  }
  ExpectGoodSettings(attributes_, result);
}

void WritersAndReaders(CaseResult& result) {
  const int rounds = result.Pick(10000, 400);
  SettingsRun run;
  run.StartReaders();
  for (int writer = 0; writer < kSettingsWriters; ++writer) run.StartWriter(writer, rounds);
  run.AwaitWriters(result);
  run.Finish(result);
  result.Done("8 writers x %d rounds, %d readers without a lock", rounds, kReaders);
}

void KillsAtRandom(CaseResult& result) {
  const int kills = result.Pick(1000, 100);
  constexpr int kNoEnd = 1000000000;
  std::mt19937 random(20231121);
  SettingsRun run;
  run.StartReaders();
  for (int writer = 0; writer < kSettingsWriters; ++writer) run.StartWriter(writer, kNoEnd);
  for (int i = 0; i < kills; ++i) {
    usleep(static_cast<useconds_t>(random() % 10000));
    const int writer = static_cast<int>(random() % kSettingsWriters);
    run.KillWriter(writer);
    run.StartWriter(writer, kNoEnd);
    for (int other = 0; other < kSettingsWriters; ++other) {
      if (run.WriterEnded(other, result)) run.StartWriter(other, kNoEnd);
    }
  }
  for (int writer = 0; writer < kSettingsWriters; ++writer) {
    run.KillWriter(writer);
    result.Expect(run.WriteHere(writer), "no write after the last kill");
  }
  result.Done("8 writers, %d readers, %d kills", kReaders, kills);
  run.Finish(result);
}

// Runs `body` in a process that is killed when it enters or leaves a system call for the
// `kill_at`th time. Results: false when it made fewer.
bool KilledAtStop(int kill_at, int (*body)(), CaseResult& result) {
  const pid_t pid = Spawn([=] {
    if (ptrace(PTRACE_TRACEME, 0, nullptr, nullptr) != 0) return 1;
    raise(SIGSTOP);
    return body();
  });
  int status = 0;
  waitpid(pid, &status, 0);
  if (!WIFSTOPPED(status)) {
    result.Fail("the process could not be traced");
    return false;
  }
  ptrace(PTRACE_SETOPTIONS, pid, nullptr, PTRACE_O_TRACESYSGOOD | PTRACE_O_EXITKILL);
  for (int stops = 0; stops < kill_at; ++stops) {
    ptrace(PTRACE_SYSCALL, pid, nullptr, nullptr);
    waitpid(pid, &status, 0);
    if (!WIFSTOPPED(status)) {
      result.Expect(status == 0, "the traced process: " + StatusText(status));
      return false;
    }
  }
  kill(pid, SIGKILL);
  waitpid(pid, &status, 0);
  return true;
}

// Kills `body`, which does one writer's round 1, at each of its system calls. The file then shows
// `before` or one of `after`, and others can write.
void KillAtEachCall(int (*body)(), const std::vector<Rounds>& allowed, int* kills,
                    CaseResult& result) {
  bool killed = true;
  for (int kill_at = 1; killed && kill_at < 1000; ++kill_at) {
    unlink(kSettingsFile);
    const struct stat before = MakeSettingsFile();
    killed = KilledAtStop(kill_at, body, result);
    *kills += killed ? 1 : 0;
    result.Checked(1);
    const std::string text = ReadFile(kSettingsFile);
    bool good = false;
    for (const Rounds& rounds : allowed) good = good || text == SettingsTextOf(rounds);
    result.Expect(good, "killed at stop " + std::to_string(kill_at) + ": another text");
    result.Expect(WriteRound(1, 1) == 0, "no write after a kill");
    ExpectGoodSettings(before, result);
  }
}

void KillAtEachSystemCall(CaseResult& result) {
  int kills = 0;
  KillAtEachCall([] { return WriteRound(0, 1); }, {{}, {1}}, &kills, result);
  KillAtEachCall([] { return WriteRound(kLevelsWriter, 1); },
                 {{}, {0, 0, 0, 0, 0, 0, 0, 1, 0}, {0, 0, 0, 0, 0, 0, 0, 1, 1}}, &kills, result);
  result.Done("%d kills: one key rewritten, a record saved", kills);
  result.Expect(kills > 40, "too few system calls were seen");
}

}  // namespace

std::vector<StressCase> SettingsCases() {
  return {
      {"settings", "8 writers, readers without a lock", WritersAndReaders},
      {"settings", "writers killed at random", KillsAtRandom},
      {"settings", "writer killed at each system call", KillAtEachSystemCall},
  };
}
