// Runs each operation of the library once for each of its allocations and system calls, with that
// call failing, and prints what went wrong and a table.
//
//   tarnwick_torture [--jobs N] [OPERATION...]          all operations, or these, N at once
//   tarnwick_torture OPERATION --fault FAULT --point N [--cold]  one run again
//   tarnwick_torture --quick [OPERATION...]             none as the first of a process, and unless
//                                                       named none with a TLS handshake
//   tarnwick_torture --cancel [OPERATION...]            the thread is cancelled at each system call
//                                                       instead, after a first run
//   tarnwick_torture --self-check                       finds the planted mistakes
//   tarnwick_torture --list                             names the operations and the faults
//
// Each operation is tortured in a child process, so that a crash is a failure of one run: the next
// child goes on after it.
#include <signal.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "tests/torture/operations.h"
#include "tests/torture/sweep.h"

// A freed block need not be watched for longer than a run, which saves time.
extern "C" const char* __asan_default_options() {
  return "quarantine_size_mb=16:malloc_context_size=10";
}

namespace {

using Clock = std::chrono::steady_clock;

// So many crashes of one operation end its sweep.
constexpr int kMostCrashes = 50;

struct Arguments {
  std::vector<std::string> names;
  Selection selection;
  int jobs = static_cast<int>(std::max(1U, std::thread::hardware_concurrency()));
  bool quick = false;
  bool cancel = false;
  bool list = false;
  bool self_check = false;
};

// An operation's sweep, made by one child after the other.
struct Job {
  Operation operation = {};
  Selection selection = {};
  Progress* progress = nullptr;
  pid_t child = -1;
  int crashes = 0;
  Clock::time_point started = {};
  double seconds = 0;
};

std::vector<Operation> AllOperations() {
  std::vector<Operation> all;
  for (const auto& some :
       {LogOperations(), UtilsOperations(), ClientOperations(), PeerOperationsUnderTorture()}) {
    all.insert(all.end(), some.begin(), some.end());
  }
  return all;
}

Job NewJob(const Operation& operation, const Selection& selection) {
  void* const memory =
      mmap(nullptr, sizeof(Progress), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  Job job;
  job.operation = operation;
  job.selection = selection;
  job.progress = new (memory) Progress();
  return job;
}

void Start(Job* job) {
  fflush(nullptr);
  if (job->started == Clock::time_point()) job->started = Clock::now();
  job->progress->finished = false;
  job->child = fork();
  if (job->child != 0) return;
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  exit(FaultSweep(job->operation, job->selection, job->progress) ? 0 : 1);
}

std::string EndOf(int status) {
  if (WIFSIGNALED(status)) return std::string("ended by signal ") + strsignal(WTERMSIG(status));
  return "ended with exit code " + std::to_string(WEXITSTATUS(status));
}

// After a crash the sweep goes on after its run. Results: false when there is nothing more to do.
bool GoOn(Job* job, int status) {
  Progress* const progress = job->progress;
  if (status == 0) return false;
  if (progress->finished) {
    NoteMistake(job->operation, ("memory is lost at the end: " + EndOf(status)).c_str(), progress);
    return false;
  }
  if (!progress->timed_out) NoteMistake(job->operation, EndOf(status).c_str(), progress);
  progress->timed_out = false;
  if (progress->current.fault == Fault::kNone || job->selection.only_first) return false;
  job->selection.first = {progress->current.fault, progress->current.number + 1};
  return ++job->crashes < kMostCrashes;
}

std::string NameOf(const Job& job) {
  return std::string(job.operation.name) + (job.selection.cold ? " (cold)" : "");
}

void PrintHeader() {
  printf("%-24s %11s %12s %8s %8s %8s\n", "operation", "allocations", "system calls", "points",
         "failures", "seconds");
}

void PrintRow(const std::string& name, const Progress& progress, double seconds) {
  printf("%-24s %11ld %12ld %8ld %8ld %8.1f\n", name.c_str(), progress.allocations, progress.calls,
         progress.points, progress.failures, seconds);
  fflush(stdout);
}

void WaitForOne(std::vector<Job>& jobs) {
  int status = 0;
  const pid_t ended = wait(&status);
  for (Job& job : jobs) {
    if (job.child != ended) continue;
    job.child = -1;
    if (GoOn(&job, status)) {
      Start(&job);
      return;
    }
    job.seconds = std::chrono::duration<double>(Clock::now() - job.started).count();
    PrintRow(NameOf(job), *job.progress, job.seconds);
  }
}

long Running(const std::vector<Job>& jobs) {
  long running = 0;
  for (const Job& job : jobs) running += job.child > 0 ? 1 : 0;
  return running;
}

// Results: the failures of all.
long RunAll(std::vector<Job>& jobs, int most_at_once) {
  PrintHeader();
  const Clock::time_point started = Clock::now();
  for (Job& job : jobs) {
    while (Running(jobs) >= most_at_once) WaitForOne(jobs);
    Start(&job);
  }
  while (Running(jobs) > 0) WaitForOne(jobs);
  Progress sum = {};
  for (const Job& job : jobs) {
    sum.allocations += job.progress->allocations;
    sum.calls += job.progress->calls;
    sum.points += job.progress->points;
    sum.failures += job.progress->failures;
  }
  PrintRow("all", sum, std::chrono::duration<double>(Clock::now() - started).count());
  return sum.failures;
}

// An operation's sweeps: one after a first run, and one as the first run of a process. A single
// point is in one of them.
void AddJobs(const Operation& operation, const Arguments& arguments, std::vector<Job>* jobs) {
  const Selection& selection = arguments.selection;
  const bool all = !selection.only_first;
  if (all || !selection.cold) jobs->push_back(NewJob(operation, selection));
  if (!operation.cold || arguments.quick || arguments.cancel || !(all || selection.cold)) return;
  Selection cold = selection;
  cold.cold = true;
  jobs->push_back(NewJob(operation, cold));
}

// Results: false for an operation that does not exist.
bool Choose(const Arguments& arguments, std::vector<Job>* jobs) {
  const std::vector<Operation> all = AllOperations();
  for (const Operation& operation : all) {
    const bool wanted = arguments.names.empty() && !(arguments.quick && operation.slow);
    if (wanted) AddJobs(operation, arguments, jobs);
  }
  for (const std::string& name : arguments.names) {
    const size_t before = jobs->size();
    for (const Operation& operation : all) {
      if (name == operation.name) AddJobs(operation, arguments, jobs);
    }
    if (jobs->size() != before) continue;
    fprintf(stderr, "there is no operation %s; see --list\n", name.c_str());
    return false;
  }
  return true;
}

bool IsFound(const PlantedOperation& planted, const Progress& progress) {
  if (planted.found == nullptr) return progress.failures == 0;
  return progress.failures > 0 && strstr(progress.message, planted.found) != nullptr;
}

// The torture of each planted operation must fail, with the words that belong to it.
int SelfCheck() {
  int missed = 0;
  for (const PlantedOperation& planted : PlantedOperations()) {
    Selection selection;
    selection.limit_seconds = planted.limit_seconds;
    selection.first.fault = planted.first;
    std::vector<Job> jobs = {NewJob(planted.operation, selection)};
    RunAll(jobs, 1);
    if (IsFound(planted, *jobs[0].progress)) continue;
    printf("MISSED %s: its message is \"%s\"\n", planted.operation.name, jobs[0].progress->message);
    ++missed;
  }
  printf("%d planted mistakes missed\n", missed);
  const std::string without = OperationsWithoutTorture();
  if (!without.empty()) printf("MISSED the operations:%s\n", without.c_str());
  return missed == 0 && without.empty() ? 0 : 1;
}

int List() {
  for (const Operation& operation : AllOperations()) printf("%s\n", operation.name);
  for (const Fault fault : kFaults) printf("--fault %s\n", FaultName(fault));
  printf("--fault %s\n", FaultName(Fault::kCancelled));
  return 0;
}

bool Parse(int argc, char** argv, Arguments* arguments) {
  for (int i = 1; i < argc; ++i) {
    const std::string word = argv[i];
    const char* const value = i + 1 < argc ? argv[i + 1] : nullptr;
    if (word == "--list") {
      arguments->list = true;
    } else if (word == "--self-check") {
      arguments->self_check = true;
    } else if (word == "--quick") {
      arguments->quick = true;
    } else if (word == "--cancel") {
      arguments->cancel = true;
      arguments->selection.first.fault = Fault::kCancelled;
    } else if (word == "--cold") {
      arguments->selection.cold = true;
    } else if (word.compare(0, 2, "--") != 0) {
      arguments->names.push_back(word);
    } else if (value == nullptr) {
      return false;
    } else if (word == "--jobs") {
      arguments->jobs = static_cast<int>(strtol(argv[++i], nullptr, 10));
    } else if (word == "--fault") {
      arguments->selection.first.fault = FaultNamed(argv[++i]);
    } else if (word == "--point") {
      arguments->selection.first.number = strtol(argv[++i], nullptr, 10);
      arguments->selection.only_first = true;
    } else {
      return false;
    }
  }
  return arguments->jobs > 0 && arguments->selection.first.fault != Fault::kNone;
}

}  // namespace

int main(int argc, char** argv) {
  Arguments arguments;
  if (!Parse(argc, argv, &arguments)) {
    fprintf(stderr, "usage: %s [--jobs N] [OPERATION...] [--fault FAULT --point N]\n", argv[0]);
    return 2;
  }
  if (arguments.list) return List();
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    fprintf(stderr, "%s writes to /var/log and the settings: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  if (arguments.self_check) return SelfCheck();
  std::vector<Job> jobs;
  if (!Choose(arguments, &jobs)) return 2;
  return RunAll(jobs, arguments.jobs) == 0 ? 0 : 1;
}
