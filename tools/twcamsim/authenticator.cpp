#include "tools/twcamsim/authenticator.h"

#include <fmt/format.h>
#include <openssl/evp.h>

#include <algorithm>
#include <utility>

#include "tools/twcamsim/digest_check.h"

namespace {

constexpr char kOpaque[] = "c0ffee5eed";
constexpr size_t kMostNonces = 4096;  // a client that never sends credentials leaves them unused

Verdict Refused(const std::string& scheme, const std::string& user, const std::string& field,
                const std::string& text) {
  Verdict verdict;
  verdict.scheme = scheme;
  verdict.user = user;
  verdict.field = field;
  verdict.text = text;
  return verdict;
}

bool DecodeBase64(const std::string& text, std::string* bytes) {
  if (text.empty() || text.size() % 4 != 0) return false;
  bytes->resize(text.size() / 4 * 3);
  const int size = EVP_DecodeBlock(reinterpret_cast<unsigned char*>(bytes->data()),
                                   reinterpret_cast<const unsigned char*>(text.data()),
                                   static_cast<int>(text.size()));
  if (size < 0) return false;
  const size_t filling = text.size() - std::min(text.find('='), text.size());
  if (filling > 2) return false;
  bytes->resize(static_cast<size_t>(size) - filling);
  return true;
}

std::string Word(const DigestWords& words, const char* name) {
  const auto found = words.find(name);
  return found == words.end() ? "" : found->second.value;
}

bool Offers(const AuthenticationStyle& style, const std::string& qop) {
  return ("," + style.qop + ",").find("," + qop + ",") != std::string::npos;
}

bool IsHex(const std::string& text, size_t size) {
  return text.size() == size &&
         text.find_first_not_of("0123456789abcdefABCDEF") == std::string::npos;
}

bool IsSession(const AuthenticationStyle& style) {
  return style.algorithm.find("MD5-sess") != std::string::npos;
}

// What is wrong with the fields beside nonce and response: its name, and a sentence.
std::pair<std::string, std::string> CheckFields(const AuthenticationStyle& style,
                                                const Account& account, const Request& request,
                                                const DigestWords& words) {
  const auto differs = [](const char* what, const std::string& got, const std::string& wanted) {
    return fmt::format("the {} is \"{}\", not \"{}\"", what, got, wanted);
  };
  const std::string user = Word(words, "username"), realm = Word(words, "realm");
  if (user != account.user) return {"user", differs("user", user, account.user)};
  if (realm != account.realm) return {"realm", differs("realm", realm, account.realm)};
  const std::string uri = Word(words, "uri");
  if (uri != request.target) return {"uri", differs("uri", uri, request.target)};
  const std::string opaque = Word(words, "opaque");
  if (style.opaque && opaque != kOpaque) {
    return {"opaque", differs("opaque value", opaque, kOpaque)};
  }
  const std::string algorithm = Word(words, "algorithm"),
                    wanted = IsSession(style) ? "MD5-sess" : "MD5";
  if (!algorithm.empty() && !EqualsIgnoringCase(algorithm, wanted)) {
    return {"algorithm", differs("algorithm", algorithm, wanted)};
  }
  const std::string qop = Word(words, "qop");
  if (qop.empty()) return {};
  if (!Offers(style, qop)) return {"qop", differs("qop", qop, style.qop)};
  if (!IsHex(Word(words, "nc"), 8)) return {"nc", "nc is not 8 hexadecimal digits"};
  if (Word(words, "cnonce").empty()) return {"cnonce", "qop is there and cnonce is not"};
  return {};
}

DigestInput InputOf(const AuthenticationStyle& style, const Account& account,
                    const Request& request, const DigestWords& words) {
  DigestInput input;
  input.user = account.user;
  input.realm = account.realm;
  input.password = account.password;
  input.method = request.method;
  input.uri = request.target;
  input.body = request.body;
  input.nonce = Word(words, "nonce");
  input.count = Word(words, "nc");
  input.cnonce = Word(words, "cnonce");
  input.qop = Word(words, "qop");
  input.session = IsSession(style);
  return input;
}

}  // namespace

Verdict Authenticator::Check(const AuthenticationStyle& style, const Request& request) {
  const std::string line = request.Get("Authorization");
  const size_t blank = std::min(line.find(' '), line.size());
  const std::string word = line.substr(0, blank),
                    rest = line.substr(std::min(blank + 1, line.size()));
  if (!style.basic && !style.digest && !style.never) {
    Verdict verdict;
    verdict.passed = true;
    verdict.scheme = "none";
    return verdict;
  }
  if (line.empty()) return Refused("none", "", "missing", "the request has no Authorization line");
  Verdict verdict = Refused(word, "", "scheme", "the scheme \"" + word + "\" was not asked for");
  if (EqualsIgnoringCase(word, "basic") && style.basic) verdict = CheckBasic(rest);
  if (EqualsIgnoringCase(word, "digest") && style.digest)
    verdict = CheckDigest(style, request, rest);
  if (verdict.passed && style.never) {
    return Refused(verdict.scheme, verdict.user, "never",
                   "the credentials are right, and refused all the same");
  }
  return verdict;
}

