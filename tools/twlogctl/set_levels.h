#ifndef TARNWICK_TOOLS_TWLOGCTL_SET_LEVELS_H_
#define TARNWICK_TOOLS_TWLOGCTL_SET_LEVELS_H_

#include <chrono>
#include <optional>
#include <string>
#include <vector>

#include "tools/twlogctl/level_plan.h"

struct SetOptions {
  std::vector<std::string> assignments;
  std::optional<std::chrono::milliseconds> span;  // how long the levels are to hold
  bool json = false;
};

// The work of "set" and "timescale". Results: the exit code.
int SetLevels(const SetOptions& options);
int SetTimeScale(bool milliseconds, bool json);

// Prints the levels that change, and those that were named by themselves.
void PrintChanges(const std::vector<LevelChange>& changes, bool json);

#endif  // TARNWICK_TOOLS_TWLOGCTL_SET_LEVELS_H_
