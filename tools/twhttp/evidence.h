// What was observed of an operation, for the verdict about it.
#ifndef TARNWICK_TOOLS_TWHTTP_EVIDENCE_H_
#define TARNWICK_TOOLS_TWHTTP_EVIDENCE_H_

#include <string>
#include <vector>

#include "tools/twhttp/options.h"
#include "tools/twhttp/run.h"
#include "tools/twhttp/trace.h"
#include "tools/twhttp/watchdog.h"

// Everything that a verdict is made of.
struct Evidence {
  const Options& options;
  const Outcome& outcome;
  const Trace& trace;
  Stop stop;
};

// The last exchange, or an empty one.
const Exchange& LastOf(const Evidence& evidence);

// What the library trips over in the head of `exchange`; nothing when libcurl read it.
std::vector<HeadFinding> FindingsOf(const Trace& trace, const Exchange& exchange);

// True when the request carried an Authorization line.
bool SentCredentials(const Exchange& exchange);

bool Contains(const std::string& text, const char* word);

#endif  // TARNWICK_TOOLS_TWHTTP_EVIDENCE_H_
