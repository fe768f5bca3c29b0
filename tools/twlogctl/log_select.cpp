#include "tools/twlogctl/log_select.h"

void LogSelector::Take(std::string_view text, bool continues, const WantedSink& sink) {
  LogLine line;
  LogMessage message = {text, nullptr, std::nullopt, continues};
  if (!continues && ParseLogLine(text, &line)) {
    message.line = &line;
    message.moment = m_clock.MomentOf(line.stamp);
    message.doubtful = m_doubts.Doubts(line.pid, message.moment, m_clock.Newest());
  }
  if (!continues) m_wantedLast = m_filter.Wants(text, message.line, message.moment);
  if (m_wantedLast) sink(message);
}
