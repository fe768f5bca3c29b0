// Processes that write to the log while something happens to it.
#ifndef TARNWICK_TESTS_STRESS_LOG_TEAM_H_
#define TARNWICK_TESTS_STRESS_LOG_TEAM_H_

#include <atomic>
#include <functional>
#include <string>
#include <vector>

#include "tests/stress/log_lines.h"
#include "tests/stress/processes.h"
#include "tests/stress/stress.h"

inline constexpr char kLogFolder[] = "/var/log/tarnwick";

// How far a writer has come, told by itself and readable by others even after its death.
struct WriterProgress {
  std::atomic<int> pid;
  std::atomic<int> started;
  std::atomic<int> finished;
};

// Writes the writer's next line.
void WriteNextLine(int writer, WriterProgress& progress);

// The main log and what it was renamed to.
class LogFiles {
 public:
  // Renames the main log, if there is one. Writers that have it open go on writing to it.
  void Rotate();
  int Rotations() const { return rotations_; }

  // Gives all files to the verifier, oldest first, and its findings to the result.
  void Verify(LogVerifier& verifier, CaseResult& result) const;

 private:
  int rotations_ = 0;
};

// Processes of two threads each, which write a line every millisecond or so until they are stopped.
class WriterPool {
 public:
  static constexpr int kThreads = 2;

  // Each process runs `setup` first.
  explicit WriterPool(int processes, const std::function<void()>& setup = {});
  ~WriterPool();
  WriterPool(const WriterPool&) = delete;
  WriterPool& operator=(const WriterPool&) = delete;

  // Waits until each writer has written `count` further lines.
  void AwaitLines(int count, CaseResult& result);

  // Between the two calls lines may get lost or cut. REQUIRES: one such time at most.
  void FaultBegins();
  void FaultEnds();

  // Lets all finish; fails for a process that crashed, did not end or left the log open.
  void Stop(CaseResult& result);

  std::vector<WriterFacts> Facts() const;
  long Lines() const;

 private:
  int RunProcess(int process);
  void RunThread(int writer);

  int writers_;
  Shared<WriterProgress> progress_;
  Shared<std::atomic<bool>> stop_;
  std::vector<pid_t> pids_;
  std::vector<int> lossy_from_;
  std::vector<int> lossy_to_;
};

#endif  // TARNWICK_TESTS_STRESS_LOG_TEAM_H_
