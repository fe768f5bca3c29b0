// libcurl's initialisation.
#include "tarnwick/http/twcurl.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

}  // namespace

TEST(TWCurlInit, WithoutARecordItsFailureIsLoggedAllTheSame) {
  if (!InFreshProcess()) return;
  unlink(kMainLog);
  Faults faults;
  faults.FailNth(Call::kCurlGlobalInit, 1, 0, 27);
  EXPECT_EQ(TWCurlInit(), nullptr);
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)),
              ElementsAre(IsLog("http", "error", "twcurl", "CurlGlobalInit",
                                "Failed to global init curl with res [27].\n")));
}

TEST(TWCurlInit, AMissingHandleIsNullAndNotLogged) {
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyInit, 1);
  EXPECT_EQ(TWCurlInit(), nullptr);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(TWCurlInit, ManyThreadsMayCallItFirst) {
  if (!InFreshProcess()) return;
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back([] {
      CURL* curl = TWCurlInit();
      EXPECT_NE(curl, nullptr);
      curl_easy_cleanup(curl);
    });
  }
  for (std::thread& thread : threads) thread.join();
}
