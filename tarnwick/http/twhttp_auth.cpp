// The Authorization lines of the client's login.
#include "tarnwick/http/digest.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/platform/owned.h"
#include "tarnwick/utils/utils.h"

std::string TWHttpClient::GenBasicAccessAuth() {
  const OwnedMemory<char> encoded(Base64Encode((m_strUser + ":" + m_strPassword).c_str()));
  return "Authorization: Basic " + std::string(encoded.get());  // throws when there is no encoding
}

std::string TWHttpClient::GenDigestAccessAuth(std::string method, std::string /*body*/) {
  ChallengeMap challenge = ParseChallenge(m_strAuthenticate);
  DIGEST_ACCESS_AUTH login;
  login.username = m_strUser;
  login.realm = challenge["realm"];
  login.nonce = challenge["nonce"];
  login.uri = "/" + m_strPath;
  login.qop = challenge["qop"];
  login.nc = "00000001";
  login.cnonce = MakeClientNonce();
  login.algorithm = challenge["algorithm"];
  login.opaque = challenge["opaque"];
  login.response = DigestResponse(login, m_strPassword, method);
  return DigestLine(login);
}
