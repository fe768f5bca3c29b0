// The operations of the soak: each does what its plan says and compares what came of it.
#ifndef TARNWICK_TESTS_SOAK_OPERATIONS_H_
#define TARNWICK_TESTS_SOAK_OPERATIONS_H_

#include <memory>
#include <string>

#include "tests/http/http_test_util.h"
#include "tests/soak/plan.h"
#include "tests/soak/server.h"
#include "tests/soak/statistics.h"

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
  std::shared_ptr<ExposedClient> again[2];  // plain and TLS, for the whole run
};

Outcome RunOperation(const Plan& plan, Session* session);

// Parts of it: with a server, and without one.
Outcome RunPeerOperation(const Plan& plan, Session* session);
Outcome RunLocalOperation(const Plan& plan, Session* session);

// The verdict on a success that gave `got` where `wanted` was due.
Outcome Compare(const std::string& got, const std::string& wanted);

Outcome Wrong(const std::string& detail);

#endif  // TARNWICK_TESTS_SOAK_OPERATIONS_H_
