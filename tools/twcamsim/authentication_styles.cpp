#include "tools/twcamsim/authenticator.h"

namespace {

AuthenticationStyle Digest(const char* name, const char* meaning) {
  AuthenticationStyle style;
  style.name = name;
  style.meaning = meaning;
  style.digest = true;
  return style;
}

AuthenticationStyle DigestQop(const char* name, const char* qop, const char* meaning) {
  AuthenticationStyle style = Digest(name, meaning);
  style.qop = qop;
  return style;
}

AuthenticationStyle DigestAlgorithm(const char* name, const char* algorithm, const char* meaning) {
  AuthenticationStyle style = DigestQop(name, "auth", meaning);
  style.algorithm = algorithm;
  return style;
}

AuthenticationStyle Both(const char* name, const char* meaning) {
  AuthenticationStyle style = DigestQop(name, "auth", meaning);
  style.basic = true;
  return style;
}

void AddPlain(std::vector<AuthenticationStyle>* styles) {
  AuthenticationStyle none;
  none.name = "none";
  none.meaning = "no credentials are asked for";
  styles->push_back(none);
  AuthenticationStyle basic;
  basic.name = "basic";
  basic.meaning = "Basic";
  basic.basic = true;
  styles->push_back(basic);
}

void AddDigest(std::vector<AuthenticationStyle>* styles) {
  styles->push_back(DigestQop("digest", "auth", "Digest with qop=\"auth\""));
  styles->push_back(Digest("digest-no-qop", "Digest without qop, as RFC 2069 has it"));
  styles->push_back(
      DigestQop("digest-qop-list", "auth-int,auth", "Digest with a list of qops, auth-int first"));
  styles->push_back(DigestQop("digest-qop-list-auth-first", "auth,auth-int",
                              "Digest with a list of qops, auth first"));
  styles->push_back(DigestQop("digest-auth-int", "auth-int", "Digest with qop=\"auth-int\" alone"));
  styles->push_back(
      DigestQop("digest-opaque", "auth", "Digest with an opaque value that must come back"));
  styles->back().opaque = true;
  styles->push_back(
      DigestAlgorithm("digest-algorithm", "MD5", "Digest with algorithm=MD5 without quotes"));
  styles->push_back(DigestAlgorithm("digest-algorithm-quoted", "\"MD5\"",
                                    "Digest with algorithm=\"MD5\" in quotes"));
  styles->push_back(DigestAlgorithm("digest-md5-sess", "MD5-sess",
                                    "Digest with algorithm=MD5-sess, checked as such"));
  styles->push_back(DigestAlgorithm("digest-odd-order", "MD5",
                                    "Digest, the parameters in an unusual order, blanks around"));
  styles->back().odd_order = true;
  styles->back().opaque = true;
  styles->push_back(
      DigestQop("digest-unquoted", "auth", "Digest with realm and nonce without quotes"));
  styles->back().unquoted = true;
}

void AddPicky(std::vector<AuthenticationStyle>* styles) {
  styles->push_back(
      DigestQop("digest-stale", "auth",
                "Digest; the first credentials for each nonce come too late: stale=true"));
  styles->back().stale_first = true;
  styles->push_back(
      DigestQop("digest-strict", "auth", "Digest, refusing credentials whose quotes are wrong"));
  styles->back().strict_quotes = true;
  styles->push_back(DigestAlgorithm("digest-strict-algorithm", "MD5",
                                    "the same, and the algorithm may have no quotes either"));
  styles->back().strict_quotes = true;
  styles->push_back(Both("digest-or-basic", "both, a line for Digest in front of one for Basic"));
  styles->push_back(Both("basic-or-digest", "both, a line for Basic in front of one for Digest"));
  styles->back().basic_first = true;
  styles->push_back(Both("digest-and-basic", "both in one line"));
  styles->back().one_line = true;
}

}  // namespace

const std::vector<AuthenticationStyle>& AuthenticationStyles() {
  static const std::vector<AuthenticationStyle> kStyles = [] {
    std::vector<AuthenticationStyle> styles;
    AddPlain(&styles);
    AddDigest(&styles);
    AddPicky(&styles);
    return styles;
  }();
  return kStyles;
}

const AuthenticationStyle* FindAuthenticationStyle(const std::string& name) {
  for (const AuthenticationStyle& style : AuthenticationStyles()) {
    if (style.name == name) return &style;
  }
  return nullptr;
}
