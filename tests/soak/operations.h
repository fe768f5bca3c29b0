// The operations of the soak: each does what its plan says and compares what came of it.
#ifndef TARNWICK_TESTS_SOAK_OPERATIONS_H_
#define TARNWICK_TESTS_SOAK_OPERATIONS_H_

#include <memory>
#include <string>

#include "tarnwick/http/twhttp.h"
#include "tests/soak/plan.h"
#include "tests/soak/server.h"
#include "tests/soak/tally.h"

// Where the plans' requests go.
struct Endpoints {
  ServerPorts server;
  int refused = 0;
  int black_hole = 0;
};

// What one thread keeps over its operations.
struct Session {
  Endpoints endpoints;
  unsigned thread = 0;
  unsigned log_lines = 0;
  std::unique_ptr<TWHttpClient> again[2];  // plain and TLS, for the whole run
};

Outcome RunOperation(const Plan& plan, Session* session);

// Parts of it, by the kind of the work.
Outcome RunSocketOperation(const Plan& plan, Session* session);
Outcome RunCurlOperation(const Plan& plan, const Session& session);
Outcome RunLocalOperation(const Plan& plan, Session* session);

// The port that the plan's request goes to, and the limit of time, in seconds, that it is made
// with: small where nothing but the limit ends it.
int PortOf(const Plan& plan, const Endpoints& endpoints);
int TimeoutOf(const Plan& plan);

// A client for the path. What the plan leaves open changes with its number.
std::unique_ptr<TWHttpClient> NewClient(const Plan& plan, const Session& session,
                                        const std::string& path);

// The verdict on a success that gave `got` where `wanted` was due.
Outcome Compare(const std::string& got, const std::string& wanted);

// A failure by a result out of the contract's list; anything else is wrong.
Outcome FailedWith(int result, std::initializer_list<int> documented);

Outcome Wrong(const std::string& detail);

// The verdict on an XML answer, which is freed.
Outcome CompareXml(const Plan& plan, xmlDoc* doc);

#endif  // TARNWICK_TESTS_SOAK_OPERATIONS_H_
