// The authentication that an endpoint asks for, and what was wrong with the credentials that
// came.
#ifndef TARNWICK_TOOLS_TWCAMSIM_AUTHENTICATOR_H_
#define TARNWICK_TOOLS_TWCAMSIM_AUTHENTICATOR_H_

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "tools/twcamsim/random.h"
#include "tools/twcamsim/request.h"

// How the challenge looks and how credentials are judged.
struct AuthenticationStyle {
  std::string name;
  std::string meaning;
  bool basic = false;
  bool digest = false;
  bool basic_first = false;
  bool one_line = false;  // both schemes in one header line
  std::string qop;        // as it stands between the quotes; empty: none
  bool opaque = false;
  std::string algorithm;       // as it stands in the challenge, with quotes if it is to have some
  bool odd_order = false;      // nonce, then realm, with domain and stale in between
  bool unquoted = false;       // realm and nonce without quotes
  bool stale_first = false;    // the first right credentials for a connection's nonce come too late
  bool strict_quotes = false;  // refuses credentials whose quotes are not RFC 2617's

  // What faults make of it.
  bool never = false;         // no credentials are right
  bool never_nonce = false;   // no nonce is known any more when its credentials come
  bool always_stale = false;  // and the challenge says so
  bool hide_realm = false;
  bool hide_nonce = false;
  bool hide_challenge = false;
  bool forbid = false;  // 403 after right credentials
  std::string scheme;   // another word in front of the challenge
};

// All styles, "none" and "basic" first.
const std::vector<AuthenticationStyle>& AuthenticationStyles();

// nullptr when there is none of that name.
const AuthenticationStyle* FindAuthenticationStyle(const std::string& name);

struct Account {
  std::string user;
  std::string password;
  std::string realm;
};

// The judgement of one request.
struct Verdict {
  bool passed = false;
  std::string scheme;  // "none", "basic", "digest", or the unknown word
  std::string user;    // who logged in, or tried to
  std::string field;   // what was wrong: "missing", "scheme", "user", "password", "realm", "nonce",
                       // "uri", "qop", "nc", "cnonce", "opaque", "algorithm", "response", "quotes"
  std::string text;    // the same in a sentence
  bool stale = false;  // right in all but the nonce's age
};

// One endpoint's accounts and nonces.
// Threads: any.
class Authenticator {
 public:
  explicit Authenticator(Account account) : account_(std::move(account)) {}

  Verdict Check(const AuthenticationStyle& style, const Request& request);

  // The WWW-Authenticate values of a 401, in their order.
  std::vector<std::string> Challenges(const AuthenticationStyle& style, const Verdict& verdict,
                                      Random* random);

  const Account& GetAccount() const { return account_; }

 private:
  struct Nonce {
    int64_t count = 0;  // the highest nc that came
    int uses = 0;
  };

  Verdict CheckBasic(const std::string& text) const;
  Verdict CheckDigest(const AuthenticationStyle& style, const Request& request,
                      const std::string& text);
  bool CheckNonce(const AuthenticationStyle& style, const std::string& nonce,
                  const std::string& count, Verdict* verdict);
  std::string DigestChallenge(const AuthenticationStyle& style, bool stale, Random* random);
  std::string NewNonce(int uses, Random* random);

  const Account account_;
  std::mutex mutex_;
  std::map<std::string, Nonce> nonces_;
  std::vector<std::string> order_;  // of the nonces, the oldest first
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_AUTHENTICATOR_H_
