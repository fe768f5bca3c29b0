#include "tarnwick/platform/qlibcfile.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <climits>
#include <cstring>
#include <exception>
#include <string>
#include <string_view>

#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/file_lock.h"
#include "tarnwick/platform/settings_file.h"
#include "tarnwick/platform/settings_text.h"
#include "tarnwick/platform/unique.h"

using namespace tarnwick;

namespace {

// The name under which the new text is written: fixed, because writers exclude each other, and so a
// crashed writer's leftover is found and removed by the next.
constexpr char kNewSuffix[] = ".tarnwick-new";

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

// What is at the path now.
struct OldFile {
  bool exists = false;
  struct stat attributes = {};
  std::string text;
};

// REQUIRES: the directory's lock. Links were followed before; one that took the file's place is
// not.
bool ReadOldFile(const std::string& path, OldFile* old) {
  const UniqueFd fd(tarnwick::OpenSettings(path.c_str(), O_NOFOLLOW, 0, &old->attributes));
  if (!fd.Valid()) return errno == ENOENT;
  old->exists = true;
  return tarnwick::ReadSettings(fd.Get(), &old->text);
}

// Owner first: changing it clears mode bits.
bool CopyAttributes(int fd, const OldFile& old) {
  if (!old.exists) return true;
  return fchown(fd, old.attributes.st_uid, old.attributes.st_gid) == 0 &&
         fchmod(fd, old.attributes.st_mode & 07777) == 0;
}

// Who opens the new file before it has the old one's attributes could read the text that follows:
// it starts with no right that the old one does not give its owner.
mode_t FirstMode(const OldFile& old) {
  return old.exists ? old.attributes.st_mode & 0600 : 0644;
}

bool WriteNewFile(const std::string& path, const OldFile& old, std::string_view text) {
  constexpr int kNew = O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC;
  const UniqueFd fd(open(path.c_str(), kNew, FirstMode(old)));
  return fd.Valid() && CopyAttributes(fd.Get(), old) && WriteAll(fd.Get(), text) &&
         fsync(fd.Get()) == 0;
}

// REQUIRES: the directory's lock.
bool ReplaceFile(const std::string& path, const OldFile& old, std::string_view text) {
  const std::string newPath = path + kNewSuffix;
  unlink(newPath.c_str());
  if (WriteNewFile(newPath, old, text) && rename(newPath.c_str(), path.c_str()) == 0) return true;
  const ErrnoSaver keeper;
  unlink(newPath.c_str());
  return false;
}

// What a rewrite is about.
struct Rewrite {
  std::string path;  // no link
  bool mayBeNew;
  std::string_view key;
  std::string_view line;
};

// REQUIRES: the directory's lock.
bool ReplaceKey(const Rewrite& rewrite) {
  OldFile old;
  if (!ReadOldFile(rewrite.path, &old)) return false;
  if (!old.exists && !rewrite.mayBeNew) return false;
  const std::string text = ReplaceSettingsLine(old.text, rewrite.key, rewrite.line);
  if (text.size() <= tarnwick::kMostSettings) return ReplaceFile(rewrite.path, old, text);
  errno = EFBIG;
  return false;
}

// Replaces the key's line under the lock of the file's directory. The file itself cannot carry the
// lock: callers hold its flock already, and it is another file after each rewrite.
bool RewriteKey(const Rewrite& rewrite) {
  const std::string path = tarnwick::Dirname(rewrite.path);
  const UniqueFd directory(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!directory.Valid()) return false;
  const FileLock lock(directory.Get());
  if (!lock.Held() || !ReplaceKey(rewrite)) return false;
  // The new text is in place; only a crash of the machine could still undo the renaming.
  fsync(directory.Get());
  return true;
}

// A word that is found again when the file is read.
bool IsKey(const char* key) {
  return key != nullptr && key[0] != '\0' && strpbrk(key, "=# \t\r\n") == nullptr;
}

int FailWith(int error) {
  errno = error;
  return -1;
}

}  // namespace

__attribute__((weak)) int QLIBCFileGetKeyValue(const char* path, const char* key, char* value,
                                               int size, int /*flags*/) try {
  const NoCancel no_cancel;
  if (path == nullptr || key == nullptr || key[0] == '\0' || value == nullptr || size < 1) {
    return FailWith(EINVAL);
  }
  struct stat attributes;
  const UniqueFd fd(tarnwick::OpenSettings(path, 0, 0, &attributes));
  std::string text;
  if (!fd.Valid() || !tarnwick::ReadSettings(fd.Get(), &text)) return -1;
  const SettingsLine line = IsKey(key) ? FindSettingsLine(text, key) : SettingsLine();
  const size_t stored = line.value.copy(value, static_cast<size_t>(size) - 1);
  value[stored] = '\0';
  return line.value.size() > INT_MAX ? INT_MAX : static_cast<int>(line.value.size());
} catch (const std::exception&) {
  return FailWith(ENOMEM);
}

__attribute__((weak)) int QLIBCFileSetKeyValue(const char* path, const char* key, const char* value,
                                               const char* format) try {
  const NoCancel no_cancel;
  if (path == nullptr || !IsKey(key) || value == nullptr || format == nullptr)
    return FailWith(EINVAL);
  std::string line;
  if (strchr(value, '\n') != nullptr || !FormatSettingsLine(format, key, value, &line)) {
    return FailWith(EINVAL);
  }
  std::string file;
  if (!tarnwick::FollowSettingsLinks(path, &file)) return -1;
  // A link to nowhere stays one.
  return RewriteKey({file, file == path, key, line}) ? 0 : -1;
} catch (const std::exception&) {
  return FailWith(ENOMEM);
}
