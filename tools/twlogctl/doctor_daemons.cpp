// The doctor's look at the processes that have the library in their memory.
#include <sys/stat.h>

#include <sstream>
#include <vector>

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
    unsigned long realNumber = 0;
    unsigned long number = 0;
    fields >> name;
    if (name == "Uid:" && fields >> realNumber >> number)
      credentials.user = static_cast<uid_t>(number);
    if (name == "Gid:" && fields >> realNumber >> number) {
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
  struct stat folder = {};
  struct stat file = {};
  if (stat(kLogFolder, &folder) != 0) return true;  // another finding tells of that
  const bool exists = stat(path, &file) == 0;
  if (!MayDo(credentials, folder, exists ? S_IXOTH : S_IWOTH | S_IXOTH)) return false;
  return !exists || MayDo(credentials, file, S_IWOTH);
}

std::string NameOf(const ProcessInfo& process) {
  return process.name + " (" + std::to_string(process.pid) + ")";
}

void CheckDaemon(const LibraryUser& user, bool recordThere, Findings* findings) {
  if (recordThere && !user.hasRecord) {
    findings->push_back({"daemons", Verdict::kWrong,
                         NameOf(user.process) +
                             " has not attached the record: it was started before the record was"
                             " made, or may not attach it, and all its levels are notice",
                         "start " + user.process.name + " again"});
  }
  const Credentials credentials = CredentialsOf(user.process.pid);
  if (!MayWrite(credentials, kMainLogPath)) {
    findings->push_back({"daemons", Verdict::kWrong,
                         NameOf(user.process) + " runs as " + UserName(credentials.user) +
                             ", who may not write " + kMainLogPath,
                         "setfacl -R -m u:" + UserName(credentials.user) + ":rwX " + kLogFolder});
  }
}

}  // namespace

void CheckDaemons(Findings* findings) {
  const auto segment = FindRecord();
  const size_t before = findings->size();
  size_t count = 0;
  for (const LibraryUser& user : LibraryUsers(segment ? segment->id : -1)) {
    if (user.process.name.compare(0, 8, "twlogctl") == 0) continue;  // another of these tools
    ++count;
    CheckDaemon(user, segment.has_value(), findings);
  }
  if (findings->size() > before) return;
  findings->push_back({"daemons", Verdict::kRight,
                       count == 0 ? "none is running, or none that shows to this user"
                                  : std::to_string(count) + " running, with the record attached",
                       ""});
}
