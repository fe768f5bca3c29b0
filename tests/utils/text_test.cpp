// Removing, trimming and copying characters.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "tarnwick/utils/utils.h"

namespace {

TEST(TrimString, ATextOfSetCharactersAloneIsEmptyAndANullSetChangesNothing) {
  EXPECT_EQ(TrimString("    ", " "), "");
  EXPECT_EQ(TrimString("  x  ", nullptr), "  x  ");
}

TEST(TrimString, TakesTheSetsCharactersFromBothEndsOnly) {
  EXPECT_EQ(TrimString("  a b  ", " "), "a b");
  EXPECT_EQ(TrimString("\"'a\"b'\"", "'\""), "a\"b");
  EXPECT_EQ(TrimString("a  ", " "), "a");
  EXPECT_EQ(TrimString("  a", " "), "a");
  EXPECT_EQ(TrimString("a", " "), "a");
}

TEST(TrimString, AnEmptyStringOrSetReturnsTheText) {
  EXPECT_EQ(TrimString("", " "), "");
  EXPECT_EQ(TrimString(" a ", ""), " a ");
  EXPECT_EQ(TrimString("", nullptr), "");
}

TEST(TrimString, AZeroByteInTheTextIsACharacter) {
  EXPECT_EQ(TrimString(std::string(" \0 ", 3), " "), std::string("\0", 1));
}

// The buffer is larger than the size that is passed, so that a write after it would show.
class StrNCopyBuffer : public ::testing::Test {
 protected:
  StrNCopyBuffer() { memset(buf_, '#', sizeof(buf_)); }
  std::string Bytes(size_t count) const { return std::string(buf_, count); }

  char buf_[16];
};

TEST_F(StrNCopyBuffer, Size1StoresTheZeroByteAlone) {
  EXPECT_EQ(StrNCopy(buf_, "text", 1), buf_);
  EXPECT_EQ(Bytes(2), std::string("\0#", 2));
}

TEST_F(StrNCopyBuffer, AShortTextIsPaddedWithZeroBytes) {
  EXPECT_EQ(StrNCopy(buf_, "abc", 8), buf_);
  EXPECT_EQ(Bytes(9), std::string("abc\0\0\0\0\0#", 9));
}

TEST_F(StrNCopyBuffer, ALongTextIsCutAndEnded) {
  StrNCopy(buf_, "abcdefgh", 4);
  EXPECT_EQ(Bytes(5), std::string("abc\0#", 5));
}

TEST_F(StrNCopyBuffer, ATextThatJustFitsIsWhole) {
  StrNCopy(buf_, "abc", 4);
  EXPECT_EQ(Bytes(5), std::string("abc\0#", 5));
}

TEST_F(StrNCopyBuffer, Size0DoesNothing) {
  EXPECT_EQ(StrNCopy(buf_, "abc", 0), buf_);
  EXPECT_EQ(Bytes(2), "##");
}

TEST_F(StrNCopyBuffer, NullPointersAreRefused) {
  EXPECT_EQ(StrNCopy(buf_, nullptr, 4), buf_);
  EXPECT_EQ(Bytes(4), "####");
  EXPECT_EQ(StrNCopy(nullptr, "abc", 4), nullptr);
}

std::string Removed(std::string text, char ch) {
  RemoveChar(text, ch);
  return text;
}

TEST(RemoveChar, ATextWithoutTheCharacterStays) {
  EXPECT_EQ(Removed("abc", 'x'), "abc");
  EXPECT_EQ(Removed("", 'x'), "");
}

TEST(RemoveChar, ErasesEveryOccurrence) {
  EXPECT_EQ(Removed("\ra\r\rb\r", '\r'), "ab");
  EXPECT_EQ(Removed("xxxx", 'x'), "");
  EXPECT_EQ(Removed("axb", 'x'), "ab");
}

TEST(RemoveChar, TheZeroByteIsACharacterToo) {
  EXPECT_EQ(Removed(std::string("a\0b\0", 4), '\0'), "ab");
}

}  // namespace
