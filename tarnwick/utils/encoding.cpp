// Percent-encoding, base64, hex, decimal and time-stamp text.
#include <cctype>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "tarnwick/utils/utils.h"

namespace {

// Wider than the unreserved characters of RFC 3986: cameras take these in query values as they are.
constexpr char kUnescaped[] = "_~()*,-.";

bool IsUnescaped(unsigned char byte) {
  return std::isalnum(byte) != 0 || (byte != 0 && std::strchr(kUnescaped, byte) != nullptr);
}

void AppendEscape(unsigned char byte, std::string* out) {
  constexpr char kDigits[] = "0123456789ABCDEF";
  out->push_back('%');
  out->push_back(kDigits[byte >> 4]);
  out->push_back(kDigits[byte & 15]);
}

void AppendEncoded(unsigned char byte, const std::string& keep, std::string* out) {
  if (IsUnescaped(byte)) {
    out->push_back(static_cast<char>(byte));
  } else if (std::isspace(byte) != 0) {
    out->append("%20");  // tabs and line ends too: no request line may hold them
  } else if (keep.find(static_cast<char>(byte)) != std::string::npos) {
    out->push_back(static_cast<char>(byte));
  } else {
    AppendEscape(byte, out);
  }
}

constexpr char kBase64[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// Encodes 1 to 3 bytes as 4 characters.
void EncodeGroup(const unsigned char* in, size_t count, char* out) {
  const unsigned second = count > 1 ? in[1] : 0U;
  const unsigned third = count > 2 ? in[2] : 0U;
  out[0] = kBase64[in[0] >> 2];
  out[1] = kBase64[(in[0] & 3U) << 4 | second >> 4];
  out[2] = count > 1 ? kBase64[(second & 15U) << 2 | third >> 6] : '=';
  out[3] = count > 2 ? kBase64[third & 63U] : '=';
}

}  // namespace

std::string UrlEncode(std::string text, std::string keep) {
  std::string result;
  result.reserve(text.size());
  for (const char c : text) AppendEncoded(static_cast<unsigned char>(c), keep, &result);
  return result;
}

char* Base64Encode(const char* text) {
  if (text == nullptr) return nullptr;
  const size_t length = std::strlen(text);
  char* const result = static_cast<char*>(std::malloc((length + 2) / 3 * 4 + 1));
  if (result == nullptr) return nullptr;
  char* out = result;
  for (size_t done = 0; done < length; done += 3, out += 4) {
    EncodeGroup(reinterpret_cast<const unsigned char*>(text) + done, length - done, out);
  }
  *out = '\0';
  return result;
}

std::string Md5ToHex(const unsigned char* digest) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string hex;
  if (digest == nullptr) return hex;
  for (int i = 0; i < 16; ++i) {
    hex.push_back(kDigits[digest[i] >> 4]);
    hex.push_back(kDigits[digest[i] & 15]);
  }
  return hex;
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
