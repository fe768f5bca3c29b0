// Memory, descriptors and processor time of this process, over the run.
#ifndef TARNWICK_TESTS_SOAK_METER_H_
#define TARNWICK_TESTS_SOAK_METER_H_

#include <cstddef>
#include <vector>

// The process's memory now: what is resident, and what malloc has given out.
long ResidentKib();
long InUseKib();

// A least-squares line through samples.
struct Slope {
  double kib_per_minute = 0;
  double error = 0;  // its standard error
};

// One sample a second, from construction on, as often as Sample is called.
class MemoryMeter {
 public:
  void Sample(double seconds);

  // Over the second half of the samples: resident memory, and what malloc has given out.
  Slope Resident() const { return SlopeOf(&Point::resident); }
  Slope InUse() const { return SlopeOf(&Point::in_use); }

  long ResidentNow() const { return points_.empty() ? 0 : points_.back().resident; }
  long InUseNow() const { return points_.empty() ? 0 : points_.back().in_use; }
  size_t Samples() const { return points_.size(); }

  // False where a sanitizer's own allocator serves malloc: what it keeps back says nothing.
  static bool IsReliable();

 private:
  struct Point {
    double minutes;
    long resident;  // KiB
    long in_use;
  };
  Slope SlopeOf(long Point::*value) const;

  std::vector<Point> points_;
};

#endif  // TARNWICK_TESTS_SOAK_METER_H_
