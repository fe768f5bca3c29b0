// spdlog: a file that stays open, appended to and flushed at each line.
#include <spdlog/sinks/basic_file_sink.h>
#include <spdlog/spdlog.h>

#include "bench/log_works.h"

namespace {

constexpr char kSpdlog[] = "spdlog";
constexpr char kPath[] = "/var/log/tarnwick/spdlog.log";

class SpdlogLine : public LineWriter {
 public:
  SpdlogLine() : m_logger("camera", std::make_shared<spdlog::sinks::basic_file_sink_mt>(kPath)) {
    m_logger.flush_on(spdlog::level::trace);
    m_logger.set_pattern("%b %e %T [%P][%n][%l] %s:%#:%!(): %v");
  }

  void Write(int process, int number) override {
    SPDLOG_LOGGER_CALL(&m_logger, spdlog::level::warn,
                       "process {:02d}: camera {:06d} does not answer", process, number);
  }

 private:
  spdlog::logger m_logger;
};

void CallDisabled(int count) {
  spdlog::logger logger("camera");
  logger.set_level(spdlog::level::warn);
  for (int i = 0; i < count; ++i) {
    SPDLOG_LOGGER_CALL(&logger, spdlog::level::debug, "camera {} does not answer", i);
    Use(&logger);
  }
}

void AddSpdlog(Registry* registry) {
  registry->AddTimed("log_disabled", kSpdlog, CallDisabled);
  AddLogger(registry, {kSpdlog, kPath, []() -> std::unique_ptr<LineWriter> {
                         return std::make_unique<SpdlogLine>();
                       }});
}

const Family kSpdlogFamily(AddSpdlog);

}  // namespace
