#include "tools/twlogctl/level_plan.h"

#include <map>
#include <optional>
#include <sstream>

#include "tools/common/names.h"
#include "tools/twlogctl/report.h"

namespace {

class PlanReader {
 public:
  explicit PlanReader(std::vector<std::string>* errors) : errors_(errors) {}

  void Read(const std::string& assignment) {
    const size_t equals = assignment.find('=');
    if (equals == std::string::npos || equals == 0) {
      errors_->push_back("\"" + assignment + "\" is not of the form CATEGORY=LEVEL");
      return;
    }
    const std::string level_text = assignment.substr(equals + 1);
    const std::optional<LOG_LEVEL> level = ParseLevel(level_text);
    if (!level) {
      errors_->push_back("unknown level \"" + level_text + "\"" + DidYouMeanLevel(level_text));
    }
    // The categories are read all the same: all mistakes are told at once.
    std::istringstream names(assignment.substr(0, equals) + ",");
    for (std::string name; std::getline(names, name, ',');) {
      ReadCategory(name, level.value_or(LOG_LEVEL_NOTICE));
    }
  }

  std::optional<int> LevelOf(LOG_CATEG categ) const {
    const auto named = named_.find(categ);
    return named != named_.end() ? named->second : all_;
  }
  bool Names(LOG_CATEG categ) const { return named_.count(categ) > 0; }

 private:
  void ReadCategory(const std::string& name, int level) {
    if (name == "all") {
      if (all_ && *all_ != level) errors_->push_back("\"all\" is given two levels");
      all_ = level;
      return;
    }
    const std::optional<LOG_CATEG> categ = ParseCategory(name);
    if (!categ) {
      errors_->push_back("unknown category \"" + name + "\"" + DidYouMeanCategory(name));
      return;
    }
    const auto [entry, is_new] = named_.emplace(*categ, level);
    if (!is_new && entry->second != level) {
      errors_->push_back("category \"" + name + "\" is given two levels");
    }
  }

  std::vector<std::string>* errors_;
  std::map<LOG_CATEG, int> named_;
  std::optional<int> all_;
};

}  // namespace

std::vector<LevelChange> PlanLevels(const std::vector<std::string>& assignments,
                                    const TWDbgLogCfg& record, std::vector<std::string>* errors) {
  PlanReader reader(errors);
  for (const std::string& assignment : assignments) reader.Read(assignment);
  std::vector<LevelChange> changes;
  for (int value = 0; value < LOG_CATEG_COUNT; ++value) {
    const auto categ = static_cast<LOG_CATEG>(value);
    const std::optional<int> level = reader.LevelOf(categ);
    if (level) changes.push_back({categ, record.Level(categ), *level, reader.Names(categ)});
  }
  return changes;
}
