#include "tools/twlogctl/create_remove.h"

#include <grp.h>
#include <json/value.h>
#include <sys/ipc.h>
#include <sys/shm.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/settings_file.h"

namespace {

std::optional<gid_t> GroupNumber(const std::string& text) {
  if (const struct group* const entry = getgrnam(text.c_str())) return entry->gr_gid;
  gid_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (text.empty() || error != std::errc() || stop != end) return std::nullopt;
  return number;
}

// The segment as it was asked for.
struct Wanted {
  mode_t mode;
  std::optional<gid_t> group;
};

int AlreadyThere(const RecordSegment& segment, const CreateOptions& options, const Wanted& wanted) {
  if (const auto stranger = segment.Stranger()) {
    Complain("there is a record already, made or owned by " + UserName(*stranger) +
             ", who can change every level; root removes it by \"twlogctl remove\"");
    return kExitWrong;
  }
  if (!segment.HasRightSize()) {
    Complain("there is a segment of " + std::to_string(segment.size) +
             " bytes under the record's key, and the record has " +
             std::to_string(sizeof(TWDbgLogCfg)) + "; \"twlogctl remove\" takes it away");
    return kExitWrong;
  }
  const bool other_mode = options.mode && segment.mode != wanted.mode;
  const bool other_group = wanted.group && segment.group != *wanted.group;
  if (other_mode || other_group) {
    Complain("there is a record already, of group " + GroupName(segment.group) + " with mode " +
             ModeText(segment.mode) + "; \"twlogctl remove\" takes it away");
    return kExitWrong;
  }
  if (options.json) {
    Json::Value line;
    line["created"] = false;
    PrintJsonLine(line);
  } else {
    puts("the record is there already, and stays as it is");
  }
  return kExitDone;
}

// A broken file would set levels that nobody has chosen: the library takes what is no number for 0.
bool SettingsMayBeLoaded() {
  SavedLevels saved;
  SettingsFault fault;
  const SettingsState state = ReadSettings(&saved, &fault);
  if (state != SettingsState::kBroken && state != SettingsState::kUnreadable) return true;
  Complain(fault.Describe() + "; correct the file or move it away first");
  return false;
}

bool SetGroup(int id, const Wanted& wanted) {
  if (!wanted.group) return true;
  struct shmid_ds state = {};
  if (shmctl(id, IPC_STAT, &state) == -1) return false;
  state.shm_perm.gid = *wanted.group;
  return shmctl(id, IPC_SET, &state) == 0;
}

// Daemons attach it from the first moment on, so its levels are set before anything else happens.
// Results: false with errno, and no segment.
bool MakeSegment(const Wanted& wanted, bool* loaded) {
  const int id = shmget(TWShmDbgLogIPCKey(), sizeof(TWDbgLogCfg),
                        IPC_CREAT | IPC_EXCL | static_cast<int>(wanted.mode));
  if (id == -1) return false;
  InitDbgCfg();
  if (g_pDbgLogCfg != nullptr) {
    *loaded = g_pDbgLogCfg->Init(0) == 0;
    if (SetGroup(id, wanted)) return true;
  }
  const int error = errno;
  FreeDbgCfg();
  shmctl(id, IPC_RMID, nullptr);
  errno = error;
  return false;
}

// Those have no record until they are started again: the library attaches when it is loaded.
void WarnOfRunningDaemons() {
  std::string names;
  for (const LibraryUser& user : LibraryUsers(-1)) {
    names += (names.empty() ? "" : ", ") + NameAndPid(user.process);
  }
  Complain(
      "a daemon attaches the record when it loads the library, and not later: start the"
      " running ones again" +
      (names.empty() ? "" : ": " + names));
}

void TellCreated(bool loaded, const CreateOptions& options) {
  if (options.json) {
    Json::Value line;
    line["created"] = true;
    line["saved_levels"] = loaded;
    PrintJsonLine(line);
  } else {
    printf("record created, %s\n",
           loaded ? "with the saved levels" : "every category at notice: nothing is saved");
  }
  fflush(stdout);
}

std::string Count(unsigned long attached) {
  return attached == 1 ? "one process has" : std::to_string(attached) + " processes have";
}

bool Confirmed(const RecordSegment& segment) {
  fprintf(stderr, "The record is attached by %s.\n",
          EscapeControls(DescribeAttached(segment), Backslash::kKept).c_str());
  fputs("They keep their levels until they end, and nobody can change them.\nRemove it? [y/N] ",
        stderr);
  char answer[16] = "";
  return fgets(answer, sizeof(answer), stdin) != nullptr && (answer[0] == 'y' || answer[0] == 'Y');
}

bool MayRemove(const RecordSegment& segment, bool yes) {
  const unsigned long attached = AttachedOthers(segment);
  if (attached == 0 || yes) return true;
  if (IsTerminal(STDIN_FILENO)) {
    if (Confirmed(segment)) return true;
    Complain("the record stays");
    return false;
  }
  Complain(Count(attached) + " it attached, and could not be reached any more; --yes removes it");
  return false;
}

}  // namespace

std::optional<mode_t> ParseRecordMode(const std::string& text) {
  unsigned mode = 0;
  const char* const end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, mode, 8);
  if (text.empty() || error != std::errc() || stop != end) return std::nullopt;
  if (mode > 0777 || (mode & 0600) != 0600) return std::nullopt;
  return mode;
}

int CreateRecord(const CreateOptions& options) {
  Wanted wanted = {options.mode.value_or(kDefaultMode), std::nullopt};
  if (options.group) {
    wanted.group = GroupNumber(*options.group);
    if (!wanted.group) {
      Complain("there is no group \"" + *options.group + "\"");
      return kExitUsage;
    }
  }
  if (const auto segment = FindRecord()) return AlreadyThere(*segment, options, wanted);
  if (!SettingsMayBeLoaded()) return kExitWrong;
  bool loaded = false;
  if (!MakeSegment(wanted, &loaded)) {
    const int error = errno;
    Complain(std::string("cannot create the record: ") + strerror(error));
    return kExitWrong;
  }
  TellCreated(loaded, options);
  WarnOfRunningDaemons();
  return kExitDone;
}

int RemoveRecord(bool yes, bool json) {
  const std::optional<RecordSegment> segment = FindRecord();
  if (!segment) {
    Complain("there is no record of levels");
    return kExitWrong;
  }
  if (!MayRemove(*segment, yes)) return kExitWrong;
  if (shmctl(segment->id, IPC_RMID, nullptr) == -1) {
    const int error = errno;
    Complain(std::string("cannot remove the record: ") + strerror(error) + "; it belongs to " +
             UserName(segment->owner));
    return kExitWrong;
  }
  if (json) {
    Json::Value line;
    line["removed"] = true;
    PrintJsonLine(line);
  } else {
    puts("record removed: every category stands at notice for what starts from now on");
  }
  return kExitDone;
}
