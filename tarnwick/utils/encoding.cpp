// Percent-encoding, base64 and hex.
#include <openssl/evp.h>

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

#include "tarnwick/utils/utils.h"

namespace {

// Wider than the unreserved characters of RFC 3986: cameras take these in query values as they are.
// They are marked with the class of letters and digits, so that one test lets both through.
struct Marks {
  constexpr Marks() {
    for (const char c : {'_', '~', '(', ')', '*', ',', '-', '.'}) {
      classOf[static_cast<unsigned char>(c)] = _ISalnum;
    }
  }
  unsigned short classOf[256] = {};
};
constexpr Marks kMarks;

char* WriteEscape(unsigned char byte, char* out) {
  static constexpr char kDigits[] = "0123456789ABCDEF";  // or it is built for each byte anew
  out[0] = '%';
  out[1] = kDigits[byte >> 4];
  out[2] = kDigits[byte & 15];
  return out + 3;
}

// OpenSSL counts in int. Only the last piece may end in the middle of a group of three bytes.
constexpr size_t kBase64Piece = size_t{3} << 28;

}  // namespace

std::string UrlEncode(std::string text, std::string keep) {
  // What isalnum and isspace look up in the process's locale, without two calls a byte.
  const unsigned short* const classes = *__ctype_b_loc();
  if (text.size() > text.max_size() / 3) throw std::bad_alloc();
  std::string result(3 * text.size(), '\0');
  char* out = &result[0];
  for (const char c : text) {
    // Stored before it is known to stay: nearly all bytes do, and the loop has one way for them.
    const auto byte = static_cast<unsigned char>(c);
    *out = c;
    const unsigned classOf = classes[byte] | kMarks.classOf[byte];
    if ((classOf & _ISalnum) != 0) {
      ++out;
      continue;
    }
    const bool isSpace = (classOf & _ISspace) != 0;
    if (!keep.empty() && !isSpace && keep.find(c) != std::string::npos) {
      ++out;
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
