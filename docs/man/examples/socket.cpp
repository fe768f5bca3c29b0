// tarnwick_socket(3): a device that greets, plain and over TLS.
#include <memory>

#include "docs/man/examples/examples.h"
#include "tarnwick/net/sslsocket.h"

std::string Greeting(const std::string& host, int port, bool tls) {
  std::unique_ptr<TWSocket> socket;
  if (tls) {
    socket = std::make_unique<SSLSocket>(host, port, 5, true);
  } else {
    socket = std::make_unique<TWSocket>(host, port, 5, true);
  }
  if (socket->Connect() != 0) return "";  // the log says why
  socket->SetKeepAliveOpt(1, 60, 10, 3);

  const std::string hello = "HELO\n";
  const int size = static_cast<int>(hello.size());
  if (socket->WriteData(hello.data(), size) != size) return "";
  char line[128];
  if (socket->ReadToLineEnd(line, sizeof(line)) < 0) return "";
  socket->Disconnect();
  return line;
}
