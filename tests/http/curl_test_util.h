// Helpers for the tests of the requests through libcurl.
#ifndef TARNWICK_TESTS_HTTP_CURL_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_CURL_TEST_UTIL_H_

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdio>
#include <string>
#include <vector>

#include "tests/support/faults.h"

inline constexpr char kFormHeader[] =
    "Content-Type: application/x-www-form-urlencoded; charset=utf-8";

// A response file without a name.
class FileInMemory {
 public:
  FileInMemory() = default;
  ~FileInMemory() { fclose(file_); }
  FileInMemory(const FileInMemory&) = delete;
  FileInMemory& operator=(const FileInMemory&) = delete;

  FILE* Stream() { return file_; }

  std::string Content() {
    fflush(file_);
    char buf[4096];
    const ssize_t n = pread(fileno(file_), buf, sizeof(buf), 0);
    return std::string(buf, n > 0 ? static_cast<size_t>(n) : 0);
  }

 private:
  FILE* file_ = tmpfile();
};

// The options that were set, in their order, but for the four that each transfer ends them with:
// those keep it from the process's signals and children (see curl_process_test.cpp), from repeating a
// request without an end, and from a cache that nobody would use.
inline std::vector<CURLoption> OptionsOf(const Faults& faults) {
  std::vector<CURLoption> options;
  for (const CurlOption& given : faults.CurlOptions()) {
    const bool ends = given.option == CURLOPT_NOSIGNAL || given.option == CURLOPT_MAXREDIRS ||
                      given.option == CURLOPT_OPENSOCKETFUNCTION ||
                      given.option == CURLOPT_SSL_SESSIONID_CACHE;
    if (!ends) options.push_back(given.option);
  }
  return options;
}

inline void ExpectHandleReleased(const Faults& faults) {
  EXPECT_EQ(faults.Count(Call::kCurlEasyInit), 1);
  EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
}

#endif  // TARNWICK_TESTS_HTTP_CURL_TEST_UTIL_H_
