// The Digest credentials of RFC 2617, section 3; docs/deliberate.md has what differs. Pure
// functions.
#ifndef TARNWICK_HTTP_DIGEST_H_
#define TARNWICK_HTTP_DIGEST_H_

#include <map>
#include <string>

namespace tarnwick {

// The values of one Digest Authorization header field.
struct DIGEST_ACCESS_AUTH {
  std::string username;
  std::string realm;
  std::string nonce;
  std::string uri;
  std::string response;
  std::string qop;
  std::string nc;
  std::string cnonce;
  std::string algorithm;
  std::string opaque;
};

using ChallengeMap = std::map<std::string, std::string>;

// The parameters realm, domain, opaque, nonce, stale, algorithm and qop of a challenge; those that
// it does not have are empty.
ChallengeMap ParseChallenge(const std::string& challenge);

// 16 random bytes in hex, from the process id and the time.
std::string MakeClientNonce();

// The request digest. REQUIRES: every field of `auth` but the response is filled.
std::string DigestResponse(const DIGEST_ACCESS_AUTH& auth, const std::string& password,
                           const std::string& method);

// The header line, without its CRLF.
std::string DigestLine(const DIGEST_ACCESS_AUTH& auth);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_DIGEST_H_
