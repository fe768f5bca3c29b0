// The Authorization lines of the client's login.
#include "tarnwick/http/digest.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

std::string TWHttpClient::GenBasicAccessAuth() {
  const OwnedMemory<char> encoded(Base64Encode((m_strUser + ":" + m_strPassword).c_str()));
  return "Authorization: Basic " + std::string(encoded.get());  // throws when there is no encoding
}

std::string TWHttpClient::GenDigestAccessAuth(std::string method, std::string /*body*/) {
  const ChallengeMap challenge = ParseChallenge(m_strAuthenticate);
  DIGEST_ACCESS_AUTH login;
  login.username = m_strUser;
  login.realm = challenge.at("realm");
  login.nonce = challenge.at("nonce");
  login.uri = "/" + m_strPath;
  login.qop = challenge.at("qop");
  login.nc = "00000001";
  login.cnonce = MakeClientNonce();
  login.algorithm = challenge.at("algorithm");
  login.opaque = challenge.at("opaque");
  login.response = DigestResponse(login, m_strPassword, method);
  return DigestLine(login);
}
