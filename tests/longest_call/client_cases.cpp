// The client's operations over its socket.
#include <json/value.h>

#include <memory>

#include "tarnwick/http/twhttp.h"
#include "tests/longest_call/cases.h"
#include "tests/longest_call/client.h"

namespace {

// A little less than the seven waits of a small read.
constexpr double kJustInSeven = 6.9;

constexpr char kChallenge[] =
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Digest realm=\"r\", nonce=\"n\"\r\n"
    "Content-Length: 0\r\n\r\n";
constexpr char kSoapHead[] = "HTTP/1.1 200 OK\r\nContent-Length: 10\r\n\r\n";

// What came of the request, as the last response has it.
int Response(TWHttpClient* client) {
  int status = 0;
  return client->CheckResponse(status);
}

int Get(int port, bool buffered, bool https) {
  const auto client = NewClient(port, buffered, https);
  client->SendRequestByGet();
  return Response(client.get());
}

auto Getting(bool buffered, bool https) {
  return [=](int port) { return Get(port, buffered, https); };
}

int LogIn(int port) {
  const auto client = NewClient(port);
  client->SendRequest(HTTP_METHOD_GET, "");
  return Response(client.get());
}

int PostForm(int port) {
  const auto client = NewClient(port);
  client->SendRequestBySocketPost("a=1");
  return Response(client.get());
}

int Soap(int port) {
  std::string reply;
  return NewClient(port)->SendReqBySocketPost("<a/>", reply);
}

int SoapLogin(int port) {
  std::string reply;
  return NewClient(port)->SendAuthReqBySocketPost("<a/>", reply);
}

int Upload(int port) {
  const auto client = NewClient(port);
  if (client->OpenRawDataUpload() != HTTP_RET_OK) return -2;
  return client->GetResp() == "{\"error\":true}" ? -1 : 0;
}

int Json(int port) {
  Json::Value value;
  return SendHttpGet("127.0.0.1", port, "a.cgi", value, kTimeout, false);
}

int Form(int port) {
  return SendHttpPost("127.0.0.1", port, "a.cgi", "a=1", "s=1", kTimeout);
}

std::vector<Case> GetCases() {
  const std::vector<Script> late401 = {
      {ExpectRequest(), Pause(kJustInSeven), Send(kChallenge), Close()}, Silent()};
  return {
      {"any socket operation, nobody answers the connect",
       "T",
       1,
       {},
       Getting(true, false),
       HTTP_RET_NOT_READY,
       Peer::kBlackHole},
      {"SendRequestByGet, silence", "7 T", 7, {Silent()}, Getting(true, false), HTTP_RET_IO_ERROR},
      {"SendRequestByGet without read-ahead, silence",
       "T",
       1,
       {Silent()},
       Getting(false, false),
       HTTP_RET_IO_ERROR},
      {"SendRequestByGet over TLS, silence",
       "14 T",
       14,
       {Silent()},
       Getting(true, true),
       HTTP_RET_IO_ERROR,
       Peer::kTls},
      {"SendRequest(GET), a late 401 and silence", "14 T", 14, late401, LogIn, HTTP_RET_IO_ERROR},
      {"SendHttpGet, silence", "7 T", 7, {Silent()}, Json, -1},
  };
}

std::vector<Case> PostCases() {
  const std::vector<Script> late401 = {
      {ExpectRequest(), Pause(kJustInSeven), Send(kChallenge), Close()}, Silent()};
  return {
      {"SendRequestBySocketPost, silence", "7 T", 7, {Silent()}, PostForm, HTTP_RET_IO_ERROR},
      {"SendHttpPost, silence", "7 T", 7, {Silent()}, Form, 0},
      {"SendReqBySocketPost, silence", "7 T", 7, {Silent()}, Soap, HTTP_RET_IO_ERROR},
      {"SendReqBySocketPost, a late head and silence",
       "14 T",
       14,
       {{ExpectRequest(), Pause(kJustInSeven), Send(kSoapHead), StallUntilFinish()}},
       Soap,
       HTTP_RET_IO_ERROR},
      {"SendAuthReqBySocketPost, a late 401 and silence", "14 T", 14, late401, SoapLogin,
       HTTP_RET_IO_ERROR},
      {"GetResp behind an upload, silence",
       "7 T",
       7,
       {{ExpectUntil("\r\n\r\n"), StallUntilFinish()}},
       Upload,
       -1},
  };
}

}  // namespace

std::vector<Case> ClientCases() {
  std::vector<Case> all = GetCases();
  for (const Case& one : PostCases()) all.push_back(one);
  return all;
}
