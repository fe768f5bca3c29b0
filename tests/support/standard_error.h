// What the process writes to standard error.
#ifndef TARNWICK_TESTS_SUPPORT_STANDARD_ERROR_H_
#define TARNWICK_TESTS_SUPPORT_STANDARD_ERROR_H_

#include <unistd.h>

#include <cstdio>
#include <string>

#include "tests/support/files.h"

// Standard error goes into a file while it lives.
class CapturedStandardError {
 public:
  CapturedStandardError() : before_(dup(STDERR_FILENO)), file_(tmpfile()) {
    fflush(stderr);
    dup2(fileno(file_), STDERR_FILENO);
  }
  ~CapturedStandardError() {
    End();
    fclose(file_);
  }
  CapturedStandardError(const CapturedStandardError&) = delete;
  CapturedStandardError& operator=(const CapturedStandardError&) = delete;

  // Results: what came.
  std::string End() {
    fflush(stderr);
    if (before_ >= 0) {
      dup2(before_, STDERR_FILENO);
      close(before_);
      before_ = -1;
    }
    return ReadFile("/proc/self/fd/" + std::to_string(fileno(file_)));
  }

 private:
  int before_;
  FILE* const file_;
};

#endif  // TARNWICK_TESTS_SUPPORT_STANDARD_ERROR_H_
