#ifndef TARNWICK_TOOLS_TWLOGCTL_WRITE_LINE_H_
#define TARNWICK_TOOLS_TWLOGCTL_WRITE_LINE_H_

#include <string>

#include "tarnwick/log/twdebuglog.h"

struct WriteOptions {
  LOG_CATEG categ = LOG_CATEG_UTILS;
  LOG_LEVEL level = LOG_LEVEL_NOTICE;
  LOG_TYPE type = LOG_TYPE_MAIN;
  std::string source = "twlogctl";  // stands in the line where a daemon's file name does
  std::string text;                 // "-" for the lines of standard input
  bool force = false;               // write although the level is off
  bool json = false;
};

// Writes the lines of a text into a log through the library, and looks whether they are there.
// Results: the exit code.
int WriteText(const WriteOptions& options);

#endif  // TARNWICK_TOOLS_TWLOGCTL_WRITE_LINE_H_
