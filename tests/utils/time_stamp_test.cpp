// Time stamps at the ends of 32-bit seconds, on systems of both word sizes.
#include <gtest/gtest.h>

#include <cstdint>
#include <ctime>
#include <string>

#include "tarnwick/utils/utils.h"

namespace {

constexpr int64_t kSecond = 1000000;
constexpr int64_t kEnd = (int64_t{1} << 31) * kSecond;  // the first moment that does not fit

// What the system makes of a count of seconds, by the width of its own.
std::string Either(const char* of_64_bits, const char* of_32_bits) {
  return sizeof(time_t) == 8 ? of_64_bits : of_32_bits;
}

TEST(FormatUtcTimeStamp, TheLastMomentOf32BitSecondsIsRight) {
  EXPECT_EQ(FormatUtcTimeStamp(kEnd - 1), "20380119T031407.999Z");
  EXPECT_EQ(FormatUtcTimeStamp(kEnd - kSecond), "20380119T031407.000Z");
}

// The calendar is the system's: where its seconds have 32 bits, they start again in 1901.
TEST(FormatUtcTimeStamp, AfterItTheSystemsSecondsAreTaken) {
  EXPECT_EQ(FormatUtcTimeStamp(kEnd), Either("20380119T031408.000Z", "19011213T204552.000Z"));
  EXPECT_EQ(FormatUtcTimeStamp(4102444800 * kSecond),
            Either("21000101T000000.000Z", "19631125T173144.000Z"));
}

TEST(FormatUtcTimeStamp, TheFirstMomentOf32BitSecondsIsRight) {
  EXPECT_EQ(FormatUtcTimeStamp(-kEnd), "19011213T204552.000Z");
  EXPECT_EQ(FormatUtcTimeStamp(-kEnd - kSecond),
            Either("19011213T204551.000Z", "20380119T031407.000Z"));
}

TEST(FormatUtcTimeStamp, BeforeTheEpochTheMillisecondsAreNegative) {
  EXPECT_EQ(FormatUtcTimeStamp(-1), "19700101T000000.000Z");
  EXPECT_EQ(FormatUtcTimeStamp(-1000), "19700101T000000.-01Z");
  EXPECT_EQ(FormatUtcTimeStamp(-999999), "19700101T000000.-999Z");
  EXPECT_EQ(FormatUtcTimeStamp(-kSecond), "19691231T235959.000Z");
}

TEST(IntToString, PrintsMoreThan32Bits) {
  EXPECT_EQ(IntToString(int64_t{1} << 32), "4294967296");
  EXPECT_EQ(IntToString(int64_t{1} << 37), "137438953472");
  EXPECT_EQ(IntToString(INT32_MIN), "-2147483648");
}

}  // namespace
