// Where the time of an operation went.
#ifndef TARNWICK_TOOLS_TWHTTP_TIMINGS_H_
#define TARNWICK_TOOLS_TWHTTP_TIMINGS_H_

#include <string>
#include <vector>

#include "tools/twhttp/options.h"
#include "tools/twhttp/trace.h"

struct Timing {
  std::string
      phase;  // "look-up", "connect", "TLS", "written", "first byte", "head", "body", "total"
  int exchange = 0;  // 0 for the total
  double at = 0;     // seconds from the beginning, when it was done
  double took = 0;   // seconds
  std::string limit;
};

// The phases that were reached, in their order.
std::vector<Timing> TimingsOf(const Trace& trace, const Options& options);

#endif  // TARNWICK_TOOLS_TWHTTP_TIMINGS_H_
