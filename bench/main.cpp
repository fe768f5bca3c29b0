// Measures the contenders of each work in turn, round by round (A B C A B C ...), so that all of
// them see the same machine, and prints a line of JSON a measurement. A round is short, and the
// ratios of one round are what a report takes the median of: hence no framework that measures one
// after the other.
#include <alloca.h>
#include <sched.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "bench/apart.h"
#include "bench/contender.h"
#include "bench/options.h"
#include "bench/server.h"

// The name by which callgrind finds what is to be counted.
extern "C" __attribute__((noinline)) void CountedRun(Contender* contender, int count) {
  contender->Count(count);
  asm volatile("");  // not the last call, or it would become a jump
}

namespace {

// With the stack so many bytes further down.
__attribute__((noinline)) void CountLower(size_t bytes, Contender* contender, int count) {
  Use(alloca(bytes));
  CountedRun(contender, count);
}

// The C library's comparisons take a longer way where a string crosses a cache line. Where in a
// line the stack begins is the kernel's choice, so a fourth of the operations is done at each of
// the places.
void CountAtAllPlaces(Contender* contender, int count) {
  constexpr int kPlaces = 4;
  constexpr size_t kStackAlignment = 16;
  for (int i = 0; i < kPlaces; ++i) {
    const int operations = count * (i + 1) / kPlaces - count * i / kPlaces;
    CountLower(kStackAlignment * static_cast<size_t>(i), contender, operations);
  }
}

// Of a work whose time is over.
constexpr int kLeastRounds = 3;

// Client and server share one processor, as this process and its children: what is compared is the
// work of both, and no transfer between processors.
void PinToOneProcessor() {
  cpu_set_t allowed;
  if (sched_getaffinity(0, sizeof(allowed), &allowed) != 0) return;
  int last = CPU_SETSIZE - 1;
  while (last > 0 && !CPU_ISSET(last, &allowed)) --last;
  CPU_ZERO(&allowed);
  CPU_SET(last, &allowed);
  sched_setaffinity(0, sizeof(allowed), &allowed);
}

// For the thousand clients.
void AllowManyFiles() {
  struct rlimit limit;
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_NOFILE, &limit);
}

// One of the peers has blocked it before main, which costs who looks at it a system call more than
// in a daemon.
void UnblockSigpipe() {
  sigset_t pipe;
  sigemptyset(&pipe);
  sigaddset(&pipe, SIGPIPE);
  sigprocmask(SIG_UNBLOCK, &pipe, nullptr);
}

bool IsSelected(const Options& options, const Work& work) {
  const auto names = [&work](const std::string& name) {
    return name == work.section || name == work.name;
  };
  return options.selected.empty() ||
         std::any_of(options.selected.begin(), options.selected.end(), names);
}

struct Runner {
  std::string name;
  std::unique_ptr<Contender> contender;
  int count;
};

// How many operations fill a round.
int CountFor(const Work& work, Contender* contender, double seconds) {
  if (work.count != 0) return work.count;
  contender->Measure(1);  // the first one of a process resolves symbols and fills caches
  const double wanted = seconds * 1e9;
  int count = 1;
  double each = contender->Measure(count);
  while (each * count < wanted / 10 && count < (1 << 24)) {
    count *= 8;
    each = contender->Measure(count);
  }
  return std::max(1, static_cast<int>(std::lround(wanted / each)));
}

void Print(const Work& work, const std::string& contender, int round, double value) {
  std::printf(
      "{\"section\":\"%s\",\"work\":\"%s\",\"contender\":\"%s\",\"round\":%d,\"%s\":%.4f,"
      "\"handles\":%zu}\n",
      work.section, work.name, contender.c_str(), round, work.unit == Unit::kBytes ? "bytes" : "ns",
      value, work.bytes);
  std::fflush(stdout);
}

std::vector<Runner> Prepare(const Work& work, const Options& options) {
  std::vector<Runner> runners;
  for (const Registry::Entry& entry : AllContenders().Of(work.name)) {
    auto contender = work.apart ? MakeApart(work.name, entry.contender) : entry.make();
    const int count = CountFor(work, contender.get(), options.roundSeconds);
    runners.push_back({entry.contender, std::move(contender), count});
  }
  return runners;
}

void Compare(const Work& work, const Options& options) {
  std::fprintf(stderr, "%s\n", work.name);
  const std::vector<Runner> runners = Prepare(work, options);
  const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(options.seconds);
  for (int round = 0; round < options.rounds; ++round) {
    if (round >= kLeastRounds && std::chrono::steady_clock::now() > end) break;
    for (const Runner& runner : runners) {
      Print(work, runner.name, round, runner.contender->Measure(runner.count));
    }
  }
}

// For a process that measures or counts one work of one contender.
int RunOne(const Options& options) {
  for (const Registry::Entry& entry : AllContenders().Of(options.work)) {
    if (entry.contender != options.contender) continue;
    const auto contender = entry.make();
    if (options.mode == Options::kMeasureOne) {
      std::printf("%.4f\n", contender->Measure(options.count));
    } else {
      contender->Count(2);  // the first ones of a process resolve symbols and make the heap grow
      getppid();            // the system calls between the two are counted
      CountAtAllPlaces(contender.get(), options.count);
      getppid();
      _exit(0);  // how many calls the end of the threads of peers takes is different each time
    }
    return 0;
  }
  return 2;
}

int List() {
  for (const Work& work : AllWorks()) {
    std::printf("%s %s:", work.section, work.name);
    for (const auto& entry : AllContenders().Of(work.name)) {
      std::printf(" %s", entry.contender.c_str());
    }
    std::printf("\n");
  }
  return 0;
}

int ListCounted(const Options& options) {
  for (const Work& work : AllWorks()) {
    if (work.counted == 0 || !IsSelected(options, work)) continue;
    for (const auto& entry : AllContenders().Of(work.name)) {
      std::printf("%s %s %s %d\n", work.section, work.name, entry.contender.c_str(), work.counted);
    }
  }
  return 0;
}

int CompareAll(const Options& options) {
  for (const std::string& name : AllContenders().LeftOut()) {
    std::fprintf(stderr, "%s is left out: it is not there\n", name.c_str());
  }
  for (const Work& work : AllWorks()) {
    if (IsSelected(options, work)) Compare(work, options);
  }
  return 0;
}

}  // namespace

int main(int argc, char** argv) {
  Options options;
  if (!ParseOptions(argc, argv, &options)) return 2;
  if (options.mode == Options::kList) return List();
  if (options.mode == Options::kListCounted) return ListCounted(options);
  if (std::getenv("TARNWICK_SANDBOX") == nullptr) {
    std::fputs("tarnwick_bench: the log files are fixed; run it in scripts/sandbox\n", stderr);
    return 2;
  }
  AllowManyFiles();
  UnblockSigpipe();
  PinToOneProcessor();
  if (options.work != nullptr) return RunOne(options);
  StartServers();
  return CompareAll(options);
}
