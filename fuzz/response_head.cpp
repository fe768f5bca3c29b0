// The head of a response, read through the socket as it comes: status line, header lines, what the
// client keeps of them, and what is left for the body.
//
//   buffered 1 16
//   HTTP/1.1 200 OK
//   Content-Length: 5
//
//   hello
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "fuzz/oracle/shared/model_head.h"
#include "fuzz/oracle/shared/model_socket.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "fuzz/support/wire.h"
#include "tarnwick/http/kept_fields.h"
#include "tarnwick/http/twhttp.h"

namespace {

constexpr int kTimeout = 5;

class Client : public TWHttpClient {
 public:
  explicit Client(bool buffered)
      : TWHttpClient("cam", 80, "a.cgi", "", "", kTimeout, false, buffered, false, false,
                     HTTP_VERSION_1_1, "") {}

  // As after a request that has been written.
  int ReadHead() {
    m_pSocket->Connect();
    m_connState = 1;
    return CheckHttpResponse();
  }

  int State() const { return m_connState; }
  int Status() const { return m_statusCode; }
  const std::string& Challenge() const { return m_strAuthenticate; }

  std::string KeptHeaders() const {
    std::string text;
    for (const auto& [key, value] : m_mapContent) text += std::to_string(key) + "=" + value + "\n";
    return text;
  }

  std::string NextByte() {
    char byte = 0;
    return m_pSocket->ReadData(&byte, 1) == 1 ? std::string(1, byte) : "";
  }
};

std::string Text(const ModelHead& head) {
  std::string text;
  for (const auto& [key, value] : head.kept) text += std::to_string(key) + "=" + value + "\n";
  return text;
}

void Compare(Client* client, const ModelHead& head) {
  ExpectSame("state", client->State(), head.state);
  ExpectSame("status", client->Status(), head.status);
  ExpectSame("kept headers", client->KeptHeaders(), Text(head));
  ExpectSame("challenge", client->Challenge(), head.challenge);
  ExpectSame("transfer encoding", client->GetTransferEncoding(), head.encoding);
  std::string cookie;
  client->GetCookie(cookie);
  ExpectSame("cookie", cookie, head.cookie);
  for (const ModelField& field : ModelFields()) {
    const int key = field.key;
    if (key < 0) continue;
    std::string value = "untouched";
    const int expected = head.state != 2 ? 1 : head.kept.count(key) == 0 ? 6 : 0;
    ExpectSame("header's result", client->GetHttpContent(static_cast<HTTP_MAP_KEY>(key), value),
               expected);
    ExpectSame("header", value, expected == 0 ? head.kept.at(key) : "untouched");
  }
}

}  // namespace

// A field that the library keeps and the oracle does not know would never be noticed: the fuzzer does
// not guess a name.
extern "C" int LLVMFuzzerInitialize(int* /*argc*/, char*** /*argv*/) {
  std::string library;
  for (const tarnwick::KeptField& field : tarnwick::kKeptFields) {
    const bool content = field.as == tarnwick::KeptAs::kContent;
    for (const char c : field.name) library += static_cast<char>(tolower(c));
    library += " " + std::to_string(content ? field.key : -1) + "\n";
  }
  std::string oracle;
  for (const ModelField& field : ModelFields()) {
    oracle += field.name + " " + std::to_string(field.key) + "\n";
  }
  ExpectSame("kept header fields", library, oracle);
  return 0;
}

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
    ModelHead head;
    // A second response on the same object: what one leaves behind must not leak into the next.
    for (int round = 0; round < (options.Has("twice") ? 2 : 1); ++round) {
      head.state = 1;
      socket.Connect();
      const int expected = ReadModelHead(&socket, &head);
      ExpectSame("result", client.ReadHead(), expected);
      Compare(&client, head);
      std::string byte;
      socket.Read(1, &byte);
      ExpectSame("first byte after the head", client.NextByte(), byte);
    }
  }
  ExpectSame("open descriptors", wire.Open(), 0);
  return 0;
}