Verdict Authenticator::CheckBasic(const std::string& text) const {
  std::string bytes;
  if (!DecodeBase64(text, &bytes)) {
    return Refused("basic", "", "encoding", "the credentials are not base64");
  }
  const size_t colon = bytes.find(':');
  if (colon == std::string::npos) {
    return Refused("basic", "", "encoding", "there is no colon between user and password");
  }
  const std::string user = bytes.substr(0, colon);
  if (user != account_.user) {
    return Refused("basic", user, "user",
                   fmt::format("the user is \"{}\", not \"{}\"", user, account_.user));
  }
  if (bytes.substr(colon + 1) != account_.password) {
    return Refused("basic", user, "password", "the password is wrong");
  }
  Verdict verdict = Refused("basic", user, "", "");
  verdict.passed = true;
  return verdict;
}

Verdict Authenticator::CheckDigest(const AuthenticationStyle& style, const Request& request,
                                   const std::string& text) {
  DigestWords words;
  if (!ParseDigestWords(text, &words)) {
    return Refused("digest", "", "quotes", "the line is not a list of name=value");
  }
  const std::string user = Word(words, "username");
  const std::string quotes = style.strict_quotes ? WrongQuotes(words) : "";
  if (!quotes.empty()) {
    return Refused("digest", user, "quotes",
                   fmt::format("\"{}\" {}", quotes,
                               words[quotes].quoted ? "must have no quotes" : "must be in quotes"));
  }
  const auto [field, sentence] = CheckFields(style, account_, request, words);
  if (!field.empty()) return Refused("digest", user, field, sentence);
  const DigestInput input = InputOf(style, account_, request, words);
  if (DigestResponse(input) != Word(words, "response")) {
    const std::string cause = ExplainDigest(input, Word(words, "response"));
    return Refused("digest", user, "response",
                   cause.empty() ? "the response is wrong: another password, or not computed from "
                                   "these fields"
                                 : "the response is " + cause);
  }
  Verdict verdict = Refused("digest", user, "", "");
  // Without qop, nc has no meaning and may be anything.
  verdict.passed = CheckNonce(style, input.nonce, input.qop.empty() ? "" : input.count, &verdict);
  return verdict;
}

// Last of all, so that "stale" always means: right but for the nonce.
bool Authenticator::CheckNonce(const AuthenticationStyle& style, const std::string& nonce,
                               const std::string& count, Verdict* verdict) {
  const std::lock_guard<std::mutex> lock(mutex_);
  const auto found = nonces_.find(nonce);
  verdict->field = "nonce";
  verdict->stale = true;
  if (found == nonces_.end()) {
    verdict->stale = false;
    verdict->text = "the nonce \"" + nonce + "\" was never given out";
    return false;
  }
  if (style.never_nonce || style.always_stale) {
    verdict->stale = style.always_stale;
    verdict->text = "the nonce is not valid any more; there is a new one";
    return false;
  }
  if (style.stale_first && found->second.uses++ == 0) {
    verdict->text = "the nonce is stale; the same credentials with the new nonce will do";
    return false;
  }
  const int64_t number = count.empty() ? found->second.count + 1 : std::stoll(count, nullptr, 16);
  if (number <= found->second.count) {
    verdict->field = "nc";
    verdict->text = fmt::format("nc {} has been used with this nonce", count);
    return false;
  }
  found->second.count = number;
  *verdict = Refused("digest", verdict->user, "", "");
  return true;
}

std::string Authenticator::NewNonce(int uses, Random* random) {
  std::string nonce = random->Hex(12);
  const std::lock_guard<std::mutex> lock(mutex_);
  if (order_.size() >= kMostNonces) {
    for (size_t i = 0; i < kMostNonces / 2; ++i) nonces_.erase(order_[i]);
    order_.erase(order_.begin(), order_.begin() + kMostNonces / 2);
  }
  nonces_[nonce].uses = uses;
  order_.push_back(nonce);
  return nonce;
}

std::string Authenticator::DigestChallenge(const AuthenticationStyle& style, bool stale,
                                           Random* random) {
  const char* quote = style.unquoted ? "" : "\"";
  const std::string realm = fmt::format("realm={0}{1}{0}", quote, account_.realm);
  const std::string nonce = fmt::format("nonce={0}{1}{0}", quote, NewNonce(stale ? 1 : 0, random));
  std::vector<std::string> words;
  if (!style.hide_realm) words.push_back(realm);
  if (!style.qop.empty()) words.push_back("qop=\"" + style.qop + "\"");
  if (!style.hide_nonce) words.push_back(nonce);
  if (style.opaque) words.push_back(fmt::format("opaque=\"{}\"", kOpaque));
  if (!style.algorithm.empty()) words.push_back("algorithm=" + style.algorithm);
  if (stale || style.odd_order) words.push_back(stale ? "stale=true" : "stale=\"false\"");
  if (style.odd_order) {
    words.push_back("domain=\"/\"");
    std::reverse(words.begin(), words.end());
  }
  return (style.scheme.empty() ? "Digest" : style.scheme) + " " +
         fmt::format("{}", fmt::join(words, style.odd_order ? " , " : ", "));
}

std::vector<std::string> Authenticator::Challenges(const AuthenticationStyle& style,
                                                   const Verdict& verdict, Random* random) {
  std::vector<std::string> lines;
  if (style.hide_challenge) return lines;
  const bool stale = verdict.stale || (style.always_stale && verdict.field != "missing");
  if (style.digest) lines.push_back(DigestChallenge(style, stale, random));
  if (style.basic) {
    const std::string scheme = style.scheme.empty() ? "Basic" : style.scheme;
    lines.push_back(style.hide_realm ? scheme
                                     : fmt::format("{} realm=\"{}\"", scheme, account_.realm));
  }
  if (style.basic_first) std::reverse(lines.begin(), lines.end());
  if (style.one_line) lines = {fmt::format("{}", fmt::join(lines, ", "))};
  return lines;
}
