// Calls of twhttp.h's client: its object, what it reads and what it tells.
#include <algorithm>
#include <iterator>

#include "tarnwick/http/kept_fields.h"
#include "tests/attack/arguments_calls.h"

using namespace tarnwick;

namespace {

TWHttpClient& Client(Ground& ground) {
  return *ground.Client().client;
}

bool IsCode(int result) {
  return result >= HTTP_RET_OK && result <= HTTP_RET_CERT_ERROR;
}

void Make(Ground& ground, Draw& /*draw*/) {
  ground.NewClient(false);
}

void MakeWith(Ground& ground, Draw& /*draw*/) {
  ground.NewClient(true);
}

void Drop(Ground& ground, Draw& /*draw*/) {
  ground.DropClient();
}

void Init(Ground& ground, Draw& draw) {
  if (ground.Client().has_socket) ground.NewClient(false);
  const bool https = draw.OneIn(5);
  const std::string host = ground.Host();
  const int port = ground.Port(https);
  const std::string& path = draw.Text();
  const std::string& user = draw.Text();
  Client(ground).Init(path, host, port, user, draw.Text(), draw.Seconds(), draw.Bool(), draw.Bool(),
                      draw.Bool(), static_cast<HTTP_VERSION>(draw.Below(4)), draw.Text(), https);
  ground.Client().has_socket = true;
}

void InitSocket(Ground& ground, Draw& draw) {
  if (ground.Client().has_socket) ground.NewClient(false);
  Client(ground).InitSocket(draw.Seconds(), draw.Bool());
  ground.Client().has_socket = true;
}

void SetPath(Ground& ground, Draw& draw) {
  Client(ground).SetPath(draw.Text());
}

void SetSocketRemoteAddr(Ground& ground, Draw& draw) {
  Client(ground).SetSocketRemoteAddr(draw.Bool() ? 0 : draw.Unsigned());
}

void SetCurlRespFile(Ground& ground, Draw& /*draw*/) {
  Client(ground).SetCurlRespFile(ground.ResponseFile());
}

void SetCookie(Ground& ground, Draw& draw) {
  const std::string& cookie = draw.Text();
  std::string kept;
  ground.Expect(Client(ground).SetCookie(cookie) == 0, "not 0");
  ground.Expect(Client(ground).GetCookie(kept) == 0 && kept == cookie, "another cookie");
}

void GetCookie(Ground& ground, Draw& draw) {
  std::string kept = draw.Text();
  ground.Expect(Client(ground).GetCookie(kept) == 0, "not 0");
}

void GetTransferEncoding(Ground& ground, Draw& /*draw*/) {
  ground.Expect(Client(ground).GetTransferEncoding().size() < 100000, "longer than any line");
}

void CheckResponse(Ground& ground, Draw& draw) {
  int status = draw.Int();
  ground.Expect(IsCode(Client(ground).CheckResponse(status)), "no result code");
}

void GetHttpContent(Ground& ground, Draw& draw) {
  const int key = draw.Bool() ? static_cast<int>(draw.Below(4)) : draw.Int();
  std::string value = "untouched";
  const int result = Client(ground).GetHttpContent(static_cast<HTTP_MAP_KEY>(key), value);
  ground.Expect(IsCode(result), "no result code");
  const bool known = std::any_of(
      std::begin(kKeptFields), std::end(kKeptFields),
      [key](const KeptField& field) { return field.as == KeptAs::kContent && field.key == key; });
  ground.Expect(known || result == HTTP_RET_BAD_KEY, "a key that is none");
  ground.Expect(result == HTTP_RET_OK || value == "untouched", "a failure that changes the value");
}

void ReadData(Ground& ground, Draw& draw) {
  const int size = static_cast<int>(draw.Size());
  const std::unique_ptr<char[]> buffer(new char[static_cast<size_t>(size)]);
  if (draw.OneIn(8)) {
    const int length = draw.Int();
    const int none = Client(ground).ReadData(nullptr, length);
    ground.Expect(none == -1 || length == 0, "null was taken");
    return;
  }
  const int result = Client(ground).ReadData(buffer.get(), size);
  ground.Expect(result >= -1 && result <= size, "a count that cannot be");
}

void WriteData(Ground& ground, Draw& draw) {
  const std::string& text = draw.Text();
  const int size = static_cast<int>(text.size());
  const int length = draw.OneIn(8) ? -size : size;
  const char* bytes = draw.OneIn(8) ? nullptr : text.data();
  const int result = Client(ground).WriteData(bytes, length);
  ground.Expect(result >= -1 && result <= size, "a count that cannot be");
}

void ReadToLineEnd(Ground& ground, Draw& draw) {
  const int size = static_cast<int>(draw.Size());
  const std::unique_ptr<char[]> buffer(new char[static_cast<size_t>(size)]);
  char* into = draw.OneIn(8) ? nullptr : buffer.get();
  const int result = Client(ground).ReadToLineEnd(into, size);
  ground.Expect(result >= -1 && result < std::max(size, 1), "a count that cannot be");
}

void RestoreData(Ground& ground, Draw& draw) {
  std::string text = draw.Text();
  const int size = static_cast<int>(text.size());
  char* bytes = draw.OneIn(8) ? nullptr : &text[0];
  const int result = Client(ground).RestoreData(bytes, draw.OneIn(8) ? -size : size);
  ground.Expect(result == 0 || result == -1, "neither 0 nor -1");
}

void HasDataToRead(Ground& ground, Draw& draw) {
  const int seconds = draw.Seconds();
  const bool has = Client(ground).HasDataToRead(seconds);
  ground.Expect(!has || seconds >= 0, "a negative time-out returns true");
}

void ReadBody(Ground& ground, Draw& draw) {
  std::string body = draw.Text();
  const int result = Client(ground).ReadBody(body);
  ground.Expect(result == HTTP_RET_OK || result == HTTP_RET_IO_ERROR, "another result code");
  if (draw.OneIn(4)) Client(ground).ReadBody(body);
}

void GetResp(Ground& ground, Draw& /*draw*/) {
  ground.Expect(Client(ground).GetResp().size() < (8u << 20), "more than any peer sent");
}

void CheckHttpResponse(Ground& ground, Draw& /*draw*/) {
  ground.Expect(IsCode(Client(ground).CheckHttpResponse()), "no result code");
}

void CheckContentType(Ground& ground, Draw& /*draw*/) {
  const int result = Client(ground).CheckContentType();
  ground.Expect(
      result == HTTP_RET_OK || result == HTTP_RET_NOT_READY || result == HTTP_RET_IO_ERROR,
      "another result code");
}

void BasicAuth(Ground& ground, Draw& /*draw*/) {
  ground.Expect(Client(ground).GenBasicAccessAuth().find("Basic ") != std::string::npos,
                "no login");
}

void DigestAuth(Ground& ground, Draw& draw) {
  const std::string& method = draw.Text();
  ground.Expect(!Client(ground).GenDigestAccessAuth(method, draw.Text()).empty(), "no login");
}

void GetCurlText(Ground& ground, Draw& /*draw*/) {
  ground.Expect(Client(ground).GetCurlText().size() < 100000, "more than any peer sent");
}

}  // namespace

