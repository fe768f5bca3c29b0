// Reads what the library sends to the system log.
#ifndef TARNWICK_TESTS_SUPPORT_SYSLOG_CAPTURE_H_
#define TARNWICK_TESTS_SUPPORT_SYSLOG_CAPTURE_H_

#include <string>
#include <vector>

struct SyslogMessage {
  int priority;      // 3: error
  int facility;      // as the LOG_USER family, not shifted
  std::string text;  // without the time and the program's name
};

// Stands in for the system log daemon at /dev/log for as long as it lives.
class SyslogCapture {
 public:
  SyslogCapture();
  ~SyslogCapture();
  SyslogCapture(const SyslogCapture&) = delete;
  SyslogCapture& operator=(const SyslogCapture&) = delete;

  // The messages that came since construction or the last call.
  std::vector<SyslogMessage> Take();

 private:
  int fd_;
};

#endif  // TARNWICK_TESTS_SUPPORT_SYSLOG_CAPTURE_H_
