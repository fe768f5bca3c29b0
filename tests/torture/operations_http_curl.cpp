// The requests through libcurl.
#include <libxml/parser.h>

#include <cstdio>

#include "tarnwick/http/twcurl.h"
#include "tests/http/curl_test_util.h"
#include "tests/torture/http_operations.h"
#include "tests/torture/operations.h"
#include "tests/torture/peer_process.h"

namespace {

constexpr int kTimeout = 3;

void Handle(Stage& stage) {
  CURL* handle = nullptr;
  stage.Run([&] { handle = TWCurlInit(); });
  stage.ExpectEither(handle != nullptr, handle == nullptr, "there is no handle");
  curl_easy_cleanup(handle);
}

void RequestWith(Stage& stage, Client client, TW_HTTP_METHOD method, bool has_body) {
  int result = -1;
  stage.Run([&] { result = client->SendRequestByCurl(method, true, kTimeout); });
  stage.ExpectEither(result == HTTP_RET_OK,
                     result == HTTP_RET_IO_ERROR || result == HTTP_RET_CERT_ERROR,
                     "the result is wrong");
  const bool whole = !has_body || client->m_strCurlText == Body();
  stage.Expect(result != HTTP_RET_OK || whole, "half a body is a success");
  Destroy(stage, std::move(client));
}

void Get(Stage& stage) {
  Client client = NewClient(stage, At("basic/length"));
  client->SetCookie("s=1");
  RequestWith(stage, std::move(client), HTTP_METHOD_GET, true);
}

void GetChunked(Stage& stage) {
  RequestWith(stage, NewClient(stage, At("chunked")), HTTP_METHOD_GET, true);
}

void GetOverTls(Stage& stage) {
  ClientSettings settings = At("length");
  settings.https = true;
  RequestWith(stage, NewClient(stage, settings), HTTP_METHOD_GET, true);
}

void Post(Stage& stage) {
  RequestWith(stage, NewClient(stage, At("a=1&b=2")), HTTP_METHOD_POST, true);
}

void GetToFile(Stage& stage) {
  FileInMemory file;
  Client client = NewClient(stage, At("chunked"));
  client->SetCurlRespFile(file.Stream());
  int result = -1;
  stage.Run([&] { result = client->SendRequestByCurl(HTTP_METHOD_GET, true, kTimeout); });
  ExpectResult(stage, result);
  fflush(file.Stream());
  char buf[16384];
  const ssize_t count = pread(fileno(file.Stream()), buf, sizeof(buf), 0);
  const std::string text(buf, static_cast<size_t>(count));
  const bool whole = text == "Connection: close\r\n\r\n" + Body();
  stage.Expect(result != HTTP_RET_OK || whole, "half a file is a success");
  Destroy(stage, std::move(client));
}

void FormWith(Stage& stage, const char* path) {
  Client client = NewClient(stage, At(path));
  int result = -1;
  stage.Run([&] { result = client->SendRequestByPost("?"); });
  ExpectResult(stage, result);
  Destroy(stage, std::move(client));
}

void Form(Stage& stage) {
  FormWith(stage, "length?a=1&b=2");
}

void FormDigest(Stage& stage) {
  FormWith(stage, "digest/length?a=1&b=2");
}

void FormDispatched(Stage& stage) {
  Client client = NewClient(stage, At("basic/length?a=1"));
  int result = -1;
  stage.Run([&] { result = client->SendRequest(HTTP_METHOD_POST, "?"); });
  ExpectResult(stage, result);
  Destroy(stage, std::move(client));
}

// The answer of an XML request: the peer's document, or none.
void ExpectAnswer(Stage& stage, Client client, int result) {
  ExpectResult(stage, result);
  Document answer;
  bool parsed = false;
  stage.Run([&] { parsed = client->GetResponseXML(answer.Get()); });
  stage.Expect(parsed == (answer.Get() != nullptr), "the result does not fit the document");
  stage.ExpectEither(answer.IsBody(), !parsed, "the answer is not the peer's");
  Destroy(stage, std::move(client));
}

template <typename Send>
void XmlWith(Stage& stage, const char* path, Send send) {
  Client client = NewClient(stage, At(path));
  Document document(kXmlBody);
  int result = -1;
  stage.Run([&] { result = send(*client, document.Get()); });
  ExpectAnswer(stage, std::move(client), result);
}

int SendXmlGet(ClientProbe& client, xmlDoc*& /*unused*/) {
  return client.SendReqByXMLGet(kTimeout);
}

void XmlGet(Stage& stage) {
  XmlWith(stage, "xml", SendXmlGet);
}

void XmlGetDigest(Stage& stage) {
  XmlWith(stage, "digest/xml", SendXmlGet);
}

void XmlPost(Stage& stage) {
  XmlWith(stage, "whole/xml",
          [](ClientProbe& client, xmlDoc*& doc) { return client.SendReqByXMLPost(doc); });
}

void XmlPut(Stage& stage) {
  XmlWith(stage, "whole/xml",
          [](ClientProbe& client, xmlDoc*& doc) { return client.SendReqByXMLPut(doc); });
}

void XmlDelete(Stage& stage) {
  XmlWith(stage, "basic/xml",
          [](ClientProbe& client, xmlDoc*& /*unused*/) { return client.SendReqByXMLDelete(); });
}

void JsonGetOverTls(Stage& stage) {
  const std::string host = "127.0.0.1";
  const std::string path = "json";
  Json::Value reply;
  int result = 1;
  stage.Run([&] { result = SendHttpsGet(host, stage.Port(), path, reply, kTimeout); });
  stage.ExpectEither(result == 0, result < 0 && result >= -3, "the result is wrong");
  stage.Expect(result != 0 || IsJsonBody(reply), "the value is not the peer's");
}

}  // namespace

std::vector<Operation> HttpCurlOperations() {
  return {
      {"curl_handle", Peer::kNone, Handle, true},
      {"curl_get", Peer::kPlain, Get, true},
      {"curl_get_chunked", Peer::kPlain, GetChunked},
      {"curl_get_file", Peer::kPlain, GetToFile},
      {"curl_get_tls", Peer::kTls, GetOverTls, false, true},
      {"curl_post", Peer::kPlain, Post},
      {"curl_form", Peer::kPlain, Form},
      {"curl_form_digest", Peer::kPlain, FormDigest},
      {"curl_form_dispatched", Peer::kPlain, FormDispatched},
      {"xml_get", Peer::kPlain, XmlGet},
      {"xml_get_digest", Peer::kPlain, XmlGetDigest},
      {"xml_post", Peer::kPlain, XmlPost},
      {"xml_put", Peer::kPlain, XmlPut, true},
      {"xml_delete", Peer::kPlain, XmlDelete},
      {"json_get_tls", Peer::kTls, JsonGetOverTls, false, true},
  };
}
