// The requests over the client's own socket, and the sockets alone.
#include <arpa/inet.h>
#include <json/json.h>

#include <algorithm>
#include <cstring>

#include "tarnwick/net/sslsocket.h"
#include "tests/soak/operations.h"

namespace {

constexpr char kErrorText[] = "{\"error\":true}";

// The headers of a right reply, whose cookie keeps its semicolon.
bool HeadersAreRight(const Plan& plan, TWHttpClient* client) {
  const std::string id = std::to_string(plan.id);
  std::string type;
  std::string cookie;
  std::string length = std::to_string(AnswerOf(plan).size());
  client->GetHttpContent(HTTP_CONTENT_TYPE, type);
  client->GetHttpContent(HTTP_CONTENT_LENGTH, length);
  client->GetCookie(cookie);
  const bool chunked = client->GetTransferEncoding() == "chunked";
  return type == "text/x-soak; id=" + id && cookie == "id=" + id + ";" &&
         length == std::to_string(AnswerOf(plan).size()) &&
         chunked == (plan.framing == Framing::kChunked);
}

// What CheckResponse says where the reply is none to read on.
Outcome Refused(TWHttpClient* client) {
  int status = 0;
  const int result = client->CheckResponse(status);
  if (result == HTTP_RET_UNAUTHORIZED && status != 401) return Wrong("401 without its status");
  return FailedWith(result, {HTTP_RET_NOT_READY, HTTP_RET_IO_ERROR, HTTP_RET_UNAUTHORIZED,
                             HTTP_RET_BAD_RESPONSE});
}

bool IsSuccess(TWHttpClient* client) {
  int status = 0;
  return client->CheckResponse(status) == HTTP_RET_OK && status == 200;
}

// The answer behind a request that has read the head itself.
Outcome ReadAnswer(const Plan& plan, int sent, TWHttpClient* client) {
  if (sent != HTTP_RET_OK) return FailedWith(sent, {HTTP_RET_IO_ERROR});
  if (!IsSuccess(client)) return Refused(client);
  if (plan.fault == Fault::kNone && !HeadersAreRight(plan, client)) return Wrong("headers");
  std::string body;
  const int result = client->ReadBody(body);
  const Outcome outcome = Compare(body, AnswerOf(plan));
  if (outcome.kind == Outcome::kWrong || result == HTTP_RET_OK) return outcome;
  return FailedWith(result, {HTTP_RET_IO_ERROR});
}

Outcome Get(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan) + kQuery);
  return ReadAnswer(plan, client->SendRequestByGet(), client.get());
}

// As a daemon polls a camera. The port of a fault is another one, which an object cannot change to,
// so such a plan has an object of its own.
Outcome GetAgain(const Plan& plan, Session* session) {
  const bool other_port =
      PortOf(plan, session->endpoints) !=
      (plan.tls ? session->endpoints.server.tls : session->endpoints.server.plain);
  if (other_port || TimeoutOf(plan) == 1) {
    const auto client = NewClient(plan, *session, ToPath(plan));
    return ReadAnswer(plan, client->SendRequestByGet(), client.get());
  }
  auto& client = session->again[plan.tls ? 1 : 0];
  if (!client) client = NewClient(plan, *session, "");
  client->SetPath("//" + ToPath(plan));
  return ReadAnswer(plan, client->SendRequestByGet(), client.get());
}

// The body in the pieces that a caller's buffer gives.
Outcome GetPieces(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  const int sent = client->SendRequestByGet();
  if (sent != HTTP_RET_OK) return FailedWith(sent, {HTTP_RET_IO_ERROR});
  if (!IsSuccess(client.get())) return Refused(client.get());
  std::string body;
  char piece[5000];
  const int size = static_cast<int>(1 + plan.id % sizeof(piece));
  int count;
  while ((count = client->ReadData(piece, size)) > 0) {
    body.append(piece, static_cast<size_t>(count));
  }
  const Outcome outcome = Compare(body, AnswerOf(plan));
  if (outcome.kind == Outcome::kWrong || count == 0) return outcome;
  return FailedWith(count, {-1});
}

