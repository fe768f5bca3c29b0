// The verifiers themselves: each must notice what it is there for.
#include <unistd.h>

#include <csignal>
#include <string>

#include "tests/stress/level_values.h"
#include "tests/stress/log_lines.h"
#include "tests/stress/processes.h"
#include "tests/stress/settings_lines.h"
#include "tests/stress/stress.h"

namespace {

constexpr int kPid = 812;
constexpr int kLines = 6;

std::string LogLineOf(int writer, int number) {
  return "Nov 21 14:03:09 [812][http][warn] stress:" + std::to_string(number) +
         ":write(): " + MessageOf(writer, number);
}

std::string WholeLog() {
  std::string text;
  for (int number = 0; number < kLines; ++number) text += LogLineOf(0, number);
  return text;
}

// The first failure in a log of writer 0, of whose lines the last two may be cut or missing when it
// is `killed`. Empty when there is none.
std::string FirstFailure(const std::string& text, bool killed) {
  LogVerifier verifier({{kPid, kLines, killed ? kLines - 2 : 0, killed ? kLines : 0}});
  verifier.Read(text);
  verifier.Finish();
  return verifier.Failures().empty() ? "" : verifier.Failures()[0];
}

struct LogExample {
  const char* name;
  std::string text;
  bool killed;
  const char* failure;  // how its text begins; empty when the log is good
};

// Changes one part of the whole log.
std::string Replaced(const std::string& part, const std::string& by) {
  std::string text = WholeLog();
  return text.replace(text.find(part), part.size(), by);
}

std::vector<LogExample> LogExamples() {
  const std::string line = LogLineOf(0, 3);
  const std::string last = LogLineOf(0, kLines - 1);
  const std::string cut = line.substr(0, line.size() / 2);
  const std::string short_cut = line.substr(0, 70);
  std::string letter = line;
  letter[letter.size() - 2] = letter[letter.size() - 2] == 'a' ? 'b' : 'a';
  return {
      {"whole", WholeLog(), false, ""},
      {"lost", Replaced(line, ""), false, "lost"},
      {"doubled", Replaced(line, line + line), false, "doubled"},
      {"torn: one line in another", Replaced(line, cut + last + line.substr(cut.size())), false,
       "cut"},
      {"torn: the end alone", Replaced(line, line.substr(30)), false, "torn"},
      {"torn: without its middle", Replaced(line, line.substr(0, 60) + line.substr(65)), false,
       "torn"},
      {"another letter", Replaced(line, letter), false, "torn"},
      {"cut", Replaced(line, cut), false, "cut"},
      {"cut before the numbers", Replaced(line, line.substr(0, 20)), false, "lost"},
      {"out of order", Replaced(line + LogLineOf(0, 4), LogLineOf(0, 4) + line), false,
       "out of order"},
      {"another process", Replaced("[812]", "[813]"), false, "from another process"},
      {"another writer", Replaced(line, LogLineOf(1, 3)), false, "unknown"},
      {"killed: last line cut", Replaced(last, last.substr(0, 50)), true, ""},
      {"killed: last line cut short", Replaced(last, last.substr(0, 5)), true, ""},
      {"killed: last line missing", Replaced(last, ""), true, ""},
      {"killed: cut in the middle", Replaced(line, short_cut), true, "cut"},
      {"killed: another missing", Replaced(line, ""), true, "lost"},
      {"killed: cut and whole", WholeLog() + last.substr(0, 80), true, "doubled"},
  };
}

void CheckLogVerifier(CaseResult& result) {
  for (const LogExample& example : LogExamples()) {
    const std::string found = FirstFailure(example.text, example.killed);
    const std::string expected = example.failure;
    const bool good = expected.empty() ? found.empty() : found.rfind(expected, 0) == 0;
    result.Checked(1);
    result.Expect(good, std::string(example.name) + ": \"" + found + "\"");
  }
  result.Done("%zu logs: whole, torn, doubled, lost, cut", LogExamples().size());
}

// A cut at each byte of the last line of a killed writer is forgiven, and of no other.
void CheckCuts(CaseResult& result) {
  const std::string last = LogLineOf(0, kLines - 1);
  const std::string rest = WholeLog().substr(0, WholeLog().size() - last.size());
  for (size_t length = 1; length < last.size(); ++length) {
    const std::string text = rest + last.substr(0, length);
    result.Checked(2);
    result.Expect(FirstFailure(text, true).empty(), "killed, cut at " + std::to_string(length));
    result.Expect(!FirstFailure(text, false).empty(), "alive, cut at " + std::to_string(length));
  }
  result.Done("the last line cut at each of %zu bytes", last.size() - 1);
}

void CheckSettingsReader(CaseResult& result) {
  Rounds rounds = {1, 2, 3, 4, 5, 6, 7, 8, 1};
  const std::string whole = SettingsTextOf(rounds);
  Rounds found;
  result.Expect(ProblemIn(whole, &found).empty() && found == rounds, "a whole file is refused");
  for (size_t length = 0; length < whole.size(); ++length) {
    result.Checked(1);
    result.Expect(!ProblemIn(whole.substr(0, length), &found).empty(),
                  "half a file of " + std::to_string(length) + " bytes passes");
  }
  std::string lost = whole;
  const size_t key = lost.find("key_3");
  lost.erase(key, lost.find("key_4") - key);
  result.Expect(!ProblemIn(lost, &found).empty(), "a lost key passes");
  rounds[3] = 9;
  const std::string mixed = whole.substr(0, key + 30) + SettingsTextOf(rounds).substr(key + 30);
  result.Expect(!ProblemIn(mixed, &found).empty(), "two files mixed pass");
  result.Done("a file cut at each of %zu bytes, a lost key, two mixed", whole.size());
}

void CheckValues(CaseResult& result) {
  const std::string value = ValueOf(2, 10);
  result.Expect(ProblemInValue(2, value, 9, 10).empty(), "a good value is refused");
  result.Expect(!ProblemInValue(2, value.substr(0, value.size() - 1), 9, 10).empty(), "half");
  result.Expect(!ProblemInValue(2, value, 11, 12).empty(), "a lost round passes");
  result.Expect(!ProblemInValue(2, value, 8, 9).empty(), "a round of the future passes");
  result.Expect(!ProblemInValue(3, value, 9, 10).empty(), "another writer's value passes");
  result.Expect(IsWrittenLevel(WrittenLevel(7)), "a good level is refused");
  result.Expect(!IsWrittenLevel((WrittenLevel(7) & 0xffff) | (WrittenLevel(8) & ~0xffff)),
                "a torn level passes");
  result.Expect(!IsWrittenLevel(0) && !IsWrittenLevel(3), "a level that nobody wrote passes");
  result.Checked(8);
  result.Done("values and levels");
}

// A process of a case that fails is a failure, whichever way it ends.
void CheckProcesses(CaseResult& result) {
  result.Expect(WaitFor(Spawn([] { return 0; }), 10) == 0, "a good process is refused");
  result.Expect(StatusText(WaitFor(Spawn([] { return 3; }), 10)) == "exit code 3", "exit code");
  result.Expect(StatusText(WaitFor(Spawn([] { return raise(SIGKILL); }), 10)) == "signal 9",
                "crash");
  const pid_t hanging = Spawn([] { return pause(); });
  result.Expect(!WaitFor(hanging, 0.2), "a hanging process has ended");
  kill(hanging, SIGKILL);
  WaitFor(hanging, 10);
  result.Checked(4);
  result.Done("processes that end, fail, crash and hang");
}

}  // namespace

std::vector<StressCase> SelfChecks() {
  return {
      {"self", "log verifier", CheckLogVerifier},
      {"self", "log verifier, cuts", CheckCuts},
      {"self", "settings reader", CheckSettingsReader},
      {"self", "values and levels", CheckValues},
      {"self", "processes", CheckProcesses},
  };
}
