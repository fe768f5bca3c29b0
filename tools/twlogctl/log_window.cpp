#include "tools/twlogctl/log_window.h"

void LogWindow::Add(const LogMessage& message) {
  if (m_size == 0) return;
  if (message.continues && !m_kept.empty()) {
    m_kept.back().text += message.text;
    return;
  }
  if (m_kept.size() == m_size) m_kept.pop_front();
  m_kept.push_back({std::string(message.text), message.moment, message.doubtful});
}

void LogWindow::Drain(const WantedSink& sink) {
  for (const Kept& kept : m_kept) {
    LogLine line;
    const bool begins = ParseLogLine(kept.text, &line);
    sink({kept.text, begins ? &line : nullptr, kept.moment, false, kept.doubtful});
  }
  m_kept.clear();
}
