#include "bench/log_works.h"

#include <sched.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <set>
#include <vector>

namespace {

// Written before the time counts: the first line of a process opens files and resolves symbols.
constexpr int kWarmUp = 10;

int64_t Now() {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);  // the same in all processes
  return int64_t{now.tv_sec} * 1000000000 + now.tv_nsec;
}

struct Span {
  int64_t begin;
  int64_t end;
};

// Several processes run on whatever processors there are; a single one stays where it is.
void UseAllProcessors() {
  cpu_set_t all;
  CPU_ZERO(&all);
  for (int cpu = 0; cpu < sysconf(_SC_NPROCESSORS_CONF); ++cpu) CPU_SET(cpu, &all);
  sched_setaffinity(0, sizeof(all), &all);
}

// The processes write when the last one is ready, and each tells when it began and ended.
class Lines : public Contender {
 public:
  Lines(const Logger& logger, int processes) : m_logger(logger), m_processes(processes) {}

  double Measure(int count) override {
    if (truncate(m_logger.path, 0) != 0) Expect(errno == ENOENT, m_logger.name, "keeps its file");
    const int each = std::max(1, count / m_processes);
    const Span span = RunAll(each);
    CheckFile(each + kWarmUp);
    return static_cast<double>(span.end - span.begin) / (each * m_processes);
  }

  void Count(int count) override {
    if (m_writer == nullptr) m_writer = m_logger.make().release();
    for (int i = 0; i < count; ++i) m_writer->Write(0, i);
  }

 private:
  Span RunAll(int lines) const {
    int ready[2], go[2], results[2];
    Expect(pipe(ready) == 0 && pipe(go) == 0 && pipe(results) == 0, m_logger.name, "has no pipe");
    std::vector<pid_t> children;
    for (int process = 0; process < m_processes; ++process) {
      children.push_back(fork());
      if (children.back() != 0) continue;
      close(go[1]);
      RunChild(process, lines, ready[1], go[0], results[1]);
    }
    close(ready[1]);  // or the end of a process that dies would not be seen
    char byte;
    for (int i = 0; i < m_processes; ++i) {
      Expect(read(ready[0], &byte, 1) == 1, m_logger.name, "has a process that cannot start");
    }
    for (const int fd : {go[0], go[1], results[1], ready[0]}) close(fd);
    const Span all = Collect(results[0]);
    close(results[0]);
    for (const pid_t child : children) waitpid(child, nullptr, 0);
    return all;
  }

  [[noreturn]] void RunChild(int process, int lines, int ready, int go, int results) const {
    if (m_processes > 1) UseAllProcessors();
    LineWriter* const writer = m_logger.make().release();  // the lines are out without its end
    for (int i = 0; i < kWarmUp; ++i) writer->Write(process, i);
    char byte = 0;
    if (write(ready, &byte, 1) != 1 || read(go, &byte, 1) != 0) _exit(1);
    Span span = {Now(), 0};
    for (int i = 0; i < lines; ++i) writer->Write(process, kWarmUp + i);
    span.end = Now();
    if (write(results, &span, sizeof(span)) != sizeof(span)) _exit(1);
    _exit(0);
  }

  // From the first one's beginning to the last one's end.
  Span Collect(int results) const {
    Span all = {INT64_MAX, 0};
    Span span;
    for (int i = 0; i < m_processes; ++i) {
      Expect(read(results, &span, sizeof(span)) == sizeof(span), m_logger.name, "has failed");
      all = {std::min(all.begin, span.begin), std::max(all.end, span.end)};
    }
    return all;
  }

  // A line that comes late counts: the system's logger writes when the caller has gone on.
  void CheckFile(int lines) const {
    const auto expected = static_cast<size_t>(lines) * static_cast<size_t>(m_processes);
    size_t found = 0;
    for (int tries = 0; tries < 500 && (found = CountLines()) < expected; ++tries) usleep(20000);
    if (found == expected) return;
    Fail(m_logger.name,
         "has lost lines: " + std::to_string(expected - found) + " of " + std::to_string(expected));
  }

  // How many different lines there are. Ends the program when one is torn or comes twice.
  size_t CountLines() const {
    std::ifstream file(m_logger.path);
    std::set<std::string> messages;
    for (std::string line; std::getline(file, line);) {
      if (file.eof()) break;  // not whole yet
      const size_t at = line.find("process ");
      if (at == std::string::npos && IsHeading(line)) continue;
      int process = -1, number = -1, end = 0;
      const bool whole =
          at != std::string::npos &&
          std::sscanf(line.c_str() + at, BENCH_MESSAGE "%n", &process, &number, &end) == 2 &&
          line.size() == at + static_cast<size_t>(end);
      if (!whole) Fail(m_logger.name, "has torn a line: " + line);
      if (!messages.insert(line.substr(at)).second) Fail(m_logger.name, "has twice: " + line);
    }
    return messages.size();
  }

  // The first lines of glog's files.
  static bool IsHeading(const std::string& line) {
    for (const char* heading :
         {"Log file created at", "Running on machine", "Running duration", "Log line format"}) {
      if (line.rfind(heading, 0) == 0) return true;
    }
    return false;
  }

  const Logger m_logger;
  const int m_processes;
  LineWriter* m_writer = nullptr;  // what Count writes with; it stays, as in the children
};

}  // namespace

void AddLogger(Registry* registry, const Logger& logger) {
  const auto add = [=](const char* work, int processes) {
    registry->Add(work, logger.name, [=] { return std::make_unique<Lines>(logger, processes); });
  };
  add("log_line", 1);
  if (!logger.forProcesses) return;
  add("log_line_4_processes", 4);
  add("log_line_16_processes", 16);
}
