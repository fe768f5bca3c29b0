// The tables and the plot of twlogctl stats.
#ifndef TARNWICK_TOOLS_TWLOGCTL_STATS_REPORT_H_
#define TARNWICK_TOOLS_TWLOGCTL_STATS_REPORT_H_

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "tools/twlogctl/log_rates.h"

struct StatsReport {
  std::string source;
  Moment begin;
  Moment end;
  LogAmounts amounts;
  std::map<int64_t, uint64_t> lines_by_second;
  bool own_processes = false;  // the processes may still run, and have names then
};

struct StatsLayout {
  size_t width = 80;
  size_t most = 10;  // of each kind
  bool blocks = false;
  bool colour = false;
};

// The lines of the report for people.
std::vector<std::string> StatsLines(const StatsReport& report, const StatsLayout& layout);

// The same for programs: a JSON object a line, "all" first, then every category, level and process.
// Results: false when standard output is gone.
bool PrintStatsJson(const StatsReport& report);

#endif  // TARNWICK_TOOLS_TWLOGCTL_STATS_REPORT_H_
