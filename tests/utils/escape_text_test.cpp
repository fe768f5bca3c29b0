// Text of somebody else for one line of a log.
#include "tarnwick/utils/escape_text.h"

#include <gtest/gtest.h>

#include <cstdio>
#include <set>
#include <string>

namespace {

using tarnwick::EscapeText;

std::string Hex(const std::string& bytes) {
  std::string text;
  for (const char byte : bytes) {
    char escaped[8];
    snprintf(escaped, sizeof(escaped), "\\x%02X", static_cast<unsigned char>(byte));
    text += escaped;
  }
  return text;
}

// A character of 1 to 3 bytes.
std::string Utf8(unsigned c) {
  const auto byte = [](unsigned value) { return static_cast<char>(value); };
  if (c < 0x80) return {byte(c)};
  if (c < 0x800) return {byte(0xC0 | c >> 6), byte(0x80 | (c & 0x3F))};
  return {byte(0xE0 | c >> 12), byte(0x80 | (c >> 6 & 0x3F)), byte(0x80 | (c & 0x3F))};
}

bool MustBeEscaped(unsigned c) {
  return c < 0x20 || (c >= 0x7F && c <= 0x9F) || c == 0x061C || c == 0x200E || c == 0x200F ||
         (c >= 0x2028 && c <= 0x202E) || (c >= 0x2066 && c <= 0x2069);
}

TEST(EscapeText, EveryCharacterOfTheFirst65535IsShownOrEscaped) {
  for (unsigned c = 0; c < 0x10000; ++c) {
    if (c >= 0xD800 && c <= 0xDFFF) continue;  // surrogates
    const std::string character = Utf8(c);
    const std::string expected = MustBeEscaped(c) ? Hex(character) : c == '\\' ? "\\\\" : character;
    ASSERT_EQ(EscapeText(character), expected) << c;
  }
}

TEST(EscapeText, FourBytesAreAsTheyAre) {
  EXPECT_EQ(EscapeText("\xF0\x9F\x93\xB7 gate"), "\xF0\x9F\x93\xB7 gate");
}

TEST(EscapeText, EveryByteThatIsNoUtf8IsEscaped) {
  for (const char* bytes : {"\x80", "\xBF", "\xC0\xAF", "\xC1\xBF", "\xE0\x80\xAF", "\xED\xA0\x80",
                            "\xF4\x90\x80\x80", "\xF5\x80\x80\x80", "\xFE", "\xFF"}) {
    EXPECT_EQ(EscapeText(bytes), Hex(bytes));
  }
}

TEST(EscapeText, ACutCharacterDoesNotTakeWhatFollows) {
  EXPECT_EQ(EscapeText("\xE2\x80"), "\\xE2\\x80");
  EXPECT_EQ(EscapeText("\xE2\x82"
                       "a"),
            "\\xE2\\x82"
            "a");
  EXPECT_EQ(EscapeText("\xC3\n"), "\\xC3\\x0A");
}

TEST(EscapeText, NoTwoStringsBecomeTheSame) {
  std::set<std::string> escaped;
  const std::string pieces[] = {"\n", "\\", "\\n", "x", "0A", "\\x0A", "\\\\", "\xC2"};
  std::set<std::string> texts;
  for (const std::string& a : pieces) {
    for (const std::string& b : pieces) texts.insert(a + b);
  }
  for (const std::string& text : texts) EXPECT_TRUE(escaped.insert(EscapeText(text)).second);
}

TEST(EscapeText, AZeroByteIsEscapedAndNoEnd) {
  EXPECT_EQ(EscapeText(std::string("a\0b", 3)),
            "a\\x00"
            "b");
}

}  // namespace
