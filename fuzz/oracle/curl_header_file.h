// Which lines of a head go into the response file.
#ifndef TARNWICK_FUZZ_ORACLE_CURL_HEADER_FILE_H_
#define TARNWICK_FUZZ_ORACLE_CURL_HEADER_FILE_H_

#include <cstddef>
#include <cstdio>
#include <string>

namespace oracle {

bool GoesIntoFile(const std::string& line);

// Writes `line`, `count` items of `size` bytes, the way the file is to be written.
// Results: what the callback must return.
size_t WriteHeaderLine(const std::string& line, size_t size, size_t count, FILE* file);

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_CURL_HEADER_FILE_H_
