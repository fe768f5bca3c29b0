// The rules that find a failure's class. The first that fits decides: what happened earlier on the
// wire explains what came later.
#include <curl/curl.h>
#include <netdb.h>

#include <cerrno>
#include <initializer_list>
#include <string_view>

#include "tools/twhttp/failure.h"

namespace {

using Id = FailureClass;

struct Rule {
  Id id;
  bool (*fits)(const Evidence& evidence);
};

bool Is(int code, std::initializer_list<int> codes) {
  for (const int each : codes) {
    if (code == each) return true;
  }
  return false;
}

bool CurlCode(const Evidence& evidence, std::initializer_list<int> codes) {
  return evidence.trace.curl.used && Is(evidence.trace.curl.code, codes);
}

// The connection that was being made when the operation ended; null when it was there.
const Connection* Unconnected(const Evidence& evidence) {
  const Connection* const last = evidence.trace.LastConnection();
  return last != nullptr && !last->connect.Done() ? last : nullptr;
}

bool ConnectError(const Evidence& evidence, std::initializer_list<int> errors) {
  if (CurlCode(evidence, {CURLE_COULDNT_CONNECT})) {
    return Is(evidence.trace.curl.os_error, errors);
  }
  const Connection* const last = Unconnected(evidence);
  return last != nullptr && last->connect.failed && Is(last->connect.error, errors);
}

// The exchange of the newest connection; null when nothing was sent over it.
const Exchange* Last(const Evidence& evidence) {
  const Exchange* const last = evidence.trace.LastExchange();
  const Connection* const newest = evidence.trace.LastConnection();
  return last != nullptr && newest != nullptr && last->connection == newest->number ? last
                                                                                    : nullptr;
}

bool CurlTimedOut(const Evidence& evidence) {
  return CurlCode(evidence, {CURLE_OPERATION_TIMEDOUT});
}

bool HeadMissing(const Exchange& exchange) {
  return !exchange.response.HeadComplete();
}

// The last wait for the peer passed without a byte, and it did not close either.
bool Silent(const Exchange& exchange) {
  return exchange.ended < 0 && exchange.empty_waits > 0;
}

bool LookUpFailed(const Evidence& evidence) {
  const Connection* const last = evidence.trace.LastConnection();
  return CurlCode(evidence, {CURLE_COULDNT_RESOLVE_HOST, CURLE_COULDNT_RESOLVE_PROXY}) ||
         (last != nullptr && last->look_up.failed);
}

bool ConnectTimedOut(const Evidence& evidence) {
  if (CurlTimedOut(evidence)) return Unconnected(evidence) != nullptr;
  return ConnectError(evidence, {ETIMEDOUT});
}

bool GaveUp(const Evidence& evidence) {
  return !evidence.outcome.good && evidence.stop == Stop::kGaveUp;
}

bool TlsFailed(const Evidence& evidence) {
  const Connection* const last = evidence.trace.LastConnection();
  if (last != nullptr && last->handshake.failed) return true;
  const bool handshake_missing = evidence.options.target.https && last != nullptr &&
                                 last->connect.Done() && last->handshake.end < 0;
  return CurlCode(evidence, {CURLE_SSL_CONNECT_ERROR, CURLE_SSL_CIPHER, CURLE_SSL_ENGINE_NOTFOUND,
                             CURLE_USE_SSL_FAILED}) ||
         (CurlTimedOut(evidence) && handshake_missing);
}

bool CertificateRefused(const Evidence& evidence) {
  return CurlCode(evidence, {CURLE_PEER_FAILED_VERIFICATION, CURLE_SSL_CACERT_BADFILE,
                             CURLE_SSL_INVALIDCERTSTATUS, CURLE_SSL_ISSUER_ERROR});
}

bool WasReset(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  const bool in_curl = CurlCode(evidence, {CURLE_RECV_ERROR, CURLE_SEND_ERROR}) &&
                       evidence.trace.curl.os_error == ECONNRESET;
  const bool says_so = evidence.trace.curl.text.find("reset by peer") != std::string::npos;
  const bool in_response =
      last != nullptr && last->end == End::kReset && !last->response.BodyComplete();
  return in_curl || says_so || ConnectError(evidence, {ECONNRESET}) || in_response ||
         (last != nullptr && last->send.failed && last->send.error == ECONNRESET);
}

bool WriteFailed(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (CurlCode(evidence, {CURLE_SEND_ERROR})) return true;
  return last != nullptr && last->send.failed;
}

bool NoReply(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (evidence.trace.curl.used) return CurlCode(evidence, {CURLE_GOT_NOTHING});
  return last != nullptr && last->received_bytes == 0 && last->end == End::kClosed &&
         !evidence.outcome.good;
}

bool KeptOpen(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  return last != nullptr && Silent(*last) && last->response.BodyComplete() &&
         !evidence.outcome.good;
}

bool ReadTimedOut(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (CurlTimedOut(evidence)) return true;
  if (last == nullptr || !Silent(*last) || last->response.BodyComplete()) return false;
  return HeadMissing(*last) || !evidence.outcome.good || !last->response.Missing().empty();
}

// What the library makes no head of, or another one than the peer meant.
bool HeadMalformed(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (CurlCode(evidence, {CURLE_WEIRD_SERVER_REPLY, CURLE_UNSUPPORTED_PROTOCOL})) return true;
  if (last == nullptr || last->received_bytes == 0) return false;
  if (HeadMissing(*last)) return true;
  if (evidence.trace.curl.used) return false;
  for (const HeadFinding& finding : FindingsOf(evidence.trace, *last)) {
    if (finding.breaks) return true;
  }
  const bool refused = evidence.outcome.last == HTTP_RET_NOT_READY;
  return (refused && !evidence.outcome.good) || last->response.Status() < 100;
}

bool BodyCut(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (CurlCode(evidence, {CURLE_PARTIAL_FILE, CURLE_BAD_CONTENT_ENCODING})) return true;
  if (CurlCode(evidence, {CURLE_RECV_ERROR}) && last != nullptr) return !HeadMissing(*last);
  if (last == nullptr) return false;
  if (last->response.BadChunk()) return true;
  if (last->end == End::kKept) return false;
  return !last->response.Missing().empty();
}

// libcurl goes on sending credentials as long as the peer calls the nonce stale, until it runs out
// of time or has read too much.
bool LoginRefusedForEver(const Evidence& evidence) {
  constexpr size_t kMany = 5;
  const std::vector<Exchange>& exchanges = evidence.trace.Exchanges();
  if (CurlCode(evidence, {CURLE_OK}) || exchanges.size() < kMany) return false;
  const Exchange& before = exchanges[exchanges.size() - 2];
  return before.response.Status() == 401 && SentCredentials(before);
}

bool LoginRefused(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  return last != nullptr && last->response.Status() == 401 && SentCredentials(*last);
}

bool LoginWanted(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  return last != nullptr && last->response.Status() == 401;
}

bool StatusIsNoSuccess(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  if (last == nullptr || HeadMissing(*last)) return false;
  return last->response.Status() < 200 || last->response.Status() > 299;
}

bool NoLength(const Evidence& evidence) {
  const OperationId id = evidence.options.operation->id;
  const bool soap = Is(static_cast<int>(id), {static_cast<int>(OperationId::kSoap),
                                              static_cast<int>(OperationId::kSoapXml),
                                              static_cast<int>(OperationId::kSoapAuth)});
  const Exchange* const last = Last(evidence);
  if (!soap || last == nullptr || evidence.outcome.result != HTTP_RET_IO_ERROR) return false;
  return last->response.BodyFraming() != Framing::kLength || last->response.Announced() == 0;
}

bool EmptyBody(const Evidence& evidence) {
  const Exchange* const last = Last(evidence);
  return evidence.options.operation->id == OperationId::kJsonGet && !evidence.outcome.good &&
         last != nullptr && last->response.HeadComplete() && last->response.BodyBytes() == 0;
}

template <Content content>
bool HasContent(const Evidence& evidence) {
  return evidence.outcome.content == content;
}

constexpr Rule kRules[] = {
    {Id::kInterrupted,
     [](const Evidence& evidence) { return evidence.stop == Stop::kInterrupted; }},
    {Id::kLocalFile,
     [](const Evidence& evidence) {
       return evidence.outcome.output_failed || CurlCode(evidence, {CURLE_WRITE_ERROR});
     }},
    {Id::kLookUp, LookUpFailed},
    {Id::kRefused, [](const Evidence& evidence) { return ConnectError(evidence, {ECONNREFUSED}); }},
    {Id::kConnectTimeout, ConnectTimedOut},
    {Id::kUnreachable,
     [](const Evidence& evidence) {
       return ConnectError(evidence, {ENETUNREACH, EHOSTUNREACH, EHOSTDOWN, ENETDOWN, EACCES, EPERM,
                                      EADDRNOTAVAIL, EINVAL});
     }},
    {Id::kCertificate, CertificateRefused},
    {Id::kTls, TlsFailed},
    {Id::kGaveUp, GaveUp},
    {Id::kReset, WasReset},
    {Id::kWriteFailed, WriteFailed},
    {Id::kNoReply, NoReply},
    {Id::kKeptOpen, KeptOpen},
    {Id::kLoginRefused, LoginRefusedForEver},
    {Id::kReadTimeout, ReadTimedOut},
    {Id::kMalformedHead, HeadMalformed},
    {Id::kLoginRefused, LoginRefused},
    {Id::kLoginWanted, LoginWanted},
    {Id::kCutBody, BodyCut},
    {Id::kStatus, StatusIsNoSuccess},
    {Id::kNoLength, NoLength},
    {Id::kEmptyBody, EmptyBody},
    {Id::kXml,
     [](const Evidence& evidence) {
       return HasContent<Content::kNotXml>(evidence) || HasContent<Content::kNoXml>(evidence);
     }},
    {Id::kJson, HasContent<Content::kNotJson>},
    {Id::kNotSuccess, HasContent<Content::kNotSuccess>},
    {Id::kOther, [](const Evidence& evidence) { return !evidence.outcome.good; }},
};

}  // namespace

FailureClass Classify(const Evidence& evidence) {
  for (const Rule& rule : kRules) {
    if (rule.fits(evidence)) return rule.id;
  }
  return Id::kNone;
}
