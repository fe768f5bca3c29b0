// What a failure's own evidence points at.
#include <algorithm>
#include <cctype>
#include <string_view>

#include "tarnwick/http/digest.h"
#include "tools/twhttp/failure.h"

namespace {

using Id = FailureClass;
using Causes = std::vector<std::string>;

std::string Lower(std::string text) {
  for (char& c : text) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return text;
}

bool Has(const std::string& text, const char* word) {
  return text.find(word) != std::string::npos;
}

const Exchange& Last(const Evidence& evidence) {
  static const Exchange none;
  const Exchange* const last = evidence.trace.LastExchange();
  return last != nullptr ? *last : none;
}

std::string SystemWords(const Evidence& evidence) {
  const Connection* const connection = evidence.trace.LastConnection();
  if (evidence.trace.curl.used) return Lower(evidence.trace.curl.text);
  return connection != nullptr ? Lower(connection->handshake.text) : "";
}

// The last challenge that came, which need not be the last reply.
std::string LastChallenge(const Evidence& evidence) {
  std::string challenge;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    if (exchange.reply.Status() == 401) challenge = exchange.reply.Value("WWW-Authenticate");
  }
  return challenge;
}

void AddDigest(const std::string& challenge, Causes* causes) {
  const ChallengeMap values = ParseChallenge(challenge);
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

Causes OfLoginRefused(const Evidence& evidence) {
  Causes causes;
  const std::string challenge = LastChallenge(evidence);
  if (!evidence.options.operation->Does(kLogin)) {
    causes.push_back("the operation sends the empty login, and no other");
  } else if (!evidence.options.target.has_login) {
    causes.push_back("the target has no user:password@, and the empty login was sent");
  }
  if (Has(Lower(challenge), "digest")) AddDigest(challenge, &causes);
  const bool by_basic = Has(Last(evidence).sent, "Authorization: Basic");
  if (by_basic && Has(Lower(challenge), "digest")) {
    causes.push_back("the login was sent by Basic, and the peer wants Digest");
  }
  return causes;
}

Causes OfLoginWanted(const Evidence& evidence) {
  const std::string challenge = Last(evidence).reply.Value("WWW-Authenticate");
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

Causes OfStatus(const Evidence& evidence) {
  const ReplyMessage& reply = Last(evidence).reply;
  const int status = reply.Status();
  const std::string place = reply.Value("Location");
  if (status >= 300 && status <= 399) {
    return {place.empty() ? "the peer redirects, and does not say where to"
                          : "the peer redirects to " + place + ", and the library follows nowhere"};
  }
  const bool old = Has(Last(evidence).sent.substr(0, 4096), " HTTP/1.0\r\n");
  if (status == 400 && old) return {"the peer wants HTTP/1.1 with a Host line: --http 1.1"};
  if (status == 403) return {"the login is good and may not do that, or the address is blocked"};
  if (status == 404) return {"the path does not exist there"};
  if (status == 405) return {"the peer does not take the method there"};
  if (status == 414) return {"the path is too long for the peer"};
  if (status == 503) return {"the peer is overloaded or starting: try again later"};
  if (status >= 500) return {"the peer failed; its body or its log tells why"};
  return {};
}

Causes OfTls(const Evidence& evidence) {
  const std::string words = SystemWords(evidence);
  if (evidence.stop == Stop::kGaveUp || Has(words, "timed out") || Has(words, "timeout")) {
    return {"the peer took the connection and says nothing in the handshake",
            "the port speaks plain HTTP and waits for the end of a request: try http://"};
  }
  if (Has(words, "wrong version number") || Has(words, "packet length too long")) {
    return {"what answers speaks no TLS: plain HTTP (try http://) or another protocol"};
  }
  if (Has(words, "unsupported protocol") || Has(words, "protocol version") ||
      Has(words, "sigalg")) {
    return {"the peer speaks only versions of TLS that are switched off here"};
  }
  if (Has(words, "dh key too small") || Has(words, "ee key too small")) {
    return {"the peer's keys are shorter than is allowed here"};
  }
  if (Has(words, "handshake failure")) return {"the two sides share no cipher"};
  if (Has(words, "reset") || Has(words, "eof") || Has(words, "syscall") || Has(words, "closed")) {
    return {"the peer closed the connection in the handshake"};
  }
  return {};
}

Causes OfCertificate(const Evidence& evidence) {
  const std::string words = SystemWords(evidence);
  if (Has(words, "expired")) return {"the certificate has expired, or the clock here is wrong"};
  if (Has(words, "not yet valid"))
    return {"the certificate is not valid yet, or the clock is wrong"};
  if (Has(words, "self-signed") || Has(words, "self signed")) {
    return {"the certificate, or one above it, is of the peer's own making"};
  }
  if (Has(words, "unable to get local issuer")) {
    return {"who issued the certificate is not known to this machine"};
  }
  if (Has(words, "does not match") || Has(words, "no alternative certificate")) {
    return {"the certificate is made out to another name than " + evidence.options.target.host};
  }
  return {};
}

Causes OfNoReply(const Evidence& evidence) {
  constexpr int kHttps = 443;
  if (!evidence.options.target.https && evidence.options.target.port == kHttps) {
    return {"port 443 speaks TLS: try https://"};
  }
  return {};
}

Causes OfHead(const Evidence& evidence) {
  const Exchange& last = Last(evidence);
  Causes causes;
  const std::string head = last.reply.Head().substr(0, 16);
  if (!evidence.options.target.https && head.size() > 1 && head[0] == '\x15' && head[1] == '\x03') {
    causes.push_back("the port speaks TLS: try https://");
  }
  const CurlFigures& curl = evidence.trace.curl;
  if (curl.used && curl.code != 0) {
    causes.push_back("libcurl says: " + curl.text);
  } else if (!last.reply.HeadComplete() && last.end == End::kClosed) {
    causes.push_back("the peer closed in the middle of the head");
  }
  for (const HeadFinding& finding : InspectHead(last.reply)) {
    causes.push_back(finding.text + ": " + finding.rule);
  }
  return causes;
}

Causes OfCutBody(const Evidence& evidence) {
  const Exchange& last = Last(evidence);
  if (last.reply.BodyFraming() == Framing::kChunked) {
    return {"the peer closed before the last chunk, or does not keep to the form of chunks"};
  }
  return {"the peer closed early, or announced more than it has"};
}

Causes OfKeptOpen(const Evidence& evidence) {
  if (evidence.options.version == HTTP_VERSION_1_1) {
    return {"--http 1.1 asks for a connection that stays: leave it out, or use --http 1.0"};
  }
  return {};
}

Causes OfGaveUp(const Evidence& evidence) {
  const Exchange& last = Last(evidence);
  if (last.send_begin >= 0 && last.received_bytes == 0) {
    return {"the request was taken, and no answer came"};
  }
  return {};
}

Causes OfXml(const Evidence& evidence) {
  const std::string words = Lower(evidence.outcome.content_error);
  if (Has(words, "entity")) return {"the document's entities multiply without end"};
  if (Has(words, "depth")) return {"the document is nested more deeply than is allowed"};
  if (evidence.outcome.content == Content::kNoXml) return {"the reply has no body"};
  return {};
}

Causes OfJson(const Evidence& evidence) {
  const Exchange& last = Last(evidence);
  const size_t head = std::min<size_t>(last.reply.HeadBytes(), last.received.size());
  const std::string start = last.received.substr(head, 3);
  if (Has(evidence.outcome.content_error, "too deeply")) {
    return {"it is nested more deeply than is allowed"};
  }
  if (start == "\xEF\xBB\xBF") return {"the body begins with a byte order mark"};
  return {};
}

// Behind the usual causes: peers that renew their nonces with each refusal are nothing unusual.
Causes AfterLoginRefused(const Evidence& evidence) {
  std::vector<std::string> nonces;
  for (const Exchange& exchange : evidence.trace.Exchanges()) {
    const std::string challenge = exchange.reply.Value("WWW-Authenticate");
    if (!challenge.empty()) nonces.push_back(ParseChallenge(challenge).at("nonce"));
  }
  const bool changes = nonces.size() > 1 && nonces.back() != nonces[nonces.size() - 2];
  if (!changes) return {};
  return {"the peer has another nonce each time, and takes an answer to the last one for wrong"};
}

Causes OfUnreachable(const Evidence& evidence) {
  const Connection* const last = evidence.trace.LastConnection();
  if (last != nullptr && last->source.failed) {
    return {"the source address could not be used: " + last->source.text};
  }
  return {};
}

}  // namespace

std::vector<std::string> SpecialCauses(const Evidence& evidence, FailureClass id) {
  static const struct {
    Id id;
    Causes (*find)(const Evidence& evidence);
  } kFinders[] = {
      {Id::kLoginRefused, OfLoginRefused},
      {Id::kLoginWanted, OfLoginWanted},
      {Id::kStatus, OfStatus},
      {Id::kTls, OfTls},
      {Id::kCertificate, OfCertificate},
      {Id::kNoReply, OfNoReply},
      {Id::kMalformedHead, OfHead},
      {Id::kCutBody, OfCutBody},
      {Id::kKeptOpen, OfKeptOpen},
      {Id::kGaveUp, OfGaveUp},
      {Id::kUnreachable, OfUnreachable},
      {Id::kXml, OfXml},
      {Id::kJson, OfJson},
  };
  for (const auto& finder : kFinders) {
    if (finder.id == id) return finder.find(evidence);
  }
  return {};
}

std::vector<std::string> FurtherCauses(const Evidence& evidence, FailureClass id) {
  return id == Id::kLoginRefused ? AfterLoginRefused(evidence) : Causes();
}

const char* NextCommand(const Evidence& evidence, FailureClass id) {
  if (id == Id::kKeptOpen && evidence.options.version == HTTP_VERSION_1_1) {
    return "twhttp {operation} --http 1.0 {url}";
  }
  if (id == Id::kCertificate && evidence.options.operation->Does(kVerify)) {
    return "twhttp {operation} -v --insecure {url}";
  }
  return FactsOf(id).next;
}
