// Faults of authentication. An endpoint that asks for none then asks for Digest.
#include "tools/twcamsim/authenticator.h"

#include "tools/twcamsim/faults.h"

namespace {

void NeedLogin(AuthenticationStyle* style) {
  if (style->basic || style->digest) return;
  style->digest = true;
  style->qop = "auth";
}

template <typename Change>
FaultType Make(const char* name, const char* meaning, Change hook,
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.authentication = hook;
  return {name, "login", std::move(rules), meaning, hooks};
}

template <bool AuthenticationStyle::*kFlag>
void Raise(AuthenticationStyle* style, const FaultContext&) {
  NeedLogin(style);
  style->*kFlag = true;
}

void SetScheme(AuthenticationStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->scheme = context.Text(0);
}

void SetQop(AuthenticationStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->qop = context.Text(0);
}

void SetAlgorithm(AuthenticationStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->algorithm = context.Text(0);
}

void DigestOnly(AuthenticationStyle* style) {
  style->digest = true;
  style->basic = false;
}

void NonceChanging(AuthenticationStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->never_nonce = true;
}

void Stale(AuthenticationStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->always_stale = true;
}

void NoNonce(AuthenticationStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->hide_nonce = true;
}

}  // namespace

std::vector<FaultType> AuthenticationFaults() {
  return {
      Make("endless-401", "all credentials are refused, the right ones as well",
           Raise<&AuthenticationStyle::never>),
      Make("nonce-changing",
           "the nonce is replaced before the credentials come, without stale=true", NonceChanging),
      Make("stale", "the nonce is stale when the credentials come", Stale),
      Make("no-realm", "the challenge has no realm", Raise<&AuthenticationStyle::hide_realm>),
      Make("no-nonce", "the Digest challenge has no nonce", NoNonce),
      Make("no-challenge", "the 401 has no WWW-Authenticate line",
           Raise<&AuthenticationStyle::hide_challenge>),
      Make("other-scheme", "the challenge begins with that word", SetScheme, {{"WORD", "Bearer"}}),
      Make("other-qop", "the challenge has that qop", SetQop, {{"QOP", "auth-conf"}}),
      Make("other-algorithm", "the challenge has that algorithm", SetAlgorithm,
           {{"NAME", "SHA-256"}}),
      Make("forbidden", "403 after right credentials", Raise<&AuthenticationStyle::forbid>),
  };
}
