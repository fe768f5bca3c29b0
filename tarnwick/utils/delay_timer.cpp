#include <sched.h>
#include <unistd.h>

#include "tarnwick/utils/utils.h"

namespace {

constexpr int kMicrosecondsPerSecond = 1000000;

// Signed and 32 bits wide: a clock that was set far away counts like any other elapsed time.
int ElapsedSince(const struct timeval& mark) {
  struct timeval now = {};
  gettimeofday(&now, nullptr);
  const int64_t elapsed = (static_cast<int64_t>(now.tv_usec) - mark.tv_usec) +
                          (static_cast<int64_t>(now.tv_sec) - mark.tv_sec) * kMicrosecondsPerSecond;
  return static_cast<int32_t>(elapsed);
}

}  // namespace

DelayTimer::DelayTimer(int periodUs) : m_delay(periodUs), m_mark() {
  BeginTiming();
}

void DelayTimer::BeginTiming() {
  gettimeofday(&m_mark, nullptr);
}

void DelayTimer::SetDelayTime(int periodUs) {
  m_delay = periodUs;
}

int DelayTimer::Delay() {
  if (m_mark.tv_sec == 0) BeginTiming();
  const int elapsed = ElapsedSince(m_mark);
  if (elapsed < 0 || elapsed >= m_delay) {
    BeginTiming();
    return sched_yield();  // pthread_yield by its standard name
  }
  // In 64 bits: a long period or the year 2038 overflows a 32-bit long.
  const int64_t end = int64_t{m_mark.tv_usec} + m_delay;
  m_mark.tv_sec = static_cast<time_t>(int64_t{m_mark.tv_sec} + end / kMicrosecondsPerSecond);
  m_mark.tv_usec = static_cast<suseconds_t>(end % kMicrosecondsPerSecond);
  return usleep(static_cast<useconds_t>(m_delay - elapsed));
}
