// The doctor's look at the processes that have the library in their memory.
#include <sys/stat.h>

#include <optional>
#include <sstream>
#include <vector>

#include "tools/common/shell.h"
#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/processes.h"
#include "tools/twlogctl/record.h"
#include "tools/twlogctl/report.h"

namespace {

struct Credentials {
  uid_t user = 0;
  std::vector<gid_t> groups;
};

// From /proc/PID/status: "Uid:" and "Gid:" have the real and the effective number, then two more.
Credentials CredentialsOf(pid_t pid) {
  Credentials credentials;
  std::istringstream status(ReadWholeFile("/proc/" + std::to_string(pid) + "/status"));
  for (std::string line; std::getline(status, line);) {
    std::istringstream fields(line);
    std::string name;
    unsigned long real_number = 0;
    unsigned long number = 0;
    fields >> name;
    if (name == "Uid:" && fields >> real_number >> number)
      credentials.user = static_cast<uid_t>(number);
    if (name == "Gid:" && fields >> real_number >> number) {
      credentials.groups.push_back(static_cast<gid_t>(number));
    }
    while (name == "Groups:" && fields >> number) {
      credentials.groups.push_back(static_cast<gid_t>(number));
    }
  }
  return credentials;
}

// What the mode alone says: access lists and capabilities of other users than root do not show
// in it.
bool MayDo(const Credentials& credentials, const struct stat& state, mode_t bits) {
  if (credentials.user == 0) return true;
  if (credentials.user == state.st_uid) return (state.st_mode >> 6 & bits) == bits;
  for (const gid_t group : credentials.groups) {
    if (group == state.st_gid) return (state.st_mode >> 3 & bits) == bits;
  }
  return (state.st_mode & bits) == bits;
}

bool MayWrite(const Credentials& credentials, const char* path) {
  struct stat directory = {};
  struct stat file = {};
  if (stat(kLogDirectory, &directory) != 0) return true;  // another finding tells of that
  const bool exists = stat(path, &file) == 0;
  if (!MayDo(credentials, directory, exists ? S_IXOTH : S_IWOTH | S_IXOTH)) return false;
  return !exists || MayDo(credentials, file, S_IWOTH);
}

// Anybody can run a process that has the library in its memory, under any name. So a finding about
// a process of another user than root says whose it is, and proposes nothing but a look at it.
Finding OtherUsersProcess(const LibraryUser& user, uid_t owner, const std::string& what) {
  return {"daemons", Verdict::kWrong,
          NameAndPid(user.process) + " runs as " + UserName(owner) + ", who may not " + what,
          LookAtProcess(user.process.pid)};
}

// What shmat asks for, as the library does.
bool MayAttach(const Credentials& credentials, const RecordSegment& segment) {
  struct stat state = {};
  state.st_uid = segment.owner;
  state.st_gid = segment.group;
  state.st_mode = segment.mode;
  Credentials effective = credentials;
  if (effective.user == segment.creator) effective.user = segment.owner;
  return MayDo(effective, state, S_IROTH | S_IWOTH);
}

void CheckAttached(const LibraryUser& user, const Credentials& credentials,
                   const std::optional<RecordSegment>& segment, Findings* findings) {
  if (!segment || user.has_record) return;
  if (!MayAttach(credentials, *segment)) {
    findings->push_back(OtherUsersProcess(
        user, credentials.user,
        "attach the record of " + UserName(segment->owner) + ":" + GroupName(segment->group) +
            " with mode " + ModeText(segment->mode) +
            ", so all its levels are notice; \"twlogctl create --group\" makes one for a group"));
    return;
  }
  findings->push_back({"daemons", Verdict::kWrong,
                       NameAndPid(user.process) +
                           " has not attached the record: it was started before the record was"
                           " made, and all its levels are notice",
                       "start " + QuoteForShell(user.process.name) + " again"});
}

void CheckDaemon(const LibraryUser& user, const std::optional<RecordSegment>& segment,
                 Findings* findings) {
  const Credentials credentials = CredentialsOf(user.process.pid);
  CheckAttached(user, credentials, segment, findings);
  if (MayWrite(credentials, kMainLogPath)) return;
  findings->push_back(OtherUsersProcess(
      user, credentials.user,
      std::string("write ") + kMainLogPath +
          "; when it is a daemon of this machine, the directory needs a group for its user"));
}

}  // namespace

void CheckDaemons(Findings* findings) {
  const auto segment = FindRecord();
  const size_t before = findings->size();
  size_t count = 0;
  for (const LibraryUser& user : LibraryUsers(segment ? segment->id : -1)) {
    if (user.process.name.compare(0, 8, "twlogctl") == 0) continue;  // another of these tools
    ++count;
    CheckDaemon(user, segment, findings);
  }
  if (findings->size() > before) return;
  findings->push_back({"daemons", Verdict::kRight,
                       count == 0 ? "none is running, or none that shows to this user"
                                  : std::to_string(count) + " running, with the record attached",
                       ""});
}
