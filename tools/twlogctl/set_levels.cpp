#include "tools/twlogctl/set_levels.h"

#include <json/value.h>

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <ctime>
#include <map>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/common/units.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/temporary_levels.h"

namespace {

void PrintChange(const LevelChange& change, bool json) {
  if (json) {
    Json::Value line;
    line["category"] = Enum2String(change.categ);
    line["old"] = LevelText(change.before);
    line["new"] = LevelText(change.after);
    PrintJsonLine(line);
    return;
  }
  const bool colour = MayColour(1);
  printf("%s: %s -> %s\n", Enum2String(change.categ), LevelWords(change.before).c_str(),
         InColour(Colour::kBold, LevelWords(change.after), colour).c_str());
}

// Categories that "all" changes from one level to another. Many have one line, which says as much.
void PrintGroup(const std::vector<LevelChange>& group) {
  constexpr size_t kFew = 4;
  if (group.size() > kFew) {
    printf("%zu categories: %s -> %s\n", group.size(), LevelWords(group.front().before).c_str(),
           LevelWords(group.front().after).c_str());
    return;
  }
  for (const LevelChange& change : group) PrintChange(change, false);
}

// The local time of day after `span`, with its day when that is another one.
std::string TimeAfter(std::chrono::milliseconds span) {
  const time_t now = time(nullptr);
  const time_t then = now + static_cast<time_t>((span.count() + 999) / 1000);
  struct tm today = {};
  struct tm local = {};
  localtime_r(&now, &today);
  localtime_r(&then, &local);
  const bool same_day = today.tm_yday == local.tm_yday && today.tm_year == local.tm_year;
  char text[64];
  strftime(text, sizeof(text), same_day ? "%T" : "%F %T", &local);
  return text;
}

// The levels that are not the old ones at the end.
void TellLeft(const std::vector<LevelChange>& left, const TWDbgLogCfg& record) {
  for (const LevelChange& change : left) {
    Complain(std::string(Enum2String(change.categ)) + " was changed to " +
             LevelWords(record.Level(change.categ)) + " meanwhile and stays so");
  }
}

int ReportEnd(const TemporaryResult& result) {
  switch (result.end) {
    case TemporaryEnd::kTimePassed:
      Complain("the time is over: the levels are back");
      return kExitDone;
    case TemporaryEnd::kInterrupted:
      Complain("interrupted: the levels are back");
      // The shell that waits for this program wants to know that it was a signal.
      signal(result.signal, SIG_DFL);
      raise(result.signal);
      return 128 + result.signal;
    case TemporaryEnd::kReverterKilled:
      Complain("the process that counts the time was killed: the levels are back early");
      return kExitWrong;
    case TemporaryEnd::kNoReverter:
      Complain("no process can be started that would put the levels back: nothing was changed");
      return kExitWrong;
  }
  return kExitWrong;
}

// A mistake in the arguments is one whether there is a record or not.
bool AssignmentsAreRight(const std::vector<std::string>& assignments) {
  const TWDbgLogCfg blank = {};
  std::vector<std::string> errors;
  PlanLevels(assignments, blank, &errors);
  for (const std::string& error : errors) Complain(error);
  if (!errors.empty()) Complain("nothing was changed");
  return errors.empty();
}

int SetForSpan(TWDbgLogCfg* record, std::vector<LevelChange> changes, const SetOptions& options) {
  // What stands at its new level already is not this call's to put back.
  const auto changes_nothing = [](const LevelChange& c) { return c.before == c.after; };
  changes.erase(std::remove_if(changes.begin(), changes.end(), changes_nothing), changes.end());
  if (changes.empty()) return kExitDone;
  const TemporaryResult result = SetTemporarily(record, changes, *options.span, [&options] {
    Complain("for " + FormatSpan(*options.span) + ", until " + TimeAfter(*options.span) +
             "; Ctrl-C puts the old levels back at once");
  });
  if (result.end != TemporaryEnd::kNoReverter) TellLeft(result.left, *record);
  return ReportEnd(result);
}

}  // namespace

void PrintChanges(const std::vector<LevelChange>& changes, bool json) {
  std::map<int, std::vector<LevelChange>> others;  // by the level before
  size_t printed = 0;
  for (const LevelChange& change : changes) {
    if (change.named || (json && change.before != change.after)) {
      PrintChange(change, json);
      ++printed;
    } else if (change.before != change.after) {
      others[change.before].push_back(change);
    }
  }
  for (const auto& group : others) PrintGroup(group.second);
  if (printed == 0 && others.empty() && !json) puts("nothing changes");
  fflush(stdout);
}

int SetLevels(const SetOptions& options) {
  if (!AssignmentsAreRight(options.assignments)) return kExitUsage;
  const AttachedRecord record = AttachRecord(Access::kWrite);
  if (!record) return kExitWrong;
  std::vector<std::string> errors;
  const std::vector<LevelChange> changes = PlanLevels(options.assignments, *record, &errors);
  PrintChanges(changes, options.json);
  if (options.span) return SetForSpan(record.get(), changes, options);
  for (const LevelChange& change : changes) record->SetLevel(change.categ, change.after);
  return kExitDone;
}

int SetTimeScale(bool milliseconds, bool json) {
  const AttachedRecord record = AttachRecord(Access::kWrite);
  if (!record) return kExitWrong;
  const char* const before = record->TimeScale() ? "milliseconds" : "seconds";
  const char* const after = milliseconds ? "milliseconds" : "seconds";
  record->SetTimeScale(milliseconds);
  if (json) {
    Json::Value line;
    line["time_stamps"] = after;
    line["old"] = before;
    PrintJsonLine(line);
  } else {
    printf("time stamps: %s -> %s\n", before, after);
  }
  return kExitDone;
}
