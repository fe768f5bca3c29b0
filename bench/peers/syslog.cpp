// syslog(3), with the rsyslogd that scripts/bench has started at /dev/log. The time is the
// caller's: the logger writes when the call has returned.
#include <sys/stat.h>
#include <syslog.h>

#include "bench/log_works.h"

namespace {

// Where scripts/bench lets rsyslogd write.
constexpr char kPath[] = "/var/log/tarnwick/syslog";

class SyslogLine : public LineWriter {
 public:
  SyslogLine() { openlog("camera", LOG_PID, LOG_USER); }

  void Write(int process, int number) override {
    syslog(LOG_WARNING, BENCH_MESSAGE, process, number);
  }
};

void AddSyslog(Registry* registry) {
  struct stat socket;
  if (stat("/dev/log", &socket) != 0) return;  // nobody listens
  AddLogger(registry, {"syslog", kPath, []() -> std::unique_ptr<LineWriter> {
                         return std::make_unique<SyslogLine>();
                       }});
}

const Family kSyslogFamily(AddSyslog);

}  // namespace
