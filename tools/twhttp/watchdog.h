// Ending an operation from outside: Ctrl-C, and the tool's own limit for what the library lets wait
// without one.
#ifndef TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_
#define TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_

enum class Stop { kNone, kInterrupted, kGaveUp };

// From here on SIGINT and SIGTERM stop the operation; a second one ends the program at once.
void CatchInterrupts();

// Why the operation is to stop.
Stop StopReason();

// Begins a wait of at most `seconds`, 0 for no limit, as given to SetGiveUp.
void SetGiveUp(double seconds);
void RestartGiveUp();
void EndGiveUp();

// As RestartGiveUp, unless a wait has begun already.
void BeginGiveUp();

// A wait from here to the end of the block.
class GiveUpWait {
 public:
  GiveUpWait() { RestartGiveUp(); }
  ~GiveUpWait() { EndGiveUp(); }
  GiveUpWait(const GiveUpWait&) = delete;
  GiveUpWait& operator=(const GiveUpWait&) = delete;
};

#endif  // TARNWICK_TOOLS_TWHTTP_WATCHDOG_H_
