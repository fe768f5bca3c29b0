// What a failure's own evidence points at.
#include "tools/twhttp/causes.h"

#include <algorithm>

#include "tools/common/text.h"

namespace {

using Id = FailureClass;

std::string SystemWords(const Evidence& evidence) {
  const Connection* const connection = evidence.trace.LastConnection();
  if (evidence.trace.curl.used) return LowerCase(evidence.trace.curl.text);
  return connection != nullptr ? LowerCase(connection->handshake.text) : "";
}

Causes OfStatus(const Evidence& evidence) {
  const ResponseMessage& response = LastOf(evidence).response;
  const int status = response.Status();
  const std::string place = response.Value("Location");
  if (status >= 300 && status <= 399) {
    return {place.empty() ? "the peer redirects, and does not say where to"
                          : "the peer redirects to " + place + ", and the library follows nowhere"};
  }
  const bool old = Contains(LastOf(evidence).sent.substr(0, 4096), " HTTP/1.0\r\n");
  if (status == 400 && old) return {"the peer wants HTTP/1.1 with a Host line: --http 1.1"};
  if (status == 403)
    return {"the credentials are good and may not do that, or the address is blocked"};
  if (status == 404) return {"the path does not exist there"};
  if (status == 405) return {"the peer does not take the method there"};
  if (status == 414) return {"the path is too long for the peer"};
  if (status == 503) return {"the peer is overloaded or starting: try again later"};
  if (status >= 500) return {"the peer failed; its body or its log tells why"};
  return {};
}

Causes OfTls(const Evidence& evidence) {
  const std::string words = SystemWords(evidence);
  if (evidence.stop == Stop::kGaveUp || Contains(words, "timed out") ||
      Contains(words, "timeout")) {
    return {"the peer took the connection and says nothing in the handshake",
            "the port speaks plain HTTP and waits for the end of a request: try http://"};
  }
  if (Contains(words, "wrong version number") || Contains(words, "packet length too long")) {
    return {"what responds speaks no TLS: plain HTTP (try http://) or another protocol"};
  }
  if (Contains(words, "unsupported protocol") || Contains(words, "protocol version") ||
      Contains(words, "sigalg")) {
    return {"the peer speaks only versions of TLS that are switched off here"};
  }
  if (Contains(words, "dh key too small") || Contains(words, "ee key too small")) {
    return {"the peer's keys are shorter than is allowed here"};
  }
  if (Contains(words, "handshake failure")) return {"the two sides share no cipher"};
  if (Contains(words, "reset") || Contains(words, "eof") || Contains(words, "syscall") ||
      Contains(words, "closed")) {
    return {"the peer closed the connection in the handshake"};
  }
  return {};
}

Causes OfCertificate(const Evidence& evidence) {
  const std::string words = SystemWords(evidence);
  if (Contains(words, "expired"))
    return {"the certificate has expired, or the clock here is wrong"};
  if (Contains(words, "not yet valid"))
    return {"the certificate is not valid yet, or the clock is wrong"};
  if (Contains(words, "self-signed") || Contains(words, "self signed")) {
    return {"the certificate, or one above it, is of the peer's own making"};
  }
  if (Contains(words, "unable to get local issuer")) {
    return {"who issued the certificate is not known to this machine"};
  }
  if (Contains(words, "does not match") || Contains(words, "no alternative certificate")) {
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
  const Exchange& last = LastOf(evidence);
  Causes causes;
  const std::string head = last.response.Head().substr(0, 16);
  if (!evidence.options.target.https && head.size() > 1 && head[0] == '\x15' && head[1] == '\x03') {
    causes.push_back("the port speaks TLS: try https://");
  }
  const CurlFigures& curl = evidence.trace.curl;
  if (curl.used && curl.code != 0) {
    causes.push_back("libcurl says: " + curl.text);
  } else if (!last.response.HeadComplete() && last.end == End::kClosed) {
    causes.push_back("the peer closed in the middle of the head");
  }
  for (const HeadFinding& finding : FindingsOf(evidence.trace, last)) {
    causes.push_back(finding.text + ": " + finding.rule);
  }
  return causes;
}

Causes OfCutBody(const Evidence& evidence) {
  const Exchange& last = LastOf(evidence);
  if (last.response.BodyFraming() == Framing::kChunked) {
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
  const Exchange& last = LastOf(evidence);
  if (last.send_begin >= 0 && last.received_bytes == 0) {
    return {"the request was taken, and no response came"};
  }
  return {};
}

Causes OfXml(const Evidence& evidence) {
  const std::string words = LowerCase(evidence.outcome.content_error);
  if (Contains(words, "entity")) return {"the document's entities multiply without end"};
  if (Contains(words, "depth")) return {"the document is nested more deeply than is allowed"};
  if (evidence.outcome.content == Content::kNoXml) return {"the response has no body"};
  return {};
}

Causes OfJson(const Evidence& evidence) {
  const Exchange& last = LastOf(evidence);
  const uint64_t head = std::min<uint64_t>(last.response.HeadBytes(), last.received.size());
  const std::string start = last.received.substr(static_cast<size_t>(head), 3);
  if (Contains(evidence.outcome.content_error, "too deeply")) {
    return {"it is nested more deeply than is allowed"};
  }
  if (start == "\xEF\xBB\xBF") return {"the body begins with a byte order mark"};
  return {};
}

Causes OfNoLength(const Evidence& evidence) {
  const ResponseMessage& response = LastOf(evidence).response;
  if (response.BodyFraming() == Framing::kChunked) return {"the service responds in chunks"};
  if (response.BodyFraming() == Framing::kLength) return {"the body is empty"};
  return {"the service tells the end of the body by closing"};
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
      {Id::kNoLength, OfNoLength},
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
  if (id == Id::kLoginRefused && Contains(LastOf(evidence).sent, "Authorization: Basic") &&
      Contains(LowerCase(LastOf(evidence).response.Value("WWW-Authenticate")), "digest")) {
    return "twhttp get -v {url}";  // which sends the credentials that are asked for
  }
  if (id == Id::kCertificate && evidence.options.operation->Uses(kVerify)) {
    return "twhttp {operation} -v --insecure {url}";
  }
  return FactsOf(id).next;
}
