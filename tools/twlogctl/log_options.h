// The options that the sub-commands which read logs have in common.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_OPTIONS_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_OPTIONS_H_

#include <string>
#include <vector>

#include "tools/twlogctl/log_filter.h"
#include "tools/twlogctl/log_time.h"

namespace CLI {
class App;
}

// As they were typed.
struct LogOptions {
  bool notification = false;
  std::string file;
  std::vector<std::string> categories;
  std::string level;
  std::vector<int> pids;
  std::string text;
  bool regex = false;
  std::string since;
  std::string until;
  bool json = false;
  bool mark = false;
};

// --notification and --file.
void AddSourceOptions(CLI::App* app, LogOptions* options);

void AddJsonOption(CLI::App* app, LogOptions* options);

// --mark.
void AddMarkOption(CLI::App* app, LogOptions* options);

// --since and --until.
void AddTimeOptions(CLI::App* app, LogOptions* options);

// --category, --level, --pid, --grep and --regex.
void AddFilterOptions(CLI::App* app, LogOptions* options);

// A check for the parser, whose own takes -1 for a large number. Results: empty, or what is wrong.
std::string IsWholeNumber(const std::string& typed);

// The path of the log that the options choose; "-" for standard input.
std::string LogPath(const LogOptions& options);

// The same for a log that is followed. Throws CLI::ParseError for standard input.
std::string FollowedPath(const LogOptions& options);

// Throws CLI::ParseError when a value is no category, level, pattern or time. `until` says where
// a time of day without a date and a span lie for --until.
LogFilter MakeFilter(const LogOptions& options, Moment now, Direction until);

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_OPTIONS_H_
