// glog: a file that stays open, flushed at each line. It has a file for each process, so that
// several processes are not compared.
#include <glog/logging.h>
#include <unistd.h>

#include "bench/log_works.h"

namespace {

constexpr char kGlog[] = "glog";
constexpr char kPath[] = "/var/log/tarnwick/glog.log";

class GlogLine : public LineWriter {
 public:
  GlogLine() {
    FLAGS_logbufsecs = 0;  // flush each line
    FLAGS_timestamp_in_logfile_name = false;
    google::SetLogDestination(google::GLOG_INFO, kPath);
    google::SetLogSymlink(google::GLOG_INFO, "");
    google::InitGoogleLogging("compare");
  }

  void Write(int process, int number) override {
    char message[128];
    std::snprintf(message, sizeof(message), BENCH_MESSAGE, process, number);
    LOG(INFO) << message;
  }
};

void CallDisabled(int count) {
  for (int i = 0; i < count; ++i) {
    VLOG(1) << "camera " << i << " does not answer";
    Use(&i);
  }
}

void AddGlog(Registry* registry) {
  registry->AddTimed("log_disabled", kGlog, CallDisabled);
  Logger logger = {kGlog, kPath,
                   []() -> std::unique_ptr<LineWriter> { return std::make_unique<GlogLine>(); }};
  logger.forProcesses = false;
  AddLogger(registry, logger);
}

const Family kGlogFamily(AddGlog);

}  // namespace
