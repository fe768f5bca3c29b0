// What the operations of the soak have come to.
#ifndef TARNWICK_TESTS_SOAK_STATISTICS_H_
#define TARNWICK_TESTS_SOAK_STATISTICS_H_

#include <mutex>
#include <string>
#include <vector>

#include "tests/soak/plan.h"

// What one operation came to, seen against what its contract says.
struct Outcome {
  enum Kind {
    kRight,   // success with the right response, to the byte
    kCut,     // success, as the contract has it, with the beginning of the right response
    kFailed,  // one of the failures that the contract names
    kWrong,   // anything else
  };
  Kind kind = kRight;
  std::string detail;  // of a wrong one
};

// Whether the plan allows for the outcome: without a fault only the right response will do.
bool IsExpected(const Plan& plan, const Outcome& outcome);

// Threads: any.
class Statistics {
 public:
  void Add(const Plan& plan, const Outcome& outcome);

  unsigned long Operations() const;
  unsigned long Unexpected() const;

  // The tables for people.
  void Print() const;

 private:
  struct Count {
    unsigned long all = 0;
    unsigned long right = 0;
    unsigned long faults = 0;
    unsigned long right_despite = 0;  // of the faults
    unsigned long cut = 0;
    unsigned long failed = 0;
    unsigned long unexpected = 0;
  };
  static void AddTo(Count* count, const Plan& plan, const Outcome& outcome);
  static void PrintRow(const char* name, const Count& count);

  mutable std::mutex mutex_;
  Count total_;
  std::vector<Count> operations_ = std::vector<Count>(SoakOperations().size());
  Count faults_[kFaults];
  std::vector<std::string> details_;  // of the first unexpected ones
};

#endif  // TARNWICK_TESTS_SOAK_STATISTICS_H_