Outcome LoginGet(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  return ReadAnswer(plan, client->SendRequest(HTTP_METHOD_GET, ""), client.get());
}

Outcome FormPost(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  client->SetCookie("id=" + std::to_string(plan.id));
  return ReadAnswer(plan, client->SendRequestBySocketPost(RequestBodyOf(plan)), client.get());
}

Outcome Soap(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  std::string reply = "untouched";
  const int result = client->SendReqBySocketPost(RequestBodyOf(plan), reply);
  if (result != HTTP_RET_OK) {
    return reply == "untouched" ? FailedWith(result, {HTTP_RET_IO_ERROR}) : Wrong("reply changed");
  }
  return IsSuccess(client.get()) ? Compare(reply, AnswerOf(plan)) : Refused(client.get());
}

Outcome SoapLogin(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  std::string reply;
  const int result = client->SendAuthReqBySocketPost(RequestBodyOf(plan), reply);
  if (result == HTTP_RET_OK) return Compare(reply, AnswerOf(plan));
  return FailedWith(result, {HTTP_RET_NOT_READY, HTTP_RET_IO_ERROR, HTTP_RET_UNAUTHORIZED,
                             HTTP_RET_BAD_RESPONSE});
}

// A document that is cut is none: success, and a null pointer.
Outcome SoapXml(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  xmlDoc* doc = nullptr;
  const int result = client->SendReqByXMLSocketPost(RequestBodyOf(plan), doc);
  if (result != HTTP_RET_OK) return FailedWith(result, {HTTP_RET_IO_ERROR});
  if (doc == nullptr) return {Outcome::kFailed, "without a document"};
  return CompareXml(plan, doc);
}

// The verdict on GetResp, whose failure is a text.
Outcome CompareResponse(const Plan& plan, const std::string& text) {
  if (text == kErrorText) return {Outcome::kFailed, "by its text"};
  return Compare(text, AnswerOf(plan));
}

Outcome Upload(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  const int result = client->OpenRawDataUpload();
  if (result != HTTP_RET_OK) return FailedWith(result, {HTTP_RET_IO_ERROR});
  const std::string parts = RequestBodyOf(plan);
  for (size_t sent = 0; sent < parts.size();) {
    const int size = static_cast<int>(std::min<size_t>(30000, parts.size() - sent));
    const int count = client->WriteData(parts.data() + sent, size);
    if (count != size) {
      return count < size ? Outcome{Outcome::kFailed, "while writing"} : Wrong("bytes written");
    }
    sent += static_cast<size_t>(count);
  }
  return CompareResponse(plan, client->GetResp());
}

Outcome SecondRequest(const Plan& plan, const Session& session) {
  const auto client = NewClient(plan, session, ToPath(plan));
  const int sent = client->SendRequestByGet();
  if (sent != HTTP_RET_OK) return FailedWith(sent, {HTTP_RET_IO_ERROR});
  if (!IsSuccess(client.get())) return Refused(client.get());
  const std::string wanted = AnswerOf(plan);
  std::string body;
  char piece[4096];
  while (body.size() < wanted.size()) {
    const size_t most = std::min(sizeof(piece), wanted.size() - body.size());
    const int count = client->ReadData(piece, static_cast<int>(most));
    if (count <= 0) return Wrong("the first reply broke off");
    body.append(piece, static_cast<size_t>(count));
  }
  if (body != wanted) return Wrong("the first reply differs");
  const std::string request = "GET /" + ToPath(plan) + "second HTTP/1.1\r\nHost: soak\r\n\r\n";
  const int size = static_cast<int>(request.size());
  if (client->WriteData(request.data(), size) != size) return {Outcome::kFailed, "while writing"};
  return CompareResponse(plan, client->GetResp());
}

Outcome JsonGet(const Plan& plan, const Session& session) {
  Json::Value reply;
  const int result = SendHttpGet("127.0.0.1", PortOf(plan, session.endpoints),
                                 ToPath(plan) + kQuery, reply, TimeoutOf(plan), true);
  if (result != 0) return FailedWith(result, {-1, -2});
  return Compare(reply["value"].asString(), ValueOf(plan));
}

