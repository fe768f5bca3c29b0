#include "tools/twlogctl/doctor_paths.h"

#include <unistd.h>

#include <climits>

#include "tools/common/shell.h"
#include "tools/twlogctl/report.h"

namespace {

std::string TargetOf(const std::string& link) {
  char target[PATH_MAX];
  const ssize_t length = readlink(link.c_str(), target, sizeof(target));
  return std::string(target, length > 0 ? static_cast<size_t>(length) : 0);
}

}  // namespace

std::optional<struct stat> StateAt(const std::string& path) {
  struct stat state = {};
  if (lstat(path.c_str(), &state) != 0) return std::nullopt;
  return state;
}

std::string DescribeState(const struct stat& state) {
  return UserName(state.st_uid) + ":" + GroupName(state.st_gid) + ", mode " +
         ModeText(state.st_mode);
}

// Renaming touches the name alone, whatever it leads to by the time it is done.
std::optional<Finding> OddFile(const char* check, const std::string& path,
                               const struct stat& state) {
  if (S_ISREG(state.st_mode)) return std::nullopt;
  const std::string away = "mv " + path + " " + path + ".old";
  if (!S_ISLNK(state.st_mode)) {
    return Finding{check, Verdict::kWrong, path + " is no regular file", away};
  }
  const std::string target =
      access(path.c_str(), F_OK) == 0
          ? "to " + QuoteForShell(TargetOf(path)) + ", made by " + UserName(state.st_uid)
          : "nowhere";
  return Finding{check, Verdict::kWrong, path + " is a link that leads " + target, away};
}

std::optional<Finding> OpenDirectory(const char* check, const std::string& path,
                                     const struct stat& state) {
  const bool foreign = !IsRootOrCaller(state.st_uid);
  if (!foreign && (state.st_mode & S_IWOTH) == 0) return std::nullopt;
  const std::string who = foreign ? UserName(state.st_uid) : "anybody";
  const std::string close = foreign ? "chown -h root:root " + path + " && " : "";
  return Finding{check, Verdict::kWrong,
                 path + ": " + who + " can put a link or another file in the place of each file: " +
                     DescribeState(state),
                 close + "chmod " + (foreign ? "0750 " : "o= ") + path};
}
