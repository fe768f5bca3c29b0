// log4cplus: a file that stays open, flushed at each line, with the lock file that lets several
// processes share it.
#include <log4cplus/fileappender.h>
#include <log4cplus/helpers/property.h>
#include <log4cplus/layout.h>
#include <log4cplus/logger.h>
#include <log4cplus/loggingmacros.h>

#include "bench/log_works.h"

namespace {

constexpr char kLog4cplus[] = "log4cplus";
constexpr char kPath[] = "/var/log/tarnwick/log4cplus.log";

class Log4cplusLine : public LineWriter {
 public:
  Log4cplusLine() {
    log4cplus::helpers::Properties properties;
    properties.setProperty("File", kPath);
    properties.setProperty("Append", "true");
    properties.setProperty("ImmediateFlush", "true");
    properties.setProperty("UseLockFile", "true");
    properties.setProperty("LockFile", std::string(kPath) + ".lock");
    log4cplus::SharedAppenderPtr appender(new log4cplus::FileAppender(properties));
    appender->setLayout(std::make_unique<log4cplus::PatternLayout>(
        "%D{%b %e %H:%M:%S} [%i][%c][%p] %b:%L:%M: %m%n"));
    m_logger.addAppender(appender);
  }

  void Write(int process, int number) override {
    LOG4CPLUS_WARN_FMT(m_logger, BENCH_MESSAGE, process, number);
  }

 private:
  log4cplus::Logger m_logger = log4cplus::Logger::getInstance("camera");
};

class Disabled : public TimedContender {
 public:
  Disabled() { m_logger.setLogLevel(log4cplus::WARN_LOG_LEVEL); }

 private:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      LOG4CPLUS_DEBUG_FMT(m_logger, BENCH_MESSAGE, 0, i);
      Use(&m_logger);
    }
  }

  log4cplus::Logger m_logger = log4cplus::Logger::getInstance("disabled");
};

void AddLog4cplus(Registry* registry) {
  registry->Add("log_disabled", kLog4cplus, [] { return std::make_unique<Disabled>(); });
  AddLogger(registry, {kLog4cplus, kPath, []() -> std::unique_ptr<LineWriter> {
                         return std::make_unique<Log4cplusLine>();
                       }});
}

const Family kLog4cplusFamily(AddLog4cplus);

}  // namespace
