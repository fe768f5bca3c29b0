// What an administrator and a managing process do to the logs meanwhile: rotation by rename, and
// levels that change all the time. A process of its own, which also reads what was rotated away.
#ifndef TARNWICK_TESTS_SOAK_LOG_ROTATOR_H_
#define TARNWICK_TESTS_SOAK_LOG_ROTATOR_H_

#include <sys/types.h>

#include <string>

#include "tests/support/log_capture.h"

// The text of a numbered line in the notification log, which only such lines go to. A thread
// numbers its lines from 1; in front of the last text stands its length.
constexpr char kNumberedLine[] = "soak thread %u line %u %u:%s\n";

struct LogReport {
  unsigned long main_lines = 0;
  unsigned long numbered_lines = 0;
  unsigned long rotations = 0;
  unsigned long level_changes = 0;
  unsigned long faults = 0;  // numbered lines that were torn, missing, doubled or in disorder
  char first_fault[256] = "";
};

// REQUIRES: no other thread runs yet.
class LogRotator {
 public:
  // Makes the shared record, attaches the library to it and starts the process.
  LogRotator();
  ~LogRotator();
  LogRotator(const LogRotator&) = delete;
  LogRotator& operator=(const LogRotator&) = delete;

  // Ends the process once it has read everything. REQUIRES: nothing is logged any more.
  LogReport Finish();

 private:
  SharedRecord record_;
  pid_t pid_ = -1;
  int stop_ = -1;    // closed to end the process
  int report_ = -1;  // what the process found
};

#endif  // TARNWICK_TESTS_SOAK_LOG_ROTATOR_H_
