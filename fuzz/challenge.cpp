// A challenge and the credentials for it. The lines are user, password, path, method and time;
// whatever follows is the challenge:
//
//   admin
//   secret
//   cgi/a.cgi
//   GET
//   1700000000
//    Digest realm="r", nonce="n", qop="auth"
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "fuzz/oracle/shared/model_credentials.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "tarnwick/http/challenge_words.h"
#include "tarnwick/http/twhttp.h"

using namespace tarnwick;

namespace {

class Client : public TWHttpClient {
 public:
  Client(const ModelCredentials& credentials, const std::string& challenge) {
    m_strUser = credentials.user;
    m_strPassword = credentials.password;
    m_strPath = credentials.path;
    m_strAuthenticate = challenge;
  }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  LogEverything();
  std::string_view text(reinterpret_cast<const char*>(data), size);
  ModelCredentials credentials;
  credentials.user = TakeLine(&text);
  credentials.password = TakeLine(&text);
  credentials.path = TakeLine(&text);
  const std::string method(TakeLine(&text));
  g_fuzz_time = std::strtol(std::string(TakeLine(&text)).c_str(), nullptr, 10) & 0x7fffffff;
  const std::string challenge(text);

  Client client(credentials, challenge);
  ExpectSame("Digest line", client.GenDigestAccessAuth(method, "body"),
             ModelDigestLine(credentials, challenge, method, "body", g_fuzz_time));
  ExpectSame("Basic line", client.GenBasicAccessAuth(), ModelBasicLine(credentials));
  for (const std::string& word : {std::string("digest"), std::string("basic"), credentials.user}) {
    ExpectSame("word in the challenge", static_cast<int64_t>(ContainsIgnoreCase(challenge, word)),
               static_cast<int64_t>(ModelContains(challenge, word)));
  }
  return 0;
}
