// Generated attacks on the library:
//
//   scripts/sandbox tarnwick_attack exchanges|arguments [COUNT] [--seed N] [--only N] [--verbose]
//       [--threads N] [--tls PERCENT] [--stall PERCENT] [--plant VIOLATION] [--quick]
//       [--self-check]
//
// A finding is printed with the --seed and --only that play it again. The exit code is 1 when there
// was a finding, 2 for a wrong call.
#include <cstdio>
#include <cstdlib>
#include <string>

#include "tests/attack/attacks.h"

namespace {

struct Attack {
  const char* name;
  int (*run)(const AttackOptions& options);
};

constexpr Attack kAttacks[] = {
    {"exchanges", RunExchanges},
    {"arguments", RunArguments},
};

int (*FindAttack(const std::string& name))(const AttackOptions&) {
  for (const Attack& attack : kAttacks) {
    if (name == attack.name) return attack.run;
  }
  return nullptr;
}

bool ReadNumber(const char* text, unsigned long* number) {
  char* end = nullptr;
  *number = strtoul(text, &end, 10);
  return *text >= '0' && *text <= '9' && *end == '\0';
}

bool ReadFlag(const std::string& word, AttackOptions* options) {
  if (word == "--quick") return options->quick = true;
  if (word == "--verbose") return options->verbose = true;
  if (word == "--self-check") return options->self_check = true;
  return false;
}

bool ReadOption(const std::string& word, const char* value, AttackOptions* options) {
  if (word == "--plant") {
    options->plant = value;
    return true;
  }
  unsigned long number = 0;
  if (!ReadNumber(value, &number)) return false;
  if (word == "--seed") options->seed = number;
  if (word == "--only") options->only = static_cast<long>(number);
  if (word == "--threads") options->threads = static_cast<int>(number);
  if (word == "--tls") options->tls = static_cast<int>(number);
  if (word == "--stall") options->stall = static_cast<int>(number);
  return word == "--seed" || word == "--only" || word == "--threads" || word == "--tls" ||
         word == "--stall";
}

bool ReadArguments(int argc, char** argv, AttackOptions* options) {
  for (int i = 2; i < argc; ++i) {
    if (ReadFlag(argv[i], options)) continue;
    if (argv[i][0] != '-') {
      if (!ReadNumber(argv[i], &options->count)) return false;
      continue;
    }
    if (i + 1 == argc || !ReadOption(argv[i], argv[i + 1], options)) return false;
    ++i;
  }
  return true;
}

}  // namespace

int main(int argc, char** argv) {
  AttackOptions options;
  const auto run = FindAttack(argc > 1 ? argv[1] : "");
  if (run == nullptr || !ReadArguments(argc, argv, &options)) {
    fprintf(
        stderr,
        "usage: %s exchanges|arguments [COUNT] [--seed N] [--only N] [--verbose] [--threads N]\n"
        "       [--tls PERCENT] [--stall PERCENT] [--plant VIOLATION] [--quick] "
        "[--self-check]\n",
        argv[0]);
    return 2;
  }
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    fprintf(stderr, "%s writes to /var/log and the settings: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  return run(options);
}
