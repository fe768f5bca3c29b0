// Files that hold what other users must neither read nor choose.
#ifndef TARNWICK_TOOLS_COMMON_PRIVATE_FILE_H_
#define TARNWICK_TOOLS_COMMON_PRIVATE_FILE_H_

#include <sys/types.h>

#include <string>

#include "tarnwick/platform/unique.h"

// All of these but OpenRegularFile follow no link at the end of a path, and return an invalid
// descriptor, or false, with the reason in `error`.

// The directory at `path`, made with mode 0700 when it is missing, the ones above it with the usual
// mode. One of another user is refused.
tarnwick::UniqueFd OpenPrivateDirectory(const std::string& path, std::string* error);

// Writes the file `name` of the directory with mode 0600, in the place of whatever has the name.
bool WritePrivateFile(const tarnwick::UniqueFd& directory, const std::string& name,
                      const std::string& bytes, std::string* error);

// Results: false with errno.
bool WriteAll(const tarnwick::UniqueFd& fd, const std::string& bytes);

// A file to write to, made with `mode` when it is missing. One of another user is refused, but no
// device. Below /dev and /proc, in directories in which no other user makes files, links are
// followed: shells write /dev/fd/63 for a pipe to another program.
tarnwick::UniqueFd OpenOwnFile(const std::string& path, int flags, mode_t mode, std::string* error);

// Opens the regular file at `path` to read it, without a wait for whatever else has the path. Links
// are followed.
// Results: not Valid() with errno: EISDIR for a directory, EINVAL for a FIFO or a device.
tarnwick::UniqueFd OpenRegularFile(const char* path);

// Appends what is left of the file to `bytes`. Results: false with errno, EFBIG when that gets
// longer than `most`.
bool ReadAll(int fd, size_t most, std::string* bytes);

// Reads the regular file `name` of the directory, of `most` bytes at most.
bool ReadRegularFile(const tarnwick::UniqueFd& directory, const std::string& name, size_t most,
                     std::string* bytes, std::string* error);

#endif  // TARNWICK_TOOLS_COMMON_PRIVATE_FILE_H_
