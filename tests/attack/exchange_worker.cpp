#include "tests/attack/exchange_worker.h"

#include <fcntl.h>
#include <libxml/parser.h>
#include <sched.h>
#include <sys/mount.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <optional>

#include "tarnwick/net/twrequestscope.h"
#include "tests/attack/exchange_plants.h"
#include "tests/attack/in_flight.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kFindingsKept = 50;

// A log of the thread's own: its lines are told from those of the others, whatever a peer writes
// into them.
void TakeOwnLog() {
  if (unshare(CLONE_NEWNS) == 0 &&
      mount("tmpfs", "/var/log/tarnwick", "tmpfs", 0, "mode=755") == 0) {
    return;
  }
  perror("no log folder of a thread's own");
  exit(2);
}

// libxml2 tells of documents that are wrong, on the error output.
void SayNothing(void* /*context*/, xmlError* /*error*/) {}

OperationResult RunGuarded(const HostileExchange& exchange, const std::string& plant) {
  try {
    std::optional<TWRequestScope> scope;
    if (exchange.escaped && plant != "log") scope.emplace().SetEscapedLog(true);
    PlantInCall(plant);
    return exchange.operation->run(exchange.target);
  } catch (const std::exception& exception) {
    OperationResult outcome;
    outcome.mistake = std::string("threw ") + exception.what();
    return outcome;
  }
}

}  // namespace

long SteadySeconds() {
  const auto now = Clock::now().time_since_epoch();
  return static_cast<long>(std::chrono::duration_cast<std::chrono::seconds>(now).count());
}

ExchangeWorker::ExchangeWorker(ExchangeRun* run, bool stalls)
    : run_(run), stalls_(stalls), peer_(*run->contexts), thread_([this] { Work(); }) {}

ExchangeWorker::~ExchangeWorker() {
  thread_.join();
}

void ExchangeWorker::Work() {
  TakeOwnLog();
  xmlSetStructuredErrorFunc(nullptr, SayNothing);
  for (;;) {
    busy_since_ = SteadySeconds();
    const uint64_t number = run_->next[stalls_ ? 1 : 0].fetch_add(run_->step);
    if (number >= run_->end) break;
    if (Stalls(run_->options.seed, number, run_->shares) == stalls_) PlayOne(number);
  }
  busy_since_ = 0;
}

void ExchangeWorker::PlayOne(uint64_t number) {
  number_ = number;
  SetInFlight(run_->options.seed, number);
  HostileExchange exchange = MakeExchange(run_->options.seed, number, run_->shares);
  exchange.target.port = peer_.Port();
  if (run_->options.verbose) printf("%s", Description(exchange).c_str());
  const std::string plant = number % kPlantEvery == kPlantFirst ? run_->options.plant : "";
  Played played = Play(exchange, plant);
  PlantInExchange(plant, &exchange, &played);
  Note(exchange, played);
}

Played ExchangeWorker::Play(const HostileExchange& exchange, const std::string& plant) {
  Played played;
  peer_.Begin(exchange);
  const double before = SecondsWithoutProcessor();
  const auto start = Clock::now();
  played.outcome = RunGuarded(exchange, plant);
  played.seconds = std::chrono::duration<double>(Clock::now() - start).count();
  played.without_processor = SecondsWithoutProcessor() - before;
  played.record = peer_.Finish();
  if (exchange.escaped) played.log = ReadFile(kMainLog);
  unlink(kMainLog);
  return played;
}

// The words of the command line with which the exchange is played alone.
std::string ExchangeWorker::WordsToPlayAgain(uint64_t number) const {
  const AttackOptions& options = run_->options;
  std::string words =
      "--seed " + std::to_string(options.seed) + " --only " + std::to_string(number);
  if (options.tls >= 0) words += " --tls " + std::to_string(options.tls);
  if (options.stall >= 0) words += " --stall " + std::to_string(options.stall);
  return words;
}

void ExchangeWorker::NoteTime(const HostileExchange& exchange, double seconds, bool stalled) {
  LongestCall& longest = stalled ? run_->longest : run_->longest_without_pause;
  if (seconds > longest.Seconds()) longest.Add(seconds, Summary(exchange));
}

void ExchangeWorker::Note(const HostileExchange& exchange, const Played& played) {
  const std::vector<std::string> findings = Judge(exchange, played, run_->margin);
  const PeerRecord& record = played.record;
  const bool stalled = !record.stalls_ms.empty();
  NoteTime(exchange, played.seconds, stalled);
  const std::lock_guard<std::mutex> lock(run_->mutex);
  ExchangeTally& tally = run_->tally;
  ++tally.exchanges;
  if (exchange.target.https) ++tally.over_tls;
  if (exchange.operation->curl) ++tally.by_curl;
  if (stalled) ++tally.stalled;
  if (stalled && exchange.target.https) ++tally.stalled_over_tls;
  if (exchange.escaped) ++tally.escaped;
  if (IsUnderstood(exchange, record)) ++tally.understood;
  tally.requests += static_cast<unsigned long>(record.deliveries);
  if (run_->options.verbose) {
    printf("result %d, outcome %d, status %d, %zu bytes of body, %.2f s, mistake [%s]\n",
           played.outcome.result, played.outcome.response, played.outcome.status,
           played.outcome.text.size(), played.seconds, played.outcome.mistake.c_str());
  }
  for (const std::string& finding : findings) {
    ++tally.findings;
    if (run_->findings.size() >= kFindingsKept) continue;
    const std::string text =
        Summary(exchange) + ": " + finding + " (" + WordsToPlayAgain(exchange.number) + ")";
    run_->findings.push_back(text);
    run_->found.push_back(exchange.number);
    printf("FINDING: %s\n", text.c_str());
    fflush(stdout);
  }
}
