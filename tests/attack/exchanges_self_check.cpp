// The verifiers of the exchanges themselves: each must notice what it is there for.
#include <unistd.h>

#include <cstdio>

#include "tests/attack/exchange_plants.h"
#include "tests/attack/exchange_run.h"
#include "tests/support/process.h"

namespace {

// Enough for every violation to meet an exchange that shows it, a log without its escapes too.
constexpr uint64_t kPlanted = 100;

// The planted exchanges of the seed, or one of them. A machine that is busy may hold a call for as
// long as the usual margin; only the violation "slow" is looked for with a smaller one.
void SetUp(const std::string& plant, long only, ExchangeRun* run) {
  run->options.plant = plant;
  run->options.stall = 0;
  run->options.threads = 8;
  run->shares.stall = 0;
  run->first = only < 0 ? kPlantFirst : static_cast<uint64_t>(only);
  run->end = only < 0 ? kPlantFirst + kPlanted * kPlantEvery : run->first + 1;
  run->step = kPlantEvery;
  if (plant == "slow") run->margin = kPlantedDelay / 2;
}

// The findings of a run, and the number of the first one's exchange; -1 without one.
unsigned long FindingsOf(const std::string& plant, long only, long* first) {
  ExchangeRun run;
  SetUp(plant, only, &run);
  PlayRun(&run);
  *first = run.found.empty() ? -1 : static_cast<long>(run.found[0]);
  return run.tally.findings;
}

bool Expect(bool good, const std::string& what) {
  printf("%s: %s\n", good ? "good" : "FAILED", what.c_str());
  return good;
}

bool CheckCrash() {
  std::string output;
  const ChildResult result = RunProgram(
      {"/proc/self/exe", "exchanges", "--only", std::to_string(kPlantFirst), "--plant", "crash"},
      &output);
  const std::string words = "died at --seed 1 --only " + std::to_string(kPlantFirst);
  return Expect(!(result.exited && result.code == 0) && output.find(words) != std::string::npos,
                "a crash names its exchange");
}

// Found among many; and those that belong to an exchange by its number alone, where nothing is
// found without the violation.
bool CheckPlant(const std::string& plant) {
  long number = -1;
  long again = -1;
  if (!Expect(FindingsOf(plant, -1, &number) > 0, plant + " is found")) return false;
  if (plant == "descriptor" || plant == "memory") return true;
  return Expect(number >= 0 && FindingsOf(plant, number, &again) > 0 && again == number,
                plant + " is found again by its number") &&
         Expect(FindingsOf("", number, &again) == 0, "nothing is found there without it");
}

bool CheckThatExchangesRepeat() {
  for (uint64_t number = 0; number < 200; ++number) {
    const std::string first = Description(MakeExchange(7, number, Shares()));
    if (first != Description(MakeExchange(7, number, Shares()))) {
      return Expect(false, "exchange " + std::to_string(number) + " repeats");
    }
  }
  return Expect(true, "the same seed and number give the same exchange");
}

}  // namespace

int CheckExchanges(const AttackOptions& /*options*/) {
  long number = -1;
  bool good = Expect(MissedOperations().empty(),
                     "each operation is attacked or left out:" + MissedOperations());
  good = CheckThatExchangesRepeat() && good;
  good =
      Expect(FindingsOf("", -1, &number) == 0, "nothing is found where nothing is planted") && good;
  for (const std::string& plant : ExchangePlants()) {
    good = (plant == "crash" ? CheckCrash() : CheckPlant(plant)) && good;
  }
  return good ? 0 : 1;
}
