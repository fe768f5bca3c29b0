// Calls of twhttp.h's requests and one-call functions, and of twcurl.h.
#include <json/value.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include "tarnwick/http/twcurl.h"
#include "tests/attack/arguments_calls.h"

namespace {

TWHttpClient& Client(Ground& ground) {
  return *ground.Client().client;
}

void ExpectSent(Ground& ground, int result) {
  ground.Expect(result == HTTP_RET_OK || result == HTTP_RET_IO_ERROR, "another result code");
}

TW_HTTP_METHOD Method(Draw& draw) {
  return static_cast<TW_HTTP_METHOD>(draw.Bool() ? 0 : draw.Int());
}

// A document with hostile content, or none.
class Document {
 public:
  explicit Document(Draw& draw) {
    if (draw.OneIn(4)) return;
    document_ = xmlNewDoc(reinterpret_cast<const xmlChar*>("1.0"));
    if (draw.OneIn(6)) return;
    xmlNode* root = xmlNewNode(nullptr, reinterpret_cast<const xmlChar*>("root"));
    xmlDocSetRootElement(document_, root);
    constexpr const char* kTexts[] = {"", "text", "<&>\"'", "\r\n", "%s%n"};
    const std::string text =
        draw.Bool() ? kTexts[draw.Below(std::size(kTexts))] : std::string(draw.Size(), 'a');
    xmlNewTextChild(root, nullptr, reinterpret_cast<const xmlChar*>("child"),
                    reinterpret_cast<const xmlChar*>(text.c_str()));
  }
  ~Document() { xmlFreeDoc(document_); }
  Document(const Document&) = delete;
  Document& operator=(const Document&) = delete;

  xmlDoc*& Get() { return document_; }

