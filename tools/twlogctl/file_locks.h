// Who holds the lock of a file, from /proc.
#ifndef TARNWICK_TOOLS_TWLOGCTL_FILE_LOCKS_H_
#define TARNWICK_TOOLS_TWLOGCTL_FILE_LOCKS_H_

#include <sys/types.h>

#include <vector>

// The processes that hold a flock of the open file `fd`: those that /proc/locks names, and where it
// names one that has ended, those that inherited its descriptor. A number below 1 is a process of
// another PID namespace.
std::vector<pid_t> LockHolders(int fd);

#endif  // TARNWICK_TOOLS_TWLOGCTL_FILE_LOCKS_H_
