// Faults of the login. An endpoint without a login gets one by Digest.
#include "tools/twcamsim/authenticator.h"

#include "tools/twcamsim/faults.h"

namespace {

void NeedLogin(LoginStyle* style) {
  if (style->basic || style->digest) return;
  style->digest = true;
  style->qop = "auth";
}

template <typename Change>
FaultType Make(const char* name, const char* meaning, Change hook,
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.login = hook;
  return {name, "login", std::move(rules), meaning, hooks};
}

template <bool LoginStyle::*kFlag>
void Raise(LoginStyle* style, const FaultContext&) {
  NeedLogin(style);
  style->*kFlag = true;
}

void SetScheme(LoginStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->scheme = context.Text(0);
}

void SetQop(LoginStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->qop = context.Text(0);
}

void SetAlgorithm(LoginStyle* style, const FaultContext& context) {
  NeedLogin(style);
  style->algorithm = context.Text(0);
}

void DigestOnly(LoginStyle* style) {
  style->digest = true;
  style->basic = false;
}

void NonceChanging(LoginStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->never_nonce = true;
}

void Stale(LoginStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->always_stale = true;
}

void NoNonce(LoginStyle* style, const FaultContext&) {
  DigestOnly(style);
  style->hide_nonce = true;
}

}  // namespace

std::vector<FaultType> LoginFaults() {
  return {
      Make("endless-401", "each login is refused, the right one as well",
           Raise<&LoginStyle::never>),
      Make("nonce-changing", "each answer finds its nonce replaced, without stale=true",
           NonceChanging),
      Make("stale", "each answer finds its nonce stale", Stale),
      Make("no-realm", "the challenge has no realm", Raise<&LoginStyle::hide_realm>),
      Make("no-nonce", "the Digest challenge has no nonce", NoNonce),
      Make("no-challenge", "the 401 has no WWW-Authenticate line",
           Raise<&LoginStyle::hide_challenge>),
      Make("other-scheme", "the challenge begins with that word", SetScheme, {{"WORD", "Bearer"}}),
      Make("other-qop", "the challenge has that qop", SetQop, {{"QOP", "auth-conf"}}),
      Make("other-algorithm", "the challenge has that algorithm", SetAlgorithm,
           {{"NAME", "SHA-256"}}),
      Make("forbidden", "403 behind a right login", Raise<&LoginStyle::forbid>),
  };
}
