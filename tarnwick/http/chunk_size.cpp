#include "tarnwick/http/chunk_size.h"

#include <algorithm>

namespace tarnwick {

namespace {

// How far the end of a size line is looked for. It must stay below the lines that are cut.
constexpr size_t kLongestLine = 256;

// The digit's value, or -1. Not by the C library's functions, which depend on the locale.
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

std::string_view FirstCompleteChunk(std::string_view bytes) {
  const size_t limit = std::min(bytes.size(), kLongestLine);
  size_t at = 0;
  while (at < limit && bytes[at] != '\r' && bytes[at] != '\n') ++at;
  if (at == limit) return {};
  const size_t size = ParseChunkSize(bytes.substr(0, at));
  at += bytes[at] == '\r' ? 2 : 1;
  if (bytes.size() < at + 2 || bytes.size() - at - 2 < size) return {};
  return {bytes.data() + at, size};
}

}  // namespace tarnwick
