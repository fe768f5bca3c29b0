// The fault injection itself: a fault that does not happen would make its test pass for nothing.
#include "tests/support/faults.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest-spi.h>
#include <gtest/gtest.h>
#include <netdb.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <thread>

namespace {

using ::testing::ElementsAre;

TEST(Faults, TheNthCallFailsAndTheOthersDoNot) {
  Faults faults;
  faults.FailNth(Call::kRead, 2, EIO);
  char byte;
  const int fd = open("/dev/zero", O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(read(fd, &byte, 1), 1);
  EXPECT_EQ(read(fd, &byte, 1), -1);
  EXPECT_EQ(errno, EIO);
  EXPECT_EQ(read(fd, &byte, 1), 1);
  EXPECT_EQ(faults.Count(Call::kRead), 3);
  EXPECT_TRUE(faults.Struck());
  close(fd);
}

TEST(Faults, AnotherThreadIsLeftAlone) {
  Faults faults;
  faults.FailFrom(Call::kOpen, 1, EACCES);
  int other = -1;
  std::thread([&] { other = open("/dev/zero", O_RDONLY | O_CLOEXEC); }).join();
  EXPECT_GE(other, 0);
  EXPECT_EQ(open("/dev/zero", O_RDONLY | O_CLOEXEC), -1);
  close(other);
}

TEST(Faults, AllocationsFail) {
  Faults faults;
  faults.FailFrom(Call::kMalloc, 1);
  void* volatile memory = malloc(10);
  EXPECT_EQ(memory, nullptr);
}

TEST(Faults, AFakedSelectHasEmptySets) {
  Faults faults;
  faults.Return(Call::kSelect, 1, 1, 1);
  fd_set reads;
  FD_ZERO(&reads);
  FD_SET(3, &reads);
  EXPECT_EQ(select(4, &reads, nullptr, nullptr, nullptr), 1);
  EXPECT_FALSE(FD_ISSET(3, &reads));
}

TEST(Faults, SizesAreRecordedAndCut) {
  Faults faults;
  faults.Limit(Call::kRead, 3);
  char buf[8];
  const int fd = open("/dev/zero", O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(read(fd, buf, sizeof(buf)), 3);
  EXPECT_THAT(faults.Sizes(Call::kRead), ElementsAre(8));
  close(fd);
}

TEST(Faults, CurlOptionsAreRecordedAndRefused) {
  CURL* easy = curl_easy_init();
  {
    Faults faults;
    faults.FailCurlOption(CURLOPT_URL, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(curl_easy_setopt(easy, CURLOPT_TIMEOUT, 7L), CURLE_OK);
    EXPECT_EQ(curl_easy_setopt(easy, CURLOPT_URL, "http://h/"), CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_TIMEOUT).number, 7);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://h/");
    EXPECT_FALSE(faults.HasOption(CURLOPT_PORT));
  }
  curl_easy_cleanup(easy);
}

TEST(Faults, TheClockIsTheTests) {
  Faults faults;
  faults.Clock([] { return timeval{1000, 5}; });
  struct timeval now;
  EXPECT_EQ(gettimeofday(&now, nullptr), 0);
  EXPECT_EQ(now.tv_sec, 1000);
  EXPECT_EQ(time(nullptr), 1000);
}

TEST(ForEachFailingCall, MakesEachCallFailOnceAndThenNone) {
  int failed = 0;
  int passed = 0;
  const int runs = ForEachFailingCall(Call::kClose, [&](Faults& faults) {
    const int results[] = {close(-1), close(-1), close(-1)};
    static_cast<void>(results);
    ++(faults.Struck() ? failed : passed);
  });
  EXPECT_EQ(runs, 3);
  EXPECT_EQ(failed, 3);
  EXPECT_EQ(passed, 1);
}

TEST(ForEachFailingCall, AnOperationWithoutEndFailsTheTest) {
  EXPECT_NONFATAL_FAILURE(ForEachFailingCall(Call::kClose,
                                             [](Faults& faults) {
                                               while (!faults.Struck()) close(-1);
                                             }),
                          "still more calls");
}

}  // namespace
