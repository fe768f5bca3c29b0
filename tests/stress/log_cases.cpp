// Many processes write to one log that is rotated, while they are killed or get signals.
#include <fcntl.h>
#include <pthread.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <memory>
#include <random>
#include <sstream>
#include <thread>

#include "tests/stress/log_team.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;

constexpr int kProcesses = 16;
constexpr int kThreads = 4;
constexpr int kLinesOfAThread = 150;
constexpr int kMostProcesses = 2000;
constexpr double kSeconds = 60;

// Keeps kProcesses of them running until enough were killed; one that ends by itself is replaced as
// well.
class KilledWriters {
 public:
  explicit KilledWriters(int kills)
      : kills_left_(kills), progress_(static_cast<size_t>(kMostProcesses * kThreads)) {}

  void Run(LogFiles& files, CaseResult& result);
  std::vector<WriterFacts> Facts() const;
  // Those that were killed with the lock in their hands.
  int Holders() const { return holders_; }
  int Processes() const { return static_cast<int>(processes_.size()); }

 private:
  struct Process {
    pid_t pid;
    bool running;
    bool killed;
  };

  void Start();
  int RunProcess(int process);
  void RunThread(int writer);
  void KillOne(CaseResult& result);
  Process* RandomProcess();
  Process* StopLockHolder(CaseResult& result);
  void NoteEnd(Process& process, int status, CaseResult& result);
  void Reap(CaseResult& result);
  int Running() const;

  int kills_left_;
  int holders_ = 0;
  Shared<WriterProgress> progress_;
  std::vector<Process> processes_;
  std::mt19937 random_{20231121};
};

void KilledWriters::Run(LogFiles& files, CaseResult& result) {
  const auto deadline = steady_clock::now() + std::chrono::duration<double>(kSeconds);
  auto next_rotation = steady_clock::now() + milliseconds(100);
  auto next_kill = steady_clock::now() + milliseconds(200);
  while (kills_left_ > 0 || Running() > 0) {
    while (kills_left_ > 0 && Running() < kProcesses && Processes() < kMostProcesses) Start();
    if (steady_clock::now() >= next_rotation) {
      files.Rotate();
      next_rotation += milliseconds(100);
    }
    if (kills_left_ > 0 && steady_clock::now() >= next_kill) {
      KillOne(result);
      next_kill += milliseconds(random_() % 150);
    }
    Reap(result);
    usleep(500);
    if (steady_clock::now() > deadline) return result.Fail("the writers do not end");
  }
}

void KilledWriters::Start() {
  const int process = Processes();
  const pid_t pid = Spawn([=] { return RunProcess(process); });
  processes_.push_back({pid, true, false});
}

int KilledWriters::RunProcess(int process) {
  std::vector<std::thread> others;
  for (int i = 1; i < kThreads; ++i) {
    others.emplace_back([=] { RunThread(process * kThreads + i); });
  }
  RunThread(process * kThreads);
  for (std::thread& other : others) other.join();
  return DescriptorsOn(kLogFolder);
}

// In bursts, so that all wait for the lock at a time and the log stays of a size that can be
// checked.
void KilledWriters::RunThread(int writer) {
  WriterProgress& progress = progress_[static_cast<size_t>(writer)];
  progress.pid = getpid();
  for (int i = 0; i < kLinesOfAThread; ++i) {
    WriteNextLine(writer, progress);
    if (i % 10 == 9) usleep(150000);
  }
}

// Any of them at any time, or, every second time, one that has the lock of the log.
void KilledWriters::KillOne(CaseResult& result) {
  if (random_() % 2 == 0) usleep(static_cast<useconds_t>(random_() % 1000));
  Process* chosen = random_() % 2 == 0 ? RandomProcess() : StopLockHolder(result);
  if (chosen == nullptr) return;
  chosen->killed = kill(chosen->pid, SIGKILL) == 0;
}

KilledWriters::Process* KilledWriters::RandomProcess() {
  std::vector<Process*> running;
  for (Process& process : processes_) {
    if (process.running) running.push_back(&process);
  }
  return running.empty() ? nullptr : running[random_() % running.size()];
}

bool HoldsALock(pid_t pid) {
  std::istringstream locks(ReadFile("/proc/locks"));
  const std::string holder = " WRITE " + std::to_string(pid) + " ";
  for (std::string line; std::getline(locks, line);) {
    const bool waits = line.find("->") != std::string::npos;
    if (!waits && line.find(holder) != std::string::npos) return true;
  }
  return false;
}

// Stops one after the other until one has stopped in a line.
KilledWriters::Process* KilledWriters::StopLockHolder(CaseResult& result) {
  for (int tries = 0; tries < 500; ++tries) {
    Process* const process = RandomProcess();
    if (process == nullptr) return nullptr;
    int status = 0;
    kill(process->pid, SIGSTOP);
    waitpid(process->pid, &status, WUNTRACED);
    if (!WIFSTOPPED(status)) {
      NoteEnd(*process, status, result);
    } else if (HoldsALock(process->pid)) {
      ++holders_;
      return process;
    } else {
      kill(process->pid, SIGCONT);
    }
  }
  return nullptr;
}

void KilledWriters::Reap(CaseResult& result) {
  for (Process& process : processes_) {
    if (!process.running) continue;
    const auto status = WaitFor(process.pid, 0);
    if (status) NoteEnd(process, *status, result);
  }
}

