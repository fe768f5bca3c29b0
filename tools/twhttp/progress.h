// The progress of a transfer that lasts, on a terminal.
#ifndef TARNWICK_TOOLS_TWHTTP_PROGRESS_H_
#define TARNWICK_TOOLS_TWHTTP_PROGRESS_H_

#include <chrono>
#include <cstdint>
#include <string>

#include "tools/twhttp/trace.h"

// The line for a transfer of `done` out of `total` bytes (0: not known) after `seconds`.
std::string ProgressLine(uint64_t done, uint64_t total, double seconds, int width);

// Draws the line on standard error, from the second second on and ten times a second at most.
class Progress {
 public:
  // `upload_size` is how much is to be sent, 0 when it is not known or nothing to wait for.
  Progress(const Trace* trace, uint64_t upload_size);

  void Update();

  // Feature the line away.
  void Finish();

 private:
  const Trace* const trace_;
  const uint64_t upload_size_;
  const std::chrono::steady_clock::time_point start_;
  std::chrono::steady_clock::time_point drawn_;
  bool visible_ = false;
};

#endif  // TARNWICK_TOOLS_TWHTTP_PROGRESS_H_
