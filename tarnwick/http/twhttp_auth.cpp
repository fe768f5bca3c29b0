// The Authorization lines of the client's auth.
#include "tarnwick/http/challenge_words.h"
#include "tarnwick/http/digest.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

std::string TWHttpClient::GenBasicAccessAuth() {
  const UniqueMalloc<char> encoded(Base64Encode((m_strUser + ":" + m_strPassword).c_str()));
  return "Authorization: Basic " + std::string(encoded.get());  // throws when there is no encoding
}

std::string TWHttpClient::GenDigestAccessAuth(std::string method, std::string /*body*/) {
  const ChallengeMap challenge = ParseChallenge(m_strAuthenticate);
  DIGEST_ACCESS_AUTH auth;
  auth.username = m_strUser;
  auth.realm = challenge.at("realm");
  auth.nonce = challenge.at("nonce");
  auth.uri = "/" + m_strPath;
  auth.qop = challenge.at("qop");
  auth.nc = "00000001";
  auth.cnonce = MakeClientNonce();
  auth.algorithm = challenge.at("algorithm");
  auth.opaque = challenge.at("opaque");
  auth.response = DigestResponse(auth, m_strPassword, method);
  return DigestLine(auth);
}

// Stores the credentials for the next request, as the last response's challenge asks for them.
// Results: false when it names neither scheme.
bool TWHttpClient::Authorize(const char* method) {
  if (ContainsIgnoreCase(m_strAuthenticate, "digest")) {
    m_strAuthorization = GenDigestAccessAuth(method, "");
    return true;
  }
  if (ContainsIgnoreCase(m_strAuthenticate, "basic")) {
    m_strAuthorization = GenBasicAccessAuth();
    return true;
  }
  return false;
}
