// The operations through libcurl.
#include <json/value.h>
#include <libxml/parser.h>

#include <cstdio>
#include <cstring>

#include "tarnwick/http/twcurl.h"
#include "tests/operations/parts.h"

OperationOutcome JsonGetOverTls(const Target& target) {
  Json::Value value;
  OperationOutcome outcome;
  outcome.result = SendHttpsGet(kPeerHost, target.port, kAttackPath, value, target.timeout);
  return outcome;
}

namespace {

OperationOutcome ByCurl(const Target& target, TW_HTTP_METHOD method) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByCurl(method, target.verify, target.timeout);
  AskForHead(*client, &outcome);
  outcome.status = -1;  // of the socket
  outcome.text = client->GetCurlText();
  outcome.has_text = outcome.result == HTTP_RET_OK;
  return outcome;
}

}  // namespace

OperationOutcome CurlGet(const Target& target) {
  return ByCurl(target, HTTP_METHOD_GET);
}

OperationOutcome CurlPost(const Target& target) {
  return ByCurl(target, HTTP_METHOD_POST);
}

namespace {

OperationOutcome ByCurlToFile(const Target& target, TW_HTTP_METHOD method) {
  FILE* const file = tmpfile();
  OperationOutcome outcome;
  {
    const auto client = NewAttackedClient(target);
    client->SetCurlRespFile(file);
    outcome.result = client->SendRequestByCurl(method, target.verify, target.timeout);
    AskForHead(*client, &outcome);
    outcome.status = -1;  // of the socket
  }
  fclose(file);
  return outcome;
}

}  // namespace

OperationOutcome CurlGetToFile(const Target& target) {
  return ByCurlToFile(target, HTTP_METHOD_GET);
}

OperationOutcome CurlPostToFile(const Target& target) {
  return ByCurlToFile(target, HTTP_METHOD_POST);
}

OperationOutcome CurlForm(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByPost("?");
  return outcome;
}

OperationOutcome CurlFormDispatched(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequest(HTTP_METHOD_POST, "?");
  return outcome;
}

namespace {

template <typename Send>
OperationOutcome ByXml(const Target& target, Send send) {
  const auto client = NewAttackedClient(target);
  xmlDoc* document = xmlParseMemory(kEnvelope, static_cast<int>(strlen(kEnvelope)));
  OperationOutcome outcome;
  outcome.result = send(*client, document);
  xmlFreeDoc(document);
  xmlDoc* doc = nullptr;
  const bool parsed = client->GetResponseXML(doc);
  if (parsed != (doc != nullptr)) outcome.mistake = "GetResponseXML";
  xmlFreeDoc(doc);
  return outcome;
}

}  // namespace

OperationOutcome XmlGet(const Target& target) {
  return ByXml(target, [&](TWHttpClient& client, xmlDoc*&) {
    return client.SendReqByXMLGet(target.timeout);
  });
}

OperationOutcome XmlPost(const Target& target) {
  return ByXml(target,
               [](TWHttpClient& client, xmlDoc*& doc) { return client.SendReqByXMLPost(doc); });
}

OperationOutcome XmlPut(const Target& target) {
  return ByXml(target,
               [](TWHttpClient& client, xmlDoc*& doc) { return client.SendReqByXMLPut(doc); });
}

OperationOutcome XmlDelete(const Target& target) {
  return ByXml(target, [](TWHttpClient& client, xmlDoc*&) { return client.SendReqByXMLDelete(); });
}

namespace {

size_t Append(char* bytes, size_t /*one*/, size_t count, void* text) {
  static_cast<std::string*>(text)->append(bytes, count);
  return count;
}

}  // namespace

// A handle of twcurl.h in the caller's hands.
OperationOutcome CurlHandle(const Target& target) {
  CURL* const handle = TWCurlInit();
  OperationOutcome outcome;
  const std::string url = (target.tls ? "https://127.0.0.1:" : "http://127.0.0.1:") +
                          std::to_string(target.port) + "/" + kAttackPath;
  curl_easy_setopt(handle, CURLOPT_URL, url.c_str());
  curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(handle, CURLOPT_TIMEOUT, static_cast<long>(target.timeout));
  curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, Append);
  curl_easy_setopt(handle, CURLOPT_WRITEDATA, &outcome.text);
  const CURLcode code = curl_easy_perform(handle);
  outcome.result = code == CURLE_OK ? 0 : 1;
  curl_easy_cleanup(handle);
  return outcome;
}
