// The operations of the client over its own socket.
#include <json/value.h>

#include <cstdlib>

#include "tarnwick/http/kept_fields.h"
#include "tests/operations/parts.h"

using namespace tarnwick;

namespace {

constexpr char kErrorText[] = "{\"error\":true}";

void ExpectOneOf(int result, std::initializer_list<int> results, const char* call,
                 OperationResult* outcome) {
  if (std::find(results.begin(), results.end(), result) != results.end()) return;
  outcome->mistake = std::string(call) + ": " + std::to_string(result);
}

bool GoesOn(const OperationSettings& settings, const OperationResult& result) {
  return settings.go_on || (result.result == HTTP_RET_OK && result.response == HTTP_RET_OK);
}

// The client's end is a step as well.
void Destroy(const OperationSettings& settings, std::shared_ptr<ExposedClient> client) {
  settings.Step([&] { client.reset(); });
}

// Sends a request by `send`, and looks at the head of the response.
template <typename Send>
OperationResult HeadAfter(const OperationSettings& settings, ExposedClient& client, Send send) {
  OperationResult result;
  settings.Step([&] { result.result = send(client); });
  AskForHead(client, &result);
  return result;
}

void ReadWholeBody(const OperationSettings& settings, ExposedClient& client,
                   OperationResult* result) {
  settings.Step([&] { result->read = client.ReadBody(result->text); });
  ExpectOneOf(result->read, {HTTP_RET_OK, HTTP_RET_IO_ERROR}, "ReadBody", result);
  result->has_text = result->read == HTTP_RET_OK;
}

template <typename Send>
OperationResult BodyAfter(const OperationSettings& settings, Send send) {
  auto client = ClientOf(settings);
  OperationResult result = HeadAfter(settings, *client, send);
  if (settings.read_body && GoesOn(settings, result)) ReadWholeBody(settings, *client, &result);
  Destroy(settings, std::move(client));
  return result;
}

int SendGet(TWHttpClient& client) {
  return client.SendRequestByGet();
}

// A GET, and what `read` makes of the response.
template <typename Read>
OperationResult ReadAfterGet(const OperationSettings& settings, Read read) {
  auto client = ClientOf(settings);
  OperationResult result = HeadAfter(settings, *client, SendGet);
  if (GoesOn(settings, result)) read(*client, &result);
  Destroy(settings, std::move(client));
  return result;
}

}  // namespace

std::shared_ptr<ExposedClient> ClientOf(const OperationSettings& settings) {
  std::shared_ptr<ExposedClient> client = settings.client;
  if (client) {
    client->SetPath(settings.path);
    return client;
  }
  client = std::make_shared<ExposedClient>(settings.port, settings);
  if (!settings.cookie.empty()) client->SetCookie(settings.cookie);
  return client;
}

void AskForHead(ExposedClient& client, OperationResult* result) {
  result->response = client.CheckResponse(result->status);
  result->head = client.m_connState == 2;
  for (const KeptField& field : kKeptFields) {
    if (field.as != KeptAs::kContent) continue;
    std::string value = "untouched";
    const int found = client.GetHttpContent(field.key, value);
    if (found == HTTP_RET_OK) {
      result->fields[field.key] = value;
      continue;
    }
    ExpectOneOf(found, {HTTP_RET_NOT_READY, HTTP_RET_NO_CONTENT}, "GetHttpContent", result);
    if (value != "untouched") result->mistake = "GetHttpContent has changed its output";
  }
  if (client.GetCookie(result->cookie) != 0) result->mistake = "GetCookie";
  result->encoding = client.GetTransferEncoding();
}

OperationResult GetBody(const OperationSettings& settings) {
  return BodyAfter(settings, SendGet);
}

OperationResult GetData(const OperationSettings& settings) {
  return ReadAfterGet(settings, [&](ExposedClient& client, OperationResult* result) {
    ReadPieces(settings, client, result);
  });
}

OperationResult GetLines(const OperationSettings& settings) {
  return ReadAfterGet(settings, [&](ExposedClient& client, OperationResult* result) {
    ReadLines(settings, client, result);
  });
}

OperationResult LoginGet(const OperationSettings& settings) {
  return BodyAfter(settings,
                   [](TWHttpClient& client) { return client.SendRequest(HTTP_METHOD_GET, ""); });
}

// One object for two requests: what the first response left must not harm the second.
OperationResult GetTwice(const OperationSettings& settings) {
  OperationSettings again = settings;
  again.client = ClientOf(settings);
  const OperationResult before = BodyAfter(again, SendGet);
  OperationResult result = BodyAfter(again, SendGet);
  if (result.mistake.empty()) result.mistake = before.mistake;
  result.first = before.text;
  Destroy(settings, std::move(again.client));
  return result;
}

