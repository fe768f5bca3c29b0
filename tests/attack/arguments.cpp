// Calls of the public functions with hostile arguments, in rounds: each makes its objects anew,
// calls functions in any order, and ends with the descriptors with which it began.
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <optional>
#include <stdexcept>

#include "tarnwick/http/twcurl.h"
#include "tarnwick/log/twdebuglog.h"
#include "tests/attack/arguments_calls.h"
#include "tests/attack/arguments_watch.h"
#include "tests/attack/attacks.h"
#include "tests/attack/figures.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr unsigned long kDefaultCalls = 300000;
constexpr unsigned long kQuickCalls = 20000;
constexpr unsigned long kSelfCheckCalls = 90;
constexpr int kCallsOfRound = 30;

// No peer makes a call wait, and the longest that a function waits by itself are the six tries of
// WriteFd.
constexpr double kLongestCall = 10;

// What a whole run may add to the memory in use, in KiB.
constexpr long kMostGrowth = 1024;

// What a planted leak takes in a round.
constexpr size_t kPlanted = 1u << 20;

// The log of rounds is thrown away when it is longer.
constexpr off_t kMostLog = 16 << 20;

// Rounds before the first footprint.
constexpr long kWarmRounds = 50;

// Findings that are printed; all are counted.
constexpr int kMostPrinted = 20;

// What a round does more often than anything else; null: nothing.
constexpr const char* kThemes[] = {nullptr,
                                   "TWHttpClient::", "TWHttpClient::", "TWSocket::", "SSLSocket::"};

class Run {
 public:
  explicit Run(const AttackOptions& options)
      : options_(options), calls_(AllCalls()), note_(options.seed) {}

  void Round(long number);
  void Print(const Footprint& start, const Footprint& third) const;
  unsigned long Calls() const { return done_; }
  int Findings() const { return findings_; }
  void Find(long round, const std::string& what);

 private:
  void Prepare(Draw& draw);
  const PublicCall& Choose(Draw& draw, const char* theme) const;
  void Call(long round, const PublicCall& call, Ground& ground);
  void CutLogs() const;

  const AttackOptions& options_;
  const std::vector<PublicCall> calls_;
  const ArgumentsPeer peer_;
  std::optional<SharedRecord> record_;
  DeathNote note_;
  LongestCall longest_;
  unsigned long done_ = 0;
  int findings_ = 0;
  std::vector<std::string> planted_;
};

void Run::Find(long round, const std::string& what) {
  ++findings_;
  if (options_.self_check || findings_ > kMostPrinted) return;
  printf("finding: %s: --seed %llu --only %ld\n", what.c_str(),
         static_cast<unsigned long long>(options_.seed), round);
}

// The record may be missing, and may hold any levels; half of the rounds log everything.
void Run::Prepare(Draw& draw) {
  FreeDbgCfg();
  record_.reset();
  if (draw.OneIn(8)) return;
  record_.emplace();
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) record_->SetLevel(i, draw.Bool() ? 7 : draw.Int());
  InitDbgCfg();
}

const PublicCall& Run::Choose(Draw& draw, const char* theme) const {
  for (;;) {
    const PublicCall& call = calls_[draw.Below(static_cast<unsigned>(calls_.size()))];
    if (theme == nullptr || draw.OneIn(5)) return call;
    if (strncmp(call.name, theme, strlen(theme)) == 0) return call;
  }
}

void Run::Call(long round, const PublicCall& call, Ground& ground) {
  const size_t before = ground.Findings().size();
  if (options_.verbose) fprintf(stderr, "%s\n", call.name);
  note_.Begin(round, call.name);
  const auto begun = Clock::now();
  try {
    call.call(ground, ground.Drawn());
    if (options_.plant == "result") ground.Expect(false, "planted");
    if (options_.plant == "exception") throw std::runtime_error("planted");
  } catch (const std::exception& exception) {
    Find(round, std::string(call.name) + " throws " + exception.what());
  }
  const double seconds = std::chrono::duration<double>(Clock::now() - begun).count();
  note_.End();
  ++done_;
  longest_.Add(seconds, call.name);
  if (seconds > kLongestCall) Find(round, std::string(call.name) + " takes too long");
  if (ground.Findings().size() > before) {
    Find(round, std::string(call.name) + ": " + ground.Findings().back());
  }
}

void Run::CutLogs() const {
  for (const char* path : {kMainLog, kNotificationLog}) {
    struct stat state = {};
    if (stat(path, &state) == 0 && state.st_size > kMostLog) unlink(path);
  }
}

