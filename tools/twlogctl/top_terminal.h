// The terminal while top has it.
#ifndef TARNWICK_TOOLS_TWLOGCTL_TOP_TERMINAL_H_
#define TARNWICK_TOOLS_TWLOGCTL_TOP_TERMINAL_H_

#include <csignal>
#include <string>

#include "tarnwick/platform/unique.h"
#include "tools/twlogctl/top_model.h"

// Signals that end the program, and the one of a new size, as bytes to read: the terminal must be
// put back before the program ends, which no handler may do.
class TopSignals {
 public:
  TopSignals();

  int Descriptor() const { return fd_.Get(); }

  // Results: the next signal that came; 0 when there is none.
  int Take();

  // Ends the program by the signal, as it would have without this class.
  static void EndBy(int signal);

 private:
  tarnwick::UniqueFd fd_;
};

// The screen, put back as it was when this goes.
class TopTerminal {
 public:
  // Results: false when the type of the terminal is unknown, or has no movement of the cursor. For
  // root its description is one of the system's.
  bool Open();
  TopTerminal() = default;
  ~TopTerminal();
  TopTerminal(const TopTerminal&) = delete;
  TopTerminal& operator=(const TopTerminal&) = delete;

  // Takes the window's present size over.
  void Resize();

  // The next key that was pressed; kNone for one without a meaning. Results: false when there is
  // none.
  bool TakeKey(TopKey* key);

 private:
  void* screen_ = nullptr;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_TOP_TERMINAL_H_
