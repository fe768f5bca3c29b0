// The length of a character of UTF-8 (RFC 3629, section 4).
#include "tarnwick/utils/utf8.h"

#include <gtest/gtest.h>

#include <string>

namespace {

using tarnwick::Utf8CharacterLength;

struct Sequence {
  std::string bytes;
  size_t length;  // 0: no character
};

TEST(Utf8CharacterLength, IsThatOfTheFirstCharacter) {
  EXPECT_EQ(Utf8CharacterLength(""), 0u);
  EXPECT_EQ(Utf8CharacterLength("ab"), 1u);
  EXPECT_EQ(Utf8CharacterLength("\xC3\xA4z"), 2u);
}

TEST(Utf8CharacterLength, OfEachLeadByteTheSecondByteHasItsBounds) {
  const Sequence sequences[] = {
      {"\xC2\x7F", 0},         {"\xC2\x80", 2},         {"\xDF\xBF", 2},
      {"\xDF\xC0", 0},         {"\xE0\x9F\x80", 0},     {"\xE0\xA0\x80", 3},
      {"\xE1\x7F\x80", 0},     {"\xE1\x80\x80", 3},     {"\xEC\xBF\x80", 3},
      {"\xEC\xC0\x80", 0},     {"\xED\x80\x80", 3},     {"\xED\x9F\x80", 3},
      {"\xED\xA0\x80", 0},     {"\xEE\x80\x80", 3},     {"\xEF\xBF\x80", 3},
      {"\xEF\xC0\x80", 0},     {"\xF0\x8F\x80\x80", 0}, {"\xF0\x90\x80\x80", 4},
      {"\xF1\x7F\x80\x80", 0}, {"\xF1\x80\x80\x80", 4}, {"\xF3\xBF\x80\x80", 4},
      {"\xF3\xC0\x80\x80", 0}, {"\xF4\x8F\x80\x80", 4}, {"\xF4\x90\x80\x80", 0},
  };
  for (const Sequence& sequence : sequences) {
    EXPECT_EQ(Utf8CharacterLength(sequence.bytes), sequence.length)
        << ::testing::PrintToString(sequence.bytes);
  }
}

TEST(Utf8CharacterLength, OtherLeadBytesBeginNone) {
  for (const char* bytes : {"\x80\x80", "\xC0\x80", "\xC1\x80", "\xF5\x80\x80\x80", "\xFF\x80"}) {
    EXPECT_EQ(Utf8CharacterLength(bytes), 0u) << ::testing::PrintToString(bytes);
  }
}

}  // namespace
