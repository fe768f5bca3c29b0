// How the slow relay hands a record on: so many of its bytes one by one, each so late.
#ifndef TARNWICK_TESTS_LONGEST_CALL_SLOW_BYTES_H_
#define TARNWICK_TESTS_LONGEST_CALL_SLOW_BYTES_H_

#include <cstddef>

inline constexpr size_t kSlowBytes = 10;
inline constexpr double kBetweenSlowBytes = 0.95;  // seconds

#endif  // TARNWICK_TESTS_LONGEST_CALL_SLOW_BYTES_H_
