// The library under a long, mixed load: eight threads do everything that it offers, against a
// server that spoils 5 of 100 responses, while the logs are rotated and the levels change.
//
//   scripts/sandbox tarnwick_soak [MINUTES] [--seed N] [--plant leak|descriptor|response|line]
//
// Each result is checked. It fails for one that the contract does not allow, for descriptors left
// open, memory that grows, an operation that hangs, and a log line that is torn or missing. --plant
// brings a fault of that kind into the client, to show that it is found.
#include <libxml/parser.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"
#include "tests/http/http_test_util.h"
#include "tests/soak/log_rotator.h"
#include "tests/soak/meter.h"
#include "tests/soak/operations.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int kThreads = 8;
constexpr int kProgressSeconds = 10;

// More than any operation takes, its time limits and a busy machine included.
constexpr int kHangSeconds = 120;

// Growth that is taken for a leak, in KiB a minute. What is in use is known to the byte: 64 KiB are
// under four bytes per operation, at the 20,000 that two processors make in a minute. Resident
// memory grows while malloc spreads over its arenas, so its bound is wider, and the first two
// minutes, in which that is most of it, never count. Both have four standard errors on top: the
// line through the samples of a short run is uncertain.
constexpr double kMostInUse = 64;
constexpr double kMostResident = 512;
constexpr double kErrors = 4;
constexpr double kWarmMinutes = 2;

struct Options {
  double minutes = 1;
  unsigned seed = 1;
  std::string plant;
};

// What the threads share.
struct Soak {
  Options options;
  Endpoints endpoints;
  std::atomic<bool> stop{false};
  Statistics statistics;
};

struct Worker {
  Soak* soak = nullptr;
  unsigned number = 0;
  pthread_t thread{};
  std::atomic<long> busy_since{0};  // seconds; of the operation under way
  std::atomic<unsigned> log_lines{0};
};

long Seconds() {
  const auto now = Clock::now().time_since_epoch();
  return static_cast<long>(std::chrono::duration_cast<std::chrono::seconds>(now).count());
}

// Once in a hundred operations.
void PlantFault(const std::string& kind, unsigned round, Session* session, Outcome* outcome) {
  if (kind.empty() || round % 100 != 99) return;
  if (kind == "leak") {
    constexpr size_t kLost = 100000;
    static std::atomic<void*> lost;
    lost = memset(malloc(kLost), 1, kLost);
  }
  if (kind == "descriptor" && dup(STDOUT_FILENO) < 0) *outcome = Wrong("no descriptor");
  if (kind == "response") *outcome = Wrong("planted");
  if (kind == "line") ++session->log_lines;
}

// libxml2 tells of documents that were cut, on the error output.
void SayNothing(void* /*context*/, xmlError* /*error*/) {}

void* Work(void* argument) {
  auto* const worker = static_cast<Worker*>(argument);
  Soak* const soak = worker->soak;
  xmlSetStructuredErrorFunc(nullptr, SayNothing);
  Random random(soak->options.seed * 1000 + worker->number);
  Session session;
  session.endpoints = soak->endpoints;
  session.thread = worker->number;
  for (unsigned round = 0; !soak->stop; ++round) {
    worker->busy_since = Seconds();
    const Plan plan = NextPlan(round * kThreads + worker->number, &random);
    Outcome outcome = RunOperation(plan, &session);
    PlantFault(soak->options.plant, round, &session, &outcome);
    soak->statistics.Add(plan, outcome);
  }
  worker->log_lines = session.log_lines;
  return nullptr;
}

void StartWorkers(Soak* soak, Worker (&workers)[kThreads]) {
  xmlInitParser();  // as libxml2 asks of programs with threads
  for (unsigned i = 0; i < kThreads; ++i) {
    workers[i].soak = soak;
    workers[i].number = i;
    workers[i].busy_since = Seconds();
    if (CreateThread(Work, &workers[i], 0, 0, &workers[i].thread) == 1) continue;
    fprintf(stderr, "thread %u could not be started\n", i);
    exit(2);
  }
}

// A thread that hangs cannot be ended, so the whole run is.
void EndIfHanging(const Worker (&workers)[kThreads]) {
  for (const Worker& worker : workers) {
    if (Seconds() - worker.busy_since <= kHangSeconds) continue;
    printf("FAILED: an operation of thread %u hangs for over %d s\n", worker.number, kHangSeconds);
    fflush(stdout);
    abort();
  }
}

void PrintProgress(long elapsed, const Soak& soak, const MemoryMeter& memory) {
  printf("%5ld s  %9lu operations  %3lu unexpected  %7ld KiB resident  %7ld KiB in use  %zu fds\n",
         elapsed, soak.statistics.Operations(), soak.statistics.Unexpected(), memory.ResidentNow(),
         memory.InUseNow(), OpenDescriptors().size());
  fflush(stdout);
}