 private:
  xmlDoc* document_ = nullptr;
};

// A value of any kind, into which a response is parsed.
Json::Value Value(Draw& draw) {
  switch (draw.Below(4)) {
    case 0:
      return Json::Value();
    case 1:
      return Json::Value(Json::arrayValue);
    case 2:
      return Json::Value("text");
    default:
      return Json::Value(Json::objectValue);
  }
}

void SendRequest(Ground& ground, Draw& draw) {
  ExpectSent(ground, Client(ground).SendRequest(Method(draw), draw.Text()));
}

void SendRequestByGet(Ground& ground, Draw& /*draw*/) {
  ExpectSent(ground, Client(ground).SendRequestByGet());
}

void SendRequestByCurl(Ground& ground, Draw& draw) {
  const int result = Client(ground).SendRequestByCurl(Method(draw), draw.Bool(), draw.Seconds());
  ground.Expect(
      result == HTTP_RET_OK || result == HTTP_RET_IO_ERROR || result == HTTP_RET_CERT_ERROR,
      "another result code");
}

void SendRequestByPost(Ground& ground, Draw& draw) {
  ExpectSent(ground, Client(ground).SendRequestByPost(draw.Text()));
}

void SocketPost(Ground& ground, Draw& draw) {
  ExpectSent(ground, Client(ground).SendRequestBySocketPost(draw.Text()));
}

void SoapPost(Ground& ground, Draw& draw) {
  std::string response = "untouched";
  const std::string& body = draw.Text();
  const int result = Client(ground).SendReqBySocketPost(body, response);
  ExpectSent(ground, result);
  ground.Expect(result == HTTP_RET_OK || response == "untouched",
                "a failure that changes the response");
  ground.Expect(result != HTTP_RET_OK || !body.empty(), "an empty body was sent");
}

void SoapLogin(Ground& ground, Draw& draw) {
  std::string response;
  const int result = Client(ground).SendAuthReqBySocketPost(draw.Text(), response);
  ground.Expect(result >= HTTP_RET_OK && result <= HTTP_RET_URI_TOO_LONG, "another result code");
}

void SoapXml(Ground& ground, Draw& draw) {
  xmlDoc* document = nullptr;
  const int result = Client(ground).SendReqByXMLSocketPost(draw.Text(), document);
  ExpectSent(ground, result);
  ground.Expect(result == HTTP_RET_OK || document == nullptr, "a document of a failure");
  xmlFreeDoc(document);
}

void OpenUpload(Ground& ground, Draw& /*draw*/) {
  ExpectSent(ground, Client(ground).OpenRawDataUpload());
}

void XmlGet(Ground& ground, Draw& draw) {
  ExpectSent(ground, Client(ground).SendReqByXMLGet(draw.Seconds()));
}

void XmlPost(Ground& ground, Draw& draw) {
  Document document(draw);
  ExpectSent(ground, Client(ground).SendReqByXMLPost(document.Get()));
}

void XmlPut(Ground& ground, Draw& draw) {
  Document document(draw);
  ExpectSent(ground, Client(ground).SendReqByXMLPut(document.Get()));
}

void XmlDelete(Ground& ground, Draw& /*draw*/) {
  ExpectSent(ground, Client(ground).SendReqByXMLDelete());
}

void ResponseXml(Ground& ground, Draw& /*draw*/) {
  xmlDoc* document = nullptr;
  const bool parsed = Client(ground).GetResponseXML(document);
  ground.Expect(parsed == (document != nullptr), "a document against the result");
  xmlFreeDoc(document);
}

void JsonGet(Ground& ground, Draw& draw) {
  Json::Value value = Value(draw);
  const std::string host = ground.Host();
  const int port = ground.Port(false);
  const int result = SendHttpGet(host, port, draw.Text(), value, draw.Seconds(), draw.Bool());
  ground.Expect(result <= 0 && result >= -2, "another result");
}

void JsonPost(Ground& ground, Draw& draw) {
  const std::string host = ground.Host();
  const int port = ground.Port(false);
  const std::string& path = draw.Text();
  const std::string& body = draw.Text();
  const int result = SendHttpPost(host, port, path, body, draw.Text(), draw.Seconds());
  ground.Expect(result == 0 || result == -1, "another result");
}

void JsonGetTls(Ground& ground, Draw& draw) {
  Json::Value value = Value(draw);
  const std::string host = ground.Host();
  const int port = ground.Port(true);
  const int result = SendHttpsGet(host, port, draw.Text(), value, draw.Seconds());
  ground.Expect(result <= 0 && result >= -3, "another result");
}

void CurlHandle(Ground& ground, Draw& /*draw*/) {
  CURL* const handle = TWCurlInit();
  ground.Expect(handle != nullptr, "no handle");
  curl_easy_cleanup(handle);
}

}  // namespace

std::vector<PublicCall> RequestCalls() {
  return {
      {"TWHttpClient::SendRequest", SendRequest},
      {"TWHttpClient::SendRequestByGet", SendRequestByGet},
      {"TWHttpClient::SendRequestByCurl", SendRequestByCurl},
      {"TWHttpClient::SendRequestByPost", SendRequestByPost},
      {"TWHttpClient::SendRequestBySocketPost", SocketPost},
      {"TWHttpClient::SendReqBySocketPost", SoapPost},
      {"TWHttpClient::SendAuthReqBySocketPost", SoapLogin},
      {"TWHttpClient::SendReqByXMLSocketPost", SoapXml},
      {"TWHttpClient::OpenRawDataUpload", OpenUpload},
      {"TWHttpClient::SendReqByXMLGet", XmlGet},
      {"TWHttpClient::SendReqByXMLPost", XmlPost},
      {"TWHttpClient::SendReqByXMLPut", XmlPut},
      {"TWHttpClient::SendReqByXMLDelete", XmlDelete},
      {"TWHttpClient::GetResponseXML", ResponseXml},
      {"SendHttpGet", JsonGet},
      {"SendHttpPost", JsonPost},
      {"SendHttpsGet", JsonGetTls},
      {"TWCurlInit", CurlHandle},
  };
}
