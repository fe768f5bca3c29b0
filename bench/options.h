// The command line of tarnwick_bench.
#ifndef TARNWICK_BENCH_OPTIONS_H_
#define TARNWICK_BENCH_OPTIONS_H_

#include <string>
#include <vector>

struct Options {
  enum Mode {
    kCompare,      // all selected works, round by round
    kList,         // what there is
    kListCounted,  // what is counted, and how often it is done for that
    kMeasureOne,   // one measurement, for the process that looks at memory
    kCountOne,     // one contender's work in CountedRun, where bench/count counts
  };
  Mode mode = kCompare;

  int rounds = 25;
  double roundSeconds = 0.05;         // of each contender
  int seconds = 60;                   // for all rounds of a work
  std::vector<std::string> selected;  // sections and works; empty for all

  // Of kMeasureOne and kCountOne.
  const char* work = nullptr;
  const char* contender = nullptr;
  int count = 0;
};

// Results: false for a wrong command line, and the usage on stderr.
bool ParseOptions(int argc, char** argv, Options* options);

#endif  // TARNWICK_BENCH_OPTIONS_H_