Outcome JsonPost(const Plan& plan, const Session& session) {
  const std::string cookie = plan.id % 2 == 0 ? "id=" + std::to_string(plan.id) : "";
  const int result = SendHttpPost("127.0.0.1", PortOf(plan, session.endpoints), ToPath(plan),
                                  RequestBodyOf(plan), cookie, TimeoutOf(plan));
  return result == 0 ? Outcome() : FailedWith(result, {-1});
}

// Reads a line, pushes its beginning back, and reads it again.
Outcome ReadLine(const Plan& plan, TWSocket* socket) {
  std::string line(plan.size + 2, '\0');
  const int length = socket->ReadToLineEnd(line.data(), static_cast<int>(line.size()));
  if (length < 0) return FailedWith(length, {-1});
  line.resize(static_cast<size_t>(length));
  if (line.empty() && socket->IsEOF()) return {Outcome::kFailed, "by the end"};
  const Outcome outcome = Compare(line, AnswerOf(plan));
  if (outcome.kind != Outcome::kRight) return outcome;
  std::string start = line.substr(0, 1000);
  const int size = static_cast<int>(start.size());
  if (socket->RestoreData(start.data(), size) != 0) return Wrong("RestoreData");
  std::string again(start.size(), '\0');
  if (socket->ReadData(again.data(), size) != size || again != start) return Wrong("pushed back");
  char rest;
  if (socket->ReadData(&rest, 1) != 0 || !socket->IsEOF()) return Wrong("no end");
  return outcome;
}

Outcome Lines(const Plan& plan, const Session& session) {
  const int port = PortOf(plan, session.endpoints);
  const int timeout = TimeoutOf(plan);
  std::unique_ptr<TWSocket> socket;
  if (plan.tls) {
    socket = std::make_unique<SSLSocket>("127.0.0.1", port, timeout, true);
  } else {
    socket = std::make_unique<TWSocket>("127.0.0.1", port, timeout, true);
  }
  if (plan.id % 2 == 0) socket->SetRemoteAddr(htonl(INADDR_LOOPBACK));
  const int connected = socket->Connect();
  if (connected < 0) return {Outcome::kFailed, "to connect"};
  if (connected != 0 || !socket->IsConnected()) return Wrong("connected");
  // The peer of a fault may have closed by now.
  const bool kept = socket->SetKeepAliveOpt(1, 60, 10, 3) == 0;
  if (!kept && plan.fault == Fault::kNone) return Wrong("keep-alive");
  const std::string request = "LINE " + ToPath(plan) + "\r\n\r\n";
  const int size = static_cast<int>(request.size());
  if (socket->WriteData(request.data(), size) != size) return {Outcome::kFailed, "while writing"};
  if (plan.fault == Fault::kNone && !plan.tls && !socket->HasDataToRead(TimeoutOf(plan))) {
    return Wrong("nothing to read");
  }
  const Outcome outcome = ReadLine(plan, socket.get());
  socket->Disconnect();
  return socket->IsConnected() ? Wrong("still connected") : outcome;
}

}  // namespace

Outcome RunSocketOperation(const Plan& plan, Session* session) {
  switch (plan.operation) {
    case Operation::kGet:
      return Get(plan, *session);
    case Operation::kGetAgain:
      return GetAgain(plan, session);
    case Operation::kGetPieces:
      return GetPieces(plan, *session);
    case Operation::kLoginGet:
      return LoginGet(plan, *session);
    case Operation::kFormPost:
      return FormPost(plan, *session);
    case Operation::kSoap:
      return Soap(plan, *session);
    case Operation::kSoapLogin:
      return SoapLogin(plan, *session);
    case Operation::kSoapXml:
      return SoapXml(plan, *session);
    case Operation::kUpload:
      return Upload(plan, *session);
    case Operation::kSecondRequest:
      return SecondRequest(plan, *session);
    case Operation::kLines:
      return Lines(plan, *session);
    case Operation::kJsonGet:
      return JsonGet(plan, *session);
    case Operation::kJsonPost:
      return JsonPost(plan, *session);
    default:
      return Wrong("no such operation");
  }
}
