// Where the logs are. The library keeps the same names to itself.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_

#include <string_view>

constexpr char kLogDirectory[] = "/var/log/tarnwick";
constexpr char kMainLogPath[] = "/var/log/tarnwick/tarnwick.log";
constexpr char kNotificationLogPath[] = "/var/log/tarnwick/twnotification.log";

// A copy may come from another machine, whose processes /proc does not know.
inline bool IsOwnLog(std::string_view path) {
  return path == kMainLogPath || path == kNotificationLogPath;
}

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_
