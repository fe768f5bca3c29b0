// One exchange, or two on one object, from the request to the last byte of the body, with the
// peer's bytes, read sizes and cuts as data. The first line holds the operation and the options,
// the second one the path:
//
//   request http11 encode 1 64
//   cgi/a.cgi?name=a b
//   HTTP/1.1 401 Unauthorized
//   WWW-Authenticate: Basic
//
//   <<close>>HTTP/1.1 200 OK
//
//   body<<close>>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/exchange.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "tarnwick/http/twhttp.h"

namespace {

constexpr long kTime = 1;
constexpr char kForm[] = "a=1&b=2";
constexpr char kSoap[] = "<a/>";
constexpr char kUntouched[] = "untouched";

ModelSettings SettingsOf(const Options& options, std::string_view path) {
  ModelSettings settings;
  settings.host = "cam";
  settings.port = 80;
  settings.timeout = options.Has("blocking") ? -1 : 5;
  settings.buffered = !options.Has("direct");
  settings.encode = options.Has("encode");
  settings.basic = options.Has("basic");
  settings.version = options.Has("http11") ? 2 : options.Has("http10") ? 1 : 0;
  settings.keep = options.Has("keep") ? "/:" : "";
  settings.credentials.user = "admin";
  settings.credentials.password = "secret";
  // Callers keep these out of a path.
  for (const char c : path) {
    if (c != '\0' && c != '\r') settings.credentials.path += c;
  }
  return settings;
}

class Client : public TWHttpClient {
 public:
  explicit Client(const ModelSettings& settings)
      : TWHttpClient(settings.host, settings.port, settings.credentials.path,
                     settings.credentials.user, settings.credentials.password, settings.timeout,
                     false, settings.buffered, settings.encode, settings.basic,
                     static_cast<HTTP_VERSION>(settings.version), settings.keep) {}

  int State() const { return m_connState; }
  const std::string& Challenge() const { return m_strAuthenticate; }
  const std::string& Authorization() const { return m_strAuthorization; }
};

class Exchange {
 public:
  Exchange(Client* client, ModelClient* model) : client_(client), model_(model) {}

  void Play(const Options& options);
  void CompareState();

 private:
  void Soap(bool login);
  void Upload();
  void ReadBody();

  Client* client_;
  ModelClient* model_;
};

void Exchange::ReadBody() {
  std::string body;
  std::string expected;
  ExpectSame("ReadBody", client_->ReadBody(body), model_->ReadBody(&expected));
  ExpectSame("body", body, expected);
}

void Exchange::Soap(bool login) {
  std::string response = kUntouched;
  std::string expected = kUntouched;
  if (login) {
    ExpectSame("SendAuthReqBySocketPost", client_->SendAuthReqBySocketPost(kSoap, response),
               model_->SoapWithCredentials(kSoap, &expected));
  } else {
    ExpectSame("SendReqBySocketPost", client_->SendReqBySocketPost(kSoap, response),
               model_->Soap(kSoap, &expected));
  }
  ExpectSame("response", response, expected);
}

void Exchange::Upload() {
  const int expected = model_->OpenUpload();
  ExpectSame("OpenRawDataUpload", client_->OpenRawDataUpload(), expected);
  if (expected != 0) return;
  ExpectSame("WriteData", client_->WriteData("part", 4), model_->WriteData("part"));
  ExpectSame("GetResp", client_->GetResp(), model_->GetResp());
}

void Exchange::Play(const Options& options) {
  if (options.Has("soap")) return Soap(options.Has("login"));
  if (options.Has("upload")) return Upload();
  if (options.Has("form")) {
    ExpectSame("SendRequestBySocketPost", client_->SendRequestBySocketPost(kForm),
               model_->Form(kForm));
  } else if (options.Has("request")) {
    ExpectSame("SendRequest", client_->SendRequest(HTTP_METHOD_GET, "?"),
               model_->GetWithCredentials());
  } else {
    ExpectSame("SendRequestByGet", client_->SendRequestByGet(), model_->Get());
  }
  CompareState();
  ReadBody();
}

void Exchange::CompareState() {
  int status = 0;
  std::string cookie;
  client_->GetCookie(cookie);
  ExpectSame("outcome", client_->CheckResponse(status), model_->Result());
  ExpectSame("status", status, model_->Head().status);
  ExpectSame("state", client_->State(), model_->Head().state);
  ExpectSame("cookie", cookie, model_->Head().cookie);
  ExpectSame("challenge", client_->Challenge(), model_->Head().challenge);
  ExpectSame("encoding", client_->GetTransferEncoding(), model_->Head().encoding);
}

// Whatever the peer sent: a request is one head, of which the peer could write no second one.
void ExpectOneHead(const std::string& request) {
  const size_t end = request.find("\r\n\r\n");
  Expect("a request without a second head",
         end == std::string::npos || request.find("\r\n\r\n", end + 4) == std::string::npos);
  Expect("a request without a bare line feed",
         request.find("\n\n") == std::string::npos && request.find("\r\r") == std::string::npos);
}

void CompareConnections(const Wire& wire, const ModelSocket& model) {
  ExpectSame("connections", static_cast<int64_t>(wire.Dialled().size()),
             static_cast<int64_t>(model.Dialled().size()));
  for (size_t i = 0; i < wire.Dialled().size(); ++i) {
    ExpectSame("request", wire.Dialled()[i].Written(), model.Dialled()[i].Written());
    ExpectSame("sizes of the reads", wire.Dialled()[i].Reads(), model.Dialled()[i].Reads());
    ExpectOneHead(wire.Dialled()[i].Written());
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  LogEverything();
  g_fuzz_time = kTime;
  std::string_view text(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&text));
  const ModelSettings settings = SettingsOf(options, TakeLine(&text));
  const std::vector<Connection> connections = ParseConnections(text);
  Wire wire(connections, options.Numbers());
  ModelClient model(settings, connections, options.Numbers());
  {
    Client client(settings);
    Exchange exchange(&client, &model);
    if (options.Has("cookie")) {
      client.SetCookie("s=1");
      model.SetCookie("s=1");
    }
    for (int round = 0; round < (options.Has("twice") ? 2 : 1); ++round) {
      exchange.Play(options);
      exchange.CompareState();
    }
  }
  CompareConnections(wire, model.Socket());
  ExpectSame("open descriptors", wire.Open(), 0);
  return 0;
}
