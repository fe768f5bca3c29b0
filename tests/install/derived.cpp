// A program of somebody who compiles without RTTI, without exceptions, or without both: it derives
// from the sockets, logs, and asks a JSON service.
#include <cstring>
#include <memory>

#include "expect.h"
#include "tarnwick/http/twcurl.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twsocket.h"
#include "tarnwick/utils/utils.h"

namespace {

// Reads from memory what a peer would send.
class FromMemory : public TWSocket {
 public:
  FromMemory() : TWSocket("127.0.0.1", 1, 1, true) {}
  int DoSelect(SELECT_TYPE) override { return 1; }
  int _Read(void* buf, unsigned int len) override {
    const unsigned int count = len < 6 ? len : 6;
    std::memcpy(buf, "line\r\n", count);
    return static_cast<int>(count);
  }
};

class CountsWaits : public SSLSocket {
 public:
  int DoSelect(SELECT_TYPE type) override {
    ++waits;
    return SSLSocket::DoSelect(type);
  }
  int waits = 0;
};

}  // namespace

int main() {
  auto socket = std::make_unique<FromMemory>();
  Expect(socket->Connect() != 0, "nobody listens on port 1");
  char line[16];
  Expect(socket->ReadToLineEnd(line, sizeof(line)) == 4, "a line is read");
  Expect(std::strcmp(line, "line") == 0, "the line is the one that was sent");
  char bytes[] = "pushed back";
  Expect(socket->RestoreData(bytes, 6) == 0, "bytes are pushed back");
  Expect(socket->ReadData(line, 6) == 6, "and read again");
  socket->SetSocketInfo("127.0.0.1", 1, 1, true);
  socket->Disconnect();
  auto tls = std::make_unique<CountsWaits>();
  tls->SetSocketInfo("127.0.0.1", 1, 1, true);
  Expect(tls->Connect() != 0, "nobody listens on port 1, with TLS neither");
  Json::Value response;
  Expect(SendHttpGet("127.0.0.1", 1, "/", response, 1, false) == -1, "a request fails");
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "a line from %s\n", "outside");
  return failures == 0 ? 0 : 1;
}
