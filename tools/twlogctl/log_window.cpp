#include "tools/twlogctl/log_window.h"

namespace {

// The lines of a message that follow so much of it are kept as one more: a file that is no log must
// not fill the memory.
constexpr size_t kLongest = 16 << 20;

}  // namespace

void LogWindow::Add(const LogMessage& message) {
  if (m_size == 0) return;
  if (message.continues && !m_kept.empty() && m_kept.back().text.size() < kLongest) {
    m_kept.back().text += message.text;
    return;
  }
  if (m_kept.size() == m_size) m_kept.pop_front();
  const bool part = message.continues && !m_kept.empty();
  m_kept.push_back({std::string(message.text), message.moment, message.doubtful, part});
}

void LogWindow::Drain(const WantedSink& sink) {
  for (const Kept& kept : m_kept) {
    LogLine line;
    const bool begins = !kept.continues && ParseLogLine(kept.text, &line);
    sink({kept.text, begins ? &line : nullptr, kept.moment, kept.continues, kept.doubtful});
  }
  m_kept.clear();
}
