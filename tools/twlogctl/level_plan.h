// What "set" is asked to change.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LEVEL_PLAN_H_
#define TARNWICK_TOOLS_TWLOGCTL_LEVEL_PLAN_H_

#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"

struct LevelChange {
  LOG_CATEG categ;
  int before;
  int after;
  bool named;  // by itself, not by "all"
};

// Reads assignments such as "http=debug", "socket,57=6" and "all=notice" against the levels of
// `record`. "all" means every category that no other assignment names, wherever it stands.
// Results: the changes in the order of the categories, those that change nothing included; `errors`
//   gets a text for each mistake, and the changes are then to be left alone.
std::vector<LevelChange> PlanLevels(const std::vector<std::string>& assignments,
                                    const TWDbgLogCfg& record, std::vector<std::string>* errors);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LEVEL_PLAN_H_
