// Ending an operation from outside: Ctrl-C, and the tool's own limit for what the library lets wait
// without one.
#ifndef TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_
#define TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_

enum class Stop { kNone, kInterrupted, kGaveUp };

// From here on SIGINT and SIGTERM stop the operation; a second one ends the program at once.
void CatchInterrupts();

// Why the operation is to stop.
Stop StopReason();

// Each wait from now on ends after `seconds`; 0 for no limit.
void SetWatchdog(double seconds);

// Begins a wait; StartWatchdog does so only when none has begun.
void RestartWatchdog();
void StartWatchdog();
void StopWatchdog();

// A wait from here to the end of the block.
class WatchedWait {
 public:
  WatchedWait() { RestartWatchdog(); }
  ~WatchedWait() { StopWatchdog(); }
  WatchedWait(const WatchedWait&) = delete;
  WatchedWait& operator=(const WatchedWait&) = delete;
};

#endif  // TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_
