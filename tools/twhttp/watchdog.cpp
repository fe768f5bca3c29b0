#include "tools/twhttp/watchdog.h"

#include <sys/time.h>
#include <unistd.h>

#include <cmath>
#include <csignal>

namespace {

volatile sig_atomic_t g_interrupts = 0;
volatile sig_atomic_t g_gave_up = 0;
double g_limit = 0;
bool g_waiting = false;

// Repeated until it is heard: the first may come between the last look and the call that waits.
constexpr int kRepeatUs = 200000;

void OnInterrupt(int /*signal*/) {
  constexpr int kInterruptedTwice = 130;
  g_interrupts = g_interrupts + 1;
  if (g_interrupts > 1) _exit(kInterruptedTwice);
  const struct itimerval again = {{0, kRepeatUs}, {0, kRepeatUs}};
  setitimer(ITIMER_REAL, &again, nullptr);
}

void OnAlarm(int /*signal*/) {
  if (g_interrupts == 0) g_gave_up = 1;
}

void Catch(int signal, void (*handler)(int)) {
  struct sigaction action = {};
  action.sa_handler = handler;  // without SA_RESTART: the waiting call has to return
  sigaction(signal, &action, nullptr);
}

}  // namespace

void CatchInterrupts() {
  Catch(SIGINT, OnInterrupt);
  Catch(SIGTERM, OnInterrupt);
  Catch(SIGALRM, OnAlarm);
}

Stop StopReason() {
  if (g_interrupts > 0) return Stop::kInterrupted;
  return g_gave_up != 0 ? Stop::kGaveUp : Stop::kNone;
}

void SetWatchdog(double seconds) {
  g_limit = seconds;
  g_gave_up = 0;
}

void RestartWatchdog() {
  if (StopReason() != Stop::kNone || g_limit <= 0) return;
  g_waiting = true;
  struct itimerval timer = {{0, kRepeatUs}, {0, 0}};
  timer.it_value.tv_sec = static_cast<time_t>(std::floor(g_limit));
  timer.it_value.tv_usec =
      static_cast<suseconds_t>((g_limit - std::floor(g_limit)) * 1e6) + 1;  // 0 would disarm
  setitimer(ITIMER_REAL, &timer, nullptr);
}

void StartWatchdog() {
  if (!g_waiting) RestartWatchdog();
}

void StopWatchdog() {
  g_waiting = false;
  if (g_interrupts > 0) return;
  const struct itimerval none = {};
  setitimer(ITIMER_REAL, &none, nullptr);
}
