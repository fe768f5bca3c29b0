// The checks of the programs that are built against the installed library.
#ifndef TARNWICK_TESTS_INSTALL_EXPECT_H_
#define TARNWICK_TESTS_INSTALL_EXPECT_H_

#include <cstdio>

inline int failures = 0;

inline void Expect(bool condition, const char* what) {
  if (condition) return;
  std::printf("not so: %s\n", what);
  ++failures;
}

#endif  // TARNWICK_TESTS_INSTALL_EXPECT_H_
