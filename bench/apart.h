// Measurements in a process of their own, whose memory holds nothing else.
#ifndef TARNWICK_BENCH_APART_H_
#define TARNWICK_BENCH_APART_H_

#include <memory>
#include <string>
#include <vector>

#include "bench/contender.h"

// A contender that starts this program anew for each measurement.
std::unique_ptr<Contender> MakeApart(const std::string& work, const std::string& contender);

// Runs a program and returns the number that it prints. Ends this program when there is none.
double NumberPrintedBy(const std::vector<std::string>& command);

#endif  // TARNWICK_BENCH_APART_H_
