// Pacing a loop.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/time.h>

#include <cerrno>
#include <climits>
#include <cstdint>
#include <vector>

#include "tarnwick/utils/utils.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// A clock that only the test and the sleeps move.
class Pacing : public ::testing::Test {
 protected:
  Pacing() {
    faults_.Clock([this] {
      return timeval{static_cast<time_t>(now_ / 1000000), static_cast<suseconds_t>(now_ % 1000000)};
    });
    faults_.Return(Call::kUsleep, 1, INT_MAX, 0);
    faults_.Before(Call::kUsleep, [this](int) { now_ += static_cast<int64_t>(Sleeps().back()); });
  }

  const std::vector<size_t>& Sleeps() const { return faults_.Sizes(Call::kUsleep); }
  int Yields() const { return faults_.Count(Call::kSchedYield); }
  void Pass(int64_t microseconds) { now_ += microseconds; }

  Faults faults_;
  int64_t now_ = 1000 * 1000000LL;
};

TEST_F(Pacing, TheSecondOfTwoQuickCallsSleepsUntilAPeriodAfterTheFirstOnesTarget) {
  DelayTimer timer(10000);
  Pass(3000);
  EXPECT_EQ(timer.Delay(), 0);
  Pass(500);
  EXPECT_EQ(timer.Delay(), 0);
  EXPECT_THAT(Sleeps(), ElementsAre(7000, 9500));
  EXPECT_EQ(now_, 1000 * 1000000LL + 20000);
  EXPECT_EQ(Yields(), 0);
}

TEST_F(Pacing, ALateCallDoesNotSleepAndStartsAPeriodNow) {
  DelayTimer timer(10000);
  Pass(25000);
  EXPECT_EQ(timer.Delay(), 0);
  EXPECT_THAT(Sleeps(), IsEmpty());
  EXPECT_EQ(Yields(), 1);
  Pass(1000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(9000));
}

TEST_F(Pacing, AClockThatWasSetBackIsTakenForLate) {
  DelayTimer timer(10000);
  Pass(-5000000);
  EXPECT_EQ(timer.Delay(), 0);
  EXPECT_THAT(Sleeps(), IsEmpty());
  EXPECT_EQ(Yields(), 1);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(10000));
}

TEST_F(Pacing, APeriodOfZeroOrLessOnlyYields) {
  for (const int period : {0, -1, INT_MIN}) {
    DelayTimer timer(period);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(timer.Delay(), 0);
  }
  EXPECT_THAT(Sleeps(), IsEmpty());
  EXPECT_EQ(Yields(), 9);
}

TEST_F(Pacing, ACallAtTheVeryEndOfThePeriodIsLate) {
  DelayTimer timer(10000);
  Pass(10000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), IsEmpty());
  Pass(9999);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(1));
}

TEST_F(Pacing, ALoopKeepsItsPeriodWithoutDrift) {
  DelayTimer timer(40000);
  for (int round = 1; round <= 100; ++round) {
    Pass(round * 37 % 30000);
    timer.Delay();
    EXPECT_EQ(now_, 1000 * 1000000LL + round * 40000);
  }
}

TEST_F(Pacing, APeriodMayCrossSeveralSeconds) {
  now_ += 999999;
  DelayTimer timer(2500000);
  timer.Delay();
  Pass(1);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(2500000, 2499999));
}

TEST_F(Pacing, BeginTimingStartsAPeriodNow) {
  DelayTimer timer(10000);
  Pass(6000);
  timer.BeginTiming();
  Pass(1000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(9000));
}

TEST_F(Pacing, ANewPeriodKeepsTheStartOfTheCurrentOne) {
  DelayTimer timer(10000);
  Pass(4000);
  timer.SetDelayTime(20000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(16000));
}

TEST_F(Pacing, AMarkAtSecondZeroIsTakenForNotStarted) {
  now_ = 999999;
  DelayTimer timer(10000);
  Pass(5000001);
  timer.Delay();  // late by five seconds, were the mark in force
  EXPECT_THAT(Sleeps(), ElementsAre(10000));
}

TEST_F(Pacing, ElapsedTimeIsTakenAs32Bits) {
  DelayTimer timer(10000);
  Pass((1LL << 32) + 4000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(6000));
  Pass(-4000 - 6000 + (1LL << 31));
  timer.Delay();
  EXPECT_EQ(Yields(), 1);
}

TEST_F(Pacing, TheEndOf32BitSecondsDoesNotDisturbThePace) {
  now_ = (int64_t{1} << 31) * 1000000 - 500000;  // half a second before
  DelayTimer timer(1000000);
  Pass(200000);
  timer.Delay();
  Pass(1000);
  timer.Delay();
  EXPECT_THAT(Sleeps(), ElementsAre(800000, 999000));
}

TEST(DelayTimer, ReturnsWhatTheSleepReturns) {
  Faults faults;
  faults.FailNth(Call::kUsleep, 1, EINTR);
  DelayTimer timer(1000000);
  errno = 0;
  EXPECT_EQ(timer.Delay(), -1);
  EXPECT_EQ(errno, EINTR);
}

TEST(DelayTimer, ReturnsWhatTheYieldReturns) {
  Faults faults;
  faults.FailNth(Call::kSchedYield, 1, ENOSYS);
  DelayTimer timer(0);
  EXPECT_EQ(timer.Delay(), -1);
}

TEST(DelayTimer, SleepsInRealTime) {
  DelayTimer timer(20000);
  timeval before;
  timeval after;
  gettimeofday(&before, nullptr);
  timer.BeginTiming();
  EXPECT_EQ(timer.Delay(), 0);
  gettimeofday(&after, nullptr);
  const int64_t passed =
      (after.tv_sec - before.tv_sec) * 1000000LL + (after.tv_usec - before.tv_usec);
  EXPECT_GE(passed, 20000);
}

}  // namespace
