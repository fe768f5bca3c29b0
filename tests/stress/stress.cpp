#include "tests/stress/stress.h"

#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <sstream>

#include "tests/stress/processes.h"
#include "tests/support/log_capture.h"

namespace {

using std::chrono::steady_clock;

constexpr size_t kTexts = 5;
constexpr char kRow[] = "%-8s  %-46s  %-66s  %9s  %8s  %7s\n";

std::string Number(long value) {
  return std::to_string(value);
}

// A case's own folders: whatever it mounts, fills or breaks goes away with its process.
void EnterFreshFolders() {
  if (unshare(CLONE_NEWNS) != 0 ||
      mount("tmpfs", "/var/log/tarnwick", "tmpfs", 0, "mode=755") != 0 ||
      mount("tmpfs", "/var/packages/Tarnwick/etc", "tmpfs", 0, "mode=755") != 0) {
    perror("no folders for the case");
    _exit(2);
  }
  RemoveSharedRecord();
}

// One line each: what was done, the count, the failures, then their texts.
std::string Serialize(const CaseResult& result) {
  std::ostringstream out;
  out << result.DoneText() << '\n' << result.CheckedCount() << '\n' << result.FailureCount();
  for (const std::string& text : result.FailureTexts()) out << '\n' << text;
  return out.str();
}

[[noreturn]] void RunInOwnProcess(const StressCase& stress_case, bool quick, int output) {
  setpgid(0, 0);
  prctl(PR_SET_PDEATHSIG, SIGKILL);  // it does not outlive a run that is stopped
  EnterFreshFolders();
  CaseResult result(quick);
  stress_case.body(result);
  result.Expect(!::testing::Test::HasFailure(), "a check of the test support failed");
  const std::string text = Serialize(result);
  const bool written = write(output, text.data(), text.size()) == static_cast<ssize_t>(text.size());
  _exit(written ? 0 : 2);
}

struct Outcome {
  std::string done = "-";
  std::string checked = "-";
  long failures = 1;
  std::vector<std::string> texts;
};

Outcome Deserialize(const std::string& text) {
  Outcome outcome;
  std::istringstream in(text);
  std::string line;
  std::getline(in, outcome.done);
  std::getline(in, outcome.checked);
  std::getline(in, line);
  outcome.failures = atol(line.c_str());
  while (std::getline(in, line)) outcome.texts.push_back(line);
  return outcome;
}

// Waits for the case's process and ends its whole group.
Outcome Await(pid_t pid, int input, int seconds) {
  Outcome outcome;
  const auto status = WaitFor(pid, seconds);
  kill(-pid, SIGKILL);
  char text[4096];
  const ssize_t length = status && *status == 0 ? read(input, text, sizeof(text)) : 0;
  if (length > 0) return Deserialize(std::string(text, static_cast<size_t>(length)));
  if (status) {
    outcome.texts.push_back("the case itself ended with status " + Number(*status));
  } else {
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
    outcome.texts.push_back("the case did not end within " + Number(seconds) + " s");
  }
  return outcome;
}

bool RunCase(const StressCase& stress_case, bool quick, int seconds) {
  int ends[2];
  if (pipe(ends) != 0) return false;
  const auto start = steady_clock::now();
  const pid_t pid = fork();
  if (pid == 0) RunInOwnProcess(stress_case, quick, ends[1]);
  close(ends[1]);
  const Outcome outcome = Await(pid, ends[0], seconds);
  close(ends[0]);
  char took[32];
  snprintf(took, sizeof(took), "%.1f s",
           std::chrono::duration<double>(steady_clock::now() - start).count());
  printf(kRow, stress_case.section, stress_case.name, outcome.done.c_str(), outcome.checked.c_str(),
         Number(outcome.failures).c_str(), took);
  for (const std::string& text : outcome.texts) printf("          ! %s\n", text.c_str());
  fflush(stdout);
  return outcome.failures == 0;
}

}  // namespace

void CaseResult::Done(const char* format, ...) {
  char text[256];
  va_list arguments;
  va_start(arguments, format);
  vsnprintf(text, sizeof(text), format, arguments);
  va_end(arguments);
  done_ = text;
}

void CaseResult::Fail(const std::string& text) {
  ++failures_;
  if (texts_.size() >= kTexts) return;
  texts_.push_back(text.substr(0, 300));
  for (char& ch : texts_.back()) {
    if (ch == '\n') ch = ' ';
  }
}

void CaseResult::Expect(bool good, const std::string& text) {
  if (!good) Fail(text);
}

bool RunCases(const std::vector<StressCase>& cases, bool quick, int seconds) {
  printf(kRow, "section", "case", "done", "checked", "failures", "time");
  fflush(stdout);
  size_t failed = 0;
  for (const StressCase& stress_case : cases) {
    if (!RunCase(stress_case, quick, seconds)) ++failed;
  }
  RemoveSharedRecord();
  printf("%zu cases, %zu failed\n", cases.size(), failed);
  return failed == 0;
}
