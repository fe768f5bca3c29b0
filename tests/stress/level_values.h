// The levels that the levels cases write: each has four equal bytes, so that a torn one shows.
#ifndef TARNWICK_TESTS_STRESS_LEVEL_VALUES_H_
#define TARNWICK_TESTS_STRESS_LEVEL_VALUES_H_

inline int WrittenLevel(int number) {
  return 0x01010101 * (1 + number % 100);
}

inline bool IsWrittenLevel(int level) {
  return level > 0 && level % 0x01010101 == 0 && level / 0x01010101 <= 100;
}

#endif  // TARNWICK_TESTS_STRESS_LEVEL_VALUES_H_
