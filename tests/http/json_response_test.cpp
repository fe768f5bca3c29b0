// The JSON step of the one-call functions.
#include "tarnwick/http/json_response.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <ucontext.h>

#include <memory>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

using namespace tarnwick;

namespace {

using ::testing::AllOf;
using ::testing::EndsWith;
using ::testing::IsEmpty;
using ::testing::SizeIs;
using ::testing::StartsWith;

int ResultOf(const std::string& text) {
  Json::Value value;
  return JsonParse(text, value);
}

std::string Repeat(const std::string& piece, int times) {
  std::string text;
  for (int i = 0; i < times; ++i) text += piece;
  return text;
}

// An array in an array and so on, `levels` of them, beside "success".
std::string Nested(int levels) {
  return "{\"success\":true,\"x\":" + Repeat("[", levels) + Repeat("]", levels) + "}";
}

// Results of JsonParse on a stack that makecontext was given.
struct Fiber {
  ucontext_t thread;
  ucontext_t fiber;
  int few = 1;
  int many = 1;
};

Fiber* g_fiber = nullptr;

void ParseInFiber() {
  g_fiber->few = ResultOf(Nested(76));
  g_fiber->many = ResultOf(Nested(77));
}

void RunInFiber(Fiber* fiber) {
  constexpr size_t kStack = 1 << 20;
  const auto stack = std::make_unique<char[]>(kStack);
  g_fiber = fiber;
  ASSERT_EQ(getcontext(&fiber->fiber), 0);
  fiber->fiber.uc_stack.ss_sp = stack.get();
  fiber->fiber.uc_stack.ss_size = kStack;
  fiber->fiber.uc_link = &fiber->thread;
  makecontext(&fiber->fiber, ParseInFiber, 0);
  ASSERT_EQ(swapcontext(&fiber->thread, &fiber->fiber), 0);
}

}  // namespace

TEST(JsonParse, SuccessDecides) {
  Json::Value value;
  EXPECT_EQ(JsonParse("{\"success\":true,\"data\":{\"n\":[1,2]}}", value), 0);
  EXPECT_EQ(value["data"]["n"][1].asInt(), 2);
  EXPECT_EQ(ResultOf("{\"success\":false}"), -2);
  EXPECT_EQ(ResultOf("{\"data\":1}"), -2);
  EXPECT_EQ(ResultOf("{}"), -2);
}

TEST(JsonParse, AnEmptyStringIsTakenUnparsedAndLeavesTheValue) {
  Json::Value value = "kept";
  EXPECT_EQ(JsonParse("", value), 0);
  EXPECT_EQ(value.asString(), "kept");
}

TEST(JsonParse, NumbersAreTrueUnlessZero) {
  EXPECT_EQ(ResultOf("{\"success\":1}"), 0);
  EXPECT_EQ(ResultOf("{\"success\":-7}"), 0);
  EXPECT_EQ(ResultOf("{\"success\":0.5}"), 0);
  EXPECT_EQ(ResultOf("{\"success\":18446744073709551615}"), 0);
  EXPECT_EQ(ResultOf("{\"success\":0}"), -2);
  EXPECT_EQ(ResultOf("{\"success\":0.0}"), -2);
}

TEST(JsonParse, ASuccessOfAnotherKindIsNotTrue) {
  for (const char* kind :
       {"null", "\"true\"", "\"\"", "[]", "[true]", "{}", "{\"success\":true}"}) {
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf("{\"success\":" + std::string(kind) + "}"), -2)) << kind;
  }
}

TEST(JsonParse, ARootOfAnotherKindHasNoSuccess) {
  for (const char* root : {"[]", "[{\"success\":true}]", "null", "true", "1", "\"success\""}) {
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(root), -2)) << root;
  }
}

TEST(JsonParse, TheNameHasItsCase) {
  EXPECT_EQ(ResultOf("{\"Success\":true}"), -2);
}

TEST(JsonParse, TheLastOfTwoMembersIsTaken) {
  EXPECT_EQ(ResultOf("{\"success\":true,\"success\":false}"), -2);
}

TEST(JsonParse, TextThatIsNoJsonIsNotParsable) {
  for (const char* text : {"x", "{", "}", "{\"success\"", "{\"success\":}", "{\"success\":tru}",
                           "<html>", "[1,", "\"", "{\"a\":\"\\u12\"}", " "}) {
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(text), -1)) << text;
  }
}

TEST(JsonParse, EveryCutOfAResponseIsNotParsable) {
  const std::string whole = "{\"success\" : true, \"d\" : [1, {\"e\" : \"f\\n\"}]}";
  for (size_t n = 1; n < whole.size(); ++n) EXPECT_EQ(ResultOf(whole.substr(0, n)), -1) << n;
  EXPECT_EQ(ResultOf(whole), 0);
}

TEST(JsonParse, CommentsAreTakenAndCollected) {
  Json::Value value;
  EXPECT_EQ(JsonParse("/* [[[ */ {\"success\": // yes\n true}\n// end", value), 0);
  EXPECT_TRUE(value.hasComment(Json::commentBefore));
}

TEST(JsonParse, AFailureIsLoggedWithoutTagsAndWithTextAndReason) {
  LogCapture log;
  EXPECT_EQ(ResultOf("{\"a\":%s%n}"), -1);
  const std::vector<LogLine> lines = log.Lines();
  ASSERT_THAT(lines, SizeIs(1));
  EXPECT_EQ(lines[0].category, "");
  EXPECT_EQ(lines[0].level, "");
  EXPECT_EQ(lines[0].source, "twhttp");
  EXPECT_EQ(lines[0].function, "JsonParse");
  Json::Value value;
  Json::Reader reader;
  EXPECT_FALSE(reader.parse("{\"a\":%s%n}", value, true));
  EXPECT_EQ(lines[0].message, "Failed to parse json: [{\"a\":%s%n}] with error [" +
                                  reader.getFormattedErrorMessages() + "]\n");
}

