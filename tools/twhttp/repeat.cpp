#include "tools/twhttp/repeat.h"

#include <time.h>
#include <unistd.h>

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "tools/common/json_output.h"
#include "tools/common/terminal.h"
#include "tools/twhttp/report.h"

namespace {

std::string Milliseconds(double seconds) {
  char text[32];
  snprintf(text, sizeof(text), "%.1f ms", seconds * 1000);
  return text;
}

// REQUIRES: sorted, not empty.
double Quantile(const std::vector<double>& sorted, double share) {
  const auto rank = static_cast<size_t>(std::ceil(share * static_cast<double>(sorted.size())));
  return sorted[std::max<size_t>(rank, 1) - 1];
}

// A row for each doubling of the latency.
std::string Histogram(const std::vector<double>& latencies) {
  constexpr double kWidest = 40;
  std::map<int, int> rows;
  for (const double latency : latencies) {
    ++rows[static_cast<int>(std::ceil(std::log2(std::max(latency * 1000, 0.001))))];
  }
  int most = 1;
  for (const auto& row : rows) most = std::max(most, row.second);
  std::string text;
  for (int power = rows.begin()->first; power <= rows.rbegin()->first; ++power) {
    const int count = rows.count(power) > 0 ? rows[power] : 0;
    const auto bar = static_cast<size_t>(std::ceil(kWidest * count / most));
    char label[64];
    snprintf(label, sizeof(label), "  up to %10s %6d ",
             Milliseconds(std::exp2(power) / 1000).c_str(), count);
    text += label + std::string(bar, '#') + "\n";
  }
  return text;
}

void Add(const Session& session, Counts* counts) {
  if (session.failure.id == FailureClass::kNone) {
    counts->latencies.push_back(session.trace.finished);
  } else {
    ++counts->failures[session.failure.id];
  }
}

// Results: false when a signal ended the wait.
bool Pause(double seconds) {
  const double whole = std::floor(seconds);
  timespec left = {static_cast<time_t>(whole), static_cast<long>((seconds - whole) * 1e9)};
  return nanosleep(&left, nullptr) == 0;
}

int ExitCodeOf(const Counts& counts) {
  const auto most =
      std::max_element(counts.failures.begin(), counts.failures.end(),
                       [](const auto& a, const auto& b) { return a.second < b.second; });
  if (StopReason() == Stop::kInterrupted) return FactsOf(FailureClass::kInterrupted).exit_code;
  return most == counts.failures.end() ? 0 : FactsOf(most->first).exit_code;
}

}  // namespace

std::string CountsText(Counts counts, bool colour) {
  std::vector<double>& latencies = counts.latencies;
  std::sort(latencies.begin(), latencies.end());
  size_t failed = 0;
  for (const auto& failure : counts.failures) failed += static_cast<size_t>(failure.second);
  std::string text = std::to_string(latencies.size() + failed) + " requests, " +
                     std::to_string(latencies.size()) + " good, " + std::to_string(failed) +
                     " failed\n";
  if (!latencies.empty()) {
    text += "latency: least " + Milliseconds(latencies.front()) + ", median " +
            Milliseconds(Quantile(latencies, 0.5)) + ", 90 % " +
            Milliseconds(Quantile(latencies, 0.9)) + ", most " + Milliseconds(latencies.back()) +
            "\n" + Histogram(latencies);
  }
  for (const auto& [id, count] : counts.failures) {
    char line[64];
    snprintf(line, sizeof(line), "%6d ", count);
    text +=
        line + InColour(Colour::kRed, FactsOf(id).name, colour) + ": " + FactsOf(id).meaning + "\n";
  }
  return text;
}

int RunRepeated(const Options& options, const std::string& body) {
  Counts counts;
  for (int i = 0; i < options.repeat && StopReason() != Stop::kInterrupted; ++i) {
    if (i > 0 && !Pause(options.interval)) break;
    Session session(options);
    RunSession(
        &session, body, [](const std::string&) { return true; }, nullptr, nullptr);
    if (session.failure.id == FailureClass::kInterrupted) break;
    Add(session, &counts);
    if (options.json && !PrintJsonLine(ReportJson(session))) break;
  }
  if (!options.json) fputs(CountsText(counts, MayColour(STDOUT_FILENO)).c_str(), stdout);
  if (fflush(stdout) != 0) return FactsOf(FailureClass::kLocalFile).exit_code;
  return ExitCodeOf(counts);
}
