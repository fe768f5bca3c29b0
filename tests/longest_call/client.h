// The client of the cases.
#ifndef TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_
#define TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_

#include <memory>
#include <string>

#include "tarnwick/http/twhttp.h"
#include "tests/longest_call/cases.h"

// What the simulated camera has at its profiles json and cgi; the others answer at any path.
inline constexpr char kJsonPath[] = "info.json";
inline constexpr char kCgiPath[] = "info.cgi";

// With the simulated camera's own account.
inline std::unique_ptr<TWHttpClient> NewClient(int port, const char* path = kJsonPath,
                                               bool buffered = true, bool https = false,
                                               const std::string& host = "127.0.0.1") {
  return std::make_unique<TWHttpClient>(host, port, path, "operator", "gate-7", kTimeout, https,
                                        buffered, false, false, HTTP_VERSION_1_1, "");
}

#endif  // TARNWICK_TESTS_LONGEST_CALL_CLIENT_H_
