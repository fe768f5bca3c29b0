#include "tarnwick/platform/qlibcfile.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <climits>
#include <cstring>
#include <exception>
#include <string>
#include <string_view>

#include "tarnwick/platform/file_lock.h"
#include "tarnwick/platform/owned.h"
#include "tarnwick/platform/settings_text.h"

namespace {

// The name under which the new text is written: fixed, because writers exclude each other, and so a
// crashed writer's leftover is found and removed by the next.
constexpr char kNewSuffix[] = ".tarnwick-new";

bool ReadAll(int fd, std::string* text) {
  char piece[4096];
  for (;;) {
    const ssize_t count = read(fd, piece, sizeof(piece));
    if (count == 0) return true;
    if (count > 0) {
      text->append(piece, static_cast<size_t>(count));
    } else if (errno != EINTR) {
      return false;
    }
  }
}

bool WriteAll(int fd, std::string_view text) {
  while (!text.empty()) {
    const ssize_t count = write(fd, text.data(), text.size());
    if (count > 0) {
      text.remove_prefix(static_cast<size_t>(count));
    } else if (count == 0 || errno != EINTR) {
      return false;
    }
  }
  return true;
}

// What stands at the path now.
struct OldFile {
  bool exists = false;
  struct stat attributes = {};
  std::string text;
};

bool ReadOldFile(const std::string& path, OldFile* old) {
  const OwnedFd fd(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!fd.Valid()) return errno == ENOENT;
  old->exists = true;
  return fstat(fd.Get(), &old->attributes) == 0 && ReadAll(fd.Get(), &old->text);
}

// Owner first: changing it clears mode bits.
bool KeepAttributes(int fd, const OldFile& old) {
  if (!old.exists) return true;
  return fchown(fd, old.attributes.st_uid, old.attributes.st_gid) == 0 &&
         fchmod(fd, old.attributes.st_mode & 07777) == 0;
}

bool WriteNewFile(const std::string& path, const OldFile& old, std::string_view text) {
  const OwnedFd fd(open(path.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0644));
  return fd.Valid() && KeepAttributes(fd.Get(), old) && WriteAll(fd.Get(), text) &&
         fsync(fd.Get()) == 0;
}

// REQUIRES: the folder's lock.
bool ReplaceFile(const std::string& path, const OldFile& old, std::string_view text) {
  const std::string newPath = path + kNewSuffix;
  unlink(newPath.c_str());
  if (WriteNewFile(newPath, old, text) && rename(newPath.c_str(), path.c_str()) == 0) return true;
  const ErrnoKeeper keeper;
  unlink(newPath.c_str());
  return false;
}

// The file behind symbolic links, so that the rename replaces the file and not the link. A path
// that does not exist yet stays as it is. Results: empty for a link to nowhere.
std::string ResolvePath(const char* path) {
  const OwnedMemory<char> real(realpath(path, nullptr));
  if (real) return real.get();
  struct stat attributes;
  return lstat(path, &attributes) == 0 ? "" : path;
}

std::string FolderOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  if (slash == std::string::npos) return ".";
  return slash == 0 ? "/" : path.substr(0, slash);
}

// Replaces the key's line under the lock of the file's folder. The file itself cannot carry the
// lock: callers hold its flock already, and it is another file after each rewrite.
bool RewriteKey(const std::string& path, std::string_view key, std::string_view line) {
  const OwnedFd folder(open(FolderOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder.Valid()) return false;
  const FileLock lock(folder.Get());
  OldFile old;
  if (!lock.Held() || !ReadOldFile(path, &old)) return false;
  if (!ReplaceFile(path, old, ReplaceSettingsLine(old.text, key, line))) return false;
  // The new text is in place; only a crash of the machine could still undo the renaming.
  fsync(folder.Get());
  return true;
}

// A word that is found again when the file is read.
bool IsKey(const char* key) {
  return key != nullptr && key[0] != '\0' && strpbrk(key, "=# \t\r\n") == nullptr;
}

int RefuseFor(int error) {
  errno = error;
  return -1;
}

}  // namespace

__attribute__((weak)) int QLIBCFileGetKeyValue(const char* path, const char* key, char* value,
                                               int size, int /*flags*/) try {
  if (path == nullptr || key == nullptr || key[0] == '\0' || value == nullptr || size < 1) {
    return RefuseFor(EINVAL);
  }
  const OwnedFd fd(open(path, O_RDONLY | O_CLOEXEC));
  std::string text;
  if (!fd.Valid() || !ReadAll(fd.Get(), &text)) return -1;
  const SettingsLine line = IsKey(key) ? FindSettingsLine(text, key) : SettingsLine();
  const size_t stored = line.value.copy(value, static_cast<size_t>(size) - 1);
  value[stored] = '\0';
  return line.value.size() > INT_MAX ? INT_MAX : static_cast<int>(line.value.size());
} catch (const std::exception&) {
  return RefuseFor(ENOMEM);
}

__attribute__((weak)) int QLIBCFileSetKeyValue(const char* path, const char* key, const char* value,
                                               const char* format) try {
  if (path == nullptr || !IsKey(key) || value == nullptr || format == nullptr)
    return RefuseFor(EINVAL);
  std::string line;
  if (strchr(value, '\n') != nullptr || !FormatSettingsLine(format, key, value, &line)) {
    return RefuseFor(EINVAL);
  }
  const std::string file = ResolvePath(path);
  return !file.empty() && RewriteKey(file, key, line) ? 0 : -1;
} catch (const std::exception&) {
  return RefuseFor(ENOMEM);
}
