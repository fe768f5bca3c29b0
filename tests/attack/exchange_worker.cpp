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
#include "tests/attack/in_flight.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr size_t kFindingsKept = 50;

// One exchange in so many has the planted violation.
constexpr uint64_t kPlantEvery = 97;

const char* const kPlants[] = {"status", "descriptor", "slow",  "split",  "result",
                               "body",   "log",        "crash", "memory", "throw"};

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

void Plant(const std::string& kind, Played* played) {
  OperationOutcome& outcome = played->outcome;
  if (kind == "status") outcome.status = 299 + outcome.status;
  if (kind == "status") outcome.result = outcome.result == 0 ? HTTP_RET_IO_ERROR : HTTP_RET_OK;
  if (kind == "descriptor" && dup(STDERR_FILENO) < 0) abort();
  if (kind == "slow") played->seconds += 100;
  if (kind == "split") played->record.connections.push_back("X-Split: yes\r\n\r\n");
  if (kind == "result") outcome.result = 77;
  if (kind == "body") outcome.text += "x";
  if (kind == "log") played->log += "Nov 22 04:40:00 [1] forged\x1b[2J\n";
  if (kind == "memory") {
    static std::atomic<void*> lost;
    lost = new char[1 << 20]();
  }
  if (kind == "crash") *static_cast<volatile char*>(nullptr) = 1;
  if (kind == "throw") outcome.mistake = "threw planted";
}

OperationOutcome RunGuarded(const HostileExchange& exchange) {
  try {
    std::optional<TWRequestScope> scope;
    if (exchange.escaped) scope.emplace().SetEscapedLog(true);
    return exchange.operation->run(exchange.target);
  } catch (const std::exception& exception) {
    OperationOutcome outcome;
    outcome.mistake = std::string("threw ") + exception.what();
    return outcome;
  }
}

}  // namespace

long SteadySeconds() {
  const auto now = Clock::now().time_since_epoch();
  return static_cast<long>(std::chrono::duration_cast<std::chrono::seconds>(now).count());
}

bool IsPlant(const std::string& kind) {
  for (const char* const plant : kPlants) {
    if (kind == plant) return true;
  }
  return kind.empty();
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
    const uint64_t number = run_->next[stalls_ ? 1 : 0]++;
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
  Played played = Play(exchange);
  if (!run_->options.plant.empty() && number % kPlantEvery == kPlantEvery - 1) {
    Plant(run_->options.plant, &played);
  }
  Note(exchange, played);
}

Played ExchangeWorker::Play(const HostileExchange& exchange) {
  Played played;
  peer_.Begin(exchange);
  const auto start = Clock::now();
  played.outcome = RunGuarded(exchange);
  played.seconds = std::chrono::duration<double>(Clock::now() - start).count();
  played.record = peer_.Finish();
  if (exchange.escaped) played.log = ReadFile(kMainLog);
  unlink(kMainLog);
  return played;
}

void ExchangeWorker::Note(const HostileExchange& exchange, const Played& played) {
  const std::vector<std::string> findings = Judge(exchange, played);
  const PeerRecord& record = played.record;
  const bool stalled = !record.stalls_ms.empty();
  run_->longest.Add(played.seconds, Summary(exchange));
  if (!stalled) run_->longest_without_pause.Add(played.seconds, Summary(exchange));
  const std::lock_guard<std::mutex> lock(run_->mutex);
  ExchangeTally& tally = run_->tally;
  ++tally.exchanges;
  if (exchange.target.tls) ++tally.over_tls;
  if (exchange.operation->curl) ++tally.by_curl;
  if (stalled) ++tally.stalled;
  if (stalled && exchange.target.tls) ++tally.stalled_over_tls;
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
    const std::string text = Summary(exchange) + ": " + finding + " (--seed " +
                             std::to_string(run_->options.seed) + " --only " +
                             std::to_string(exchange.number) + ")";
    run_->findings.push_back(text);
    printf("FINDING: %s\n", text.c_str());
    fflush(stdout);
  }
}
