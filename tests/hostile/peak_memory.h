// How much memory the process has taken at most since an object was made.
#ifndef TARNWICK_TESTS_HOSTILE_PEAK_MEMORY_H_
#define TARNWICK_TESTS_HOSTILE_PEAK_MEMORY_H_

#include <gtest/gtest.h>

#include <cstdlib>
#include <string>

#include "tests/support/files.h"

class PeakMemory {
 public:
  // Writing 5 makes the kernel forget the peak so far.
  PeakMemory() {
    WriteFile("/proc/self/clear_refs", "5");
    before_ = Kilobytes("VmRSS:");
  }

  size_t GrowthInKilobytes() const {
    const size_t peak = Kilobytes("VmHWM:");
    return peak > before_ ? peak - before_ : 0;
  }

 private:
  static size_t Kilobytes(const std::string& field) {
    const std::string status = ReadFile("/proc/self/status");
    const size_t at = status.find(field);
    EXPECT_NE(at, std::string::npos) << field;
    return at == std::string::npos ? 0 : strtoul(status.c_str() + at + field.size(), nullptr, 10);
  }

  size_t before_;
};

#endif  // TARNWICK_TESTS_HOSTILE_PEAK_MEMORY_H_
