// A log line, put together once more.
#ifndef TARNWICK_FUZZ_ORACLE_LOG_PREFIX_H_
#define TARNWICK_FUZZ_ORACLE_LOG_PREFIX_H_

#include <cstdint>
#include <optional>
#include <string>

namespace oracle {

struct LogCall {
  int64_t seconds = 0;  // of local time since 1970
  int microseconds = 0;
  bool milliseconds = false;  // time stamps carry them
  int pid = 0;
  int tid = 0;
  std::optional<std::string> category;
  std::optional<std::string> level;
  std::string file;
  int line = 0;
  std::string function;
  std::string message;
};

std::string LogLineOf(const LogCall& call);

// The part after the last separator of either kind.
std::string BaseName(const std::string& path);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_LOG_PREFIX_H_
