// The doctor's look at the log folder and the files in it.
#include <fcntl.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <optional>

#include "tarnwick/platform/owned.h"
#include "tools/common/amounts.h"
#include "tools/twlogctl/doctor.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/report.h"

namespace {

// Below these a burst of lines fills the disk before anybody looks.
constexpr double kFewBytes = 1 << 20;
constexpr unsigned long kFewFiles = 16;

std::optional<struct stat> StateOf(const std::string& path) {
  struct stat state = {};
  if (stat(path.c_str(), &state) != 0) return std::nullopt;
  return state;
}

std::string Describe(const struct stat& state) {
  return UserName(state.st_uid) + ":" + GroupName(state.st_gid) + ", mode " +
         ModeText(state.st_mode);
}

// Opens it as the library does, but makes no file and waits for nobody. Results: 0 or errno.
int TryToOpen(const char* path) {
  const OwnedFd fd(open(path, O_WRONLY | O_APPEND | O_CLOEXEC | O_NONBLOCK));
  return fd.Valid() ? 0 : errno;
}

void CheckFile(const char* path, Findings* findings) {
  const std::string name = path;
  const auto state = StateOf(path);
  struct stat link = {};
  if (!state && lstat(path, &link) == 0) {
    findings->push_back(
        {"file", Verdict::kWrong, name + " is a link that leads nowhere", "rm " + name});
    return;
  }
  if (!state) return;  // the first line makes it
  if (!S_ISREG(state->st_mode)) {
    findings->push_back({"file", Verdict::kWrong, name + " is no regular file",
                         "mv " + name + " " + name + ".old"});
    return;
  }
  const int error = TryToOpen(path);
  if (error == 0) {
    findings->push_back(
        {"file", Verdict::kRight,
         name + ", " + Describe(*state) + ", " + FormatBytes(static_cast<double>(state->st_size)),
         ""});
    return;
  }
  const std::string text =
      name + " cannot be written: " + strerror(error) + "; " + Describe(*state);
  const bool attribute = error == EPERM;  // of chattr: root is refused too
  const std::string allow = "setfacl -m u:" + UserName(geteuid()) + ":rw " + name;
  findings->push_back({"file", Verdict::kWrong, text, attribute ? "chattr -i " + name : allow});
}

}  // namespace

void CheckFolder(Findings* findings) {
  const std::string folder = kLogFolder;
  const auto state = StateOf(folder);
  const int error = errno;
  const std::string make = "install -d -m 0755 " + folder;
  if (!state) {
    findings->push_back({"folder", Verdict::kWrong, folder + ": " + strerror(error), make});
  } else if (!S_ISDIR(state->st_mode)) {
    findings->push_back(
        {"folder", Verdict::kWrong, folder + " is no folder", "rm " + folder + " && " + make});
  } else if ((state->st_mode & S_IRWXU) != S_IRWXU) {
    findings->push_back({"folder", Verdict::kWrong,
                         folder + " keeps its owner from making files: " + Describe(*state),
                         "chmod u+rwx " + folder});
  } else {
    findings->push_back({"folder", Verdict::kRight, folder + ", " + Describe(*state), ""});
  }
}

void CheckSpace(Findings* findings) {
  const std::string folder = kLogFolder;
  struct statvfs system = {};
  if (statvfs(kLogFolder, &system) != 0) return;  // the folder's check has told
  const double bytes = static_cast<double>(system.f_bavail) * static_cast<double>(system.f_frsize);
  const std::string left = FormatBytes(bytes) + " left for " + folder;
  if ((system.f_flag & ST_RDONLY) != 0) {
    findings->push_back({"space", Verdict::kWrong, folder + " is mounted read-only",
                         "mount -o remount,rw $(findmnt -no TARGET -T " + folder + ")"});
  } else if (bytes < kFewBytes) {
    findings->push_back({"space", Verdict::kWrong, "only " + left,
                         "remove files: du -xh $(findmnt -no TARGET -T " + folder +
                             ") | sort -h | tail shows the large folders"});
  } else if (system.f_files > 0 && system.f_favail < kFewFiles) {
    findings->push_back({"space", Verdict::kWrong,
                         "only " + std::to_string(system.f_favail) + " more files fit in " + folder,
                         "remove files: du -x --inodes $(findmnt -no TARGET -T " + folder +
                             ") | sort -n | tail shows the folders with many"});
  } else {
    findings->push_back({"space", Verdict::kRight, left, ""});
  }
}

void CheckFiles(Findings* findings) {
  CheckFile(kMainLogPath, findings);
  CheckFile(kNotificationLogPath, findings);
}
