// The causes that a challenge and the credentials for it point at.
#include "tools/twhttp/causes.h"

#include "tarnwick/http/digest.h"
#include "tools/common/text.h"

namespace {

// The last challenge that came, which need not be the last response.
std::string LastChallenge(const Evidence& evidence) {
  std::string challenge;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    if (exchange.response.Status() == 401) challenge = exchange.response.Value("WWW-Authenticate");
  }
  return challenge;
}

void AddDigest(const std::string& challenge, Causes* causes) {
  const tarnwick::ChallengeMap values = tarnwick::ParseChallenge(challenge);
  const std::string algorithm = LowerCase(values.at("algorithm"));
  if (LowerCase(values.at("stale")) == "true") {
    causes->push_back(
        "the peer calls the nonce stale: it renews it faster than credentials for it arrive");
  }
  for (const char* needed : {"realm", "nonce"}) {
    if (values.at(needed).empty()) causes->push_back(std::string("the challenge has no ") + needed);
  }
  if (algorithm == "md5-sess") {
    causes->push_back("the peer asks for MD5-sess, which the library computes as plain MD5");
  } else if (!algorithm.empty() && algorithm != "md5") {
    causes->push_back("the peer asks for " + values.at("algorithm") +
                      ", and the library computes MD5 alone");
  }
  const std::string qop = LowerCase(values.at("qop"));
  if (qop == "auth-int") {
    causes->push_back(
        "the peer asks for qop auth-int, which the library computes in a way of its own");
  }
}

}  // namespace

Causes OfLoginRefused(const Evidence& evidence) {
  Causes causes;
  const std::string challenge = LastChallenge(evidence);
  if (!evidence.options.operation->Uses(kCredentials)) {
    causes.push_back("the operation sends empty credentials, and no others");
  } else if (!evidence.options.target.has_credentials) {
    causes.push_back("the target has no user:password@, and empty credentials were sent");
  }
  if (Contains(LowerCase(challenge), "digest")) AddDigest(challenge, &causes);
  const bool by_basic = Contains(LastOf(evidence).sent, "Authorization: Basic");
  if (by_basic && Contains(LowerCase(challenge), "digest")) {
    causes.push_back("the credentials were sent by Basic, and the peer wants Digest");
  }
  return causes;
}

Causes OfLoginWanted(const Evidence& evidence) {
  const std::string challenge = LastOf(evidence).response.Value("WWW-Authenticate");
  const std::string words = LowerCase(challenge);
  if (challenge.empty()) return {"the 401 names no scheme: its head has no WWW-Authenticate"};
  if (!Contains(words, "digest") && !Contains(words, "basic")) {
    return {"the peer offers " + challenge.substr(0, challenge.find(' ')) +
            ", and the library knows Basic and Digest"};
  }
  if (!evidence.options.operation->Uses(kCredentials)) {
    return {"the operation sends no credentials; another one has to be used with this peer"};
  }
  Causes causes;
  if (evidence.options.target.has_credentials && Contains(words, "digest"))
    AddDigest(challenge, &causes);
  return causes;
}

Causes AfterLoginRefused(const Evidence& evidence) {
  std::vector<std::string> nonces;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    const std::string challenge = exchange.response.Value("WWW-Authenticate");
    if (!challenge.empty()) nonces.push_back(tarnwick::ParseChallenge(challenge).at("nonce"));
  }
  Causes causes;
  if (!tarnwick::ParseChallenge(LastChallenge(evidence)).at("algorithm").empty()) {
    causes.emplace_back(
        "the library quotes the algorithm in its credentials, which strict peers refuse");
  }
  const bool changes = nonces.size() > 1 && nonces.back() != nonces[nonces.size() - 2];
  if (changes) {
    causes.emplace_back(
        "the peer has another nonce each time, and refuses credentials for the last one");
  }
  return causes;
}
