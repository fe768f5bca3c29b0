// What a buffer of received bytes holds, in plain values.
#ifndef TARNWICK_FUZZ_ORACLE_CURL_BUFFER_H_
#define TARNWICK_FUZZ_ORACLE_CURL_BUFFER_H_

#include <cstddef>
#include <cstdint>
#include <string>

namespace oracle {

struct Buffer {
  bool there = false;  // false: no memory is held
  uint32_t size = 0;
  std::string bytes;  // `size` of them while `there`

  // The bytes of memory that `count` more need.
  uint64_t Needed(uint64_t count) const { return uint64_t{size} + count + 1; }

  // Appends, in memory that may not be had. Of a lost block the size stays, and zero bytes stand
  // in its place when there is memory again.
  void Append(const std::string& more, bool memory);
};

}  // namespace oracle

#endif  // TARNWICK_FUZZ_ORACLE_CURL_BUFFER_H_
