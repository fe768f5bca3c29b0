#include "fuzz/oracle/curl_header_file.h"

#include <algorithm>
#include <string_view>

namespace oracle {

namespace {

constexpr std::string_view kLeftOut = "Transfer-Encoding:";

bool StandsAt(const std::string& line, size_t at) {
  for (size_t i = 0; i < kLeftOut.size(); ++i) {
    if (at + i >= line.size() || line[at + i] != kLeftOut[i]) return false;
  }
  return true;
}

}  // namespace

bool GoesIntoFile(const std::string& line) {
  if (line.size() == 2 && line[0] == '\r' && line[1] == '\n') return true;
  for (size_t at = 0; at < line.size(); ++at) {
    if (StandsAt(line, at)) return false;
  }
  return std::count(line.begin(), line.end(), ':') > 0;
}

size_t WriteHeaderLine(const std::string& line, size_t size, size_t count, FILE* file) {
  if (!GoesIntoFile(line)) return size * count;
  const size_t written = std::fwrite(line.data(), size, count, file);
  std::fflush(file);
  return written;
}

}  // namespace oracle
