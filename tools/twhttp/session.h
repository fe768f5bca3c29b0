// One run of an operation, with everything that was observed.
#ifndef TARNWICK_TOOLS_TWHTTP_SESSION_H_
#define TARNWICK_TOOLS_TWHTTP_SESSION_H_

#include <functional>
#include <string>

#include "tools/twhttp/failure.h"
#include "tools/twhttp/options.h"
#include "tools/twhttp/run.h"
#include "tools/twhttp/trace.h"

class FakePeer;

struct Session {
  explicit Session(const Options& all) : options(all), trace(!all.record.empty()) {}

  const Options& options;
  Trace trace;
  Outcome outcome;
  Failure failure;
};

// Runs the operation of `session`. `on_transfer` is called after bytes went or came; `peer` may be
// null.
void RunSession(Session* session, const std::string& body, const BodyWriter& write,
                const std::function<void()>& on_transfer, FakePeer* peer);

// The body to send, from the options. Results: false when its file cannot be read, which is told.
bool LoadBody(const Options& options, std::string* body);

#endif  // TARNWICK_TOOLS_TWHTTP_SESSION_H_
