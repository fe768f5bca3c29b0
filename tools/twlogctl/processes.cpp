#include "tools/twlogctl/processes.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <sstream>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tools/common/private_file.h"
#include "tools/common/shell.h"
#include "tools/twlogctl/owned_directory.h"

namespace {

// The maps of a process of 100,000 mappings take 8 MiB.
constexpr size_t kLongestFile = 64 << 20;

// The file name under which a System V segment stands in /proc/PID/maps.
std::string SegmentName() {
  char name[32];
  snprintf(name, sizeof(name), "/SYSV%08x", static_cast<unsigned>(TWShmDbgLogIPCKey()));
  return name;
}

double SecondsSinceBoot() {
  struct timespec now = {};
  clock_gettime(CLOCK_BOOTTIME, &now);
  return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) / 1e9;
}

// A line is "from-to flags offset device inode path", and the inode of a segment is its id.
bool IsSegment(const std::string& line, const std::string& name, int segment) {
  if (line.find(name) == std::string::npos) return false;
  std::istringstream words(line);
  std::string range, flags, offset, device;
  long long inode = -1;
  return static_cast<bool>(words >> range >> flags >> offset >> device >> inode) &&
         inode == segment;
}

// The IPC namespace of a process, which has segments of its own; a container's is another one.
// Empty when the process hides it, as it does its memory.
std::string IpcNamespace(const std::string& process) {
  char name[64];
  const ssize_t length = readlink(("/proc/" + process + "/ns/ipc").c_str(), name, sizeof(name));
  return length > 0 ? std::string(name, static_cast<size_t>(length)) : "";
}

LibraryUser LookAtMemory(pid_t pid, int segment) {
  LibraryUser user;
  const std::string segment_name = SegmentName();
  std::istringstream maps(ReadWholeFile("/proc/" + std::to_string(pid) + "/maps"));
  for (std::string line; std::getline(maps, line);) {
    if (line.find("/libtarnwick.so") != std::string::npos) user.has_library = true;
    if (IsSegment(line, segment_name, segment)) user.has_record = true;
  }
  return user;
}

}  // namespace

std::string ReadWholeFile(const std::string& path) {
  const tarnwick::UniqueFd file = OpenRegularFile(path.c_str());
  std::string text;
  const bool read = ReadAll(file.Get(), kLongestFile, &text);
  return read || errno != EFBIG ? text : "";
}

std::string NameAndPid(const ProcessInfo& process) {
  return QuoteForShell(process.name) + " (" + std::to_string(process.pid) + ")";
}

std::string LookAtProcess(pid_t pid) {
  return "ps -o user,pid,lstart,args -p " + std::to_string(pid);
}

uid_t UserOf(pid_t pid) {
  struct stat state = {};
  if (stat(("/proc/" + std::to_string(pid)).c_str(), &state) != 0) return static_cast<uid_t>(-1);
  return state.st_uid;
}

std::optional<ProcessInfo> ReadProcess(pid_t pid) {
  const std::string stat = ReadWholeFile("/proc/" + std::to_string(pid) + "/stat");
  const size_t open = stat.find('(');
  const size_t close = stat.rfind(')');  // a name may hold brackets itself
  if (open == std::string::npos || close == std::string::npos) return std::nullopt;
  ProcessInfo process;
  process.pid = pid;
  process.name = stat.substr(open + 1, close - open - 1);
  std::istringstream fields(stat.substr(close + 1));
  fields >> process.state;
  std::string skipped;
  for (int field = 4; field < 22; ++field) fields >> skipped;
  double start_ticks = 0;  // field 22, since the machine was started
  fields >> start_ticks;
  process.age_seconds =
      std::max(0.0, SecondsSinceBoot() - start_ticks / static_cast<double>(sysconf(_SC_CLK_TCK)));
  return process;
}

std::vector<pid_t> AllProcesses() {
  std::vector<pid_t> pids;
  const OwnedDirectory directory(opendir("/proc"));
  if (!directory) return pids;
  while (const struct dirent* const entry = readdir(directory.get())) {
    const long pid = std::strtol(entry->d_name, nullptr, 10);  // 0 for what is no process
    if (pid > 0) pids.push_back(static_cast<pid_t>(pid));
  }
  std::sort(pids.begin(), pids.end());
  return pids;
}

std::vector<LibraryUser> LibraryUsers(int segment) {
  std::vector<LibraryUser> users;
  const std::string own_namespace = IpcNamespace("self");
  for (const pid_t pid : AllProcesses()) {
    if (pid == getpid() || IpcNamespace(std::to_string(pid)) != own_namespace) continue;
    LibraryUser user = LookAtMemory(pid, segment);
    if (!user.has_library && !user.has_record) continue;
    const std::optional<ProcessInfo> process = ReadProcess(pid);
    if (!process) continue;
    user.process = *process;
    users.push_back(user);
  }
  return users;
}
