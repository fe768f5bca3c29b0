#include "tests/stress/log_team.h"

#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <thread>

#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

constexpr int kDescriptorLeft = 3;
constexpr double kSeconds = 30;

std::string RotatedName(int number) {
  return std::string(kMainLog) + "." + std::to_string(number);
}

}  // namespace

void WriteNextLine(int writer, WriterProgress& progress) {
  const int number = progress.started++;
  WriteLine(writer, number);
  ++progress.finished;
}

void LogFiles::Rotate() {
  if (rename(kMainLog, RotatedName(rotations_).c_str()) == 0) ++rotations_;
}

void LogFiles::Verify(LogVerifier& verifier, CaseResult& result) const {
  for (int i = 0; i < rotations_; ++i) verifier.Read(ReadFile(RotatedName(i)));
  verifier.Read(ReadFile(kMainLog));
  verifier.Finish();
  result.Checked(verifier.WholeLines());
  for (const std::string& failure : verifier.Failures()) result.Fail(failure);
}

WriterPool::WriterPool(int processes, const std::function<void()>& setup)
    : writers_(processes * kThreads),
      progress_(static_cast<size_t>(writers_)),
      lossy_from_(static_cast<size_t>(writers_), 0),
      lossy_to_(static_cast<size_t>(writers_), 0) {
  for (int process = 0; process < processes; ++process) {
    pids_.push_back(Spawn([this, process, &setup] {
      if (setup) setup();
      return RunProcess(process);
    }));
  }
}

WriterPool::~WriterPool() {
  for (const pid_t pid : pids_) {
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
  }
}

int WriterPool::RunProcess(int process) {
  std::thread other([this, process] { RunThread(process * kThreads + 1); });
  RunThread(process * kThreads);
  other.join();
  return DescriptorsOn(kLogFolder) == 0 ? 0 : kDescriptorLeft;
}

void WriterPool::RunThread(int writer) {
  WriterProgress& progress = progress_[static_cast<size_t>(writer)];
  progress.pid = getpid();
  while (!*stop_) {
    WriteNextLine(writer, progress);
    usleep(1000);
  }
}

void WriterPool::AwaitLines(int count, CaseResult& result) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(kSeconds);
  std::vector<int> targets;
  for (size_t i = 0; i < lossy_from_.size(); ++i) targets.push_back(progress_[i].finished + count);
  for (size_t i = 0; i < targets.size(); ++i) {
    while (progress_[i].finished < targets[i]) {
      if (std::chrono::steady_clock::now() > deadline) {
        return result.Fail("writer " + std::to_string(i) + " does not get on");
      }
      usleep(1000);
    }
  }
}

void WriterPool::FaultBegins() {
  for (size_t i = 0; i < lossy_from_.size(); ++i) lossy_from_[i] = progress_[i].finished;
}

void WriterPool::FaultEnds() {
  for (size_t i = 0; i < lossy_to_.size(); ++i) lossy_to_[i] = progress_[i].started;
}

void WriterPool::Stop(CaseResult& result) {
  *stop_ = true;
  for (const pid_t pid : pids_) {
    const auto status = WaitFor(pid, kSeconds);
    if (!status) kill(pid, SIGKILL);
    result.Expect(status == 0, "a writer: " + StatusText(status));
  }
  pids_.clear();
}

std::vector<WriterFacts> WriterPool::Facts() const {
  std::vector<WriterFacts> facts;
  for (size_t i = 0; i < lossy_from_.size(); ++i) {
    facts.push_back({progress_[i].pid, progress_[i].started, lossy_from_[i], lossy_to_[i]});
  }
  return facts;
}

long WriterPool::Lines() const {
  long lines = 0;
  for (size_t i = 0; i < lossy_from_.size(); ++i) lines += progress_[i].started;
  return lines;
}
