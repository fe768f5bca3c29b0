// Where the logs are. The library keeps the same names to itself.
#ifndef TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_
#define TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_

constexpr char kLogFolder[] = "/var/log/tarnwick";
constexpr char kMainLogPath[] = "/var/log/tarnwick/tarnwick.log";
constexpr char kNotificationLogPath[] = "/var/log/tarnwick/twnotification.log";

#endif  // TARNWICK_TOOLS_TWLOGCTL_LOG_PATHS_H_
