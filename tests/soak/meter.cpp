#include "tests/soak/meter.h"

#include <malloc.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define TARNWICK_SANITIZERS_MALLOC
// GCC 12 comes without the sanitizers' header that declares it.
extern "C" size_t __sanitizer_get_current_allocated_bytes();
#endif

long ResidentKib() {
  FILE* file = fopen("/proc/self/statm", "re");
  if (file == nullptr) return 0;
  long total = 0;
  long resident = 0;
  if (fscanf(file, "%ld %ld", &total, &resident) != 2) resident = 0;
  fclose(file);
  return resident * (sysconf(_SC_PAGESIZE) / 1024);
}

long InUseKib() {
#ifdef TARNWICK_SANITIZERS_MALLOC
  return static_cast<long>(__sanitizer_get_current_allocated_bytes() / 1024);
#else
  const struct mallinfo2 info = mallinfo2();
  return static_cast<long>((info.uordblks + info.hblkhd) / 1024);
#endif
}

void MemoryMeter::Sample(double seconds) {
  points_.push_back({seconds / 60, ResidentKib(), InUseKib()});
}

bool MemoryMeter::IsReliable() {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  return false;
#else
  return true;
#endif
}

Slope MemoryMeter::SlopeOf(long Point::*value) const {
  const size_t first = points_.size() / 2;
  const double count = static_cast<double>(points_.size() - first);
  if (count < 3) return {};
  double mean_x = 0;
  double mean_y = 0;
  for (size_t i = first; i < points_.size(); ++i) {
    mean_x += points_[i].minutes / count;
    mean_y += static_cast<double>(points_[i].*value) / count;
  }
  double xx = 0;
  double xy = 0;
  double yy = 0;
  for (size_t i = first; i < points_.size(); ++i) {
    const double x = points_[i].minutes - mean_x;
    const double y = static_cast<double>(points_[i].*value) - mean_y;
    xx += x * x;
    xy += x * y;
    yy += y * y;
  }
  if (xx <= 0) return {};
  const double slope = xy / xx;
  return {slope, std::sqrt(std::fmax(yy - slope * xy, 0) / (count - 2) / xx)};
}
