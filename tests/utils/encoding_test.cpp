// Percent-encoding, base64, hex, decimal and time-stamp text. The expected encodings come from
// OpenSSL or from the standards' own examples.
#include <gtest/gtest.h>
#include <locale.h>
#include <openssl/evp.h>

#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/utils/utils.h"
#include "tests/support/faults.h"

namespace {

TEST(UrlEncode, KeepsTheSlashOnlyWhenAsked) {
  EXPECT_EQ(UrlEncode("x y/z", ""), "x%20y%2Fz");
  EXPECT_EQ(UrlEncode("x y/z", "/"), "x%20y/z");
}

TEST(UrlEncode, LettersDigitsAndEightMarksStay) {
  const std::string plain = "AZaz09_~()*,-.";
  EXPECT_EQ(UrlEncode(plain, ""), plain);
}

TEST(UrlEncode, AllWhiteSpaceBecomesABlanksEscapeEvenWhenItIsToBeKept) {
  EXPECT_EQ(UrlEncode(" \t\n\v\f\r", ""), "%20%20%20%20%20%20");
  EXPECT_EQ(UrlEncode(" \t\n\v\f\r", " \t\n\v\f\r"), "%20%20%20%20%20%20");
}

// Every byte on its own, by the rules in words.
std::string EscapeOf(int byte) {
  const std::string kept = "_~()*,-.";
  const bool alnum =
      (byte >= '0' && byte <= '9') || (byte >= 'A' && byte <= 'Z') || (byte >= 'a' && byte <= 'z');
  if (alnum || (byte != 0 && kept.find(static_cast<char>(byte)) != std::string::npos)) {
    return std::string(1, static_cast<char>(byte));
  }
  if (byte == ' ' || (byte >= 9 && byte <= 13)) return "%20";
  const char* digits = "0123456789ABCDEF";
  return std::string("%") + digits[byte / 16] + digits[byte % 16];
}

TEST(UrlEncode, EveryByteFollowsTheRules) {
  for (int byte = 0; byte < 256; ++byte) {
    EXPECT_EQ(UrlEncode(std::string(1, static_cast<char>(byte)), ""), EscapeOf(byte)) << byte;
  }
}

TEST(UrlEncode, EveryByteMayBeKeptButWhiteSpace) {
  for (int byte = 0; byte < 256; ++byte) {
    const std::string text(1, static_cast<char>(byte));
    EXPECT_EQ(UrlEncode(text, text), EscapeOf(byte) == "%20" ? "%20" : text) << byte;
  }
}

TEST(UrlEncode, TheKeepSetOfTheHttpClientLeavesAQueryReadable) {
  EXPECT_EQ(UrlEncode("cgi/x.cgi?a=1&b=%2&c=\"", "/?=&"), "cgi/x.cgi?a=1&b=%252&c=%22");
}

TEST(UrlEncode, AnEmptyStringIsEmpty) {
  EXPECT_EQ(UrlEncode("", "/"), "");
}

std::string Base64(const std::string& text) {
  char* encoded = Base64Encode(text.c_str());
  const std::string result = encoded == nullptr ? "null" : encoded;
  free(encoded);
  return result;
}

TEST(Base64Encode, AnEmptyStringReturnsAnAllocatedEmptyString) {
  char* encoded = Base64Encode("");
  ASSERT_NE(encoded, nullptr);
  EXPECT_STREQ(encoded, "");
  free(encoded);
}

// OpenSSL takes a length of an int, so that the text goes to it in pieces.
TEST(Base64Encode, ATextOfMoreThan768MebibytesIsEncodedToItsEnd) {
  if (sizeof(size_t) < 8) GTEST_SKIP() << "no room for it in 32 bits of addresses";
  constexpr size_t kWhole = (size_t{3} << 28) / 3 * 4;
  const std::string text = std::string(size_t{3} << 28, 'a') + "bcd";
  char* const encoded = Base64Encode(text.c_str());
  ASSERT_NE(encoded, nullptr);
  EXPECT_EQ(strlen(encoded), kWhole + 4);
  EXPECT_STREQ(encoded + kWhole - 4, "YWFhYmNk");
  free(encoded);
}

TEST(Base64Encode, ReturnsTheStandardsExamples) {
  EXPECT_EQ(Base64("f"), "Zg==");
  EXPECT_EQ(Base64("fo"), "Zm8=");
  EXPECT_EQ(Base64("foo"), "Zm9v");
  EXPECT_EQ(Base64("foob"), "Zm9vYg==");
  EXPECT_EQ(Base64("fooba"), "Zm9vYmE=");
  EXPECT_EQ(Base64("foobar"), "Zm9vYmFy");
  EXPECT_EQ(Base64("Aladdin:open sesame"), "QWxhZGRpbjpvcGVuIHNlc2FtZQ==");
}

std::string OpensslBase64(const std::string& text) {
  std::vector<unsigned char> encoded((text.size() + 2) / 3 * 4 + 1);
  EVP_EncodeBlock(encoded.data(), reinterpret_cast<const unsigned char*>(text.data()),
                  static_cast<int>(text.size()));
  return reinterpret_cast<const char*>(encoded.data());
}

TEST(Base64Encode, AgreesWithOpensslForEveryByteAndLength) {
  std::string bytes;
  for (int byte = 1; byte < 256; ++byte) bytes.push_back(static_cast<char>(byte));
  for (size_t start = 0; start < 3; ++start) {
    EXPECT_EQ(Base64(bytes.substr(start)), OpensslBase64(bytes.substr(start)));
  }
  for (size_t length = 0; length < 200; ++length) {
    const std::string text = bytes.substr(bytes.size() - length);
    EXPECT_EQ(Base64(text), OpensslBase64(text)) << length;
  }
}

TEST(Base64Encode, ALongTextHasNoLineFeeds) {
  EXPECT_EQ(Base64(std::string(3000, '\xff')), std::string(4000, '/'));
}

TEST(Base64Encode, WithoutMemoryOrTextReturnsNull) {
  EXPECT_EQ(ForEachFailingCall(Call::kMalloc,
                               [](Faults& faults) {
                                 char* encoded = Base64Encode("text");
                                 EXPECT_EQ(encoded == nullptr, faults.Struck());
                                 free(encoded);
                               }),
            1);
  EXPECT_EQ(Base64Encode(nullptr), nullptr);
}

TEST(Md5ToHex, PrintsTheBytesInOrderInLowerCase) {
  const unsigned char digest[16] = {0x00, 0x01, 0x0f, 0x10, 0x7f, 0x80, 0xab, 0xcd,
                                    0xef, 0xff, 0x12, 0x34, 0x56, 0x78, 0x9a, 0xbc};
  EXPECT_EQ(Md5ToHex(digest), "00010f107f80abcdefff123456789abc");
}

TEST(Md5ToHex, PrintsTheDigestOfTheStandardsExample) {
  unsigned char digest[EVP_MAX_MD_SIZE];
  ASSERT_EQ(EVP_Digest("abc", 3, digest, nullptr, EVP_md5(), nullptr), 1);
  EXPECT_EQ(Md5ToHex(digest), "900150983cd24fb0d6963f7d28e17f72");
}

TEST(Md5ToHex, NoDigestReturnsAnEmptyString) {
  EXPECT_EQ(Md5ToHex(nullptr), "");
}

TEST(IntToString, PrintsDecimalNumbersWithTheirSign) {
  EXPECT_EQ(IntToString(0), "0");
  EXPECT_EQ(IntToString(-1), "-1");
  EXPECT_EQ(IntToString(1234567), "1234567");
  EXPECT_EQ(IntToString(INT64_MAX), "9223372036854775807");
  EXPECT_EQ(IntToString(INT64_MIN), "-9223372036854775808");
}

TEST(FormatUtcTimeStamp, ZeroIsTheEpoch) {
  EXPECT_EQ(FormatUtcTimeStamp(0), "19700101T000000.000Z");
}

TEST(FormatUtcTimeStamp, PrintsDateTimeAndMilliseconds) {
  EXPECT_EQ(FormatUtcTimeStamp(1709647389417000), "20240305T140309.417Z");
  EXPECT_EQ(FormatUtcTimeStamp(1709647389417999), "20240305T140309.417Z");
  EXPECT_EQ(FormatUtcTimeStamp(1709647389007000), "20240305T140309.007Z");
  EXPECT_EQ(FormatUtcTimeStamp(951782399999999), "20000228T235959.999Z");
  EXPECT_EQ(FormatUtcTimeStamp(951782400000000), "20000229T000000.000Z");
}

TEST(FormatUtcTimeStamp, DoesNotFollowTheLocalTime) {
  setenv("TZ", "XXX-5:30", 1);
  tzset();
  EXPECT_EQ(FormatUtcTimeStamp(1709647389417000), "20240305T140309.417Z");
  setenv("TZ", "UTC", 1);
  tzset();
}

// The remainder of a negative count keeps its sign, as the arithmetic says.
TEST(FormatUtcTimeStamp, CountsBeforeTheEpochAreCutTowardsIt) {
  EXPECT_EQ(FormatUtcTimeStamp(-1000000), "19691231T235959.000Z");
  EXPECT_EQ(FormatUtcTimeStamp(-1500000), "19691231T235959.-500Z");
}

TEST(FormatUtcTimeStamp, ACountBeyondEveryCalendarDoesNotCrash) {
  EXPECT_NE(FormatUtcTimeStamp(INT64_MAX), "");
  EXPECT_NE(FormatUtcTimeStamp(INT64_MIN), "");
}

TEST(FormatUtcTimeStamp, WithoutACalendarDateTheMillisecondsRemain) {
  Faults faults;
  faults.FailNth(Call::kGmtimeR, 1);
  EXPECT_EQ(FormatUtcTimeStamp(1709647389417000), ".417Z");
}

TEST(TextHelpers, AreSafeFromSeveralThreads) {
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int round = 0; round < 200; ++round) {
        EXPECT_EQ(UrlEncode("a b/c", ""), "a%20b%2Fc");
        EXPECT_EQ(Base64("foobar"), "Zm9vYmFy");
        EXPECT_EQ(FormatUtcTimeStamp(1709647389417000), "20240305T140309.417Z");
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