// One that had just ended by itself when it was killed is a survivor.
void KilledWriters::NoteEnd(Process& process, int status, CaseResult& result) {
  process.running = false;
  process.killed = process.killed && WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL;
  if (process.killed) {
    --kills_left_;
  } else {
    result.Expect(status == 0, "a writer: " + StatusText(status));
  }
}

int KilledWriters::Running() const {
  return static_cast<int>(std::count_if(processes_.begin(), processes_.end(),
                                        [](const Process& process) { return process.running; }));
}

std::vector<WriterFacts> KilledWriters::Facts() const {
  std::vector<WriterFacts> facts;
  for (size_t i = 0; i < processes_.size() * kThreads; ++i) {
    const WriterProgress& progress = progress_[i];
    WriterFacts writer{processes_[i / kThreads].pid, progress.started, 0, 0};
    if (processes_[i / kThreads].killed) {
      writer.lossy_from = progress.finished;
      writer.lossy_to = progress.started;
    }
    facts.push_back(writer);
  }
  return facts;
}

void KillsAndRotation(CaseResult& result) {
  const int kills = result.Pick(200, 30);
  LogFiles files;
  KilledWriters writers(kills);
  writers.Run(files, result);
  LogVerifier verifier(writers.Facts());
  files.Verify(verifier, result);
  result.Done("%d kills, %d with the lock, %ld lines cut; %d rotations, %d processes", kills,
              writers.Holders(), verifier.CutLines(), files.Rotations(), writers.Processes());
  result.Expect(files.Rotations() > 0 && verifier.WholeLines() > 0, "nothing was written");
}

void IgnoreSignal(int) {}

// Sends signals without SA_RESTART to the threads of its process until the process ends.
void SignalThreads(const std::vector<pthread_t>& threads) {
  for (;;) {
    for (const pthread_t thread : threads) pthread_kill(thread, SIGUSR1);
    usleep(100);
  }
}

// Results: how often a signal ended a wait for the lock; a line takes and releases it once.
long WriteCountingWaits(int writer, int lines, WriterProgress& progress) {
  const Faults faults;
  progress.pid = getpid();
  for (int i = 0; i < lines; ++i) WriteNextLine(writer, progress);
  return faults.Count(Call::kFlock) - 2L * lines;
}

int WriteUnderSignals(int process, int lines, Shared<WriterProgress>& progress,
                      std::atomic<long>* interrupted) {
  struct sigaction action = {};
  action.sa_handler = IgnoreSignal;
  sigaction(SIGUSR1, &action, nullptr);
  auto ended = std::make_shared<std::atomic<int>>(0);
  std::vector<std::thread> writers;
  std::vector<pthread_t> handles;
  for (int writer = process * kThreads; writer < (process + 1) * kThreads; ++writer) {
    writers.emplace_back([=, &progress] {
      *interrupted += WriteCountingWaits(writer, lines, progress[static_cast<size_t>(writer)]);
      ++*ended;
    });
    handles.push_back(writers.back().native_handle());
  }
  // The handles stay valid to the end: they are not joined before the signals end with the process.
  std::thread(SignalThreads, handles).detach();
  while (*ended < kThreads) usleep(1000);
  _exit(DescriptorsOn(kLogFolder));
}

// Holds the lock for 3 ms at a time, so that the signals hit writers that wait for it.
long HoldLockUntilEnd(const std::vector<pid_t>& pids, CaseResult& result) {
  const int fd = open(kMainLog, O_WRONLY | O_CREAT | O_CLOEXEC, 0666);
  long holds = 0;
  for (const pid_t pid : pids) {
    const auto deadline = steady_clock::now() + std::chrono::duration<double>(kSeconds);
    std::optional<int> status;
    while (!(status = WaitFor(pid, 0)) && steady_clock::now() < deadline) {
      flock(fd, LOCK_EX);
      usleep(3000);
      flock(fd, LOCK_UN);
      usleep(300);
      ++holds;
    }
    result.Expect(status == 0, "a writer: " + StatusText(status));
  }
  close(fd);
  return holds;
}

void SignalsInTheWaitForTheLock(CaseResult& result) {
  constexpr int kSignalled = 4;
  const int lines = result.Pick(2000, 200);
  Shared<WriterProgress> progress(kSignalled * kThreads);
  Shared<std::atomic<long>> interrupted;
  std::vector<pid_t> pids;
  for (int process = 0; process < kSignalled; ++process) {
    pids.push_back(
        Spawn([&, process] { return WriteUnderSignals(process, lines, progress, &*interrupted); }));
  }
  const long holds = HoldLockUntilEnd(pids, result);
  std::vector<WriterFacts> facts;
  for (size_t i = 0; i < kSignalled * kThreads; ++i)
    facts.push_back({progress[i].pid, lines, 0, 0});
  LogVerifier verifier(facts);
  LogFiles().Verify(verifier, result);
  result.Done("4 processes x 4 threads, lock held %ld times, %ld waits interrupted", holds,
              interrupted->load());
  result.Expect(*interrupted > 0, "no signal came in a wait");
}

}  // namespace

std::vector<StressCase> LogCases() {
  return {
      {"log", "16 processes x 4 threads, rotation, kills", KillsAndRotation},
      {"log", "signals while waiting for the lock", SignalsInTheWaitForTheLock},
  };
}
