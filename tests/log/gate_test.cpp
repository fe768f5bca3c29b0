// The macro that every log call goes through, in a source file that sets its own bare name.
#define TW_LOG_SOURCE "camerad"
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

LOG_LEVEL Level(int value) {
  return static_cast<LOG_LEVEL>(value);
}

TEST(Gate, WithoutARecordNoticeIsWrittenAndInfoAndDebug3AreNotAndWithItTheCategorysLevelDecides) {
  FreeDbgCfg();
  unlink(kMainLog);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_NOTICE, "notice\n");
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_INFO, "info\n");
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG3, "debug3\n");
  ASSERT_EQ(ParseLog(ReadFile(kMainLog)).size(), 1u);

  LogCapture log(3);
  log.SetLevel(LOG_CATEG_HTTP, 5);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "debug\n");
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG2, "debug2\n");
  EXPECT_THAT(log.Messages(), ElementsAre("debug\n"));
}

TEST(Gate, EveryPairOfLevelsComparesAsSignedNumbers) {
  LogCapture log;
  for (int configured = -2; configured <= 9; ++configured) {
    log.SetLevel(LOG_CATEG_HTTP, configured);
    for (int level = 0; level <= 7; ++level) {
      EXPECT_EQ(TWLogEnabled(LOG_CATEG_HTTP, Level(level)), level <= configured);
    }
  }
}

TEST(Gate, WithoutARecordLevelsUpToNoticePass) {
  FreeDbgCfg();
  for (int level = 0; level <= 7; ++level) {
    EXPECT_EQ(TWLogEnabled(LOG_CATEG_UTILS, Level(level)), level <= 3);
  }
}

TEST(Gate, EachCategoryHasItsOwnLevel) {
  LogCapture log(3);
  log.SetLevel(LOG_CATEG_SOCKET, 7);
  log.SetLevel(LOG_CATEG_UTILS, 0);
  TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_DEBUG3, "socket\n");
  TW_LOG(LOG_CATEG_UTILS, LOG_LEVEL_ERROR, "utils\n");
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_NOTICE, "http\n");
  EXPECT_THAT(log.Messages(), ElementsAre("socket\n", "http\n"));
}

TEST(Gate, WritesNamesSourceLineAndFunction) {
  LogCapture log;
  TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_WARN, "count %d of %s\n", 3, "many");
  const int line = __LINE__ - 1;
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsLog("socket", "warn", "camerad", "TestBody", "count 3 of many\n")));
  EXPECT_EQ(log.Lines()[0].line, line);
}

TEST(Gate, AMessageNeedsNoArguments) {
  LogCapture log;
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ALARM, "plain\n");
  EXPECT_THAT(log.Messages(), ElementsAre("plain\n"));
}

TEST(Gate, ArgumentsAreNotEvaluatedWhileTheLevelIsOff) {
  LogCapture log(3);
  int evaluated = 0;
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_INFO, "%d\n", ++evaluated);
  EXPECT_EQ(evaluated, 0);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_NOTICE, "%d\n", ++evaluated);
  EXPECT_EQ(evaluated, 1);
  EXPECT_THAT(log.Messages(), ElementsAre("1\n"));
}

TEST(Gate, CategoryAndLevelAreEvaluatedOnce) {
  LogCapture log;
  int evaluated = 0;
  const auto level = [&] {
    ++evaluated;
    return LOG_LEVEL_WARN;
  };
  TW_LOG(LOG_CATEG_HTTP, level(), "x\n");
  EXPECT_EQ(evaluated, 1);
}

TEST(Gate, IsOneStatementInsideIfAndElse) {
  LogCapture log;
  for (const bool condition : {true, false}) {
    if (condition)
      TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "then\n");
    else
      TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "else\n");
  }
  EXPECT_THAT(log.Messages(), ElementsAre("then\n", "else\n"));
}

TEST(Gate, ACategoryOutsideTheTableIsUnknownAndIsAtNotice) {
  LogCapture log(7);
  const auto outside = static_cast<LOG_CATEG>(74);
  TW_LOG(outside, LOG_LEVEL_NOTICE, "notice\n");
  TW_LOG(outside, LOG_LEVEL_INFO, "info\n");
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsLog("unknown", "notice", "camerad", "TestBody", "notice\n")));
}

TEST(Gate, ALevelOutsideTheTableIsUnknown) {
  LogCapture log(7);
  TW_LOG(LOG_CATEG_HTTP, Level(-1), "below\n");
  TW_LOG(LOG_CATEG_HTTP, Level(8), "above\n");
  EXPECT_THAT(log.Lines(), ElementsAre(IsLog("http", "unknown", "camerad", "TestBody", "below\n")));
}

TEST(Gate, AnAdministratorsChangeTakesEffectAtOnce) {
  LogCapture log(3);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "before\n");
  log.SetLevel(LOG_CATEG_HTTP, 5);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_DEBUG, "after\n");
  log.SetLevel(LOG_CATEG_HTTP, 2);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_NOTICE, "lowered\n");
  EXPECT_THAT(log.Messages(), ElementsAre("after\n"));
}

TEST(Gate, AMacroCallWithTheLevelOffOpensNoFile) {
  LogCapture log(3);
  TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_INFO, "off\n");
  EXPECT_FALSE(FileExists(kMainLog));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

}  // namespace
