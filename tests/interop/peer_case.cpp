#include "tests/interop/peer_case.h"

#include <gmock/gmock.h>
#include <json/json.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include "tests/interop/certificates.h"

namespace {

using ::testing::HasSubstr;

constexpr char kForm[] = "pan=3&tilt=-4";
constexpr char kEnvelope[] =
    "<?xml version=\"1.0\" encoding=\"UTF-8\"?>"
    "<s:Envelope xmlns:s=\"http://schemas.xmlsoap.org/soap/envelope/\"><s:Body>"
    "<GetInfo xmlns=\"urn:camera\"><name>gate</name></GetInfo></s:Body></s:Envelope>";
constexpr char kUploadBody[] = "-------------QUENMULTIPART_BOUNDARY-----------\r\n\r\n12345\r\n";

const char* NameOf(Op op) {
  switch (op) {
    case Op::kHttpGet:
      return "SendHttpGet";
    case Op::kHttpPost:
      return "SendHttpPost";
    case Op::kHttpsGet:
      return "SendHttpsGet";
    case Op::kGet:
      return "SendRequest (GET)";
    case Op::kForm:
      return "SendRequestBySocketPost with ReadBody";
    case Op::kPost:
      return "SendRequest (POST)";
    case Op::kSoap:
      return "SendReqBySocketPost";
    case Op::kSoapAuth:
      return "SendAuthReqBySocketPost";
    case Op::kXmlGet:
      return "SendReqByXMLGet with GetResponseXML";
    case Op::kXmlPut:
      return "SendReqByXMLPut with GetResponseXML";
    case Op::kCurl:
      return "SendRequestByCurl (GET)";
    case Op::kUpload:
      return "OpenRawDataUpload with GetResp";
  }
  return "";
}

bool ReadsByCurl(Op op) {
  return op == Op::kHttpsGet || op == Op::kPost || op == Op::kXmlGet || op == Op::kXmlPut ||
         op == Op::kCurl;
}

bool IsOneCall(Op op) {
  return op == Op::kHttpGet || op == Op::kHttpPost || op == Op::kHttpsGet;
}

bool IsTls(const PeerCase& c) {
  return std::string(c.transport) != "plain";
}

// What came: the operation's result, and a text.
struct Response {
  int result;
  std::string text;
};

Response SendOneCall(int port, const PeerCase& c) {
  Json::Value value;
  if (c.op == Op::kHttpPost) {
    return {SendHttpPost("127.0.0.1", port, c.path, kForm, "session=42", 1), ""};
  }
  if (c.op == Op::kHttpGet) {
    const int result = SendHttpGet("127.0.0.1", port, c.path, value, 1, false);
    return {result, value.toStyledString()};
  }
  const TrustedAuthority trusted(Certificates().CaFile());
  const int result = SendHttpsGet("127.0.0.1", port, c.path, value, 10);
  return {result, value.toStyledString()};
}

Response WithBody(ExposedClient* client, int sent) {
  if (sent != HTTP_RET_OK) return {sent, ""};
  Response response;
  response.result = client->ReadBody(response.text);
  return response;
}

Response WithDocument(ExposedClient* client, int sent) {
  xmlDoc* doc = nullptr;
  if (!client->GetResponseXML(doc)) return {sent, ""};
  xmlChar* value =
      xmlGetProp(xmlDocGetRootElement(doc), reinterpret_cast<const xmlChar*>("method"));
  const Response response = {sent, value != nullptr ? reinterpret_cast<const char*>(value) : ""};
  xmlFree(value);
  xmlFreeDoc(doc);
  return response;
}

Response PutXml(ExposedClient* client) {
  xmlDoc* doc =
      xmlReadDoc(reinterpret_cast<const xmlChar*>("<preset id=\"7\"/>"), nullptr, nullptr, 0);
  const int sent = client->SendReqByXMLPut(doc);
  xmlFreeDoc(doc);
  return WithDocument(client, sent);
}

Response Upload(ExposedClient* client) {
  const int opened = client->OpenRawDataUpload();
  if (opened != HTTP_RET_OK) return {opened, ""};
  client->WriteData(kUploadBody, sizeof(kUploadBody) - 1);  // a server that has refused may be gone
  return {opened, client->GetResp()};
}

Response Send(ExposedClient* client, Op op) {
  std::string text;
  int result;
  switch (op) {
    case Op::kForm:
      return WithBody(client, client->SendRequestBySocketPost(kForm));
    case Op::kPost:
      return {client->SendRequest(HTTP_METHOD_POST, "?"), ""};
    case Op::kSoap:
      result = client->SendReqBySocketPost(kEnvelope, text);
      return {result, text};
    case Op::kSoapAuth:
      result = client->SendAuthReqBySocketPost(kEnvelope, text);
      return {result, text};
    case Op::kXmlGet:
      return WithDocument(client, client->SendReqByXMLGet(10));
    case Op::kXmlPut:
      return PutXml(client);
    case Op::kCurl:
      result = client->SendRequestByCurl(HTTP_METHOD_GET, false, 10);
      return {result, client->GetCurlText()};
    case Op::kUpload:
      return Upload(client);
    default:
      return WithBody(client, client->SendRequest(HTTP_METHOD_GET, ""));
  }
}

std::string InWords(const Outcome& outcome) {
  return "result " + std::to_string(outcome.result) + ", CheckResponse " +
         std::to_string(outcome.check) + ", status " + std::to_string(outcome.status);
}

ClientSettings SettingsOf(const PeerCase& c, bool buffered) {
  ClientSettings settings = LoginTo({IsTls(c), buffered}, c.path);
  const std::string login = c.login;
  if (login == "none") settings.user = settings.password = "";
  if (login == "wrong password") settings.password = "gate-8";
  settings.version = c.version;
  settings.timeout = c.expected.waits ? 1 : 15;
  return settings;
}

void PlayOnce(const WebServer& server, const PeerCase& c, bool buffered) {
  const char* reading = ReadsByCurl(c.op) ? "libcurl" : buffered ? "buffered" : "direct";
  const std::string operation = std::string(NameOf(c.op)) + c.note;
  AddRow({operation, server.Name(), c.login, c.transport, reading, c.result});
  const int port = server.Port(c.port);
  if (IsOneCall(c.op)) {
    const Response response = SendOneCall(port, c);
    EXPECT_EQ(response.result, c.expected.result);
    EXPECT_THAT(response.text, HasSubstr(c.expected.text));
    return;
  }
  ExposedClient client(port, SettingsOf(c, buffered));
  const Response response = Send(&client, c.op);
  Outcome came = {response.result, HTTP_RET_OK, 0, "", false};
  came.check = client.CheckResponse(came.status);
  if (c.expected.check == kIoErrorOrNotReady &&
      (came.check == HTTP_RET_IO_ERROR || came.check == HTTP_RET_NOT_READY)) {
    came.check = kIoErrorOrNotReady;
  }
  EXPECT_EQ(InWords(came), InWords(c.expected)) << reading;
  EXPECT_THAT(response.text, HasSubstr(c.expected.text)) << reading;
}

}  // namespace

std::ostream& operator<<(std::ostream& out, const PeerCase& c) {
  return out << NameOf(c.op) << c.note << ", " << c.path;
}

void Play(const WebServer& server, const PeerCase& c) {
  PlayOnce(server, c, true);
  if (ReadsByCurl(c.op) || IsOneCall(c.op) || c.expected.waits) return;
  PlayOnce(server, c, false);
}
