#include "tarnwick/http/chunk_size.h"

namespace {

// The digit's value, or -1. Not the C library's functions: the locale must not count here.
int HexValue(char c) {
  if (c >= '0' && c <= '9') return c - '0';
  if (c >= 'a' && c <= 'f') return c - 'a' + 10;
  if (c >= 'A' && c <= 'F') return c - 'A' + 10;
  return -1;
}

}  // namespace

uint32_t ParseChunkSize(std::string_view line) {
  uint32_t size = 0;
  for (const char c : line) {
    const int digit = HexValue(c);
    if (digit < 0) break;
    size = size * 16 + static_cast<uint32_t>(digit);
  }
  return size;
}
