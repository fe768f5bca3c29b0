// Percent-encoding, base64 and hex.
#include <openssl/evp.h>

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <new>

#include "tarnwick/utils/utils.h"

namespace {

// What a byte goes out as.
struct Encoded {
  char text[3];
  uint8_t length;  // 1 or 3; 0 where the locale decides
};

constexpr char kUpperDigits[] = "0123456789ABCDEF";

constexpr Encoded Plain(char c) {
  return {{c, 0, 0}, 1};
}

constexpr Encoded Escape(unsigned char byte) {
  return {{'%', kUpperDigits[byte >> 4], kUpperDigits[byte & 15]}, 3};
}

// In every locale: letters, digits and more marks than the unreserved ones of RFC 3986, 2.3. Tabs
// and CR and LF go out as blanks. Both kept as they are: callers may depend on them; pinned by the
// tests of UrlEncode. Beyond ASCII the locale has letters.
struct EscapeTable {
  constexpr EscapeTable() {
    for (int c = 0; c < 256; ++c) of[c] = Escape(static_cast<unsigned char>(c));
    for (int c = '0'; c <= 'z'; ++c) {
      if (c <= '9' || (c >= 'A' && c <= 'Z') || c >= 'a') of[c] = Plain(static_cast<char>(c));
    }
    for (const char c : {'_', '~', '(', ')', '*', ',', '-', '.'}) {
      of[static_cast<unsigned char>(c)] = Plain(c);
    }
    for (int c = '\t'; c <= '\r'; ++c) of[c] = Escape(' ');
    for (int c = 128; c < 256; ++c) of[c].length = 0;
  }
  Encoded of[256] = {};
};

constexpr EscapeTable kUsual;

Encoded EncodeByLocale(unsigned char byte) {
  if (isalnum(byte) != 0) return Plain(static_cast<char>(byte));
  return Escape(isspace(byte) != 0 ? ' ' : byte);
}

// Fills `own` with `usual`, and with what `keep` holds but for blanks and their like.
void AddKept(const std::string& keep, const Encoded (&usual)[256], Encoded (*own)[256]) {
  std::copy(std::begin(usual), std::end(usual), *own);
  for (const char c : keep) {
    const auto byte = static_cast<unsigned char>(c);
    if (isspace(byte) == 0) (*own)[byte] = Plain(c);
  }
}

// OpenSSL counts in int. Only the last piece may end in the middle of a group of three bytes.
constexpr size_t kBase64Piece = size_t{3} << 28;

}  // namespace

// A table in place of a branch per byte.
std::string UrlEncode(std::string text, std::string keep) {
  Encoded own[256];
  if (!keep.empty()) AddKept(keep, kUsual.of, &own);
  const Encoded* const encoded = keep.empty() ? kUsual.of : own;
  if (text.size() > text.max_size() / 3 - 1) throw std::bad_alloc();
  // A byte more than three for each, because the lengths are copied along.
  std::string result(3 * text.size() + 1, '\0');
  char* out = &result[0];
  Encoded inLocale;
  for (const char c : text) {
    const Encoded* code = &encoded[static_cast<unsigned char>(c)];
    if (code->length == 0) {
      inLocale = EncodeByLocale(static_cast<unsigned char>(c));
      code = &inLocale;
    }
    std::memcpy(out, code, sizeof(*code));
    out += code->length;
  }
  result.resize(static_cast<size_t>(out - result.data()));
  return result;
}

char* Base64Encode(const char* text) {
  if (text == nullptr) return nullptr;
  const size_t length = std::strlen(text);
  auto* const result = static_cast<unsigned char*>(std::malloc((length + 2) / 3 * 4 + 1));
  if (result == nullptr) return nullptr;
  const auto* in = reinterpret_cast<const unsigned char*>(text);
  unsigned char* out = result;
  size_t left = length;
  do {
    const size_t piece = std::min(left, kBase64Piece);
    out += EVP_EncodeBlock(out, in, static_cast<int>(piece));
    in += piece;
    left -= piece;
  } while (left > 0);
  return reinterpret_cast<char*>(result);
}

std::string Md5ToHex(const unsigned char* digest) {
  static constexpr char kDigits[] = "0123456789abcdef";
  if (digest == nullptr) return std::string();
  char hex[32];
  for (size_t i = 0; i < 16; ++i) {
    hex[2 * i] = kDigits[digest[i] >> 4];
    hex[2 * i + 1] = kDigits[digest[i] & 15];
  }
  return std::string(hex, sizeof(hex));
}
