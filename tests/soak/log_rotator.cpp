#include "tests/soak/log_rotator.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>

#include "tarnwick/log/twdebuglog.h"
#include "tests/soak/plan.h"
#include "tests/support/files.h"

namespace {

constexpr int kTickMs = 20;            // a change of levels
constexpr unsigned kRotateTicks = 25;  // a rotation every half second

// A rotated file is read so many rotations later: a writer that has opened it may still be waiting
// for its turn.
constexpr unsigned kGrace = 10;

constexpr int kTalkative = 4;  // one change in so many lets everything through

class Keeper {
 public:
  explicit Keeper(SharedRecord* record) : record_(record) {}

  void Run(int stop);
  const LogReport& Report() const { return report_; }

 private:
  void ChangeLevels();
  void Rotate();
  void ReadGeneration(unsigned generation);
  void CheckNumberedLine(const std::string& line);
  void Fault(const std::string& what);

  SharedRecord* const record_;
  Random random_{1};
  LogReport report_;
  unsigned generation_ = 0;
  std::map<unsigned, unsigned> last_;  // the last number of each thread
};

std::string RotatedName(const char* log, unsigned generation) {
  return std::string(log) + "." + std::to_string(generation);
}

void Keeper::Run(int stop) {
  for (unsigned tick = 1;; ++tick) {
    pollfd waiting = {stop, POLLIN, 0};
    if (poll(&waiting, 1, kTickMs) > 0) break;
    ChangeLevels();
    if (tick % kRotateTicks == 0) Rotate();
  }
  Rotate();
  for (unsigned i = generation_ > kGrace ? generation_ - kGrace + 1 : 1; i <= generation_; ++i) {
    ReadGeneration(i);
  }
}

void Keeper::ChangeLevels() {
  record_->SetTimeScale(Below(2, &random_) == 0);
  const bool everything = Below(kTalkative, &random_) == 0;
  const int level = everything ? LOG_LEVEL_DEBUG3 : static_cast<int>(Below(5, &random_));
  if (Below(2, &random_) == 0) {
    record_->SetAllLevels(level);
  } else {
    record_->SetLevel(static_cast<int>(Below(LOG_CATEG_COUNT, &random_)), level);
  }
  ++report_.level_changes;
}

void Keeper::Rotate() {
  ++generation_;
  ++report_.rotations;
  rename(kMainLog, RotatedName(kMainLog, generation_).c_str());
  rename(kNotificationLog, RotatedName(kNotificationLog, generation_).c_str());
  if (generation_ > kGrace) ReadGeneration(generation_ - kGrace);
}

void Keeper::ReadGeneration(unsigned generation) {
  const std::string main = RotatedName(kMainLog, generation);
  const std::string text = ReadFile(main);
  report_.main_lines += static_cast<unsigned long>(std::count(text.begin(), text.end(), '\n'));
  unlink(main.c_str());

  const std::string numbered = RotatedName(kNotificationLog, generation);
  const std::string lines = ReadFile(numbered);
  for (size_t begin = 0; begin < lines.size();) {
    const size_t end = std::min(lines.find('\n', begin), lines.size() - 1) + 1;
    CheckNumberedLine(lines.substr(begin, end - begin));
    begin = end;
  }
  unlink(numbered.c_str());
}

void Keeper::CheckNumberedLine(const std::string& line) {
  ++report_.numbered_lines;
  const size_t message = line.find("(): ");
  unsigned thread = 0;
  unsigned number = 0;
  unsigned length = 0;
  int end = 0;
  if (message == std::string::npos || line.back() != '\n' ||
      sscanf(line.c_str() + message + 4, "soak thread %u line %u %u:%n", &thread, &number, &length,
             &end) != 3 ||
      line.size() != message + 4 + static_cast<size_t>(end) + length + 1) {
    Fault("torn: " + line.substr(0, 100));
    return;
  }
  if (number != ++last_[thread]) {
    Fault("line " + std::to_string(number) + " of thread " + std::to_string(thread) + " where " +
          std::to_string(last_[thread]) + " was due");
    last_[thread] = number;
  }
}

void Keeper::Fault(const std::string& what) {
  if (report_.faults++ > 0) return;
  what.copy(report_.first_fault, sizeof(report_.first_fault) - 1);
}

}  // namespace

LogRotator::LogRotator() {
  int stop[2];
  int report[2];
  if (pipe2(stop, O_CLOEXEC) != 0 || pipe2(report, O_CLOEXEC) != 0) {
    perror("pipe");
    exit(2);
  }
  const pid_t parent = getpid();
  pid_ = fork();
  if (pid_ == 0) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != parent) _exit(0);
    close(stop[1]);
    Keeper keeper(&record_);
    keeper.Run(stop[0]);
    const bool told = write(report[1], &keeper.Report(), sizeof(LogReport)) > 0;
    _exit(told ? 0 : 1);
  }
  close(stop[0]);
  close(report[1]);
  stop_ = stop[1];
  report_ = report[0];
  FreeDbgCfg();
  InitDbgCfg();
}

LogRotator::~LogRotator() {
  FreeDbgCfg();
  if (stop_ >= 0) close(stop_);
  if (report_ >= 0) close(report_);
  if (pid_ <= 0) return;
  kill(pid_, SIGKILL);
  waitpid(pid_, nullptr, 0);
}

LogReport LogRotator::Finish() {
  close(stop_);
  stop_ = -1;
  LogReport report;
  if (read(report_, &report, sizeof(report)) != sizeof(report)) {
    report.faults = 1;
    snprintf(report.first_fault, sizeof(report.first_fault), "the log keeper has died");
  }
  return report;
}
