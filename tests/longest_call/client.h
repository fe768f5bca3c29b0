// The client of the cases.
#ifndef TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_
#define TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_

#include <memory>
#include <string>

#include "tarnwick/http/twhttp.h"
#include "tests/longest_call/cases.h"

inline std::unique_ptr<TWHttpClient> NewClient(int port, bool buffered = true, bool https = false,
                                               const std::string& host = "127.0.0.1") {
  return std::make_unique<TWHttpClient>(host, port, "a.cgi", "user", "password", kTimeout, https,
                                        buffered, false, false, HTTP_VERSION_1_1, "");
}

#endif  // TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_
