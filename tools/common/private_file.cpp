#include "tools/common/private_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <filesystem>

namespace {

tarnwick::UniqueFd Refuse(const std::string& path, const std::string& reason, std::string* error) {
  *error = path + ": " + reason;
  return tarnwick::UniqueFd(-1);
}

// A slash at the end would follow a link.
std::string WithoutSlashes(std::string path) {
  while (path.size() > 1 && path.back() == '/') path.pop_back();
  return path;
}

bool IsBelow(const std::string& path, const char* directory) {
  return path.compare(0, std::strlen(directory), directory) == 0;
}

// Below /dev and /proc, in a directory into which no other user can put a link: /dev/shm and
// /dev/mqueue are open to everybody, and "/dev/.." leads elsewhere.
bool IsSystemFile(const std::string& path) {
  if (!IsBelow(path, "/dev/") && !IsBelow(path, "/proc/")) return false;
  struct stat state = {};
  if (stat(path.substr(0, path.rfind('/') + 1).c_str(), &state) != 0) return false;
  const bool own = state.st_uid == 0 || state.st_uid == geteuid();
  return own && (state.st_mode & (S_IWGRP | S_IWOTH)) == 0;
}

}  // namespace

bool ReadAll(int fd, size_t most, std::string* bytes) {
  char piece[65536];
  for (;;) {
    const ssize_t count = read(fd, piece, sizeof(piece));
    if (count == 0) return true;
    if (count == -1 && errno == EINTR) continue;
    if (count == -1) return false;
    bytes->append(piece, static_cast<size_t>(count));
    if (bytes->size() <= most) continue;
    errno = EFBIG;
    return false;
  }
}

bool WriteAll(const tarnwick::UniqueFd& fd, const std::string& bytes) {
  for (size_t done = 0; done < bytes.size();) {
    const ssize_t count = write(fd.Get(), bytes.data() + done, bytes.size() - done);
    if (count == -1 && errno == EINTR) continue;
    if (count == -1) return false;
    done += static_cast<size_t>(count);
  }
  return true;
}

tarnwick::UniqueFd OpenPrivateDirectory(const std::string& path, std::string* error) {
  const std::string directory = WithoutSlashes(path);
  std::error_code ignored;  // mkdir tells what is wrong
  const auto above = std::filesystem::path(directory).parent_path();
  if (!above.empty()) std::filesystem::create_directories(above, ignored);
  if (mkdir(directory.c_str(), 0700) != 0 && errno != EEXIST) {
    return Refuse(directory, std::strerror(errno), error);
  }
  tarnwick::UniqueFd fd(open(directory.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
  if (!fd.Valid()) {
    struct stat state = {};
    const int reason = errno;
    const bool link = lstat(directory.c_str(), &state) == 0 && S_ISLNK(state.st_mode);
    return Refuse(directory, link ? "it is a link" : std::strerror(reason), error);
  }
  struct stat state = {};
  if (fstat(fd.Get(), &state) != 0) return Refuse(directory, std::strerror(errno), error);
  if (state.st_uid != geteuid()) return Refuse(directory, "it belongs to another user", error);
  return fd;
}

bool WritePrivateFile(const tarnwick::UniqueFd& directory, const std::string& name,
                      const std::string& bytes, std::string* error) {
  unlinkat(directory.Get(), name.c_str(), 0);  // where it cannot, the next call tells
  const int flags = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const tarnwick::UniqueFd fd(openat(directory.Get(), name.c_str(), flags, 0600));
  if (fd.Valid() && WriteAll(fd, bytes)) return true;
  *error = name + ": " + std::strerror(errno);
  return false;
}

tarnwick::UniqueFd OpenOwnFile(const std::string& path, int flags, mode_t mode,
                               std::string* error) {
  const bool system = IsSystemFile(path);
  struct stat state = {};
  const auto foreign = [&] { return !S_ISCHR(state.st_mode) && state.st_uid != geteuid(); };
  // Before it is opened, too: the open of somebody else's FIFO would wait.
  if (!system && lstat(path.c_str(), &state) == 0) {
    if (S_ISLNK(state.st_mode)) return Refuse(path, "it is a link", error);
    if (foreign()) return Refuse(path, "it belongs to another user", error);
  }
  tarnwick::UniqueFd fd(
      open(path.c_str(), flags | O_CREAT | O_CLOEXEC | (system ? 0 : O_NOFOLLOW), mode));
  if (!fd.Valid() || fstat(fd.Get(), &state) != 0) {
    return Refuse(path, std::strerror(errno), error);
  }
  if (!system && foreign()) return Refuse(path, "it belongs to another user", error);
  return fd;
}

tarnwick::UniqueFd OpenRegularFile(const char* path) {
  tarnwick::UniqueFd fd(open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat state = {};
  if (!fd.Valid() || fstat(fd.Get(), &state) != 0) return tarnwick::UniqueFd(-1);
  if (S_ISREG(state.st_mode)) return fd;
  errno = S_ISDIR(state.st_mode) ? EISDIR : EINVAL;
  return tarnwick::UniqueFd(-1);
}

bool ReadRegularFile(const tarnwick::UniqueFd& directory, const std::string& name, size_t most,
                     std::string* bytes, std::string* error) {
  const int flags = O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
  const tarnwick::UniqueFd fd(openat(directory.Get(), name.c_str(), flags));
  struct stat state = {};
  if (!fd.Valid() || fstat(fd.Get(), &state) != 0) {
    *error = name + ": " + (errno == ELOOP ? "it is a link" : std::strerror(errno));
    return false;
  }
  if (!S_ISREG(state.st_mode)) {
    *error = name + ": it is no regular file";
    return false;
  }
  if (ReadAll(fd.Get(), most, bytes)) return true;
  *error = name + ": " + std::strerror(errno);
  return false;
}
