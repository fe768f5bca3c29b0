// A body, chunked or not, in both ways to read: ReadBody after a head that has been read, GetResp
// with the head in front.
//
//   chunked buffered 3
//   4;name=value
//   Wiki
//   0
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/shared/model_body.h"
#include "fuzz/oracle/shared/model_head.h"
#include "fuzz/oracle/shared/model_socket.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;

class Client : public TWHttpClient {
 public:
  explicit Client(bool buffered)
      : TWHttpClient("cam", 80, "a.cgi", "", "", kTimeout, false, buffered, false, false,
                     HTTP_VERSION_1_1, "") {}

  void Connect() { m_pSocket->Connect(); }

  int ReadBodyOf(const std::string& encoding, std::string* body) {
    m_connState = 2;
    m_strTransferEncoding = encoding;
    return ReadBody(*body);
  }

  std::string Rest() {
    char piece[64];
    const int got = m_pSocket->ReadData(piece, sizeof(piece));
    return got > 0 ? std::string(piece, static_cast<size_t>(got)) : std::to_string(got);
  }
};

void CompareRest(Client* client, ModelSocket* socket) {
  std::string rest;
  const int got = socket->Read(64, &rest);
  ExpectSame("what is left", client->Rest(), got > 0 ? rest : std::to_string(got));
}

void CompareBody(Client* client, ModelSocket* socket, const std::string& encoding) {
  std::string body;
  std::string expected_body;
  const int expected = ReadModelBody(socket, encoding, &expected_body);
  ExpectSame("result", client->ReadBodyOf(encoding, &body), expected);
  ExpectSame("body", body, expected_body);
}

void CompareResponse(Client* client, ModelSocket* socket) {
  ModelHead head;
  std::string body;
  const bool failed =
      ReadModelHead(socket, &head) != 0 || ReadModelBody(socket, head.encoding, &body) != 0;
  ExpectSame("response", client->GetResp(), failed ? "{\"error\":true}" : body);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  LogEverything();
  std::string_view text(reinterpret_cast<const char*>(data), size);
  const Options options(TakeLine(&text));
  const bool buffered = !options.Has("direct");
  const std::vector<Connection> connections = ParseConnections(text);
  Wire wire(connections, options.Numbers());
  ModelSocket socket(kTimeout, buffered, connections, options.Numbers());
  {
    Client client(buffered);
    client.Connect();
    socket.Connect();
    if (options.Has("response")) {
      CompareResponse(&client, &socket);
    } else {
      CompareBody(&client, &socket, options.Has("chunked") ? "chunked" : "");
    }
    CompareRest(&client, &socket);
  }
  ExpectSame("open descriptors", wire.Open(), 0);
  return 0;
}
