#include "tests/attack/figures.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

#include "tests/soak/meter.h"
#include "tests/support/process.h"

namespace {

// The calling thread's account of the scheduler, open for as long as the thread lives.
class SchedulerAccount {
 public:
  SchedulerAccount() : fd_(open("/proc/thread-self/schedstat", O_RDONLY | O_CLOEXEC)) {}
  ~SchedulerAccount() {
    if (fd_ >= 0) close(fd_);
  }
  SchedulerAccount(const SchedulerAccount&) = delete;
  SchedulerAccount& operator=(const SchedulerAccount&) = delete;

  double SecondsWaited() const {
    char text[100] = "";
    const ssize_t length = pread(fd_, text, sizeof(text) - 1, 0);
    unsigned long long ran = 0;
    unsigned long long waited = 0;
    const bool told = length > 0 && sscanf(text, "%llu %llu", &ran, &waited) == 2;
    return told ? static_cast<double>(waited) * 1e-9 : 0;
  }

 private:
  int fd_;
};

}  // namespace

double SecondsWithoutProcessor() {
  thread_local const SchedulerAccount account;
  return account.SecondsWaited();
}

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
