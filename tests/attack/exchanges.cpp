// Exchanges of the library's HTTP client and sockets with a hostile server.
#include <curl/curl.h>
#include <libxml/parser.h>
#include <sys/mount.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "tests/attack/attacks.h"
#include "tests/attack/exchange_plants.h"
#include "tests/attack/exchange_run.h"
#include "tests/attack/in_flight.h"
#include "tests/http/http_test_util.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

constexpr unsigned long kExchanges = 2000000;
constexpr unsigned long kQuickExchanges = 20000;

// Of those without pauses; and how many with pauses for each of them.
constexpr int kThreads = 8;
constexpr int kPatientThreads = 15;

constexpr int kProgressSeconds = 30;

// More than any call takes, a silence of 45 s included.
constexpr int kHangSeconds = 120;

// Growth of the memory in use, from the start to the end, that is a leak: 6,000 exchanges leave
// 145 KiB, which OpenSSL and libcurl have made once.
constexpr long kMostGrowthKib = 4096;

ExchangeTally TallyOf(ExchangeRun* run) {
  const std::lock_guard<std::mutex> lock(run->mutex);
  return run->tally;
}

void PrintProgress(long elapsed, ExchangeRun* run) {
  const ExchangeTally tally = TallyOf(run);
  const Footprint now = CurrentFootprint();
  printf("%5ld s  %8lu exchanges  %6lu with a pause  %2lu findings  %ld KiB resident\n", elapsed,
         tally.exchanges, tally.stalled, tally.findings, now.resident_kib);
  fflush(stdout);
}

using Workers = std::vector<std::unique_ptr<ExchangeWorker>>;

void EndIfHanging(const ExchangeRun& run, const Workers& workers) {
  for (const auto& worker : workers) {
    const long since = worker->BusySince();
    if (since == 0 || SteadySeconds() - since <= kHangSeconds) continue;
    printf("FINDING: hangs for over %d s (--seed %lu --only %lu)\n", kHangSeconds,
           static_cast<unsigned long>(run.options.seed),
           static_cast<unsigned long>(worker->Number()));
    fflush(stdout);
    abort();
  }
}

bool IsOver(const Workers& workers) {
  return std::all_of(workers.begin(), workers.end(),
                     [](const auto& worker) { return worker->BusySince() == 0; });
}

// Waits for the workers. Results: the footprint after the first third of the exchanges.
Footprint Watch(ExchangeRun* run, const Workers& workers) {
  Footprint third;
  const long start = SteadySeconds();
  long next = start + kProgressSeconds;
  const uint64_t a_third = run->first + (run->end - run->first) / 3;
  while (!IsOver(workers) || run->next[0] < run->end || run->next[1] < run->end) {
    usleep(20000);
    if (third.resident_kib == 0 && run->next[0] >= a_third) third = CurrentFootprint();
    EndIfHanging(*run, workers);
    if (SteadySeconds() < next) continue;
    PrintProgress(SteadySeconds() - start, run);
    next += kProgressSeconds;
  }
  return third;
}

void AddFinding(const std::string& text, ExchangeRun* run) {
  printf("FINDING: %s\n", text.c_str());
  ++run->tally.findings;
}

void JudgeFootprints(ExchangeRun* run) {
  if (run->finish.descriptors != run->start.descriptors) {
    AddFinding(std::to_string(run->start.descriptors) + " descriptors before, " +
                   std::to_string(run->finish.descriptors) + " after",
               run);
  }
  if (run->finish.in_use_kib > run->start.in_use_kib + kMostGrowthKib) {
    AddFinding("memory grows", run);
  }
}

std::string SecondsOf(const LongestCall& call) {
  char text[32];
  snprintf(text, sizeof(text), "%.2f s, ", call.Seconds());
  return text + call.Name();
}

void PrintTable(const ExchangeRun& run) {
  const ExchangeTally& tally = run.tally;
  puts("");
  PrintFigure("seed, seconds, threads", std::to_string(run.options.seed) + ", " +
                                            std::to_string(run.seconds) + ", " +
                                            std::to_string(run.options.threads));
  PrintFigure("exchanges", std::to_string(tally.exchanges));
  PrintFigure("  plain", std::to_string(tally.exchanges - tally.over_tls));
  PrintFigure("  over TLS", std::to_string(tally.over_tls));
  PrintFigure("  through libcurl", std::to_string(tally.by_curl));
  PrintFigure("  with a pause of the server's", std::to_string(tally.stalled));
  PrintFigure("  with a pause, over TLS", std::to_string(tally.stalled_over_tls));
  PrintFigure("  with an escaped log, checked", std::to_string(tally.escaped));
  PrintFigure("  clean, whose status was compared", std::to_string(tally.understood));
  PrintFigure("responses begun", std::to_string(tally.requests));
  PrintFootprint("at the start", run.start);
  PrintFootprint("after the first third", run.third);
  PrintFootprint("at the end", run.finish);
  PrintFigure("longest call with a pause", SecondsOf(run.longest));
  PrintFigure("longest call without one", SecondsOf(run.longest_without_pause));
  PrintFigure("findings", std::to_string(tally.findings));
}

// What is made once in a process, before the descriptors are counted.
void WarmUp() {
  xmlInitParser();  // as libxml2 asks of programs with threads
  curl_global_init(CURL_GLOBAL_DEFAULT);
}

bool IsPlant(const std::string& kind) {
  const std::vector<std::string>& plants = ExchangePlants();
  return kind.empty() || std::find(plants.begin(), plants.end(), kind) != plants.end();
}

bool SetUp(const AttackOptions& options, ExchangeRun* run) {
  if (!IsPlant(options.plant)) return false;
  run->options = options;
  if (options.tls >= 0) run->shares.tls = static_cast<size_t>(options.tls);
  if (options.stall >= 0) run->shares.stall = static_cast<size_t>(options.stall);
  const unsigned long usual = options.quick ? kQuickExchanges : kExchanges;
  run->end = options.count > 0 ? options.count : usual;
  if (options.only >= 0) {
    run->first = static_cast<uint64_t>(options.only);
    run->end = run->first + 1;
  }
  if (run->options.threads == 0) run->options.threads = options.only >= 0 ? 1 : kThreads;
  return true;
}

void StartWorkers(ExchangeRun* run, Workers* workers) {
  run->next[0] = run->next[1] = run->first;
  const bool one = run->first + run->step >= run->end;
  const int patient = run->shares.stall == 0 || one ? 1 : kPatientThreads;
  for (int i = 0; i < run->options.threads; ++i) {
    workers->push_back(std::make_unique<ExchangeWorker>(run, false));
    for (int k = 0; k < patient; ++k) {
      workers->push_back(std::make_unique<ExchangeWorker>(run, true));
    }
  }
}

}  // namespace

void PlayRun(ExchangeRun* run) {
  const PeerContexts contexts;
  run->contexts = &contexts;
  const TrustedAuthority trusted(contexts.CaFile());
  const LogCapture log;
  WarmUp();
  const long began = SteadySeconds();
  run->start = CurrentFootprint();
  {
    Workers workers;
    StartWorkers(run, &workers);
    run->third = Watch(run, workers);
  }
  run->finish = CurrentFootprint();
  run->seconds = SteadySeconds() - began;
  JudgeFootprints(run);
}

int RunExchanges(const AttackOptions& options) {
  if (options.self_check) return CheckExchanges(options);
  ExchangeRun run;
  if (!SetUp(options, &run)) return 2;
  PrintInFlightAtDeath();
  PlayRun(&run);
  PrintTable(run);
  return run.tally.findings == 0 ? 0 : 1;
}