void Watch(Soak* soak, const Worker (&workers)[kThreads], MemoryMeter* memory) {
  const auto start = Clock::now();
  const long total = static_cast<long>(soak->options.minutes * 60);
  for (long second = 1; second <= total; ++second) {
    while (Clock::now() < start + std::chrono::seconds(second)) usleep(10000);
    memory->Sample(std::chrono::duration<double>(Clock::now() - start).count());
    EndIfHanging(workers);
    if (second % kProgressSeconds == 0) PrintProgress(second, *soak, *memory);
  }
}

void StopWorkers(Soak* soak, Worker (&workers)[kThreads]) {
  soak->stop = true;
  for (Worker& worker : workers) {
    while (pthread_tryjoin_np(worker.thread, nullptr) == EBUSY) {
      EndIfHanging(workers);
      usleep(10000);
    }
  }
}

// One thing that the run is judged by.
class Verdict {
 public:
  void __attribute__((format(printf, 3, 4))) Judge(bool good, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    vprintf(format, arguments);
    va_end(arguments);
    puts(good ? "" : "  <-- FAILED");
    good_ = good_ && good;
  }
  bool Good() const { return good_; }

 private:
  bool good_ = true;
};

void JudgeSlope(const char* what, const Slope& slope, double most, bool warm, Verdict* verdict) {
  const char* left_out = warm ? "" : " (not judged: still warming up)";
  if (!MemoryMeter::IsReliable()) left_out = " (not judged under a sanitizer)";
  const bool grows = slope.kib_per_minute > most + kErrors * slope.error;
  verdict->Judge(!grows || *left_out != '\0',
                 "%-20s %+.1f KiB/min, standard error %.1f, bound %.0f + %.0f errors%s", what,
                 slope.kib_per_minute, slope.error, most, kErrors, left_out);
}

void JudgeDescriptors(const std::map<int, std::string>& before, Verdict* verdict) {
  const std::map<int, std::string> after = OpenDescriptors();
  verdict->Judge(before == after, "%-20s %zu before, %zu after", "descriptors", before.size(),
                 after.size());
  for (const auto& [fd, name] : after) {
    if (before.count(fd) == 0) printf("  left open: %d %s\n", fd, name.c_str());
  }
}

void JudgeLog(const LogReport& report, const Worker (&workers)[kThreads], Verdict* verdict) {
  unsigned long written = 0;
  for (const Worker& worker : workers) written += worker.log_lines;
  printf("%-20s %lu lines of the main log, %lu rotations, %lu changes of levels\n", "log",
         report.main_lines, report.rotations, report.level_changes);
  verdict->Judge(report.faults == 0 && report.numbered_lines == written,
                 "%-20s %lu written, %lu found, %lu torn, missing or in disorder %s",
                 "numbered lines", written, report.numbered_lines, report.faults,
                 report.first_fault);
}

bool Run(const Options& options) {
  Soak soak;
  soak.options = options;
  const ClosedPort refused;
  const BlackHolePort black_hole;
  const Server server;
  LogRotator log_rotator;
  const TrustedAuthority trusted(server.CaFile());
  soak.endpoints = {server.Ports(), refused.Port(), black_hole.Port()};

  const std::map<int, std::string> descriptors = OpenDescriptors();
  Worker workers[kThreads];
  MemoryMeter memory;
  StartWorkers(&soak, workers);
  Watch(&soak, workers, &memory);
  StopWorkers(&soak, workers);

  Verdict verdict;
  soak.statistics.Print();
  puts("");
  const unsigned long unexpected = soak.statistics.Unexpected();
  verdict.Judge(unexpected == 0, "%-20s %lu, unexpected %lu, in %.1f minutes with seed %u",
                "operations", soak.statistics.Operations(), unexpected, options.minutes,
                options.seed);
  const bool warm = options.minutes / 2 >= kWarmMinutes;
  JudgeSlope("memory in use", memory.InUse(), kMostInUse, true, &verdict);
  JudgeSlope("resident memory", memory.Resident(), kMostResident, warm, &verdict);
  JudgeDescriptors(descriptors, &verdict);
  JudgeLog(log_rotator.Finish(), workers, &verdict);
  return verdict.Good();
}

bool ParseOptions(int argc, char** argv, Options* options) {
  for (int i = 1; i < argc; ++i) {
    const std::string option = argv[i];
    if (option == "--seed" && i + 1 < argc) {
      options->seed = static_cast<unsigned>(strtoul(argv[++i], nullptr, 10));
    } else if (option == "--plant" && i + 1 < argc) {
      options->plant = argv[++i];
    } else {
      options->minutes = strtod(option.c_str(), nullptr);
      if (options->minutes <= 0) return false;
    }
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  Options options;
  if (!ParseOptions(argc, argv, &options)) {
    fprintf(stderr, "usage: %s [MINUTES] [--seed N] [--plant leak|descriptor|response|line]\n",
            argv[0]);
    return 2;
  }
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    fprintf(stderr, "%s writes to /var/log and the settings: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  if (!MissedOperations().empty()) {
    fprintf(stderr, "operations that the soak misses:%s\n", MissedOperations().c_str());
    return 2;
  }
  const bool good = Run(options);
  puts(good ? "soak passed" : "soak FAILED");
  return good ? 0 : 1;
}
