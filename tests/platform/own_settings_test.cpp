// Replacing the settings-file functions at link time.
#include <gtest/gtest.h>

#include <string>

#include "tests/support/process.h"

namespace {

void ExpectOwnFunctionsCalled(const char* program) {
  std::string output;
  EXPECT_EQ(RunProgram({program}, &output).code, 0);
  EXPECT_EQ(output,
            "get tw_dbglog_settings\n"
            "get tw_dbglog_time_scale\n"
            "set tw_dbglog_settings=7,6,3\n"
            "set tw_dbglog_time_scale=yes\n"
            "0 0 6\n");
}

TEST(OwnSettingsFunctions, ReplaceThoseOfTheSharedLibrary) {
  ExpectOwnFunctionsCalled(TARNWICK_OWN_SETTINGS_SHARED);
}

TEST(OwnSettingsFunctions, ReplaceThoseOfTheStaticLibrary) {
  ExpectOwnFunctionsCalled(TARNWICK_OWN_SETTINGS_STATIC);
}

}  // namespace
