// The cases of the stress program and the table that it prints.
#ifndef TARNWICK_TESTS_STRESS_STRESS_H_
#define TARNWICK_TESTS_STRESS_STRESS_H_

#include <string>
#include <vector>

// What came of one case.
// Threads: one thread uses it at a time.
class CaseResult {
 public:
  explicit CaseResult(bool quick) : quick_(quick) {}

  // The count for this form of the run.
  int Pick(int full, int quick) const { return quick_ ? quick : full; }

  // Says in the table what was done, such as "200 kills, 31 rotations".
  void Done(const char* format, ...) __attribute__((format(printf, 2, 3)));

  // Adds to the lines, rounds or reads that were looked at.
  void Checked(long count) { checked_ += count; }

  void Fail(const std::string& text);
  void Expect(bool good, const std::string& text);

  const std::string& DoneText() const { return done_; }
  long CheckedCount() const { return checked_; }
  long FailureCount() const { return failures_; }

  // The first failures; the rest are counted only.
  const std::vector<std::string>& FailureTexts() const { return texts_; }

 private:
  bool quick_;
  std::string done_;
  long checked_ = 0;
  long failures_ = 0;
  std::vector<std::string> texts_;
};

struct StressCase {
  const char* section;
  const char* name;
  void (*body)(CaseResult& result);
};

// Runs each case in a process of its own, with empty log and settings folders and no shared record,
// and prints its row. A case that crashes or runs longer than `seconds` has failed, and what it
// left running is killed.
// Results: true when no case failed.
bool RunCases(const std::vector<StressCase>& cases, bool quick, int seconds);

std::vector<StressCase> LogCases();
std::vector<StressCase> LogFaultCases();
std::vector<StressCase> LogForkCases();
std::vector<StressCase> SettingsCases();
std::vector<StressCase> SettingsFaultCases();
std::vector<StressCase> LevelsCases();
std::vector<StressCase> LifeCases();

// Gives each verifier texts and values that are wrong, and expects it to notice.
std::vector<StressCase> SelfChecks();

#endif  // TARNWICK_TESTS_STRESS_STRESS_H_
