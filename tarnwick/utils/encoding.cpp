// Percent-encoding, base64, hex, decimal and time-stamp text.
#include <cctype>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>

#include "tarnwick/utils/utils.h"

namespace {

// Wider than the unreserved characters of RFC 3986: cameras take these in query values as they are.
// The one bit set for each of them, 64 characters a word.
constexpr uint64_t MarkBits(int word) {
  uint64_t bits = 0;
  for (const char c : {'_', '~', '(', ')', '*', ',', '-', '.'}) {
    if (c / 64 == word) bits |= uint64_t{1} << (c % 64);
  }
  return bits;
}
constexpr uint64_t kMarks[4] = {MarkBits(0), MarkBits(1), 0, 0};

bool IsMark(unsigned char byte) {
  return (kMarks[byte / 64] >> (byte % 64) & 1) != 0;
}

char* WriteEscape(unsigned char byte, char* out) {
  constexpr char kDigits[] = "0123456789ABCDEF";
  out[0] = '%';
  out[1] = kDigits[byte >> 4];
  out[2] = kDigits[byte & 15];
  return out + 3;
}

constexpr char kBase64[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// Encodes 3 bytes as 4 characters.
void EncodeGroup(unsigned first, unsigned second, unsigned third, char* out) {
  const unsigned bits = first << 16 | second << 8 | third;
  out[0] = kBase64[bits >> 18];
  out[1] = kBase64[bits >> 12 & 63U];
  out[2] = kBase64[bits >> 6 & 63U];
  out[3] = kBase64[bits & 63U];
}

}  // namespace

std::string UrlEncode(std::string text, std::string keep) {
  // What isalnum and isspace look up in the process's locale, without two calls a byte.
  const unsigned short* const classes = *__ctype_b_loc();
  if (text.size() > text.max_size() / 3) throw std::bad_alloc();
  std::string result(3 * text.size(), '\0');
  char* out = &result[0];
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    const unsigned classOf = classes[byte];
    if ((classOf & _ISalnum) != 0 || IsMark(byte)) {
      *out++ = c;
      continue;
    }
    // Tabs and line ends become blanks too, whatever `keep` holds: no request line may have them.
    const bool isSpace = (classOf & _ISspace) != 0;
    if (!keep.empty() && !isSpace && keep.find(c) != std::string::npos) {
      *out++ = c;
    } else {
      out = WriteEscape(isSpace ? ' ' : byte, out);
    }
  }
  result.resize(static_cast<size_t>(out - result.data()));
  return result;
}

char* Base64Encode(const char* text) {
  if (text == nullptr) return nullptr;
  const size_t length = std::strlen(text);
  char* const result = static_cast<char*>(std::malloc((length + 2) / 3 * 4 + 1));
  if (result == nullptr) return nullptr;
  const auto* in = reinterpret_cast<const unsigned char*>(text);
  char* out = result;
  for (const unsigned char* const end = in + length / 3 * 3; in != end; in += 3, out += 4) {
    EncodeGroup(in[0], in[1], in[2], out);
  }
  const size_t rest = length % 3;
  if (rest != 0) {
    EncodeGroup(in[0], in[1], 0, out);  // behind a single byte stands the text's own zero
    if (rest == 1) out[2] = '=';
    out[3] = '=';
    out += 4;
  }
  *out = '\0';
  return result;
}

std::string Md5ToHex(const unsigned char* digest) {
  constexpr char kDigits[] = "0123456789abcdef";
  if (digest == nullptr) return std::string();
  char hex[32];
  for (size_t i = 0; i < 16; ++i) {
    hex[2 * i] = kDigits[digest[i] >> 4];
    hex[2 * i + 1] = kDigits[digest[i] & 15];
  }
  return std::string(hex, sizeof(hex));
}

std::string IntToString(int64_t value) {
  return std::to_string(value);
}

std::string FormatUtcTimeStamp(int64_t microseconds) {
  const time_t seconds = static_cast<time_t>(microseconds / 1000000);
  struct tm utc = {};
  char date[64] = "";
  if (gmtime_r(&seconds, &utc) != nullptr) strftime(date, sizeof(date), "%Y%m%dT%H%M%S", &utc);
  char milliseconds[64];
  snprintf(milliseconds, sizeof(milliseconds), ".%03lldZ",
           static_cast<long long>(microseconds / 1000 % 1000));
  return std::string(date) + milliseconds;
}
