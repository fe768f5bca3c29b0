#include "tests/attack/figures.h"

#include <cstdio>

#include "tests/soak/meter.h"
#include "tests/support/process.h"

Footprint CurrentFootprint() {
  return {ResidentKib(), InUseKib(), OpenDescriptors().size()};
}

void LongestCall::Add(double seconds, const std::string& name) {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (seconds <= seconds_) return;
  seconds_ = seconds;
  name_ = name;
}

double LongestCall::Seconds() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return seconds_;
}

std::string LongestCall::Name() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return name_;
}

void PrintFigure(const char* name, const std::string& value) {
  printf("%-34s %s\n", name, value.c_str());
}

void PrintFootprint(const char* moment, const Footprint& footprint) {
  printf("%-34s %ld KiB resident, %ld KiB in use, %zu descriptors\n", moment,
         footprint.resident_kib, footprint.in_use_kib, footprint.descriptors);
}
