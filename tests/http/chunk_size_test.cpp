// The size line of a chunk.
#include "tarnwick/http/chunk_size.h"

#include <gtest/gtest.h>

#include <string>

using namespace tarnwick;

using namespace std::string_literals;

TEST(ParseChunkSize, AnExtensionIsIgnored) {
  EXPECT_EQ(ParseChunkSize("1A;ext=1"), 26u);
  EXPECT_EQ(ParseChunkSize("1A ;ext=1"), 26u);
  EXPECT_EQ(ParseChunkSize("a;"), 10u);
}

TEST(ParseChunkSize, DigitsOfEitherCaseCount) {
  EXPECT_EQ(ParseChunkSize("0123456"), 0x123456u);
  EXPECT_EQ(ParseChunkSize("789abcd"), 0x789abcdu);
  EXPECT_EQ(ParseChunkSize("EFabcDEF"), 0xefabcdefu);
}

TEST(ParseChunkSize, EveryOtherByteEndsTheNumber) {
  const std::string digits = "0123456789abcdefABCDEF";
  for (int byte = 0; byte < 256; ++byte) {
    const char c = static_cast<char>(byte);
    if (digits.find(c) != std::string::npos) continue;
    EXPECT_EQ(ParseChunkSize("2"s + c + "3"), 2u) << byte;
    EXPECT_EQ(ParseChunkSize(std::string(1, c)), 0u) << byte;
  }
}

TEST(ParseChunkSize, WithoutALeadingDigitItIsZero) {
  EXPECT_EQ(ParseChunkSize(""), 0u);
  EXPECT_EQ(ParseChunkSize(" 5"), 0u);
  EXPECT_EQ(ParseChunkSize("-5"), 0u);
  EXPECT_EQ(ParseChunkSize("+5"), 0u);
  EXPECT_EQ(ParseChunkSize(";5"), 0u);
  EXPECT_EQ(ParseChunkSize("\r"), 0u);
}

TEST(ParseChunkSize, APrefixOf0xIsZero) {
  EXPECT_EQ(ParseChunkSize("0x1f"), 0u);
  EXPECT_EQ(ParseChunkSize("0X1f"), 0u);
}

TEST(ParseChunkSize, ThirtyTwoBitsAreUnsignedAndHigherOnesAreLost) {
  EXPECT_EQ(ParseChunkSize("7fffffff"), 0x7fffffffu);
  EXPECT_EQ(ParseChunkSize("80000000"), 0x80000000u);
  EXPECT_EQ(ParseChunkSize("ffffffff"), 0xffffffffu);
  EXPECT_EQ(ParseChunkSize("100000000"), 0u);
  EXPECT_EQ(ParseChunkSize("100000001"), 1u);
  EXPECT_EQ(ParseChunkSize(std::string(30, 'f') + "12345678"), 0x12345678u);
}

TEST(ParseChunkSize, AnyNumberOfLeadingZerosIsIgnored) {
  EXPECT_EQ(ParseChunkSize(std::string(5000, '0') + "2"), 2u);
}
