#include "tools/twlogctl/file_locks.h"

#include <sys/stat.h>
#include <sys/sysmacros.h>

#include <cstdio>
#include <sstream>
#include <string>

#include "tools/twlogctl/owned_directory.h"
#include "tools/twlogctl/processes.h"

namespace {

// The device of the mount that an open file stands on, "major:minor" in decimal. On some file
// systems a file's own device number is another one, and /proc/locks has the mount's.
std::string MountDevice(int fd) {
  std::istringstream info(ReadWholeFile("/proc/self/fdinfo/" + std::to_string(fd)));
  std::string word, id;
  while (info >> word) {
    if (word == "mnt_id:") info >> id;
  }
  std::istringstream mounts(ReadWholeFile("/proc/self/mountinfo"));
  for (std::string line; std::getline(mounts, line);) {
    std::istringstream fields(line);
    std::string mount, parent, device;
    if (fields >> mount >> parent >> device && mount == id) return device;
  }
  return "";
}

// A file as /proc/locks writes it: "08:01:131", the device in hexadecimal.
std::string LockName(unsigned major_number, unsigned minor_number, ino_t inode) {
  char text[64];
  snprintf(text, sizeof(text), "%02x:%02x:%llu", major_number, minor_number,
           static_cast<unsigned long long>(inode));
  return text;
}

std::vector<std::string> LockNames(int fd) {
  struct stat state = {};
  if (fstat(fd, &state) != 0) return {};
  std::vector<std::string> names = {
      LockName(major(state.st_dev), minor(state.st_dev), state.st_ino)};
  std::istringstream device(MountDevice(fd));
  unsigned major_number = 0, minor_number = 0;
  char colon = 0;
  if (device >> major_number >> colon >> minor_number) {
    names.push_back(LockName(major_number, minor_number, state.st_ino));
  }
  return names;
}

// The pid of a line "1: FLOCK ADVISORY WRITE 812 08:01:131 0 EOF" for one of these files. A
// waiter's line has "->" in the second place.
bool HoldsOneOf(const std::string& line, const std::vector<std::string>& names, pid_t* pid) {
  std::istringstream fields(line);
  std::string number, type, advisory, kind, file;
  if (!(fields >> number >> type >> advisory >> kind >> *pid >> file) || type != "FLOCK")
    return false;
  for (const std::string& name : names) {
    if (file == name) return true;
  }
  return false;
}

// Whether the descriptor of a process is this file, with a lock on it.
bool IsLockedDescriptor(const std::string& process, const std::string& number,
                        const struct stat& file) {
  struct stat state = {};
  if (stat((process + "/fd/" + number).c_str(), &state) != 0) return false;
  if (state.st_dev != file.st_dev || state.st_ino != file.st_ino) return false;
  const std::string info = ReadWholeFile(process + "/fdinfo/" + number);
  return info.find("lock:") != std::string::npos && info.find("FLOCK") != std::string::npos;
}

std::vector<pid_t> HoldersByDescriptor(int fd) {
  std::vector<pid_t> holders;
  struct stat file = {};
  if (fstat(fd, &file) != 0) return holders;
  for (const pid_t pid : AllProcesses()) {
    const std::string process = "/proc/" + std::to_string(pid);
    const OwnedDirectory directory(opendir((process + "/fd").c_str()));
    if (!directory) continue;
    bool holds = false;
    while (const struct dirent* const entry = readdir(directory.get())) {
      if (entry->d_name[0] != '.') holds |= IsLockedDescriptor(process, entry->d_name, file);
    }
    if (holds) holders.push_back(pid);
  }
  return holders;
}

}  // namespace

std::vector<pid_t> LockHolders(int fd) {
  std::vector<pid_t> holders;
  const std::vector<std::string> names = LockNames(fd);
  std::istringstream locks(ReadWholeFile("/proc/locks"));
  bool ended = false;
  for (std::string line; std::getline(locks, line);) {
    pid_t pid = 0;
    if (!HoldsOneOf(line, names, &pid)) continue;
    ended |= pid > 0 && !ReadProcess(pid);
    holders.push_back(pid);
  }
  return ended ? HoldersByDescriptor(fd) : holders;
}
