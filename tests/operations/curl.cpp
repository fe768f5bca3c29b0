// The operations through libcurl, and the documents that some of them carry.
#include <json/value.h>
#include <libxml/parser.h>

#include <cstdio>

#include "tarnwick/http/twcurl.h"
#include "tests/operations/parts.h"

OwnedDocument::OwnedDocument(const std::string& text)
    : document_(xmlParseMemory(text.data(), static_cast<int>(text.size()))) {}

std::string OwnedDocument::Text() const {
  if (document_ == nullptr) return "";
  xmlChar* bytes = nullptr;
  int length = 0;
  xmlDocDumpMemory(document_, &bytes, &length);
  const std::string text(reinterpret_cast<const char*>(bytes), static_cast<size_t>(length));
  xmlFree(bytes);
  return text;
}

void TakeValue(const Json::Value& value, OperationResult* result) {
  result->untouched = value == "untouched";
  result->has_text = result->result == 0 && !result->untouched;
  if (!result->untouched) result->text = value.toStyledString();
}

OperationResult JsonGetOverTls(const OperationSettings& settings) {
  Json::Value value = "untouched";
  OperationResult result;
  settings.Step([&] {
    result.result =
        SendHttpsGet(settings.host, settings.port, settings.path, value, settings.limit);
  });
  TakeValue(value, &result);
  return result;
}

namespace {

struct FileCloser {
  void operator()(FILE* file) const { fclose(file); }
};
using OwnedFile = std::unique_ptr<FILE, FileCloser>;

// As much as `most` bytes of it.
std::string Content(FILE* file, size_t most) {
  std::string content(std::min(static_cast<size_t>(std::max(ftell(file), 0L)), most), '\0');
  rewind(file);
  content.resize(fread(content.data(), 1, content.size(), file));
  return content;
}

OperationResult ByCurl(const OperationSettings& settings, TW_HTTP_METHOD method, FILE* file) {
  auto client = ClientOf(settings);
  if (file != nullptr) client->SetCurlRespFile(file);
  OperationResult result;
  settings.Step(
      [&] { result.result = client->SendRequestByCurl(method, settings.verify, settings.limit); });
  AskForHead(*client, &result);
  result.has_text = result.result == HTTP_RET_OK;
  result.text = file != nullptr ? Content(file, settings.most) : client->GetCurlText();
  settings.Step([&] { client.reset(); });
  return result;
}

OperationResult ByCurlToFile(const OperationSettings& settings, TW_HTTP_METHOD method) {
  const OwnedFile file(tmpfile());
  if (file) return ByCurl(settings, method, file.get());
  OperationResult result;
  result.mistake = "there is no temporary file";
  return result;
}

template <typename Send>
OperationResult SendByCurl(const OperationSettings& settings, Send send) {
  auto client = ClientOf(settings);
  OperationResult result;
  settings.Step([&] { result.result = send(*client); });
  AskForHead(*client, &result);
  settings.Step([&] { client.reset(); });
  return result;
}

}  // namespace

OperationResult CurlGet(const OperationSettings& settings) {
  return ByCurl(settings, HTTP_METHOD_GET, nullptr);
}

OperationResult CurlPost(const OperationSettings& settings) {
  return ByCurl(settings, HTTP_METHOD_POST, nullptr);
}

OperationResult CurlGetToFile(const OperationSettings& settings) {
  return ByCurlToFile(settings, HTTP_METHOD_GET);
}

OperationResult CurlPostToFile(const OperationSettings& settings) {
  return ByCurlToFile(settings, HTTP_METHOD_POST);
}

// What is posted stands in the path, after a question mark.
OperationResult CurlForm(const OperationSettings& settings) {
  return SendByCurl(settings, [](TWHttpClient& client) { return client.SendRequestByPost("?"); });
}

OperationResult CurlLoginForm(const OperationSettings& settings) {
  return SendByCurl(settings,
                    [](TWHttpClient& client) { return client.SendRequest(HTTP_METHOD_POST, "?"); });
}

namespace {

template <typename Send>
OperationResult ByXml(const OperationSettings& settings, Send send) {
  auto client = ClientOf(settings);
  OwnedDocument sent(settings.body);
  OperationResult result;
  settings.Step([&] { result.result = send(*client, sent.Get()); });
  AskForHead(*client, &result);
  if (client->m_pRespBuf != nullptr) result.first.assign(client->m_pRespBuf, client->m_respLen);
  OwnedDocument received;
  settings.Step([&] { result.has_text = client->GetResponseXML(received.Get()); });
  if (result.has_text != (received.Get() != nullptr)) result.mistake = "GetResponseXML";
  result.text = received.Text();
  settings.Step([&] { client.reset(); });
  return result;
}

}  // namespace

OperationResult XmlGet(const OperationSettings& settings) {
  return ByXml(settings, [&](TWHttpClient& client, xmlDoc*& /*unused*/) {
    return client.SendReqByXMLGet(settings.limit);
  });
}

OperationResult XmlPost(const OperationSettings& settings) {
  return ByXml(settings, [](TWHttpClient& client, xmlDoc*& document) {
    return client.SendReqByXMLPost(document);
  });
}

OperationResult XmlPut(const OperationSettings& settings) {
  return ByXml(settings, [](TWHttpClient& client, xmlDoc*& document) {
    return client.SendReqByXMLPut(document);
  });
}

OperationResult XmlDelete(const OperationSettings& settings) {
  return ByXml(settings, [](TWHttpClient& client, xmlDoc*& /*unused*/) {
    return client.SendReqByXMLDelete();
  });
}

namespace {

size_t Append(char* bytes, size_t /*one*/, size_t count, void* text) {
  static_cast<std::string*>(text)->append(bytes, count);
  return count;
}

}  // namespace

// A handle of twcurl.h in the caller's hands.
OperationResult CurlHandle(const OperationSettings& settings) {
  OperationResult result;
  CURL* handle = nullptr;
  settings.Step([&] { handle = TWCurlInit(); });
  const std::unique_ptr<CURL, void (*)(CURL*)> owner(handle, curl_easy_cleanup);
  if (handle == nullptr) {
    result.result = 1;
    return result;
  }
  const std::string url = (settings.https ? "https://" : "http://") + settings.host + ":" +
                          std::to_string(settings.port) + "/" + settings.path;
  curl_easy_setopt(handle, CURLOPT_URL, url.c_str());
  curl_easy_setopt(handle, CURLOPT_NOSIGNAL, 1L);
  curl_easy_setopt(handle, CURLOPT_TIMEOUT, static_cast<long>(settings.limit));
  curl_easy_setopt(handle, CURLOPT_WRITEFUNCTION, Append);
  curl_easy_setopt(handle, CURLOPT_WRITEDATA, &result.text);
  result.result = curl_easy_perform(handle) == CURLE_OK ? 0 : 1;
  result.has_text = result.result == 0;
  return result;
}
