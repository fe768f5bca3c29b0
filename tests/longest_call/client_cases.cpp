// The client's operations over its socket.
#include <json/value.h>
#include <libxml/tree.h>

#include <memory>

#include "tarnwick/http/twhttp.h"
#include "tests/longest_call/cases.h"
#include "tests/longest_call/client.h"

namespace {

constexpr char kEnvelope[] = "<GetDeviceInformation/>";

// What came of the request, as the last response has it.
int Response(TWHttpClient* client) {
  int status = 0;
  return client->CheckResponse(status);
}

int Get(int port, bool buffered, bool https) {
  const auto client = NewClient(port, kJsonPath, buffered, https);
  client->SendRequestByGet();
  return Response(client.get());
}

auto Getting(bool buffered, bool https) {
  return [=](int port) { return Get(port, buffered, https); };
}

int LogIn(int port) {
  const auto client = NewClient(port, kCgiPath);
  client->SendRequest(HTTP_METHOD_GET, "");
  return Response(client.get());
}

int PostForm(int port) {
  const auto client = NewClient(port, kCgiPath);
  client->SendRequestBySocketPost("a=1");
  return Response(client.get());
}

int Soap(int port) {
  std::string reply;
  return NewClient(port)->SendReqBySocketPost(kEnvelope, reply);
}

int SoapXml(int port) {
  xmlDoc* doc = nullptr;
  const int result = NewClient(port)->SendReqByXMLSocketPost(kEnvelope, doc);
  xmlFreeDoc(doc);
  return result;
}

int SoapLogin(int port) {
  std::string reply;
  return NewClient(port)->SendAuthReqBySocketPost(kEnvelope, reply);
}

int Upload(int port) {
  const auto client = NewClient(port);
  if (client->OpenRawDataUpload() != HTTP_RET_OK) return -2;
  return client->GetResp() == "{\"error\":true}" ? -1 : 0;
}

int Json(int port) {
  Json::Value value;
  return SendHttpGet("127.0.0.1", port, kJsonPath, value, kTimeout, false);
}

int Form(int port) {
  return SendHttpPost("127.0.0.1", port, kCgiPath, "a=1", "s=1", kTimeout);
}

// An answer is late when it comes a little before the end of the seven waits of a small read.
std::vector<Case> GetCases() {
  const Peer silent = Camera("json,fault=stall-before-status");
  return {
      {"any socket operation, nobody answers the connect", "T", 1, Camera("json,fault=black-hole"),
       Getting(true, false), HTTP_RET_NOT_READY},
      {"SendRequestByGet, silence", "7 T", 7, silent, Getting(true, false), HTTP_RET_IO_ERROR},
      {"SendRequestByGet, silence in the head", "7 T", 7, Camera("json,fault=stall-in-head"),
       Getting(true, false), HTTP_RET_IO_ERROR},
      // The head has 95 bytes.
      {"SendRequestByGet, the head in two pieces, each late", "7 T for each piece", 14,
       Camera("json,fault=stall-before-status:6900,fault=slow:60:6900"), Getting(true, false),
       HTTP_RET_OK},
      {"SendRequestByGet without read-ahead, silence", "T", 1, silent, Getting(false, false),
       HTTP_RET_IO_ERROR},
      {"SendRequestByGet over TLS, silence in the head", "14 T", 14,
       Camera("json,tls,fault=stall-in-head"), Getting(true, true), HTTP_RET_IO_ERROR},
      {"SendRequest(GET), a late 401 and a late answer", "14 T", 14,
       Camera("cgi-digest,fault=stall-before-status:6900"), LogIn, HTTP_RET_OK},
      {"SendHttpGet, silence", "7 T", 7, silent, Json, -1},
      {"SendHttpGet, a late head and silence in the body", "7 T + 3 T", 10,
       Camera("json,fault=stall-in-body:10,fault=stall-before-status:6900"), Json, -1},
      {"SendHttpGet, a late 401, a late head and silence in the body", "14 T + 3 T", 17,
       Camera("json,login=digest,user=,password=,fault=stall-in-body:10,fault=stall-before-status:"
              "6900"),
       Json, -1},
  };
}

std::vector<Case> PostCases() {
  const Peer silent = Camera("cgi,fault=stall-before-status");
  const Peer late_head = Camera("soap,fault=stall-before-status:6900,fault=stall-after-head");
  return {
      {"SendRequestBySocketPost, silence", "7 T", 7, silent, PostForm, HTTP_RET_IO_ERROR},
      {"SendHttpPost, silence", "7 T", 7, silent, Form, 0},
      {"SendReqBySocketPost, silence", "7 T", 7, Camera("soap,fault=stall-before-status"), Soap,
       HTTP_RET_IO_ERROR},
      {"SendReqBySocketPost, a late head and silence", "14 T", 14, late_head, Soap,
       HTTP_RET_IO_ERROR},
      {"SendReqByXMLSocketPost, a late head and silence", "14 T", 14, late_head, SoapXml,
       HTTP_RET_IO_ERROR},
      {"SendAuthReqBySocketPost, a late 401 and a late answer", "14 T", 14,
       Camera("soap,login=digest,fault=stall-before-status:6900"), SoapLogin, HTTP_RET_OK},
      {"GetResp behind an upload, silence", "7 T", 7, Camera("upload,fault=stall-after-request"),
       Upload, -1},
  };
}

}  // namespace

std::vector<Case> ClientCases() {
  std::vector<Case> all = GetCases();
  for (const Case& one : PostCases()) all.push_back(one);
  return all;
}