// Further header lines, and a head where there is none.
OperationResult GetHeadAgain(const OperationSettings& settings) {
  return ReadAfterGet(settings, [&](ExposedClient& client, OperationResult* result) {
    int found = HTTP_RET_OK;
    settings.Step([&] { found = client.CheckContentType(); });
    ExpectOneOf(found, {HTTP_RET_OK, HTTP_RET_NOT_READY, HTTP_RET_IO_ERROR}, "CheckContentType",
                result);
    settings.Step([&] { found = client.CheckHttpResponse(); });
    if (found < HTTP_RET_OK || found > HTTP_RET_URI_TOO_LONG) result->mistake = "CheckHttpResponse";
    settings.Step([&] { client.GenBasicAccessAuth(); });
    settings.Step([&] { client.GenDigestAccessAuth("GET", ""); });
  });
}

OperationResult FormPost(const OperationSettings& settings) {
  std::string body = settings.body;
  return BodyAfter(settings, [&](TWHttpClient& client) {
    return client.SendRequestBySocketPost(std::move(body));
  });
}

namespace {

// A SOAP request by one of the two functions, whose response stays untouched after a failure of the
// first.
template <typename Send>
OperationResult SoapBy(const OperationSettings& settings, Send send) {
  static const std::string kUntouched = "untouched";
  auto client = ClientOf(settings);
  std::string response = kUntouched;
  OperationResult result =
      HeadAfter(settings, *client, [&](TWHttpClient& sender) { return send(sender, response); });
  result.has_text = result.result == HTTP_RET_OK;
  result.untouched = response == kUntouched;
  if (!result.untouched) result.text = response;
  Destroy(settings, std::move(client));
  return result;
}

}  // namespace

OperationResult Soap(const OperationSettings& settings) {
  OperationResult result = SoapBy(settings, [&](TWHttpClient& client, std::string& response) {
    return client.SendReqBySocketPost(settings.body, response);
  });
  if (!result.has_text && !result.untouched) result.mistake = "a failure has changed the response";
  return result;
}

OperationResult SoapLogin(const OperationSettings& settings) {
  return SoapBy(settings, [&](TWHttpClient& client, std::string& response) {
    return client.SendAuthReqBySocketPost(settings.body, response);
  });
}

OperationResult SoapXml(const OperationSettings& settings) {
  auto client = ClientOf(settings);
  std::string body = settings.body;
  OwnedDocument document;
  OperationResult result = HeadAfter(settings, *client, [&](TWHttpClient& sender) {
    return sender.SendReqByXMLSocketPost(std::move(body), document.Get());
  });
  result.has_text = document.Get() != nullptr;
  result.text = document.Text();
  const bool failed = result.result != HTTP_RET_OK;
  if (failed && result.has_text) result.mistake = "a failure has left a document";
  Destroy(settings, std::move(client));
  return result;
}

namespace {

void ReadResponse(const OperationSettings& settings, ExposedClient& client,
                  OperationResult* result) {
  settings.Step([&] { result->text = client.GetResp(); });
  result->has_text = result->text != kErrorText;
  result->read = result->has_text ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
  if (!result->has_text) result->text.clear();
}

}  // namespace

OperationResult Upload(const OperationSettings& settings) {
  auto client = ClientOf(settings);
  OperationResult result;
  settings.Step([&] { result.result = client->OpenRawDataUpload(); });
  const bool opened = result.result == HTTP_RET_OK;
  const bool written =
      (opened || settings.go_on) && WritePieces(settings, *client, settings.body, &result);
  if (written || settings.go_on) {
    ReadResponse(settings, *client, &result);
    if (opened) AskForHead(*client, &result);
  }
  Destroy(settings, std::move(client));
  return result;
}

// A request that the caller writes, on the connection of the one before, whose body he has read.
OperationResult SecondRequest(const OperationSettings& settings) {
  return ReadAfterGet(settings, [&](ExposedClient& client, OperationResult* result) {
    const size_t length = strtoul(result->Field(HTTP_CONTENT_LENGTH).c_str(), nullptr, 10);
    const size_t most = std::min(settings.most, std::max<size_t>(length, 1));
    std::string& first = result->first;
    while (first.size() < most &&
           ReadPiece(settings, client, std::min(settings.piece, most - first.size()), &first,
                     result)) {
    }
    const bool whole = first.size() == length;
    if ((whole || settings.go_on) && WritePieces(settings, client, settings.second, result)) {
      ReadResponse(settings, client, result);
    }
  });
}

OperationResult JsonGet(const OperationSettings& settings) {
  Json::Value value = "untouched";
  OperationResult result;
  settings.Step([&] {
    result.result = SendHttpGet(settings.host, settings.port, settings.path, value,
                                settings.timeout, settings.encode_query);
  });
  TakeValue(value, &result);
  return result;
}

OperationResult JsonPost(const OperationSettings& settings) {
  OperationResult result;
  settings.Step([&] {
    result.result = SendHttpPost(settings.host, settings.port, settings.path, settings.body,
                                 settings.cookie, settings.timeout);
  });
  return result;
}
