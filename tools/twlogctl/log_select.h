// From the text of messages to the ones that are wanted.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_SELECT_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_SELECT_H_

#include <functional>
#include <optional>
#include <string_view>
#include <utility>

#include "tools/twlogctl/log_doubt.h"
#include "tools/twlogctl/log_filter.h"
#include "tools/twlogctl/log_line.h"
#include "tools/twlogctl/log_time.h"

struct LogMessage {
  std::string_view text;  // as it stands in the log
  const LogLine* line;    // null for lines without a message's beginning
  std::optional<Moment> moment;
  bool continues;         // lines that belong to the message given out before
  bool doubtful = false;  // its first line cannot be what it says
};

using WantedSink = std::function<void(const LogMessage& message)>;

class LogSelector {
 public:
  // With `own_log` the log is one of this machine's processes.
  LogSelector(LogFilter filter, Moment newest, bool own_log)
      : filter_(std::move(filter)), clock_(newest), doubts_(own_log) {}

  // Takes a message as a MessageSink does and hands it on if it is wanted. Lines that continue a
  // message share its fate.
  void Take(std::string_view text, bool continues, const WantedSink& sink);

  void Advance(Moment newest) { clock_.Advance(newest); }
  LogFilter& Filter() { return filter_; }

 private:
  LogFilter filter_;
  LogClock clock_;
  LineDoubts doubts_;
  bool wanted_last_ = false;
};

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_SELECT_H_
