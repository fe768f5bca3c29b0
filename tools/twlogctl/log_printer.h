// Messages on standard output.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_PRINTER_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_PRINTER_H_

#include "tools/twlogctl/log_select.h"

class LogPrinter {
 public:
  // Without `json` a pipe or a file gets the bytes of the log, unless `mark`. On a terminal control
  // bytes are escaped, and lines have the colour of their level. There, and with `mark`, "? "
  // stands in front of a doubtful message and "| " in front of the further lines of each one.
  LogPrinter(bool json, bool mark);

  void Print(const LogMessage& message);

  // Results: false when standard output does not take what was printed, which the program reports
  // at its end.
  bool Flush();

 private:
  void PrintText(const LogMessage& message);

  bool json_;
  bool terminal_;
  bool mark_;
  bool colour_;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_PRINTER_H_
