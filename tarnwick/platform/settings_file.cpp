#include "tarnwick/platform/settings_file.h"

#include <fcntl.h>

#include <climits>

namespace tarnwick {

namespace {

// As many as the kernel follows in one path (path_resolution(7)).
constexpr int kMostLinks = 40;

// A link of another user would lead a rewrite to a file of the user's choice.
bool IsTrustedOwner(uid_t owner) {
  return owner == 0 || owner == geteuid();
}

// The target of the link that `fd` refers to, and of no link that took its place meanwhile.
bool ReadLink(int fd, std::string* target) {
  char bytes[PATH_MAX];
  const ssize_t length = readlinkat(fd, "", bytes, sizeof(bytes));
  if (length < 0) return false;
  target->assign(bytes, static_cast<size_t>(length));
  return true;
}

}  // namespace

std::string Dirname(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) return ".";
  return slash == 0 ? "/" : path.substr(0, slash);
}

bool FollowSettingsLinks(const char* path, std::string* file) {
  *file = path;
  for (int links = 0; links <= kMostLinks; ++links) {
    const UniqueFd fd(open(file->c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
    if (!fd.Valid()) return errno == ENOENT;
    struct stat attributes;
    if (fstat(fd.Get(), &attributes) != 0) return false;
    if (!S_ISLNK(attributes.st_mode)) return true;
    if (!IsTrustedOwner(attributes.st_uid)) break;
    std::string target;
    if (!ReadLink(fd.Get(), &target)) return false;
    *file = target.front() == '/' ? target : Dirname(*file) + "/" + target;
  }
  errno = ELOOP;
  return false;
}

UniqueFd OpenSettings(const char* path, int flags, mode_t mode, struct stat* attributes) {
  UniqueFd fd(open(path, flags | O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC, mode));
  if (!fd.Valid() || fstat(fd.Get(), attributes) != 0) return UniqueFd(-1);
  if (S_ISREG(attributes->st_mode)) return fd;
  errno = S_ISDIR(attributes->st_mode) ? EISDIR : EINVAL;
  return UniqueFd(-1);
}

bool ReadSettings(int fd, std::string* text) {
  char piece[4096];
  for (;;) {
    const ssize_t count = read(fd, piece, sizeof(piece));
    if (count == 0) return true;
    if (count < 0) {
      if (errno != EINTR) return false;
      continue;
    }
    text->append(piece, static_cast<size_t>(count));
    if (text->size() > kMostSettings) {
      errno = EFBIG;
      return false;
    }
  }
}

}  // namespace tarnwick
