#include "tools/twhttp/progress.h"

#include <unistd.h>

#include <algorithm>
#include <cstdio>

#include "tools/common/terminal.h"
#include "tools/common/units.h"

namespace {

using Clock = std::chrono::steady_clock;

double SecondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

std::string Bar(double share, int width) {
  const auto filled = static_cast<size_t>(share * width);
  return "[" + std::string(filled, '#') + std::string(static_cast<size_t>(width) - filled, '.') +
         "]";
}

}  // namespace

std::string ProgressLine(uint64_t done, uint64_t total, double seconds, int width) {
  constexpr int kTextRoom = 52;
  constexpr int kWidestBar = 40;
  const double rate = seconds > 0 ? static_cast<double>(done) / seconds : 0;
  std::string speed = FormatBytes(static_cast<double>(done)) + ", " + FormatBytes(rate) + "/s";
  if (total == 0 || rate <= 0) return speed;
  const double share = std::min(1.0, static_cast<double>(done) / static_cast<double>(total));
  const double left = (1 - share) * static_cast<double>(total) / rate;
  const std::chrono::milliseconds span(static_cast<int64_t>(left) * 1000);
  char percent[16];
  snprintf(percent, sizeof(percent), " %3.0f %% ", share * 100);
  const int bar = std::min(width - kTextRoom, kWidestBar);
  return (bar > 4 ? Bar(share, bar) : "") + percent + speed + ", " + FormatSpan(span) + " left";
}

Progress::Progress(const Trace* trace, uint64_t upload_size)
    : trace_(trace), upload_size_(upload_size), start_(Clock::now()), drawn_(start_) {}

void Progress::Update() {
  constexpr double kQuietSeconds = 1;
  constexpr double kPeriod = 0.1;
  const Exchange* const last = trace_->LastExchange();
  if (last == nullptr || SecondsSince(start_) < kQuietSeconds || SecondsSince(drawn_) < kPeriod) {
    return;
  }
  drawn_ = Clock::now();
  const bool receiving = last->received_bytes > 0;
  const uint64_t done = receiving ? last->response.BodyBytes() : last->sent_bytes;
  const uint64_t total = receiving ? last->response.Announced() : upload_size_;
  const int width = TerminalWidth(STDERR_FILENO);
  const std::string line = ProgressLine(done, total, SecondsSince(start_), width);
  fprintf(stderr, "\r\x1b[K%s", line.substr(0, static_cast<size_t>(width - 1)).c_str());
  fflush(stderr);
  visible_ = true;
}

void Progress::Finish() {
  if (!visible_) return;
  fputs("\r\x1b[K", stderr);
  fflush(stderr);
  visible_ = false;
}
