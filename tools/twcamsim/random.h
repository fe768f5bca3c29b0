// Numbers that look random and are the same for the same seed.
#ifndef TARNWICK_TOOLS_TWCAMSIM_RANDOM_H_
#define TARNWICK_TOOLS_TWCAMSIM_RANDOM_H_

#include <cstddef>
#include <cstdint>
#include <string>

// A sequence of its own for each connection, so that what one client sees does not depend on what
// others do at the same time.
class Random {
 public:
  Random(uint64_t seed, uint64_t endpoint, uint64_t connection);

  uint64_t Next();

  // From 0 to `limit` - 1; 0 when the limit is 0.
  uint64_t Below(uint64_t limit);

  // `bytes` bytes as twice as many hexadecimal digits.
  std::string Hex(size_t bytes);

 private:
  uint64_t state_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_RANDOM_H_
