// The doctor's look at the log directory and the files in it.
#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <vector>

#include "tarnwick/platform/unique.h"
#include "tools/common/shell.h"
#include "tools/common/units.h"
#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/doctor_paths.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/report.h"

namespace {

// Below these a burst of lines fills the disk before anybody looks.
constexpr double kFewBytes = 1 << 20;
constexpr unsigned long kFewFiles = 16;

// Opens it as the library does, but makes no file and waits for nobody. Results: 0 or errno.
int TryToOpen(const char* path) {
  const tarnwick::UniqueFd fd(
      open(path, O_WRONLY | O_APPEND | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW));
  return fd.Valid() ? 0 : errno;
}

// The users that may make files in the log's directory are those of its group, when that may write
// it: daemons that do not run as root are set up like this, and make logs of their own.
bool MayMakeLogs(uid_t user) {
  const auto directory = StateAt(kLogDirectory);
  if (!directory || (directory->st_mode & S_IWGRP) == 0) return false;
  const struct passwd* const entry = getpwuid(user);
  if (entry == nullptr) return false;
  std::vector<gid_t> groups(64);
  auto count = static_cast<int>(groups.size());
  if (getgrouplist(entry->pw_name, entry->pw_gid, groups.data(), &count) < 0) return false;
  groups.resize(static_cast<size_t>(count));
  return std::find(groups.begin(), groups.end(), directory->st_gid) != groups.end();
}

// Results: nothing when only those may change it who may change all logs.
std::optional<Finding> ForeignLog(const std::string& path, const struct stat& state) {
  if (!IsRootOrCaller(state.st_uid) && !MayMakeLogs(state.st_uid)) {
    return Finding{"file", Verdict::kWrong,
                   path + " was made by " + UserName(state.st_uid) +
                       ", who can change what it says: " + DescribeState(state),
                   "mv " + path + " " + path + ".old"};
  }
  if ((state.st_mode & S_IWOTH) == 0) return std::nullopt;
  return Finding{"file", Verdict::kWrong,
                 path + ": anybody can change what it says: " + DescribeState(state),
                 "chmod o-w " + path};
}

Finding UnwritableLog(const std::string& path, const struct stat& state, int error) {
  const bool attribute = error == EPERM;  // of chattr: root is refused too
  const std::string allow = "setfacl -m u:" + QuoteForShell(UserName(geteuid())) + ":rw " + path;
  return {"file", Verdict::kWrong,
          path + " cannot be written: " + strerror(error) + "; " + DescribeState(state),
          attribute ? "chattr -i " + path : allow};
}

Finding LookAtLog(const char* path, const struct stat& state) {
  if (const auto odd = OddFile("file", path, state)) return *odd;
  if (const auto foreign = ForeignLog(path, state)) return *foreign;
  const int error = TryToOpen(path);
  if (error != 0) return UnwritableLog(path, state, error);
  return {"file", Verdict::kRight,
          std::string(path) + ", " + DescribeState(state) + ", " +
              FormatBytes(static_cast<double>(state.st_size)),
          ""};
}

void CheckFile(const char* path, Findings* findings) {
  const auto state = StateAt(path);
  if (state) findings->push_back(LookAtLog(path, *state));  // otherwise the first line makes it
}

// Who may open a log, even for reading, can hold its lock, and every daemon then waits.
Finding LookAtDirectory(const std::string& directory, const struct stat& state) {
  if ((state.st_mode & S_IRWXU) != S_IRWXU) {
    return {"folder", Verdict::kWrong,
            directory + " keeps its owner from making files: " + DescribeState(state),
            "chmod u+rwx " + directory};
  }
  if (const auto open = OpenDirectory("folder", directory, state)) return *open;
  if ((state.st_mode & S_IRWXO) != 0) {
    return {"folder", Verdict::kWrong,
            directory +
                " lets other users open the logs, and hold their locks: " + DescribeState(state),
            "chmod o= " + directory};
  }
  const bool shared = (state.st_mode & S_IWGRP) != 0 && state.st_gid != 0;
  return {
      "folder", shared ? Verdict::kNote : Verdict::kRight,
      directory + ", " + DescribeState(state) +
          (shared ? ": each user of the group can put other files in the place of the logs" : ""),
      ""};
}

}  // namespace

// Root may lead the directory elsewhere by a link: nobody else can change that one.
void CheckDirectory(Findings* findings) {
  const std::string directory = kLogDirectory;
  const auto link = StateAt(directory);
  struct stat state = {};
  const int error = stat(kLogDirectory, &state) == 0 ? 0 : errno;
  const std::string make = "install -d -m 0750 " + directory;
  if (link && S_ISLNK(link->st_mode) && (error != 0 || !IsRootOrCaller(link->st_uid))) {
    const auto odd = OddFile("folder", directory, *link);
    findings->push_back({"folder", Verdict::kWrong, odd->text, odd->fix + " && " + make});
  } else if (error != 0) {
    findings->push_back({"folder", Verdict::kWrong, directory + ": " + strerror(error), make});
  } else if (!S_ISDIR(state.st_mode)) {
    findings->push_back({"folder", Verdict::kWrong, directory + " is no directory",
                         "rm " + directory + " && " + make});
  } else {
    findings->push_back(LookAtDirectory(directory, state));
  }
}

void CheckSpace(Findings* findings) {
  const std::string directory = kLogDirectory;
  struct statvfs system = {};
  if (statvfs(kLogDirectory, &system) != 0) return;  // the directory's check has told
  const double bytes = static_cast<double>(system.f_bavail) * static_cast<double>(system.f_frsize);
  const std::string left = FormatBytes(bytes) + " left for " + directory;
  if ((system.f_flag & ST_RDONLY) != 0) {
    findings->push_back({"space", Verdict::kWrong, directory + " is mounted read-only",
                         "mount -o remount,rw $(findmnt -no TARGET -T " + directory + ")"});
  } else if (bytes < kFewBytes) {
    findings->push_back({"space", Verdict::kWrong, "only " + left,
                         "remove files: du -xh $(findmnt -no TARGET -T " + directory +
                             ") | sort -h | tail shows the large directories"});
  } else if (system.f_files > 0 && system.f_favail < kFewFiles) {
    findings->push_back(
        {"space", Verdict::kWrong,
         "only " + std::to_string(system.f_favail) + " more files fit in " + directory,
         "remove files: du -x --inodes $(findmnt -no TARGET -T " + directory +
             ") | sort -n | tail shows the directories with many"});
  } else {
    findings->push_back({"space", Verdict::kRight, left, ""});
  }
}

void CheckFiles(Findings* findings) {
  CheckFile(kMainLogPath, findings);
  CheckFile(kNotificationLogPath, findings);
}
