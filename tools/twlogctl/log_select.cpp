#include "tools/twlogctl/log_select.h"

void LogSelector::Take(std::string_view text, bool continues, const WantedSink& sink) {
  LogLine line;
  LogMessage message = {text, nullptr, std::nullopt, continues};
  if (!continues && ParseLogLine(text, &line)) {
    message.line = &line;
    message.moment = clock_.MomentOf(line.stamp);
    message.doubtful = doubts_.Doubts(line.pid, message.moment, clock_.Newest());
  }
  if (!continues) wanted_last_ = filter_.Wants(text, message.line, message.moment);
  if (wanted_last_) sink(message);
}
