// The last messages of a log, for -n.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_WINDOW_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_WINDOW_H_

#include <deque>
#include <optional>
#include <string>

#include "tools/twlogctl/log_select.h"

// Keeps the newest messages, and their lines that came later as a part of them.
class LogWindow {
 public:
  explicit LogWindow(size_t size) : size_(size) {}

  void Add(const LogMessage& message);

  // Hands them on, the oldest first, and keeps none.
  void Drain(const WantedSink& sink);

 private:
  struct Kept {
    std::string text;
    std::optional<Moment> moment;
    bool doubtful = false;
    bool continues = false;  // lines of a long message whose beginning came before
  };
  size_t size_;
  std::deque<Kept> kept_;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_WINDOW_H_
