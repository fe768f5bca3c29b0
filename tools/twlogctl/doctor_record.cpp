// The doctor's look at the shared record and its levels.
#include <sys/shm.h>

#include <cerrno>
#include <cstring>

#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"

namespace {

std::string Describe(const RecordSegment& segment) {
  return std::to_string(segment.size) + " bytes, " + UserName(segment.owner) + ":" +
         GroupName(segment.group) + ", mode " + ModeText(segment.mode);
}

// The record without complaints. Results: null with errno.
AttachedRecord Attach(const RecordSegment& segment) {
  void* const address = shmat(segment.id, nullptr, SHM_RDONLY);
  if (reinterpret_cast<intptr_t>(address) == -1) return nullptr;
  return AttachedRecord(static_cast<TWDbgLogCfg*>(address));
}

// Nobody may attach it read-write, as the library does, when its mode does not let anybody write.
bool OwnerMayWrite(const RecordSegment& segment) {
  return (segment.mode & 0600) == 0600;
}

}  // namespace

void CheckRecord(Findings* findings) {
  const auto segment = FindRecord();
  if (!segment) {
    findings->push_back({"record", Verdict::kWrong,
                         "there is no record: every category stands at notice, and no level can be"
                         " changed",
                         "twlogctl create, and start the daemons again"});
  } else if (!segment->HasRightSize()) {
    findings->push_back({"record", Verdict::kWrong,
                         "the record has another size than " + std::to_string(sizeof(TWDbgLogCfg)) +
                             ": " + Describe(*segment),
                         "stop the daemons, twlogctl remove, twlogctl create, start them again"});
  } else if (!OwnerMayWrite(*segment)) {
    findings->push_back(
        {"record", Verdict::kWrong,
         "its mode keeps processes from attaching the record: " + Describe(*segment),
         "twlogctl remove --yes && twlogctl create"});
  } else if (!Attach(*segment)) {
    const std::string reason = strerror(errno);
    findings->push_back(
        {"record", Verdict::kWrong,
         "the record cannot be attached here: " + reason + "; " + Describe(*segment),
         "run this as " + UserName(segment->owner) + ", or as one of the group " +
             GroupName(segment->group)});
  } else {
    findings->push_back({"record", Verdict::kRight, Describe(*segment), ""});
  }
}

void CheckLevels(Findings* findings) {
  const auto segment = FindRecord();
  const AttachedRecord record = segment && segment->HasRightSize() ? Attach(*segment) : nullptr;
  if (!record) return;
  for (int value = 0; value < LOG_CATEG_COUNT; ++value) {
    const auto categ = static_cast<LOG_CATEG>(value);
    const int level = record->Level(categ);
    if (level >= LOG_LEVEL_NOTICE) continue;
    const std::string name = Enum2String(categ);
    // A level below zero lets nothing through; the other low ones are somebody's choice.
    findings->push_back(
        {"levels", level < LOG_LEVEL_ALARM ? Verdict::kWrong : Verdict::kNote,
         level < LOG_LEVEL_ALARM
             ? name + " stands at " + LevelText(level) + ", which lets no line through"
             : name + " writes " + LevelText(level) + " and worse alone",
         level < LOG_LEVEL_ALARM ? "twlogctl set " + name + "=notice" : ""});
  }
}
