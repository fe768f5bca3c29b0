// A parser that is wrong on purpose: the test fuzz_planted_difference fails when this target runs
// through, for then a difference to the oracle goes unseen. Its sizes of chunks lose the letters in
// upper case.
#include <cctype>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>

#include "fuzz/support/target.h"
#include "tarnwick/http/chunk_size.h"

using namespace tarnwick;

namespace {

uint32_t FaultySize(const std::string& line) {
  uint32_t size = 0;
  for (const char c : line) {
    const bool digit = (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');  // the planted fault
    if (!digit) break;
    size = size * 16 + static_cast<uint32_t>(c <= '9' ? c - '0' : c - 'a' + 10);
  }
  return size;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string line(reinterpret_cast<const char*>(data), size);
  ExpectSame("chunk size", FaultySize(line), ParseChunkSize(line));
  return 0;
}
