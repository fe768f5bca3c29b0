// The version that programs ask for.
#include "tarnwick/version.h"

#include <gtest/gtest.h>

#include <cstdio>

namespace {

TEST(Version, TheTextIsThatOfTheNumber) {
  int major = 0;
  int minor = 0;
  int patch = 0;
  ASSERT_EQ(sscanf(TWVersion(), "%d.%d.%d", &major, &minor, &patch), 3);
  EXPECT_EQ(major * 10000 + minor * 100 + patch, TWVersionNumber());
}

TEST(Version, IsTheOneThatThisProgramWasCompiledWith) {
  EXPECT_EQ(TWVersionNumber(), TARNWICK_VERSION_NUMBER);
  EXPECT_STREQ(TWVersion(), TARNWICK_PROJECT_VERSION);
}

}  // namespace
