// Lines that cannot be what they say.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_DOUBT_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_DOUBT_H_

#include <map>
#include <optional>

#include "tools/twlogctl/log_time.h"

// Whether a process can have written a line, as far as /proc knows: not one with a number above
// this system's largest; and not one that runs and was started after the line. The latter is
// certain only while no number was given twice since the start of the system.
class ProcessNumbers {
 public:
  ProcessNumbers();

  bool CannotHaveWritten(int pid, std::optional<Moment> moment);

 private:
  std::optional<Moment> StartOf(int pid);

  int largest_;
  std::optional<Moment> unique_since_;
  std::map<int, std::optional<Moment>> starts_;
};

// Judges the first lines of a log's messages one after another.
class LineDoubts {
 public:
  // With `own_log` the log's writers are processes of this machine, which /proc knows.
  explicit LineDoubts(bool own_log) {
    if (own_log) numbers_.emplace();
  }

  // `newest` is no earlier than the log's last line.
  bool Doubts(int pid, std::optional<Moment> moment, Moment newest);

 private:
  bool RunsBack(std::optional<Moment> moment, Moment newest);

  std::optional<ProcessNumbers> numbers_;
  std::optional<Moment> before_;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_DOUBT_H_
