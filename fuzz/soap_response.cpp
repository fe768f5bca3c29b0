// A SOAP exchange: what the response is of the peer's bytes, and what the document.
//
//   login buffered 16 1
//   HTTP/1.1 200 OK
//   Content-Length: 4
//
//   <a/>
//
// Words of line 1: "login" sends credentials after a challenge, "document" parses the response,
// "direct" reads without the buffer, "twice" posts twice.
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/soap_response.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "fuzz/support/xml.h"
#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;
constexpr long kTime = 1700000000;
constexpr char kHost[] = "cam";
constexpr char kEnvelope[] = "<Envelope/>";

const ModelCredentials& Credentials() {
  static const ModelCredentials credentials = {"admin", "secret", "soap/svc"};
  return credentials;
}

class Client : public TWHttpClient {
 public:
  explicit Client(bool buffered)
      : TWHttpClient(kHost, 80, Credentials().path, Credentials().user, Credentials().password,
                     kTimeout, false, buffered, false, false, HTTP_VERSION_NONE, "") {}

  int State() const { return m_connState; }
};

class Exchange {
 public:
  Exchange(const Options& options, const std::vector<Connection>& connections)
      : options_(options),
        wire_(connections, options.Numbers()),
        client_(!options.Has("direct")),
        socket_(kTimeout, !options.Has("direct"), connections, options.Numbers()),
        model_(&socket_, kHost, Credentials(), kTime) {}

  void Post() {
    const bool login = options_.Has("login");
    const bool document = !login && options_.Has("document");
    std::string expected = "before";
    const int result = login ? model_.PostWithCredentials(kEnvelope, &expected)
                             : model_.Post(kEnvelope, &expected);
    document ? CheckDocument(result, expected) : CheckResponse(login, result, expected);
  }

  void CheckClient() {
    int status = -1;
    ExpectSame("the last result", client_.CheckResponse(status), model_.Result());
    ExpectSame("the status", status, model_.Head().status);
    ExpectSame("the state", client_.State(), model_.Head().state);
    ExpectSame("the connections", static_cast<int64_t>(wire_.Dialled().size()),
               static_cast<int64_t>(socket_.Dialled().size()));
    for (size_t i = 0; i < socket_.Dialled().size(); ++i) {
      ExpectSame("a request", wire_.Dialled()[i].Written(), socket_.Dialled()[i].Written());
    }
  }

 private:
  void CheckResponse(bool login, int result, const std::string& expected) {
    std::string response = "before";
    const int got = login ? client_.SendAuthReqBySocketPost(kEnvelope, response)
                          : client_.SendReqBySocketPost(kEnvelope, response);
    ExpectSame("the result", got, result);
    ExpectSame("the response", response, expected);
  }

  void CheckDocument(int result, const std::string& response) {
    xmlDoc before = {};
    xmlDoc* doc = &before;
    ExpectSame("the result", client_.SendReqByXMLSocketPost(kEnvelope, doc), result);
    if (result != HTTP_RET_OK) {
      Expect("a failure leaves the document", doc == &before);
      return;
    }
    const std::string reports = TakeXmlReports();
    ExpectSame("the document", XmlText(doc), XmlTextOf(oracle::WithoutLineEnds(response)));
    ExpectSame("what is reported", reports, TakeXmlReports());
    xmlFreeDoc(doc);
  }

  const Options& options_;
  Wire wire_;
  Client client_;
  ModelSocket socket_;
  oracle::SoapClient model_;
};

}  // namespace

extern "C" int LLVMFuzzerInitialize(int*, char***) {
  LogEverything();
  WatchXml();
  g_fuzz_time = kTime;
  return 0;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&input));
  Exchange exchange(options, ParseConnections(input));
  exchange.Post();
  if (options.Has("twice")) exchange.Post();
  exchange.CheckClient();
  return 0;
}
