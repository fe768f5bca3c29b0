// Many requests, counted.
#ifndef TARNWICK_TOOLS_TWHTTP_REPEAT_H_
#define TARNWICK_TOOLS_TWHTTP_REPEAT_H_

#include <map>
#include <string>
#include <vector>

#include "tools/twhttp/failure.h"

struct Counts {
  std::vector<double> latencies;  // seconds, of the good ones
  std::map<FailureClass, int> failures;
};

// The counts in a table: how many, quantiles, a histogram of the latencies, failures by class.
std::string CountsText(Counts counts, bool colour);

// Makes the requests one after another. Results: the exit code: 0 when all were good, else that of
// the class which failed most often.
int RunRepeated(const Options& options, const std::string& body);

#endif  // TARNWICK_TOOLS_TWHTTP_REPEAT_H_