TEST(JsonParse, ItsLineHasNoGate) {
  {
    LogCapture log(-1);
    ResultOf("x");
    EXPECT_THAT(log.Lines(), SizeIs(1));
    log.Clear();
  }
  ASSERT_EQ(g_pDbgLogCfg, nullptr);
  ResultOf("x");
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)), SizeIs(1));
}

TEST(JsonParse, AMissingSuccessIsNotLogged) {
  LogCapture log;
  ResultOf("{\"success\":false}");
  ResultOf("[]");
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(JsonParse, NineHundredLevelsParseOnAnUsualStack) {
  EXPECT_EQ(ResultOf(Nested(900)), 0);
  EXPECT_EQ(ResultOf(Repeat("{\"success\":", 900) + "1" + Repeat("}", 900)), -2);
}

TEST(JsonParse, VeryDeepNestingIsNotParsable) {
  LogCapture log;
  for (const int levels : {1100, 5000, 100000}) {
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(Nested(levels)), -1)) << levels;
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(Repeat("[", levels)), -1)) << levels;
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(Repeat("{\"a\":", levels)), -1)) << levels;
    EXPECT_NO_THROW(EXPECT_EQ(ResultOf(Repeat("[{\"a\":", levels)), -1)) << levels;
  }
  for (const LogLine& line : log.Lines()) {
    EXPECT_THAT(line.message, AllOf(StartsWith("Failed to parse json: ["), EndsWith("]\n")));
    EXPECT_EQ(line.function, "JsonParse");
  }
  EXPECT_THAT(log.Lines(), SizeIs(12));
}

TEST(JsonParse, VeryDeepNestingDoesNotOverflowASmallStack) {
  const std::string texts[] = {Nested(100000),
                               Repeat("[", 100000),
                               Repeat("{\"a\":", 100000),
                               Repeat("[/* c */", 100000),
                               Repeat("[\n//c\n", 100000),
                               Repeat("[//c\r", 100000),
                               "//\r" + Repeat("[", 100000),
                               "[\"\\\\\"," + Repeat("[", 100000)};
  RunOnSmallStack(64 << 10, [&] {
    for (const std::string& text : texts) EXPECT_NO_THROW(EXPECT_EQ(ResultOf(text), -1));
  });
}

TEST(JsonParse, NoDepthOverflowsASmallStack) {
  RunOnSmallStack(64 << 10, [] {
    EXPECT_EQ(ResultOf(Nested(8)), 0);
    for (int levels = 16; levels < 1200; levels += 16) {
      const int result = ResultOf(Nested(levels));
      EXPECT_TRUE(result == 0 || result == -1) << levels;
    }
  });
}

TEST(JsonParse, BracketsInStringsAndCommentsAreNoNesting) {
  EXPECT_EQ(ResultOf("{\"success\":true,\"x\":\"" + std::string(5000, '[') + "\"}"), 0);
  EXPECT_EQ(ResultOf("/*" + std::string(5000, '{') + "*/{\"success\":true}"), 0);
}

TEST(JsonParse, WhereTheSystemDoesNotTellTheStackSixtyLevelsParseAndThousandsDoNot) {
  Faults faults;
  faults.FailFrom(Call::kPthreadGetattrNp, 1);
  EXPECT_EQ(ResultOf(Nested(60)), 0);
  EXPECT_EQ(ResultOf(Nested(900)), -1);
  EXPECT_EQ(faults.Count(Call::kPthreadGetattrNp), 2);
}

TEST(JsonParse, OnAStackThatIsNotTheThreadsOwn77LevelsParseAndNoMore) {
  Fiber in_main_thread;  // whose stack lies above the heap; another thread's may lie below
  RunInFiber(&in_main_thread);
  EXPECT_EQ(in_main_thread.few, 0);
  EXPECT_EQ(in_main_thread.many, -1);
  RunOnSmallStack(128 << 10, [] {
    Fiber fiber;
    RunInFiber(&fiber);
    EXPECT_EQ(fiber.few, 0);
    EXPECT_EQ(fiber.many, -1);
  });
}

TEST(JsonParse, AWideResponseIsParsed) {
  EXPECT_EQ(ResultOf("{\"success\":true,\"x\":[" + Repeat("[],", 20000) + "{}]}"), 0);
}

TEST(JsonDepth, CountsTheDeepestNesting) {
  EXPECT_EQ(JsonDepth(""), 0);
  EXPECT_EQ(JsonDepth("1"), 0);
  EXPECT_EQ(JsonDepth("[]"), 1);
  EXPECT_EQ(JsonDepth("[][]"), 1);
  EXPECT_EQ(JsonDepth("{\"a\":[{}],\"b\":[]}"), 3);
  EXPECT_EQ(JsonDepth("[[["), 3);
}

TEST(JsonDepth, LeavesStringsAndCommentsAside) {
  EXPECT_EQ(JsonDepth("[\"[[\\\"[[\"]"), 1);
  EXPECT_EQ(JsonDepth("[\"\\\\\",[]]"), 2);
  EXPECT_EQ(JsonDepth("/* [[ */ [ // [[\n ]"), 1);
  EXPECT_EQ(JsonDepth("[\"unended [["), 1);
  EXPECT_EQ(JsonDepth("[/* unended [["), 1);
  EXPECT_EQ(JsonDepth("[// unended [["), 1);
  EXPECT_EQ(JsonDepth("/["), 1);
}
