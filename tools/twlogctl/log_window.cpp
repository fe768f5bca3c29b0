#include "tools/twlogctl/log_window.h"

namespace {

// The lines of a message that follow so much of it are kept as one more: a file that is no log must
// not fill the memory.
constexpr size_t kLongest = 16 << 20;

}  // namespace

void LogWindow::Add(const LogMessage& message) {
  if (size_ == 0) return;
  if (message.continues && !kept_.empty() && kept_.back().text.size() < kLongest) {
    kept_.back().text += message.text;
    return;
  }
  if (kept_.size() == size_) kept_.pop_front();
  const bool part = message.continues && !kept_.empty();
  kept_.push_back({std::string(message.text), message.moment, message.doubtful, part});
}

void LogWindow::Drain(const WantedSink& sink) {
  for (const Kept& kept : kept_) {
    LogLine line;
    const bool begins = !kept.continues && ParseLogLine(kept.text, &line);
    sink({kept.text, begins ? &line : nullptr, kept.moment, kept.continues, kept.doubtful});
  }
  kept_.clear();
}
