// The arithmetic of Digest authentication (RFC 2617).
#ifndef TARNWICK_TOOLS_TWCAMSIM_DIGEST_CHECK_H_
#define TARNWICK_TOOLS_TWCAMSIM_DIGEST_CHECK_H_

#include <map>
#include <string>

#include "tools/twcamsim/authenticator.h"

// A parameter of an Authorization line.
struct DigestWord {
  std::string value;
  bool quoted = false;
};

using DigestWords = std::map<std::string, DigestWord>;  // names in lower case

// Takes the text after "Digest " apart.
// Results: false when a quote is not closed or a parameter has no "=".
bool ParseDigestWords(const std::string& text, DigestWords* words);

// MD5 as 32 hexadecimal digits.
std::string Md5Hex(const std::string& text);

// What a response is computed from.
struct DigestInput {
  std::string user;
  std::string realm;
  std::string password;
  std::string method;
  std::string uri;
  std::string body;
  std::string nonce;
  std::string count;
  std::string cnonce;
  std::string qop;  // "", "auth" or "auth-int"; anything else is taken for ""
  bool session = false;
};

std::string DigestResponse(const DigestInput& input);

// Why `given` is not the right response: the one change to `input` that would make it right, as a
// clause ("computed without qop"); empty when none that is known does.
std::string ExplainDigest(const DigestInput& input, const std::string& given);

// The first parameter whose quotes are not as RFC 2617 has them; empty when all are.
std::string WrongQuotes(const DigestWords& words);

#endif  // TARNWICK_TOOLS_TWCAMSIM_DIGEST_CHECK_H_
