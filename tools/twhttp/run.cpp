#include "tools/twhttp/run.h"

#include <json/value.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <algorithm>
#include <cstdio>
#include <memory>

#include "tarnwick/platform/unique.h"
#include "tools/common/json_output.h"
#include "tools/twhttp/client.h"
#include "tools/twhttp/content.h"
#include "tools/twhttp/upload.h"

namespace {

class Runner {
 public:
  Runner(const Options& options, const std::string& body, const BodyWriter& write)
      : options_(options),
        body_(body),
        write_(write),
        client_(options, options.target.https && !(options.offline && options.operation->by_curl)) {
  }

  Outcome Run();

 private:
  void Write(const std::string& piece);
  void Finish();
  void ReadBody();
  void Stream();
  void Get();
  void Form();
  void Soap();
  void NoteBadXml();
  void SoapXml();
  void Upload();
  void ReadWhole();
  void RawResp();
  void ByCurl(TW_HTTP_METHOD method);
  void Xml();
  int SendXml();
  void JsonGet();
  void JsonGets();
  void JsonPost();
  void JudgeJson(const Json::Value& response, int failed);

  const Options& options_;
  const std::string& body_;
  const BodyWriter& write_;
  ToolClient client_;
  Outcome outcome_;
  bool wanted_ = true;
};

void Runner::Write(const std::string& piece) {
  outcome_.body_bytes += piece.size();
  wanted_ = piece.empty() || write_(piece);
}

// The operations that leave their outcome in the client.
void Runner::Finish() {
  outcome_.last = client_.CheckResponse(outcome_.status);
  outcome_.good =
      outcome_.result == HTTP_RET_OK && outcome_.last == HTTP_RET_OK && !outcome_.read_failed;
}

// An endless response is written while it comes. Chunks only ReadBody decodes.
void Runner::ReadBody() {
  int status = 0;
  const int last = client_.CheckResponse(status);
  if (outcome_.result != HTTP_RET_OK || last == HTTP_RET_NOT_READY || last == HTTP_RET_IO_ERROR) {
    return;
  }
  if (client_.GetTransferEncoding() != "chunked") return Stream();
  std::string body;
  outcome_.read_failed = client_.ReadBody(body) != HTTP_RET_OK;
  const uint64_t wanted = options_.max_body > 0 ? options_.max_body : body.size();
  Write(body.substr(0, static_cast<size_t>(std::min<uint64_t>(wanted, body.size()))));
}

void Runner::Stream() {
  constexpr int kPiece = 8192;
  std::string piece(kPiece, '\0');
  uint64_t total = 0;
  while (wanted_ && (options_.max_body == 0 || total < options_.max_body)) {
    const int count = client_.ReadData(piece.data(), kPiece);
    outcome_.read_failed = count < 0;
    if (count <= 0) return;
    total += static_cast<uint64_t>(count);
    const uint64_t surplus =
        options_.max_body > 0 && total > options_.max_body ? total - options_.max_body : 0;
    Write(piece.substr(0, static_cast<size_t>(count) - static_cast<size_t>(surplus)));
  }
}

void Runner::Get() {
  outcome_.result = client_.SendRequest(HTTP_METHOD_GET, "?");
  ReadBody();
  Finish();
}

void Runner::Form() {
  outcome_.result = client_.SendRequestBySocketPost(body_);
  ReadBody();
  Finish();
}

void Runner::Soap() {
  std::string response;
  outcome_.result = options_.operation->id == OperationId::kSoap
                        ? client_.SendReqBySocketPost(body_, response)
                        : client_.SendAuthReqBySocketPost(body_, response);
  Write(response);
  Finish();
}

void Runner::NoteBadXml() {
  outcome_.content = Content::kNotXml;
  outcome_.content_error = FirstXmlError();
}

void Runner::SoapXml() {
  xmlDoc* parsed = nullptr;
  outcome_.result = client_.SendReqByXMLSocketPost(body_, parsed);
  const Document document(parsed);
  Finish();
  if (outcome_.result != HTTP_RET_OK) return;
  if (!document) return NoteBadXml();
  xmlChar* text = nullptr;
  int size = 0;
  xmlDocDumpMemory(document.get(), &text, &size);
  Write(std::string(reinterpret_cast<const char*>(text), static_cast<size_t>(size)));
  xmlFree(text);
}

void Runner::Upload() {
  outcome_.result = client_.OpenRawDataUpload();
  if (outcome_.result != HTTP_RET_OK) return;
  if (!UploadFile(&client_, options_, body_)) outcome_.result = HTTP_RET_IO_ERROR;
  ReadWhole();
}

// The whole response comes as one text, and so does its failure.
void Runner::ReadWhole() {
  const std::string response = client_.GetResp();
  const bool failed = response == "{\"error\":true}";
  if (!failed) Write(response);
  Finish();
  const bool success = outcome_.status >= 200 && outcome_.status <= 299;
  outcome_.last = success ? HTTP_RET_OK : HTTP_RET_BAD_RESPONSE;
  outcome_.good = outcome_.result == HTTP_RET_OK && success && !failed;
}

void Runner::RawResp() {
  const std::string request = options_.has_body ? body_
                                                : "GET /" + options_.target.path +
                                                      " HTTP/1.0\r\nHost: " + options_.target.host +
                                                      "\r\nConnection: close\r\n\r\n";
  outcome_.result = client_.SendAsItIs(request);
  if (outcome_.result != HTTP_RET_OK) return;
  ReadWhole();
}

void Runner::ByCurl(TW_HTTP_METHOD method) {
  tarnwick::UniqueFile file(nullptr);
  if (!options_.response_file.empty()) {
    file.reset(std::fopen(options_.response_file.c_str(), "w+e"));
    outcome_.output_failed = !file;
    if (!file) return;
  }
  client_.SetCurlRespFile(file.get());
  outcome_.result = client_.SendRequestByCurl(method, options_.verify_peer, options_.timeout);
  Write(client_.GetCurlText());
  Finish();
}

int Runner::SendXml() {
  Document document(body_.empty() ? nullptr
                                  : xmlReadMemory(body_.data(), static_cast<int>(body_.size()),
                                                  nullptr, nullptr, XML_PARSE_NONET));
  xmlDoc* plain = document.get();
  switch (options_.operation->id) {
    case OperationId::kXmlPost:
      return client_.SendReqByXMLPost(plain);
    case OperationId::kXmlPut:
      return client_.SendReqByXMLPut(plain);
    case OperationId::kXmlDelete:
      return client_.SendReqByXMLDelete();
    default:
      return client_.SendReqByXMLGet(options_.timeout);
  }
}

// The response to a change may be empty, that to a GET may not.
void Runner::Xml() {
  outcome_.result = SendXml();
  Finish();
  const std::string collected = client_.Collected();
  Write(collected);
  if (!outcome_.good) return;
  if (collected.empty()) {
    if (options_.operation->id == OperationId::kXmlGet) outcome_.content = Content::kNoXml;
    return;
  }
  xmlDoc* parsed = nullptr;
  if (!client_.GetResponseXML(parsed)) NoteBadXml();
  xmlFreeDoc(parsed);
}

// The library returns one result for what is no JSON and for what is no success.
void Runner::JudgeJson(const Json::Value& response, int failed) {
  outcome_.good = outcome_.result == 0;
  if (outcome_.result == failed) {
    outcome_.content_error = JsonError();
    outcome_.content = outcome_.content_error.empty() ? Content::kNotSuccess : Content::kNotJson;
    if (outcome_.content_error.empty()) outcome_.content_error = SuccessError(response);
  }
  const bool shown = outcome_.content != Content::kNotJson && !response.isNull();
  if (shown) Write(CompactJson(response) + "\n");
}

void Runner::JsonGet() {
  constexpr int kFailed = -2;
  Json::Value response;
  const Target& target = options_.target;
  outcome_.result = SendHttpGet(target.host, target.port, target.path, response, options_.timeout,
                                options_.encode_query);
  JudgeJson(response, kFailed);
}

void Runner::JsonGets() {
  constexpr int kFailed = -3;
  if (options_.offline) return ByCurl(HTTP_METHOD_GET);  // the same request, without the TLS
  Json::Value response;
  const Target& target = options_.target;
  outcome_.result = SendHttpsGet(target.host, target.port, target.path, response, options_.timeout);
  JudgeJson(response, kFailed);
}

void Runner::JsonPost() {
  const Target& target = options_.target;
  outcome_.result =
      SendHttpPost(target.host, target.port, target.path, body_, options_.cookie, options_.timeout);
  outcome_.good = outcome_.result == 0;
}

Outcome Runner::Run() {
  switch (options_.operation->id) {
    case OperationId::kGet:
      Get();
      break;
    case OperationId::kForm:
      Form();
      break;
    case OperationId::kSoap:
    case OperationId::kSoapAuth:
      Soap();
      break;
    case OperationId::kSoapXml:
      SoapXml();
      break;
    case OperationId::kUpload:
      Upload();
      break;
    case OperationId::kCurlGet:
      ByCurl(HTTP_METHOD_GET);
      break;
    case OperationId::kCurlPost:
      ByCurl(HTTP_METHOD_POST);
      break;
    case OperationId::kCurlForm:
      outcome_.result = client_.SendRequestByPost(options_.separators);
      Finish();
      break;
    case OperationId::kXmlGet:
    case OperationId::kXmlPost:
    case OperationId::kXmlPut:
    case OperationId::kXmlDelete:
      Xml();
      break;
    case OperationId::kJsonGet:
      JsonGet();
      break;
    case OperationId::kJsonPost:
      JsonPost();
      break;
    case OperationId::kJsonGets:
      JsonGets();
      break;
    case OperationId::kRawResp:
      RawResp();
      break;
  }
  return outcome_;
}

}  // namespace

Outcome RunOperation(const Options& options, const std::string& body, const BodyWriter& write) {
  ListenToXml();
  return Runner(options, body, write).Run();
}
