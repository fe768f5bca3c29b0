// What /proc tells about the processes that use the record and the logs.
#ifndef TARNWICK_TOOLS_TWLOGCTL_PROCESSES_H_
#define TARNWICK_TOOLS_TWLOGCTL_PROCESSES_H_

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

struct ProcessInfo {
  pid_t pid = 0;
  std::string name;
  char state = '?';        // the letter of /proc/PID/stat; T is a stopped process
  double age_seconds = 0;  // since it was started
};

// "camerad (812)". The name is what the process calls itself; one that is not plain is quoted for
// the shell, so that it cannot look like several processes.
std::string NameAndPid(const ProcessInfo& process);

// A command that shows whose process it is and what it runs, and changes nothing.
std::string LookAtProcess(pid_t pid);

// The user a process runs as; nobody's number when it has gone.
uid_t UserOf(pid_t pid);

// Results: nothing when there is no such process (any more).
std::optional<ProcessInfo> ReadProcess(pid_t pid);

// The processes of the machine whose number is in this /proc.
std::vector<pid_t> AllProcesses();

// How a process stands to the record.
struct LibraryUser {
  ProcessInfo process;
  bool has_library = false;  // it has the shared library in its memory
  bool has_record = false;   // it has attached the record with the given segment
};

// The processes but this one that have the shared library or the record in their memory, of
// those that could share the record: the ones of this IPC namespace. Those of other users are
// seen by root alone. `segment` is the record's id, or -1 for none.
std::vector<LibraryUser> LibraryUsers(int segment);

// The whole text of a regular file, empty when it cannot be read or has more than 64 MiB. For /proc
// too, whose files have no size.
std::string ReadWholeFile(const std::string& path);

#endif  // TARNWICK_TOOLS_TWLOGCTL_PROCESSES_H_