void Run::Round(long number) {
  const size_t descriptors = CurrentFootprint().descriptors;
  {
    Ground ground(peer_, options_.seed * 1000003 + static_cast<uint64_t>(number));
    Prepare(ground.Drawn());
    const char* theme = kThemes[ground.Drawn().Below(std::size(kThemes))];
    for (int i = 0; i < kCallsOfRound; ++i) Call(number, Choose(ground.Drawn(), theme), ground);
  }
  if (options_.plant == "descriptor") dup(STDOUT_FILENO);
  if (options_.plant == "leak") planted_.emplace_back(kPlanted, 'a');
  if (CurrentFootprint().descriptors != descriptors) Find(number, "descriptors stay open");
  if (!peer_.Runs()) Find(number, "the peer has ended");
  CutLogs();
}

void Run::Print(const Footprint& start, const Footprint& third) const {
  PrintFigure("calls", std::to_string(done_));
  PrintFigure("functions", std::to_string(calls_.size()));
  PrintFootprint("at the start", start);
  PrintFootprint("after the first third", third);
  PrintFootprint("at the end", CurrentFootprint());
  PrintFigure("longest call", std::to_string(longest_.Seconds()) + " s, " + longest_.Name());
  PrintFigure("findings", std::to_string(findings_));
}

// What the process opens and keeps with the first use: the connection to the system log, libcurl's
// state, the map of names.
void WarmUp(const AttackOptions& options, Run* run) {
  openlog(nullptr, LOG_NDELAY, LOG_USER);
  curl_easy_cleanup(TWCurlInit());
  const long rounds = options.self_check ? 1 : kWarmRounds;
  for (long i = 0; i < rounds; ++i) run->Round(-1 - i);
}

void ExpectNoGrowth(const Footprint& third, Run* run) {
  const long growth = CurrentFootprint().in_use_kib - third.in_use_kib;
  if (growth > kMostGrowth)
    run->Find(-1, "memory in use grew by " + std::to_string(growth) + " KiB");
}

unsigned long CountOf(const AttackOptions& options) {
  if (options.count > 0) return options.count;
  return options.quick ? kQuickCalls : kDefaultCalls;
}

int RunRounds(const AttackOptions& options) {
  Run run(options);
  if (options.only >= 0) {
    run.Round(options.only);
    return run.Findings() > 0;
  }
  WarmUp(options, &run);
  const unsigned long count = CountOf(options) + run.Calls();
  const unsigned long first_third = run.Calls() + CountOf(options) / 3;
  const Footprint start = CurrentFootprint();
  Footprint third = start;
  for (long round = 0; run.Calls() < count; ++round) {
    run.Round(round);
    if (run.Calls() < first_third) third = CurrentFootprint();
  }
  ExpectNoGrowth(third, &run);
  if (!options.self_check) run.Print(start, third);
  return run.Findings() > 0;
}

// Each name of the library that has no call, and the last one of the tables when it is not missed.
int CheckTables() {
  std::vector<PublicCall> calls = AllCalls();
  int wrong = 0;
  for (const std::string& name : MissingCalls(calls, TARNWICK_SYMBOLS)) {
    printf("no call of %s\n", name.c_str());
    ++wrong;
  }
  calls.pop_back();
  if (MissingCalls(calls, TARNWICK_SYMBOLS).size() == static_cast<size_t>(wrong) + 1) return wrong;
  puts("a missing call is not noticed");
  return wrong + 1;
}

// That the tables are complete, and that each kind of finding is found.
int SelfCheck(AttackOptions options) {
  int wrong = CheckTables();
  options.count = kSelfCheckCalls;
  for (const char* plant : {"", "result", "exception", "descriptor", "leak"}) {
    options.plant = plant;
    const int expected = options.plant.empty() ? 0 : 1;
    if (RunRounds(options) == expected) continue;
    printf("%s: %s\n", expected == 1 ? "not found" : "a finding", plant);
    ++wrong;
  }
  printf("%zu calls, %d faults of the self-check\n", AllCalls().size(), wrong);
  return wrong > 0;
}

}  // namespace

int RunArguments(const AttackOptions& options) {
  for (const char* name : {"http_proxy", "https_proxy", "all_proxy", "HTTPS_PROXY", "ALL_PROXY"}) {
    unsetenv(name);
  }
  const TempDir folder;
  if (chdir(folder.Path().c_str()) != 0) return 2;
  const int result = options.self_check ? SelfCheck(options) : RunRounds(options);
  if (chdir("/") != 0) return 2;
  return result;
}
