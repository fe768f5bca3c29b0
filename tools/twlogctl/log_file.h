// A log file that grows while it is read.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_FILE_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_FILE_H_

#include <sys/stat.h>

#include <string>
#include <utility>

#include "tarnwick/platform/unique.h"

// Reads what writers append, without their lock: whoever looks at a log must not hold up the
// daemons. A truncation shows by the file's length, or by other bytes at the places that were read
// last: writers may have appended more than was there before anybody looked.
class LogFile {
 public:
  enum class Result {
    kNothing,   // nothing new
    kData,      // `data` was filled
    kRestarted  // the file was truncated; the next call reads it from its beginning
  };

  // REQUIRES: a regular file's descriptor, open for reading.
  explicit LogFile(tarnwick::UniqueFd fd) : fd_(std::move(fd)) {}

  // Puts the next bytes, 64 KiB at most, into `data`.
  Result Read(std::string* data);

  // How many bytes Read has not given out yet.
  off_t Unread() const;

  // True when the file has no name any more.
  bool Removed() const;

  // True when `status` is that of this file.
  bool Is(const struct stat& status) const;

  int Descriptor() const { return fd_.Get(); }

 private:
  // Bytes that were read, to be found again at their place.
  struct Mark {
    off_t offset = 0;
    std::string bytes;
  };

  bool Stands(const Mark& mark) const;
  bool Truncated() const;
  void Remember(const std::string& data);
  Result Restart();

  tarnwick::UniqueFd fd_;
  off_t offset_ = 0;
  Mark head_;  // the first bytes of the file
  Mark tail_;  // the last ones in front of offset_
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_FILE_H_
