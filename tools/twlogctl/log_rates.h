// How much was logged, and by whom.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_RATES_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_RATES_H_

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tools/twlogctl/log_select.h"

struct LogAmount {
  uint64_t lines = 0;  // continuation lines included
  uint64_t bytes = 0;

  void Add(const LogAmount& other);
};

using NamedAmounts = std::map<std::string, LogAmount>;

struct LogAmounts {
  LogAmount all;
  NamedAmounts categories;  // the empty name is that of lines without names
  NamedAmounts levels;
  NamedAmounts processes;

  // Lines that continue a message have no names; `owner` is the message's first line.
  void Add(const LogAmount& amount, const LogLine* owner);
  void Add(const LogAmounts& other);
};

// The loudest first: by lines, then by bytes.
std::vector<std::pair<std::string, LogAmount>> LoudestFirst(const NamedAmounts& amounts);

// Counts messages: all of them together, and lines by the second.
class LogCounter {
 public:
  void Add(const LogMessage& message);

  const LogAmounts& Amounts() const { return amounts_; }
  const std::map<int64_t, uint64_t>& LinesBySecond() const { return lines_; }

  // Of the messages that have a time.
  std::optional<Moment> First() const { return first_; }
  std::optional<Moment> Last() const { return last_; }

 private:
  LogAmounts amounts_;
  std::map<int64_t, uint64_t> lines_;  // by the seconds since 1970
  std::optional<Moment> first_;
  std::optional<Moment> last_;
};

// Counts the messages of the last seconds.
class SlidingCounter {
 public:
  explicit SlidingCounter(std::chrono::seconds window) : window_(window) {}

  // A message without a time is of `now`.
  void Add(const LogMessage& message, Moment now);

  // Forgets what is older than the window.
  void Advance(Moment now);

  LogAmounts Amounts() const;
  std::map<int64_t, uint64_t> LinesBySecond() const;
  std::chrono::seconds Window() const { return window_; }

 private:
  std::chrono::seconds window_;
  std::map<int64_t, LogAmounts> seconds_;
};

// The lines and bytes of a message.
LogAmount AmountOf(const LogMessage& message);

int64_t SecondOf(Moment moment);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_RATES_H_
