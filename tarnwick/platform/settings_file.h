// The settings file as a file: which one a path means, and what is taken for one.
#ifndef TARNWICK_PLATFORM_SETTINGS_FILE_H_
#define TARNWICK_PLATFORM_SETTINGS_FILE_H_

#include <sys/stat.h>

#include <cstddef>
#include <string>

#include "tarnwick/platform/unique.h"

namespace tarnwick {

// The longest text of settings that is read or written, in bytes.
inline constexpr size_t kMostSettings = size_t{1} << 20;

// The directory that holds the file at `path`.
std::string Dirname(const std::string& path);

// The path of the file that is to be written for `path`: a symbolic link at the path is followed,
// and those that it leads to, when it belongs to root or to the caller (effective user).
//
// Results: true, with `path` itself when it is no link, and with the last link's target also when
//   nothing is there; false with errno otherwise, ELOOP for another user's link and for more
//   than 40.
bool FollowSettingsLinks(const char* path, std::string* file);

// Opens a regular file for reading, without waiting for anything; `flags` are added to those of
// open(2), `mode` is that of a file it makes. `attributes` are the file's.
//
// Results: not valid with errno on failure, EISDIR for a directory and EINVAL for a FIFO or a
//   device, of which nothing is read.
UniqueFd OpenSettings(const char* path, int flags, mode_t mode, struct stat* attributes);

// Reads all of a file. Results: false with errno on failure, EFBIG beyond kMostSettings.
bool ReadSettings(int fd, std::string* text);

}  // namespace tarnwick

#endif  // TARNWICK_PLATFORM_SETTINGS_FILE_H_
