#include "tools/twlogctl/status.h"

#include <json/value.h>

#include <cstdio>
#include <string>
#include <utility>
#include <vector>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"

namespace {

std::string KeyText() {
  char text[16];
  snprintf(text, sizeof(text), "0x%08x", static_cast<unsigned>(TWShmDbgLogIPCKey()));
  return text;
}

std::vector<std::pair<std::string, int>> LevelsOf(const TWDbgLogCfg& record, bool all) {
  std::vector<std::pair<std::string, int>> levels;
  for (int value = 0; value < LOG_CATEG_COUNT; ++value) {
    const auto categ = static_cast<LOG_CATEG>(value);
    const int level = record.Level(categ);
    if (all || level != LOG_LEVEL_NOTICE) levels.emplace_back(Enum2String(categ), level);
  }
  return levels;
}

Json::Value ProcessesJson(const RecordSegment& segment) {
  Json::Value list(Json::arrayValue);
  for (const LibraryUser& user : LibraryUsers(segment.id)) {
    if (!user.has_record) continue;
    Json::Value process;
    process["pid"] = static_cast<Json::Int64>(user.process.pid);
    process["name"] = user.process.name;
    list.append(process);
  }
  return list;
}

Json::Value SegmentJson(const RecordSegment& segment) {
  Json::Value object;
  object["record"] = true;
  object["key"] = KeyText();
  object["size"] = static_cast<Json::UInt64>(segment.size);
  object["owner"] = UserName(segment.owner);
  object["group"] = GroupName(segment.group);
  object["mode"] = ModeText(segment.mode);
  object["attached"] = static_cast<Json::UInt64>(AttachedOthers(segment));
  object["processes"] = ProcessesJson(segment);
  return object;
}

int ShowJson(const RecordSegment& segment, bool all) {
  Json::Value object = SegmentJson(segment);
  const AttachedRecord record = AttachRecord(Access::kRead);
  if (record) {
    object["time_stamps"] = record->TimeScale() ? "milliseconds" : "seconds";
    object["levels"] = Json::Value(Json::objectValue);
    for (const auto& [name, level] : LevelsOf(*record, all)) {
      object["levels"][name] = LevelText(level);
    }
  }
  PrintJsonLine(object);
  return record ? kExitDone : kExitWrong;
}

void PrintSegment(const RecordSegment& segment) {
  printf("record       present, key %s\n", KeyText().c_str());
  printf("size         %zu bytes\n", segment.size);
  const std::string owner = UserName(segment.owner) + ":" + GroupName(segment.group);
  printf("owner        %s\n", EscapeControls(owner).c_str());
  printf("mode         %s\n", ModeText(segment.mode).c_str());
  printf("attached     %s\n", EscapeControls(DescribeAttached(segment), Backslash::kKept).c_str());
}

Colour ColourOf(int level) {
  if (level < LOG_LEVEL_NOTICE) return Colour::kRed;
  return level > LOG_LEVEL_NOTICE ? Colour::kYellow : Colour::kNone;
}

void PrintLevels(const TWDbgLogCfg& record, bool all) {
  const bool colour = MayColour(1);
  const auto levels = LevelsOf(record, all);
  const size_t others = LOG_CATEG_COUNT - levels.size();
  for (const auto& [name, level] : levels) {
    printf("%-15s%s\n", name.c_str(), InColour(ColourOf(level), LevelWords(level), colour).c_str());
  }
  if (others > 0) printf("%zu %s at notice\n", others, others == 1 ? "category" : "categories");
}

int ShowText(const RecordSegment& segment, bool all) {
  PrintSegment(segment);
  fflush(stdout);  // in front of a complaint
  const AttachedRecord record = AttachRecord(Access::kRead);
  if (!record) return kExitWrong;
  printf("time stamps  %s\n\n", record->TimeScale() ? "milliseconds" : "seconds");
  PrintLevels(*record, all);
  return kExitDone;
}

int ShowMissing(bool json) {
  if (json) {
    Json::Value object;
    object["record"] = false;
    object["key"] = KeyText();
    PrintJsonLine(object);
  } else {
    printf("record       missing, key %s: every category stands at notice\n", KeyText().c_str());
  }
  return kExitWrong;
}

}  // namespace

int ShowStatus(bool all, bool json) {
  const std::optional<RecordSegment> segment = FindRecord();
  if (!segment) return ShowMissing(json);
  return json ? ShowJson(*segment, all) : ShowText(*segment, all);
}
