// Whether what the library sent is well-formed: nothing that a peer sends may split a request or
// bring a line of its own into one.
#ifndef TARNWICK_TESTS_ATTACK_REQUEST_CHECK_H_
#define TARNWICK_TESTS_ATTACK_REQUEST_CHECK_H_

#include <string>

#include "tests/attack/attacked_operations.h"

// True when `bytes` hold a whole request of the operation; of an upload, a whole head.
bool IsWholeRequest(const std::string& bytes, const AttackedOperation& operation);

// How long the whole request at the front of `bytes` is. REQUIRES: IsWholeRequest.
size_t RequestLength(const std::string& bytes, const AttackedOperation& operation);

// What is wrong with all that came on one connection; empty for nothing. The last request may have
// broken off. `requests` is increased by those that were begun.
std::string RequestProblem(const std::string& bytes, const AttackedOperation& operation,
                           int* requests);

#endif  // TARNWICK_TESTS_ATTACK_REQUEST_CHECK_H_
