// Which messages of a log are wanted.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_FILTER_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_FILTER_H_

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/twlogctl/log_line.h"
#include "tools/twlogctl/log_time.h"

// A compiled POSIX extended regular expression.
class TextPattern {
 public:
  // Results: null when `text` is no such expression; `error` then says why.
  static std::shared_ptr<const TextPattern> Compile(const std::string& text, std::string* error);
  ~TextPattern();
  TextPattern(const TextPattern&) = delete;
  TextPattern& operator=(const TextPattern&) = delete;

  bool Finds(std::string_view text) const;

 private:
  struct Compiled;
  explicit TextPattern(std::unique_ptr<Compiled> compiled);
  std::unique_ptr<Compiled> compiled_;
};

// A condition that is empty is met by every message, and the others only by messages that have what
// they ask for: a line without names is of no category and no level.
struct LogFilter {
  std::vector<std::string> categories;  // their names
  std::optional<int> level;             // this and the more severe
  std::vector<int> pids;
  std::string text;                            // anywhere in the message, its prefix included
  std::shared_ptr<const TextPattern> pattern;  // the same
  std::optional<Moment> since;
  std::optional<Moment> until;  // exclusive

  // `line` is null for text that stands in front of a log's first message, `moment` that of `line`.
  bool Wants(std::string_view message, const LogLine* line, std::optional<Moment> moment) const;

  bool WantsTime(std::optional<Moment> moment) const;

 private:
  bool WantsLine(const LogLine& line) const;
  bool NeedsLine() const;
};

// The number of a level's name as it stands in a log line; -1 for any other text.
int LevelNumber(std::string_view name);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_FILTER_H_
