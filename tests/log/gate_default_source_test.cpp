// The macro in a source file that sets no name of its own.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/log_capture.h"

namespace {

TEST(Gate, WithoutANameOfItsOwnAFilesBaseNameIsPrinted) {
  LogCapture log;
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "x\n");
  EXPECT_THAT(log.Lines(), ::testing::ElementsAre(IsLog(
                               "http", "warn", "gate_default_source_test.cpp", "TestBody", "x\n")));
}

}  // namespace
