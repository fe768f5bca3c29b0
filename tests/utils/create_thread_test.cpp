// Starting threads.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <limits.h>
#include <pthread.h>

#include <cerrno>
#include <cstddef>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"
#include "tests/support/faults.h"
#include "tests/support/flag.h"
#include "tests/support/log_capture.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// What a thread finds out about itself.
struct Report {
  size_t stack_size = 0;
  int detach_state = -1;
  Flag done;
};

void* FillReport(void* argument) {
  auto* report = static_cast<Report*>(argument);
  pthread_attr_t attr;
  pthread_getattr_np(pthread_self(), &attr);
  pthread_attr_getstacksize(&attr, &report->stack_size);
  pthread_attr_getdetachstate(&attr, &report->detach_state);
  pthread_attr_destroy(&attr);
  report->done.Set();
  return argument;
}

TEST(CreateThread, BelowErrorAFailureIsNotLogged) {
  LogCapture log;
  Faults faults;
  faults.FailFrom(Call::kPthreadCreate, 1);
  pthread_t thread;
  log.SetLevel(LOG_CATEG_UTILS, 0);
  EXPECT_EQ(CreateThread(FillReport, nullptr, 0, 0, &thread), 0);
  EXPECT_THAT(log.Lines(), IsEmpty());
  log.SetLevel(LOG_CATEG_UTILS, 1);
  EXPECT_EQ(CreateThread(FillReport, nullptr, 0, 0, &thread), 0);
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to create thread.\n"));
}

TEST(CreateThread, LogsAFailure) {
  const LogCapture log;
  Faults faults;
  faults.FailNth(Call::kPthreadCreate, 1, 0, EAGAIN);
  pthread_t thread;
  EXPECT_EQ(CreateThread(FillReport, nullptr, 0, 0, &thread), 0);
  EXPECT_THAT(log.Lines(), ElementsAre(IsLog("utils", "error", "utils", "CreateThread",
                                             "Failed to create thread.\n")));
}

TEST(CreateThread, RunsTheRoutineWithItsArgument) {
  const LogCapture log;
  Report report;
  pthread_t thread;
  ASSERT_EQ(CreateThread(FillReport, &report, 0, 0, &thread), 1);
  void* result = nullptr;
  EXPECT_EQ(pthread_join(thread, &result), 0);
  EXPECT_EQ(result, &report);
  EXPECT_EQ(report.detach_state, PTHREAD_CREATE_JOINABLE);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(CreateThread, AnyDetachedFlagButZeroDetaches) {
  for (const int detached : {1, 2, -1}) {
    Report report;
    pthread_t thread;
    ASSERT_EQ(CreateThread(FillReport, &report, 0, detached, &thread), 1);
    ASSERT_TRUE(report.done.Wait());
    EXPECT_EQ(report.detach_state, PTHREAD_CREATE_DETACHED);
  }
}

TEST(CreateThread, UsesTheStackSize) {
  Report report;
  pthread_t thread;
  constexpr unsigned kStack = 20 << 20;  // beyond what an earlier thread may have left
  ASSERT_EQ(CreateThread(FillReport, &report, kStack, 0, &thread), 1);
  pthread_join(thread, nullptr);
  EXPECT_GE(report.stack_size, kStack);
}

TEST(CreateThread, StackSizeZeroReturnsTheSystemsDefault) {
  pthread_attr_t attr;
  pthread_attr_init(&attr);
  size_t expected = 0;
  pthread_attr_getstacksize(&attr, &expected);
  pthread_attr_destroy(&attr);
  Faults faults;
  Report report;
  pthread_t thread;
  ASSERT_EQ(CreateThread(FillReport, &report, 0, 0, &thread), 1);
  pthread_join(thread, nullptr);
  EXPECT_GE(report.stack_size, expected);  // an ended thread's larger stack may serve again
  EXPECT_EQ(faults.Count(Call::kPthreadAttrSetstacksize), 0);
}

TEST(CreateThread, AStackSizeThatIsRefusedLeavesTheDefault) {
  const LogCapture log;
  Report report;
  pthread_t thread;
  ASSERT_EQ(CreateThread(FillReport, &report, 1, 0, &thread), 1);
  pthread_join(thread, nullptr);
  EXPECT_GE(report.stack_size, static_cast<size_t>(PTHREAD_STACK_MIN));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(CreateThread, WithoutARoutineOrAPlaceForTheHandleFails) {
  const LogCapture log;
  pthread_t thread;
  EXPECT_EQ(CreateThread(nullptr, nullptr, 0, 0, &thread), 0);
  EXPECT_EQ(CreateThread(FillReport, nullptr, 0, 0, nullptr), 0);
  EXPECT_THAT(log.Messages(),
              ElementsAre("Failed to create thread.\n", "Failed to create thread.\n"));
}

TEST(CreateThread, SeveralDetachedThreadsRunSideBySide) {
  Report reports[8];
  for (Report& report : reports) {
    pthread_t thread;
    ASSERT_EQ(CreateThread(FillReport, &report, 1 << 20, 1, &thread), 1);
  }
  for (Report& report : reports) EXPECT_TRUE(report.done.Wait());
}

}  // namespace
