// The encodings and text helpers. Line 1: the characters to keep, to trim and (its first) to
// remove; the rest is the text. A text that is a number is a count of microseconds as well.
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

#include "fuzz/oracle/encoding.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "tarnwick/http/query_encoding.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

constexpr size_t kDigest = 16;
constexpr int64_t kYear10000 = 253402300800;

std::string UpToZero(const std::string& text) {
  return text.c_str();
}

void CheckUrlEncoding(const std::string& text, const std::string& keep) {
  const std::string encoded = UrlEncode(text, keep);
  ExpectSame("UrlEncode", encoded, oracle::UrlEncoded(text, keep));
  const bool ambiguous = keep.find('%') != std::string::npos;
  if (ambiguous) return;
  ExpectSame("UrlEncode and back", oracle::UrlDecoded(encoded), oracle::WithBlanks(text));
}

void CheckQueryEncoding(const std::string& text, const std::string& keep) {
  ExpectSame("EncodeQueryValues", EncodeQueryValues(text, keep), oracle::QueryEncoded(text, keep));
}

void CheckBase64(const std::string& text) {
  const UniqueMalloc<char> encoded(Base64Encode(text.c_str()));
  Expect("Base64Encode has memory", encoded != nullptr);
  ExpectSame("Base64Encode", encoded.get(), oracle::Base64(UpToZero(text)));
  ExpectSame("Base64Encode and back", oracle::Base64Decoded(encoded.get()), UpToZero(text));
}

void CheckHex(std::string text) {
  text.resize(kDigest, '\x7f');
  const std::string hex = Md5ToHex(reinterpret_cast<const unsigned char*>(text.data()));
  ExpectSame("Md5ToHex", hex, oracle::Hex(text));
  ExpectSame("Md5ToHex and back", oracle::HexDecoded(hex), text);
}

void CheckHelpers(const std::string& text, const std::string& set) {
  ExpectSame("TrimString", TrimString(text, set.c_str()), oracle::Trimmed(text, UpToZero(set)));
  const char ch = set.empty() ? '\n' : set[0];
  std::string without = text;
  RemoveChar(without, ch);
  ExpectSame("RemoveChar", without, oracle::Without(text, ch));
}

// The buffer is as long as the set, so that the text is now longer and now shorter.
void CheckCopy(const std::string& text, const std::string& set) {
  const auto buffer = std::make_unique<char[]>(set.size());  // the sanitizer sees its end
  std::memset(buffer.get(), '#', set.size());
  Expect("StrNCopy returns its buffer",
         StrNCopy(buffer.get(), text.c_str(), set.size()) == buffer.get());
  ExpectSame("StrNCopy", std::string_view(buffer.get(), set.size()),
             oracle::CopiedIntoBuffer(UpToZero(text), set.size(), '#'));
}

void CheckNumber(int64_t number) {
  ExpectSame("IntToString", IntToString(number), oracle::Decimal(number));
  const std::string stamp = FormatUtcTimeStamp(number);
  if (number < 0 || number / 1000000 >= kYear10000) return;
  ExpectSame("FormatUtcTimeStamp", stamp, oracle::TimeStamp(number));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  const std::string set(TakeLine(&input));
  const std::string text(input);
  CheckUrlEncoding(text, set);
  CheckQueryEncoding(text, set);
  CheckBase64(text);
  CheckHex(text);
  CheckHelpers(text, set);
  CheckCopy(text, set);
  CheckNumber(std::strtoll(text.c_str(), nullptr, 10));
  return 0;
}
