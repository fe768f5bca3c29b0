// The doctor's look at the shared record and its levels.
#include <sys/shm.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <map>

#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"

namespace {

constexpr char kReplace[] = "twlogctl remove --yes && twlogctl create";

std::string Describe(const RecordSegment& segment) {
  return std::to_string(segment.size) + " bytes, " + UserName(segment.owner) + ":" +
         GroupName(segment.group) + ", mode " + ModeText(segment.mode);
}

// Nobody may attach it read-write, as the library does, when its mode does not let anybody write.
bool OwnerMayWrite(const RecordSegment& segment) {
  return (segment.mode & 0600) == 0600;
}

// "http", "http and 3 more", "all 74 categories".
std::string NamesOf(const std::vector<std::string>& names) {
  if (names.size() == 1) return names.front();
  if (names.size() == LOG_CATEG_COUNT) return "all " + std::to_string(names.size()) + " categories";
  return names.front() + " and " + std::to_string(names.size() - 1) + " more";
}

std::string BackToNotice(const std::vector<std::string>& names) {
  if (names.size() == LOG_CATEG_COUNT) return "twlogctl set all=notice";
  std::string command = "twlogctl set";
  for (const std::string& name : names) command += " " + name + "=notice";
  return command;
}

// A number that is no level was nobody's choice; the low levels may be somebody's.
void TellLevel(int level, const std::vector<std::string>& names, Findings* findings) {
  const bool one = names.size() == 1;
  const std::string what = NamesOf(names);
  if (level >= LOG_LEVEL_ALARM && level <= LOG_LEVEL_DEBUG3) {
    findings->push_back(
        {"levels", Verdict::kNote,
         what + (one ? " writes " : " write ") + LevelText(level) + " and worse alone", ""});
    return;
  }
  findings->push_back({"levels", Verdict::kWrong,
                       what + (one ? " stands at " : " stand at ") + LevelWords(level) +
                           ", which lets " + (level < LOG_LEVEL_ALARM ? "no" : "every") +
                           " line through",
                       BackToNotice(names)});
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
  } else if (const auto stranger = segment->Stranger()) {
    findings->push_back({"record", Verdict::kWrong,
                         "the record was made or is owned by " + UserName(*stranger) +
                             ", who can change every level: " + Describe(*segment),
                         kReplace});
  } else if ((segment->mode & S_IWOTH) != 0) {
    findings->push_back({"record", Verdict::kWrong,
                         "anybody can change every level in the record: " + Describe(*segment),
                         kReplace});
  } else if (!OwnerMayWrite(*segment)) {
    findings->push_back(
        {"record", Verdict::kWrong,
         "its mode keeps processes from attaching the record: " + Describe(*segment), kReplace});
  } else if (!Attach(*segment, SHM_RDONLY)) {
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
  const AttachedRecord record =
      segment && segment->HasRightSize() ? Attach(*segment, SHM_RDONLY) : nullptr;
  if (!record) return;
  std::map<int, std::vector<std::string>> by_level;
  for (int value = 0; value < LOG_CATEG_COUNT; ++value) {
    const auto categ = static_cast<LOG_CATEG>(value);
    by_level[record->Level(categ)].emplace_back(Enum2String(categ));
  }
  for (const auto& [level, names] : by_level) {
    if (level < LOG_LEVEL_NOTICE || level > LOG_LEVEL_DEBUG3) TellLevel(level, names, findings);
  }
}
