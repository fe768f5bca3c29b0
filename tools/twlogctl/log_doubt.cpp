#include "tools/twlogctl/log_doubt.h"

#include <cstdlib>
#include <limits>
#include <sstream>

#include "tools/twlogctl/processes.h"

namespace {

// Local time without a zone goes back by an hour in autumn, a clock that is set by more than that
// is rare, and a line may wait long for the lock after its time was taken.
constexpr std::chrono::hours kMargin(2);

// The number after a word at the beginning of a line of /proc/stat.
std::optional<long long> SystemFigure(const std::string& name) {
  std::istringstream lines(ReadWholeFile("/proc/stat"));
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string word;
    long long number = 0;
    if (words >> word >> number && word == name) return number;
  }
  return std::nullopt;
}

int LargestNumber() {
  const long largest = std::strtol(ReadWholeFile("/proc/sys/kernel/pid_max").c_str(), nullptr, 10);
  constexpr int kMost = std::numeric_limits<int>::max();
  return largest > 0 && largest < kMost ? static_cast<int>(largest) : kMost;
}

// When the system was started, unless it has begun to give numbers again since.
std::optional<Moment> UniqueSince(int largest) {
  const auto started = SystemFigure("btime");
  const auto processes = SystemFigure("processes");
  if (!started || !processes || *processes >= largest) return std::nullopt;
  return Moment(std::chrono::seconds(*started));
}

}  // namespace

ProcessNumbers::ProcessNumbers()
    : largest_(LargestNumber()), unique_since_(UniqueSince(largest_)) {}

// Results: nothing for a process that does not run.
std::optional<Moment> ProcessNumbers::StartOf(int pid) {
  const auto known = starts_.find(pid);
  if (known != starts_.end()) return known->second;
  std::optional<Moment> start;
  if (const auto process = ReadProcess(pid)) {
    start = Now() - std::chrono::milliseconds(static_cast<int64_t>(process->age_seconds * 1000));
  }
  starts_[pid] = start;
  return start;
}

bool ProcessNumbers::CannotHaveWritten(int pid, std::optional<Moment> moment) {
  if (pid <= 0 || pid > largest_) return true;
  if (!unique_since_ || !moment || *moment < *unique_since_ + kMargin) return false;
  const auto start = StartOf(pid);
  return start && *start > *moment + kMargin;
}

// A line ahead of the present is not what the next one is compared with: that one would be told for
// it.
bool LineDoubts::RunsBack(std::optional<Moment> moment, Moment newest) {
  if (!moment) return false;
  if (*moment > newest + kMargin) return true;
  const bool back = before_ && *moment + kMargin < *before_;
  before_ = moment;
  return back;
}

bool LineDoubts::Doubts(int pid, std::optional<Moment> moment, Moment newest) {
  const bool back = RunsBack(moment, newest);
  return back || (numbers_ && numbers_->CannotHaveWritten(pid, moment));
}
