// The entry of every test program.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  if (GTEST_FLAG_GET(list_tests)) return RUN_ALL_TESTS();
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    fprintf(stderr, "%s writes to /var/log and the settings: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  return RUN_ALL_TESTS();
}
