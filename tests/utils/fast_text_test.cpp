// UrlEncode, Base64Encode and RemoveChar beside plain ones, on random text.
#include <gtest/gtest.h>

#include <cctype>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <random>

#include "tarnwick/utils/utils.h"

namespace {

std::string PlainUrlEncode(const std::string& text, const std::string& keep) {
  std::string result;
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    char escape[4];
    snprintf(escape, sizeof(escape), "%%%02X", byte);
    const bool mark = c != '\0' && strchr("_~()*,-.", c) != nullptr;
    if (isalnum(byte) != 0 || mark) {
      result += c;
    } else if (isspace(byte) != 0) {
      result += "%20";
    } else {
      result += keep.find(c) != std::string::npos ? std::string(1, c) : escape;
    }
  }
  return result;
}

std::string PlainBase64(const std::string& text) {
  static constexpr char kDigits[] =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string result;
  for (size_t bit = 0; bit < 8 * text.size(); bit += 6) {
    unsigned value = 0;
    for (size_t at = bit; at < bit + 6; ++at) {
      const auto byte = at / 8 < text.size() ? static_cast<unsigned char>(text[at / 8]) : 0U;
      value = value * 2 + (byte >> (7 - at % 8) & 1U);
    }
    result += kDigits[value];
  }
  while (result.size() % 4 != 0) result += '=';
  return result;
}

std::string PlainWithout(const std::string& text, char ch) {
  std::string result;
  for (const char c : text) {
    if (c != ch) result += c;
  }
  return result;
}

// Any bytes, or those that are special here more often.
std::string RandomText(std::mt19937* random, size_t size) {
  static constexpr char kSpecial[] = " \t\r\n_~()*,-./?&=%aZ0\x80\xe4";
  std::string text;
  const bool any = (*random)() % 2 == 0;
  while (text.size() < size) {
    text += any ? static_cast<char>((*random)() % 256) : kSpecial[(*random)() % sizeof(kSpecial)];
  }
  return text;
}

TEST(FastText, IsWhatThePlainWayReturns) {
  std::mt19937 random(1);
  for (size_t round = 0; round < 2000; ++round) {
    const std::string text = RandomText(&random, round % 100);
    const std::string keep = RandomText(&random, random() % 4);
    ASSERT_EQ(UrlEncode(text, keep), PlainUrlEncode(text, keep));
    const std::string c = text.c_str();
    char* const encoded = Base64Encode(c.c_str());
    ASSERT_EQ(std::string(encoded), PlainBase64(c));
    free(encoded);
    for (const char ch : {'\r', '\n', 'a', '\0'}) {
      std::string without = text;
      RemoveChar(without, ch);
      ASSERT_EQ(without, PlainWithout(text, ch));
    }
  }
}

TEST(FastText, EveryByteIsEncodedAsTheProcesssLocaleClassesIt) {
  for (const char* locale : {"C", "C.UTF-8", "POSIX"}) {
    ASSERT_NE(setlocale(LC_CTYPE, locale), nullptr);
    for (int byte = 0; byte < 256; ++byte) {
      const std::string text(1, static_cast<char>(byte));
      EXPECT_EQ(UrlEncode(text, ""), PlainUrlEncode(text, "")) << byte;
      EXPECT_EQ(UrlEncode(text, text), PlainUrlEncode(text, text)) << byte;
    }
  }
  setlocale(LC_CTYPE, "C");
}

TEST(FastText, RemovesFromTextsOfLinesOfAnyLength) {
  std::string lines, joined;
  for (size_t length = 0; length < 400; ++length) {
    lines += std::string(length, 'x') + "\r\n";
    joined += std::string(length, 'x');
  }
  RemoveChar(lines, '\r');
  RemoveChar(lines, '\n');
  EXPECT_EQ(lines, joined);
  RemoveChar(lines, 'x');
  EXPECT_EQ(lines, "");
}

}  // namespace
