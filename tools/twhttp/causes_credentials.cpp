// The causes that a challenge and what was answered to it point at.
#include "tools/twhttp/causes.h"

#include "tarnwick/http/digest.h"

namespace {

// The last challenge that came, which need not be the last reply.
std::string LastChallenge(const Evidence& evidence) {
  std::string challenge;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    if (exchange.reply.Status() == 401) challenge = exchange.reply.Value("WWW-Authenticate");
  }
  return challenge;
}

void AddDigest(const std::string& challenge, Causes* causes) {
  const tarnwick::ChallengeMap values = tarnwick::ParseChallenge(challenge);
  const std::string algorithm = Lower(values.at("algorithm"));
  if (Lower(values.at("stale")) == "true") {
    causes->push_back("the peer calls the nonce stale: it renews it faster than it is answered");
  }
  for (const char* needed : {"realm", "nonce"}) {
    if (values.at(needed).empty()) causes->push_back(std::string("the challenge has no ") + needed);
  }
  if (algorithm == "md5-sess") {
    causes->push_back("the peer asks for MD5-sess, which the library answers as plain MD5");
  } else if (!algorithm.empty() && algorithm != "md5") {
    causes->push_back("the peer asks for " + values.at("algorithm") +
                      ", and the library answers by MD5 alone");
  }
  const std::string qop = Lower(values.at("qop"));
  if (qop == "auth-int") {
    causes->push_back(
        "the peer asks for qop auth-int, which the library answers in a way of its own");
  }
}

}  // namespace

Causes OfLoginRefused(const Evidence& evidence) {
  Causes causes;
  const std::string challenge = LastChallenge(evidence);
  if (!evidence.options.operation->Does(kLogin)) {
    causes.push_back("the operation sends the empty login, and no other");
  } else if (!evidence.options.target.has_login) {
    causes.push_back("the target has no user:password@, and the empty login was sent");
  }
  if (Has(Lower(challenge), "digest")) AddDigest(challenge, &causes);
  const bool by_basic = Has(LastOf(evidence).sent, "Authorization: Basic");
  if (by_basic && Has(Lower(challenge), "digest")) {
    causes.push_back("the login was sent by Basic, and the peer wants Digest");
  }
  return causes;
}

Causes OfLoginWanted(const Evidence& evidence) {
  const std::string challenge = LastOf(evidence).reply.Value("WWW-Authenticate");
  const std::string words = Lower(challenge);
  if (challenge.empty()) return {"the 401 names no scheme: its head has no WWW-Authenticate"};
  if (!Has(words, "digest") && !Has(words, "basic")) {
    return {"the peer offers " + challenge.substr(0, challenge.find(' ')) +
            ", and the library knows Basic and Digest"};
  }
  if (!evidence.options.operation->Does(kLogin)) {
    return {"the operation sends no login; another one has to be used with this peer"};
  }
  Causes causes;
  if (evidence.options.target.has_login && Has(words, "digest")) AddDigest(challenge, &causes);
  return causes;
}

Causes AfterLoginRefused(const Evidence& evidence) {
  std::vector<std::string> nonces;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    const std::string challenge = exchange.reply.Value("WWW-Authenticate");
    if (!challenge.empty()) nonces.push_back(tarnwick::ParseChallenge(challenge).at("nonce"));
  }
  Causes causes;
  if (!tarnwick::ParseChallenge(LastChallenge(evidence)).at("algorithm").empty()) {
    causes.emplace_back(
        "the library quotes the algorithm in its answer, which strict peers refuse");
  }
  const bool changes = nonces.size() > 1 && nonces.back() != nonces[nonces.size() - 2];
  if (changes) {
    causes.emplace_back(
        "the peer has another nonce each time, and takes an answer to the last one for wrong");
  }
  return causes;
}
