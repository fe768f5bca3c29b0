// The digests of RFC 2617 as the library computes them, written down a second time: what the tests
// compare its Authorization lines with.
#ifndef TARNWICK_TESTS_MODEL_DIGEST_H_
#define TARNWICK_TESTS_MODEL_DIGEST_H_

#include <openssl/md5.h>

#include <string>

inline std::string HexOf(const unsigned char (&digest)[MD5_DIGEST_LENGTH]) {
  static const char digits[] = "0123456789abcdef";
  std::string hex;
  for (const unsigned char byte : digest) {
    hex += digits[byte >> 4];
    hex += digits[byte & 15];
  }
  return hex;
}

// OpenSSL 3 marks these functions as deprecated; no others take more bytes after the digest is made.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

inline std::string Md5(const std::string& text) {
  unsigned char digest[MD5_DIGEST_LENGTH];
  MD5(reinterpret_cast<const unsigned char*>(text.data()), text.size(), digest);
  return HexOf(digest);
}

// The chain of qop "auth-int": a finished context is fed its own digest and finished again.
inline std::string AuthIntHa2(const std::string& method, const std::string& uri) {
  const std::string start = method + ":" + uri;
  MD5_CTX context;
  unsigned char digest[MD5_DIGEST_LENGTH];
  MD5_Init(&context);
  MD5_Update(&context, start.data(), start.size());
  MD5_Final(digest, &context);
  const std::string more = ":" + HexOf(digest);
  MD5_Update(&context, more.data(), more.size());
  MD5_Final(digest, &context);
  return HexOf(digest);
}

#pragma GCC diagnostic pop

#endif  // TARNWICK_TESTS_MODEL_DIGEST_H_
