// The first line of a log message, taken apart.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_LINE_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_LINE_H_

#include <string_view>

// The time that stands in front of a line: neither year nor zone.
struct LogStamp {
  int month = -1;  // 0 to 11; -1 when the line has no time, or a month of another language
  int day = 0;
  int hour = 0;
  int minute = 0;
  int second = 0;
  int millisecond = -1;  // -1 when the line has none
};

// The parts of
//
//   Mar  5 14:03:09.250 [812][840][camera][warn] camerad:57:Probe(): camera 3 does not answer
//
// as views of the text they were parsed from.
struct LogLine {
  LogStamp stamp;
  int pid = 0;
  int tid = 0;                // the process's own number when the line has none: the main thread
  std::string_view category;  // empty, like `level`, for a line without names
  std::string_view level;
  std::string_view file;
  int line = 0;
  std::string_view function;
  std::string_view message;  // to the end of the text, continuation lines included
};

// Takes the first line of `text` apart.
// Results: false when it does not begin a message; `line` is then undefined.
bool ParseLogLine(std::string_view text, LogLine* line);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_LINE_H_
