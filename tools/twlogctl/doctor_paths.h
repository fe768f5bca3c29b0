// What stands at a fixed path, and who may change it.
#ifndef TARNWICK_TOOLS_TWLOGCTL_DOCTOR_PATHS_H_
#define TARNWICK_TOOLS_TWLOGCTL_DOCTOR_PATHS_H_

#include <sys/stat.h>

#include <optional>
#include <string>

#include "tools/twlogctl/doctor.h"

// What stands at the path itself: a link is not followed. Results: nothing, with errno.
std::optional<struct stat> StateAt(const std::string& path);

// "root:root, mode 0640".
std::string DescribeState(const struct stat& state);

// The finding for a link and for what is no regular file: daemons would follow the one, and wait at
// a FIFO, while root reads and writes what another user has chosen. Results: nothing for a regular
// file.
std::optional<Finding> OddFile(const char* check, const std::string& path,
                               const struct stat& state);

// The finding for a directory that somebody else owns or anybody may write. Results: nothing when
// it belongs to root or this user and others cannot write it.
std::optional<Finding> OpenDirectory(const char* check, const std::string& path,
                                     const struct stat& state);

#endif  // TARNWICK_TOOLS_TWLOGCTL_DOCTOR_PATHS_H_
