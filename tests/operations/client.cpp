// The operations of the client over its own socket.
#include <json/value.h>
#include <libxml/tree.h>

#include <cstring>

#include "tests/operations/parts.h"

namespace {

constexpr char kUploadEnd[] = "\r\n-------------QUENMULTIPART_BOUNDARY-------------\r\n";

void ExpectOneOf(int result, std::initializer_list<int> results, const char* call,
                 OperationOutcome* outcome) {
  if (std::find(results.begin(), results.end(), result) != results.end()) return;
  outcome->mistake = std::string(call) + ": " + std::to_string(result);
}

void ReadBodyOf(TWHttpClient& client, OperationOutcome* outcome) {
  const int result = client.ReadBody(outcome->text);
  ExpectOneOf(result, {HTTP_RET_OK, HTTP_RET_IO_ERROR}, "ReadBody", outcome);
  outcome->has_text = result == HTTP_RET_OK;
}

OperationOutcome BodyAfter(TWHttpClient& client, int result) {
  OperationOutcome outcome;
  outcome.result = result;
  if (result == HTTP_RET_OK) AskForHead(client, &outcome);
  ReadBodyOf(client, &outcome);
  return outcome;
}

}  // namespace

std::unique_ptr<TWHttpClient> NewAttackedClient(const Target& target) {
  return std::make_unique<TWHttpClient>(kPeerHost, target.port, kAttackPath, kAttackUser,
                                        kAttackPassword, target.timeout, target.tls,
                                        target.buffered, false, false, target.version, "");
}

void AskForHead(TWHttpClient& client, OperationOutcome* outcome) {
  outcome->response = client.CheckResponse(outcome->status);
  for (const HTTP_MAP_KEY key : {HTTP_CONTENT_TYPE, HTTP_CONTENT_LENGTH, HTTP_CONTENT_RANGE}) {
    std::string value = "untouched";
    const int result = client.GetHttpContent(key, value);
    if (result == HTTP_RET_OK) continue;
    if (result != HTTP_RET_NOT_READY && result != HTTP_RET_NO_CONTENT) {
      outcome->mistake = "GetHttpContent: " + std::to_string(result);
    }
    if (value != "untouched") outcome->mistake = "GetHttpContent has changed its output";
  }
  std::string cookie;
  if (client.GetCookie(cookie) != 0) outcome->mistake = "GetCookie";
  static_cast<void>(client.GetTransferEncoding());
}

OperationOutcome GetBody(const Target& target) {
  const auto client = NewAttackedClient(target);
  client->SetCookie("id=1;");
  return BodyAfter(*client, client->SendRequestByGet());
}

OperationOutcome GetData(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByGet();
  if (outcome.result == HTTP_RET_OK) AskForHead(*client, &outcome);
  ReadAll(*client, target.piece, &outcome);
  outcome.has_text = false;  // with its chunk lines
  return outcome;
}

OperationOutcome GetLines(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByGet();
  if (outcome.result == HTTP_RET_OK) AskForHead(*client, &outcome);
  ReadLines(*client, target.piece, &outcome);
  return outcome;
}

OperationOutcome LoginGet(const Target& target) {
  const auto client = NewAttackedClient(target);
  return BodyAfter(*client, client->SendRequest(HTTP_METHOD_GET, ""));
}

// One object for two requests: what the first response left must not harm the second.
OperationOutcome GetTwice(const Target& target) {
  const auto client = NewAttackedClient(target);
  BodyAfter(*client, client->SendRequestByGet());
  OperationOutcome outcome = BodyAfter(*client, client->SendRequestByGet());
  outcome.has_text = false;  // decoded by the first response's transfer encoding
  return outcome;
}

// Further header lines, and a head where there is none.
OperationOutcome GetHeadAgain(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByGet();
  if (outcome.result == HTTP_RET_OK) AskForHead(*client, &outcome);
  ExpectOneOf(client->CheckContentType(), {HTTP_RET_OK, HTTP_RET_NOT_READY, HTTP_RET_IO_ERROR},
              "CheckContentType", &outcome);
  const int result = client->CheckHttpResponse();
  if (result < HTTP_RET_OK || result > HTTP_RET_URI_TOO_LONG) outcome.mistake = "CheckHttpResponse";
  client->GenBasicAccessAuth();
  client->GenDigestAccessAuth("GET", "");
  return outcome;
}

OperationOutcome FormPost(const Target& target) {
  const auto client = NewAttackedClient(target);
  return BodyAfter(*client, client->SendRequestBySocketPost(kForm));
}

OperationOutcome Soap(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  std::string text = "untouched";
  outcome.result = client->SendReqBySocketPost(kEnvelope, text);
  AskForHead(*client, &outcome);
  if (outcome.result != HTTP_RET_OK && text != "untouched") outcome.mistake = "text of a failure";
  return outcome;
}

OperationOutcome SoapLogin(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  std::string text;
  outcome.result = client->SendAuthReqBySocketPost(kEnvelope, text);
  AskForHead(*client, &outcome);
  return outcome;
}

OperationOutcome SoapXml(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  xmlDoc* doc = nullptr;
  outcome.result = client->SendReqByXMLSocketPost(kEnvelope, doc);
  AskForHead(*client, &outcome);
  if (outcome.result != HTTP_RET_OK && doc != nullptr) outcome.mistake = "a failure's document";
  xmlFreeDoc(doc);
  return outcome;
}

OperationOutcome Upload(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->OpenRawDataUpload();
  const std::string part(target.piece, 'x');
  const int size = static_cast<int>(part.size());
  const int written = client->WriteData(part.data(), size);
  if (written < -1 || written > size) outcome.mistake = "WriteData";
  client->WriteData(kUploadEnd, static_cast<int>(strlen(kUploadEnd)));
  outcome.text = client->GetResp();
  outcome.has_text = outcome.text != "{\"error\":true}";
  if (outcome.result == HTTP_RET_OK) AskForHead(*client, &outcome);
  return outcome;
}

// A request that the caller writes, on the connection of the one before.
OperationOutcome SecondRequest(const Target& target) {
  const auto client = NewAttackedClient(target);
  OperationOutcome outcome;
  outcome.result = client->SendRequestByGet();
  char piece[64];
  client->ReadData(piece, sizeof(piece));
  client->WriteData(kSocketRequest, static_cast<int>(strlen(kSocketRequest)));
  client->GetResp();
  int status = 0;
  outcome.response = client->CheckResponse(status);
  return outcome;
}

OperationOutcome JsonGet(const Target& target) {
  Json::Value value;
  OperationOutcome outcome;
  outcome.result =
      SendHttpGet(kPeerHost, target.port, kAttackPath, value, target.timeout, target.buffered);
  return outcome;
}

OperationOutcome JsonPost(const Target& target) {
  OperationOutcome outcome;
  outcome.result =
      SendHttpPost(kPeerHost, target.port, kAttackPath, kForm, "id=1;", target.timeout);
  return outcome;
}
