#include "tests/torture/traces.h"

#include <fcntl.h>
#include <sched.h>
#include <sys/file.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/process.h"

namespace {

constexpr const char* kFolders[] = {"/var/log/tarnwick", "/var/packages/Tarnwick/etc", "/tmp"};

// The log appears with its first line, the settings when they are first saved.
bool IsExpected(const std::string& name) {
  return name == "tarnwick.log" || name == "twnotification.log" || name == "settings.conf";
}

std::set<std::string> FilesInFolders() {
  std::set<std::string> files;
  for (const char* folder : kFolders) {
    for (const std::string& name : ListFolder(folder)) {
      if (!IsExpected(name)) files.insert(std::string(folder) + "/" + name);
    }
  }
  return files;
}

std::string NewFiles(const std::set<std::string>& before, const std::set<std::string>& after) {
  std::string names;
  for (const std::string& file : after) {
    if (before.count(file) == 0) names += "the file " + file + " is left; ";
  }
  return names;
}

bool IsLocked(const std::string& path) {
  const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return false;
  const bool locked = flock(fd, LOCK_EX | LOCK_NB) != 0;
  close(fd);
  return locked;
}

std::string DescriptorDifference(const Traces& before, const Traces& after) {
  for (const auto& [fd, target] : after.descriptors) {
    const auto known = before.descriptors.find(fd);
    if (known == before.descriptors.end()) {
      return "descriptor " + std::to_string(fd) + " (" + target + ") is left open; ";
    }
    if (known->second != target) return "descriptor " + std::to_string(fd) + " has changed; ";
  }
  return before.descriptors.size() > after.descriptors.size() ? "a descriptor is gone; " : "";
}

bool SameSignals(const sigset_t& a, const sigset_t& b) {
  for (int number = 1; number < NSIG; ++number) {
    if (sigismember(&a, number) != sigismember(&b, number)) return false;
  }
  return true;
}

}  // namespace

long CountThreads() {
  struct stat tasks = {};
  stat("/proc/self/task", &tasks);
  return static_cast<long>(tasks.st_nlink) - 2;
}

Traces TakeTraces() {
  Traces traces;
  traces.descriptors = OpenDescriptors();
  traces.files = FilesInFolders();
  traces.threads = CountThreads();
  pthread_sigmask(SIG_SETMASK, nullptr, &traces.blocked);
  struct sigaction action = {};
  sigaction(SIGPIPE, nullptr, &action);
  traces.on_sigpipe = action.sa_handler;
  traces.attached = g_pDbgLogCfg != nullptr;
  return traces;
}

std::string DifferenceOf(const Traces& before, const Traces& after, bool with_files) {
  std::string difference = DescriptorDifference(before, after);
  if (with_files) difference += NewFiles(before.files, after.files);
  // A thread that has been joined may be seen for a moment.
  for (int tries = 0; tries < 300 && CountThreads() != before.threads; ++tries) usleep(1000);
  if (before.threads != CountThreads()) difference += "the number of threads has changed; ";
  if (!SameSignals(before.blocked, after.blocked)) difference += "the signal mask has changed; ";
  if (before.on_sigpipe != after.on_sigpipe) difference += "SIGPIPE is handled otherwise; ";
  if (before.attached != after.attached) difference += "the record is attached otherwise; ";
  return difference;
}

std::string HeldLock() {
  for (const char* path :
       {"/var/log/tarnwick/tarnwick.log", "/var/log/tarnwick/twnotification.log",
        "/var/packages/Tarnwick/etc/settings.conf", "/var/packages/Tarnwick/etc"}) {
    if (IsLocked(path)) return std::string(path) + " is left locked; ";
  }
  return "";
}

bool IsolateProcess() {
  if (unshare(CLONE_NEWNS | CLONE_NEWIPC) != 0) return false;
  for (const char* folder : kFolders) {
    if (mount("tmpfs", folder, "tmpfs", 0, "mode=1777") != 0) return false;
  }
  return true;
}
