// What the soak's server responds to a request, and how it spoils the response.
#ifndef TARNWICK_TESTS_SOAK_RESPONSE_H_
#define TARNWICK_TESTS_SOAK_RESPONSE_H_

#include <string>

#include "tests/soak/plan.h"
#include "tests/support/server_connection.h"

struct Request {
  std::string head;  // with the empty line
  std::string body;
  Plan plan;
};

// Reads one request; false when the client ended, or sent one that the soak does not know.
bool ReadRequest(ServerConnection* connection, Request* request);

// Responds to it, with the fault of its plan. Results: true when the connection stays open for
// another.
bool SendResponse(ServerConnection* connection, const Request& request);

// Bytes that are not a response.
std::string Noise(unsigned seed);

#endif  // TARNWICK_TESTS_SOAK_RESPONSE_H_
