// The works of logs: what each logger must be able to do, once.
#ifndef TARNWICK_BENCH_LOG_WORKS_H_
#define TARNWICK_BENCH_LOG_WORKS_H_

#include <memory>
#include <string>

#include "bench/contender.h"

// The message of every line; the two numbers tell which line of which process it is.
#define BENCH_MESSAGE "process %02d: camera %06d does not answer"

// Writes lines to its file, each of them at once. Made in the process that uses it.
class LineWriter {
 public:
  virtual ~LineWriter() = default;
  virtual void Write(int process, int number) = 0;
};

struct Logger {
  const char* name;
  const char* path;  // of the file that its lines are in
  std::unique_ptr<LineWriter> (*make)();
  bool forProcesses = true;  // several processes may write to one file
};

// Registers one line, and lines from 4 and 16 processes. Afterwards each line must be in the file,
// once and whole.
void AddLogger(Registry* registry, const Logger& logger);

#endif  // TARNWICK_BENCH_LOG_WORKS_H_