std::vector<PublicCall> ClientCalls() {
  return {
      {"TWHttpClient::TWHttpClient", Make},
      {"TWHttpClient::TWHttpClient", MakeWith},
      {"TWHttpClient::~TWHttpClient", Drop},
      {"TWHttpClient::Init", Init},
      {"TWHttpClient::InitSocket", InitSocket},
      {"TWHttpClient::SetPath", SetPath},
      {"TWHttpClient::SetSocketRemoteAddr", SetSocketRemoteAddr},
      {"TWHttpClient::SetCurlRespFile", SetCurlRespFile},
      {"TWHttpClient::SetCookie", SetCookie},
      {"TWHttpClient::GetCookie", GetCookie},
      {"TWHttpClient::GetTransferEncoding", GetTransferEncoding},
      {"TWHttpClient::CheckResponse", CheckResponse},
      {"TWHttpClient::GetHttpContent", GetHttpContent},
      {"TWHttpClient::ReadData", ReadData},
      {"TWHttpClient::WriteData", WriteData},
      {"TWHttpClient::ReadToLineEnd", ReadToLineEnd},
      {"TWHttpClient::RestoreData", RestoreData},
      {"TWHttpClient::HasDataToRead", HasDataToRead},
      {"TWHttpClient::ReadBody", ReadBody},
      {"TWHttpClient::GetResp", GetResp},
      {"TWHttpClient::CheckHttpResponse", CheckHttpResponse},
      {"TWHttpClient::CheckContentType", CheckContentType},
      {"TWHttpClient::GenBasicAccessAuth", BasicAuth},
      {"TWHttpClient::GenDigestAccessAuth", DigestAuth},
      {"TWHttpClient::GetCurlText", GetCurlText},
  };
}
