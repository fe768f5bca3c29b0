// GETs, form POSTs and uploads over the client's socket, and their bodies.
#include "tests/torture/http_operations.h"
#include "tests/torture/operations.h"
#include "tests/torture/peer_process.h"

namespace {

constexpr char kErrorText[] = "{\"error\":true}";

// The outcome of an exchange whose head was read, or was spoilt by the fault.
void ExpectHead(Stage& stage, const ClientProbe& client) {
  const bool whole = client.m_result == HTTP_RET_OK && client.m_statusCode == 200;
  stage.ExpectEither(whole, client.m_result != HTTP_RET_OK, "the outcome is wrong");
}

bool IsFrontPart(const std::string& body) {
  return Body().compare(0, body.size(), body) == 0;
}

void GetWith(Stage& stage, const ClientSettings& settings) {
  Client client = NewClient(stage, settings);
  int result = -1;
  stage.Run([&] { result = client->SendRequestByGet(); });
  ExpectResult(stage, result);
  if (result == HTTP_RET_OK) ExpectHead(stage, *client);
  if (client->m_result == HTTP_RET_OK) {
    stage.Expect(Content(*client, HTTP_CONTENT_RANGE) == "bytes 0-9/10", "a header is lost");
    stage.Expect(client->m_strCookie == "id=42;", "the cookie is lost");
  }
  Destroy(stage, std::move(client));
}

void Get(Stage& stage) {
  ClientSettings settings = At("get?a=b c&d=/");
  settings.encode_query = true;
  GetWith(stage, settings);
}

void GetOverTls(Stage& stage) {
  ClientSettings settings = At("get");
  settings.https = true;
  GetWith(stage, settings);
}

void Login(Stage& stage, const ClientSettings& settings) {
  Client client = NewClient(stage, settings);
  int result = -1;
  stage.Run([&] { result = client->SendRequest(HTTP_METHOD_GET, "?"); });
  ExpectResult(stage, result);
  if (result == HTTP_RET_OK) ExpectHead(stage, *client);
  Destroy(stage, std::move(client));
}

void GetDigest(Stage& stage) {
  Login(stage, At("digest/body"));
}

void GetBasic(Stage& stage) {
  Login(stage, At("basic/body"));
}

void GetBasicAtOnce(Stage& stage) {
  ClientSettings settings = At("basic/body");
  settings.basic_auth = true;
  Login(stage, settings);
}

// Without a whole head there is no body to read.
void ReadBodyOf(Stage& stage, Client client, bool chunked) {
  const bool has_head = client->m_connState == 2;
  std::string body;
  int result = -1;
  stage.Run([&] { result = client->ReadBody(body); });
  ExpectResult(stage, result);
  stage.Expect(IsFrontPart(body), "the body is not the peer's");
  // A chunk's size that cannot be read ends the body as a success.
  const bool whole = body == Body() || (chunked && stage.MayFail() && has_head);
  stage.Expect(result != HTTP_RET_OK || whole, "half a body is a success");
  Destroy(stage, std::move(client));
}

void BodyWith(Stage& stage, const ClientSettings& settings, bool chunked) {
  Client client = NewClient(stage, settings);
  stage.Run([&] { client->SendRequestByGet(); });
  ReadBodyOf(stage, std::move(client), chunked);
}

void BodyToTheEnd(Stage& stage) {
  BodyWith(stage, At("body"), false);
}

void BodyDirect(Stage& stage) {
  ClientSettings settings = At("body");
  settings.buffered = false;
  BodyWith(stage, settings, false);
}

void BodyChunked(Stage& stage) {
  BodyWith(stage, At("chunked"), true);
}

void BodyChunkedDirect(Stage& stage) {
  ClientSettings settings = At("chunked");
  settings.buffered = false;
  BodyWith(stage, settings, true);
}

// The handshake is part of the GET's own torture.
void BodyOverTls(Stage& stage) {
  ClientSettings settings = At("chunked");
  settings.https = true;
  Client client = NewClient(stage, settings);
  client->SendRequestByGet();
  ReadBodyOf(stage, std::move(client), true);
}

void FormPost(Stage& stage) {
  Client client = NewClient(stage, At("form/length"));
  client->SetCookie("s=1");
  std::string content = "a=1&b=2&c=a value that is longer than a short string";
  int result = -1;
  stage.Run([&] { result = client->SendRequestBySocketPost(std::move(content)); });
  ExpectResult(stage, result);
  if (result == HTTP_RET_OK) ExpectHead(stage, *client);
  Destroy(stage, std::move(client));
}

// Results: true when the peer has all of the upload.
bool WritePieces(Stage& stage, ClientProbe& client) {
  for (const std::string& piece : {std::string(5000, 'u'), std::string("END OF UPLOAD")}) {
    int written = -1;
    const int length = static_cast<int>(piece.size());
    stage.Run([&] { written = client.WriteData(piece.data(), length); });
    stage.ExpectEither(written == length, written < length, "a piece is not written");
    if (written != length) return false;
  }
  return true;
}

void UploadWith(Stage& stage, const ClientSettings& settings) {
  Client client = NewClient(stage, settings);
  int result = -1;
  stage.Run([&] { result = client->OpenRawDataUpload(); });
  ExpectResult(stage, result);
  if (result == HTTP_RET_OK && WritePieces(stage, *client)) {
    std::string body;
    stage.Run([&] { body = client->GetResp(); });
    stage.ExpectEither(body == Body(), body == kErrorText, "the response is wrong");
  }
  Destroy(stage, std::move(client));
}

void Upload(Stage& stage) {
  UploadWith(stage, At("upload"));
}

void UploadOverTls(Stage& stage) {
  ClientSettings settings = At("upload");
  settings.https = true;
  UploadWith(stage, settings);
}

}  // namespace

std::vector<Operation> HttpSocketOperations() {
  return {
      {"get", Peer::kPlain, Get, true},
      {"get_tls", Peer::kTls, GetOverTls, false, true},
      {"get_digest", Peer::kPlain, GetDigest},
      {"get_basic", Peer::kPlain, GetBasic},
      {"get_basic_at_once", Peer::kPlain, GetBasicAtOnce},
      {"body", Peer::kPlain, BodyToTheEnd},
      {"body_direct", Peer::kPlain, BodyDirect},
      {"body_chunked", Peer::kPlain, BodyChunked},
      {"body_chunked_direct", Peer::kPlain, BodyChunkedDirect},
      {"body_tls", Peer::kTls, BodyOverTls},
      {"form_post", Peer::kPlain, FormPost},
      {"upload", Peer::kPlain, Upload},
      {"upload_tls", Peer::kTls, UploadOverTls, false, true},
  };
}
