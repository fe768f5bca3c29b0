// The stress program:
//
//   scripts/sandbox tarnwick_stress [log|settings|levels|life] [--quick] [--case=PART_OF_ITS_NAME]
//   scripts/sandbox tarnwick_stress --self-check
//
// Without a section it runs all. The exit code is 1 when a case failed, 2 for a wrong call.
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "tests/stress/stress.h"

namespace {

constexpr int kSecondsOfACase = 900;
constexpr int kSecondsOfAQuickCase = 60;

constexpr char kCaseOption[] = "--case=";

struct Wanted {
  std::string section;  // empty: all
  std::string part;     // of the cases' names
  bool quick = false;
  bool self_check = false;
};

Wanted ReadArguments(int argc, char** argv) {
  Wanted wanted;
  for (int i = 1; i < argc; ++i) {
    const std::string argument = argv[i];
    if (argument == "--quick") {
      wanted.quick = true;
    } else if (argument == "--self-check") {
      wanted.self_check = true;
    } else if (argument.rfind(kCaseOption, 0) == 0) {
      wanted.part = argument.substr(strlen(kCaseOption));
    } else {
      wanted.section = argument;
    }
  }
  return wanted;
}

std::vector<StressCase> CasesOf(const Wanted& wanted) {
  if (wanted.self_check) return SelfChecks();
  std::vector<StressCase> cases;
  for (const auto& part : {LogCases(), LogFaultCases(), LogForkCases(), SettingsCases(),
                           SettingsFaultCases(), LevelsCases(), LifeCases()}) {
    for (const StressCase& stress_case : part) {
      if (!wanted.section.empty() && wanted.section != stress_case.section) continue;
      if (std::string(stress_case.name).find(wanted.part) == std::string::npos) continue;
      cases.push_back(stress_case);
    }
  }
  return cases;
}

}  // namespace

int main(int argc, char** argv) {
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    fprintf(stderr, "%s writes to /var/log and the settings: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  const Wanted wanted = ReadArguments(argc, argv);
  const std::vector<StressCase> cases = CasesOf(wanted);
  if (cases.empty()) {
    fprintf(stderr, "usage: %s [log|settings|levels|life] [--quick] [--case=NAME] | --self-check\n",
            argv[0]);
    return 2;
  }
  const int seconds = wanted.quick ? kSecondsOfAQuickCase : kSecondsOfACase;
  return RunCases(cases, wanted.quick, seconds) ? 0 : 1;
}
