// The operations with a server: run from the shared table as the plan says, and judged by what the
// server had to send.
#include <arpa/inet.h>

#include <algorithm>

#include "tests/operations/operations.h"
#include "tests/soak/operations.h"

namespace {

int PortOf(const Plan& plan, const Endpoints& endpoints) {
  switch (plan.fault) {
    case Fault::kRefused:
      return endpoints.refused;
    case Fault::kBlackHole:
      return endpoints.black_hole;
    case Fault::kHangUp:
      return endpoints.server.hang_up;
    case Fault::kNoise:
      return endpoints.server.noise;
    case Fault::kSilence:
      return endpoints.server.silence;
    case Fault::kBadCertificate:
      return endpoints.server.bad_certificate;
    default:
      return plan.tls ? endpoints.server.tls : endpoints.server.plain;
  }
}

// In seconds: small where nothing but the limit ends the request.
int TimeoutOf(const Plan& plan) {
  constexpr int kGenerous = 30;
  const bool waits = plan.fault == Fault::kBlackHole || plan.fault == Fault::kSilence ||
                     plan.fault == Fault::kStall || plan.fault == Fault::kStallBody;
  return waits ? 1 : kGenerous;
}

// What the path, or a request of the caller's own, carries beside the plan.
std::string PathOf(const Plan& plan) {
  std::string path = ToPath(plan);
  if (Has(plan, kSendsQuery)) path += kQuery;
  if (OperationOf(plan).name == std::string("curl_login_form")) path += "?" + RequestBodyOf(plan);
  return Has(plan, kOneObject) ? "//" + path : path;
}

void SetRequest(const Plan& plan, OperationSettings* settings) {
  settings->path = PathOf(plan);
  settings->body = Has(plan, kLine) ? "LINE " + ToPath(plan) + "\r\n\r\n" : RequestBodyOf(plan);
  settings->second = "GET /" + ToPath(plan) + "second HTTP/1.1\r\nHost: soak\r\n\r\n";
  const bool post = OperationOf(plan).name == std::string("json_post");
  if (Has(plan, kSendsCookie) || (post && plan.id % 2 == 0)) {
    settings->cookie = "id=" + std::to_string(plan.id);
  }
}

// What the plan leaves open changes with its number.
OperationSettings SettingsOf(const Plan& plan, const Session& session) {
  OperationSettings settings;
  settings.host = plan.id % 8 == 0 ? "localhost" : "127.0.0.1";
  settings.port = PortOf(plan, session.endpoints);
  SetRequest(plan, &settings);
  settings.user = kUser;
  settings.password = kPassword;
  settings.timeout = settings.limit = TimeoutOf(plan);
  settings.https = plan.tls;
  // Without a buffer a SOAP request takes what one read returns for the response.
  settings.buffered = plan.size > 4000 || plan.id % 8 != 1 || Has(plan, kSoap) || Has(plan, kLine);
  settings.encode_query = Has(plan, kSendsQuery);
  settings.basic_auth = plan.scheme == Scheme::kBasic && plan.id % 2 == 0;
  settings.version = static_cast<HTTP_VERSION>(plan.id % 3);
  // Half of the TLS requests trust the server's authority, the others anybody; the one that must
  // meet the wrong certificate verifies it.
  settings.verify = plan.fault == Fault::kBadCertificate || plan.id % 2 == 0;
  settings.piece = Has(plan, kLine)                            ? plan.size + 1
                   : OperationOf(plan).sends == Sends::kUpload ? 30000
                                                               : 1 + plan.id % 5000;
  if (Has(plan, kLine) && plan.id % 2 == 0) settings.address = htonl(INADDR_LOOPBACK);
  return settings;
}

// The port of a fault is another one, which an object cannot change to, so such a plan has an
// object of its own.
void TakeOneObject(const Plan& plan, Session* session, OperationSettings* settings) {
  const ServerPorts& ports = session->endpoints.server;
  const bool usual = settings->port == (plan.tls ? ports.tls : ports.plain);
  if (!Has(plan, kOneObject) || !usual || settings->timeout == 1) return;
  auto& client = session->again[plan.tls ? 1 : 0];
  if (!client) client = std::make_shared<ExposedClient>(settings->port, *settings);
  settings->client = client;
}

Outcome FailedBy(const char* what, int result) {
  return {Outcome::kFailed, std::string("with ") + what + " " + std::to_string(result)};
}

Outcome JudgeFailure(const Plan& plan, const PeerOperation& operation, int result) {
  const std::vector<int>& failures = operation.failures;
  const bool documented = std::find(failures.begin(), failures.end(), result) != failures.end();
  const int certificate = operation.tls == OverTls::kAlways ? -2 : HTTP_RET_CERT_ERROR;
  const bool fits =
      !operation.curl || (result == certificate) == (plan.fault == Fault::kBadCertificate);
  // The server sends none of the statuses of these.
  const bool sent = result != HTTP_RET_REDIRECT && result != HTTP_RET_URI_TOO_LONG;
  return documented && fits && sent ? FailedBy("result", result)
                                    : Wrong("result " + std::to_string(result));
}

// What CheckResponse says where the response is none to read on.
Outcome JudgeResponse(const OperationResult& result) {
  const int response = result.response;
  if (response == HTTP_RET_UNAUTHORIZED && result.status != 401) {
    return Wrong("401 without its status");
  }
  const bool known = response == HTTP_RET_NOT_READY || response == HTTP_RET_IO_ERROR ||
                     response == HTTP_RET_UNAUTHORIZED || response == HTTP_RET_BAD_RESPONSE;
  return known ? FailedBy("response", response) : Wrong("response " + std::to_string(response));
}

// The header fields of a right response, whose cookie keeps its semicolon.
bool HeadIsRight(const Plan& plan, const OperationResult& result) {
  const std::string id = std::to_string(plan.id);
  const bool chunked = plan.framing == Framing::kChunked && !Has(plan, kTwoRequests);
  const std::string announced = result.Field(HTTP_CONTENT_LENGTH);
  const bool length = announced.empty() || announced == std::to_string(ResponseBodyOf(plan).size());
  return result.Field(HTTP_CONTENT_TYPE) == "text/x-soak; id=" + id &&
         result.cookie == "id=" + id + ";" && length && (result.encoding == "chunked") == chunked;
}

// The text of a right response, as the operation shows it.
std::string WantedText(const Plan& plan) {
  if (Has(plan, kXml)) return "<?xml version=\"1.0\"?>\n" + ResponseBodyOf(plan) + "\n";
  if (!Has(plan, kJson)) return ResponseBodyOf(plan);
  return "{\n\t\"success\" : true,\n\t\"value\" : \"" + ValueOf(plan) + "\"\n}\n";
}

// The file holds the header fields, an empty line and the body.
Outcome JudgeFile(const Plan& plan, const std::string& content) {
  const std::string id = std::to_string(plan.id);
  const size_t head = content.find("\r\n\r\n");
  // A head that broke off ends without its empty line.
  if (head == std::string::npos && plan.fault == Fault::kCutHead) return {Outcome::kCut, ""};
  const std::string start = "Content-Type: text/x-soak; id=" + id + "\r\nSet-Cookie: id=" + id;
  if (head == std::string::npos || content.rfind(start, 0) != 0) return Wrong("the file's head");
  return Compare(content.substr(head + 4), ResponseBodyOf(plan));
}

Outcome JudgeLine(const Plan& plan, const OperationResult& result) {
  if (result.first.empty()) return FailedBy("a line of", result.read);
  const Outcome outcome = Compare(result.first, ResponseBodyOf(plan));
  if (outcome.kind != Outcome::kRight) return outcome;
  return result.has_text && result.text.empty() ? outcome : Wrong("no end");
}

Outcome JudgeText(const Plan& plan, const OperationResult& result) {
  const Outcome outcome = Compare(result.text, WantedText(plan));
  // A success may leave the value as it was: the response was empty.
  const bool cut = result.has_text || (Has(plan, kJson) && result.untouched);
  if (outcome.kind == Outcome::kWrong || cut) return outcome;
  return {Outcome::kFailed, "without its text"};
}

Outcome Judge(const Plan& plan, const PeerOperation& operation, const OperationResult& result) {
  if (!result.mistake.empty()) return Wrong(result.mistake);
  if (result.result != HTTP_RET_OK) return JudgeFailure(plan, operation, result.result);
  const bool has_head = !operation.curl && result.status != -1;
  if (has_head && result.response != HTTP_RET_OK) return JudgeResponse(result);
  const bool healthy = plan.fault == Fault::kNone;
  if (healthy && has_head && !HeadIsRight(plan, result)) return Wrong("header fields");
  if (healthy && !result.healthy) return Wrong("a smaller call");
  if (Has(plan, kReadsNothing)) return {};
  if (Has(plan, kLine)) return JudgeLine(plan, result);
  if (Has(plan, kTwoRequests) && result.first != ResponseBodyOf(plan))
    return Wrong("first response");
  if (operation.name == std::string("curl_get_file")) return JudgeFile(plan, result.text);
  return JudgeText(plan, result);
}

}  // namespace

Outcome RunPeerOperation(const Plan& plan, Session* session) {
  OperationSettings settings = SettingsOf(plan, *session);
  TakeOneObject(plan, session, &settings);
  const PeerOperation& operation = OperationNamed(OperationOf(plan).name);
  return Judge(plan, operation, operation.run(settings));
}
