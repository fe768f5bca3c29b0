// Moments: those of log lines, which have no year, and those that people type.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_TIME_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_TIME_H_

#include <chrono>
#include <ctime>
#include <optional>
#include <string>
#include <string_view>

#include "tools/twlogctl/log_line.h"

// Local time is the process's time zone throughout.
using Moment = std::chrono::time_point<std::chrono::system_clock, std::chrono::milliseconds>;

Moment Now();

// Gives the lines of a log the year they lack: the latest in which the line is not more than a day
// newer than `newest`. So lines of December that are read in January are of the year before, and a
// clock or zone that differs a little does no harm; a log of more than a year is beyond it.
class LogClock {
 public:
  // `newest` is no earlier than the log's last line: the present, or the time of the last change of
  // a copied log.
  explicit LogClock(Moment newest) : newest_(newest) {}

  // A log that grows has newer lines by and by.
  void Advance(Moment newest) { newest_ = newest; }
  Moment Newest() const { return newest_; }

  // No value for a line without a time.
  std::optional<Moment> MomentOf(const LogStamp& stamp);

 private:
  Moment newest_;
  // The hour of the line before: most lines are of the same one, and mktime is slow.
  LogStamp hour_;
  time_t hour_start_ = 0;
};

// Where a time of day without a date lies, and a span: before the present or after it.
enum class Direction { kBack, kAhead };

// "14:00", "14:00:30", "2026-03-05", "2026-03-05 14:00" (or with "T" and seconds), or a span from
// `now` ("10m", "1.5h").
std::optional<Moment> ParseMoment(std::string_view text, Moment now, Direction direction);

// "2026-03-05 14:03:09.250", or without the milliseconds.
std::string FormatMoment(Moment moment, bool milliseconds);

// "14:03:09".
std::string FormatClock(Moment moment);

// "2026-03-05T14:03:09.250+0100": for programs.
std::string FormatIso(Moment moment);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_TIME_H_
