// The sockets: connecting, the TLS handshake, reading, writing and waiting.
#include <netinet/in.h>

#include <cstring>
#include <memory>
#include <string>

#include "tarnwick/net/sslsocket.h"
#include "tarnwick/net/twsocket.h"
#include "tests/torture/operations.h"
#include "tests/torture/peer_process.h"

namespace {

using Socket = std::unique_ptr<TWSocket>;

constexpr char kHost[] = "127.0.0.1";
constexpr char kRequest[] = "GET /length HTTP/1.1\r\n\r\n";
constexpr int kTimeout = 2;

bool Connect(Stage& stage, TWSocket& socket) {
  int result = 1;
  stage.Run([&] { result = socket.Connect(); });
  stage.ExpectEither(result == 0, result < 0, "the result of connecting is wrong");
  stage.Expect(socket.IsConnected() == (result == 0), "the state does not fit the result");
  return result == 0;
}

void Destroy(Stage& stage, Socket socket) {
  stage.Run([&] { socket->Disconnect(); });
  stage.Expect(!socket->IsConnected(), "it is connected after the disconnect");
  stage.Run([&] { socket.reset(); });
}

void ConnectTo(Stage& stage, Socket socket) {
  Connect(stage, *socket);
  Destroy(stage, std::move(socket));
}

void ConnectWithTimeout(Stage& stage) {
  ConnectTo(stage, std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, true));
}

void ConnectBlocking(Stage& stage) {
  ConnectTo(stage, std::make_unique<TWSocket>(kHost, stage.Port(), -1, false));
}

void ConnectFromAddress(Stage& stage) {
  auto socket = std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, true);
  socket->SetRemoteAddr(htonl(INADDR_LOOPBACK));
  ConnectTo(stage, std::move(socket));
}

// By the hosts file.
void ConnectByName(Stage& stage) {
  ConnectTo(stage, std::make_unique<TWSocket>("localhost", stage.Port(), kTimeout, true));
}

void ConnectRefused(Stage& stage) {
  auto socket = std::make_unique<TWSocket>(kHost, 1, kTimeout, true);
  int result = 1;
  stage.Run([&] { result = socket->Connect(); });
  stage.Expect(result == -1, "a refused connection is a success");
  Destroy(stage, std::move(socket));
}

void Handshake(Stage& stage) {
  ConnectTo(stage, std::make_unique<SSLSocket>(kHost, stage.Port(), kTimeout, true));
}

// A handshake on a connection that is there already ends the old one first.
void Reconnect(Stage& stage) {
  auto socket = std::make_unique<SSLSocket>(kHost, stage.Port(), kTimeout, true);
  if (socket->Connect() != 0) stage.Expect(false, "no first connection");
  ConnectTo(stage, std::move(socket));
}

void KeepAlive(Stage& stage) {
  auto socket = std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, true);
  socket->Connect();
  int result = 1;
  stage.Run([&] { result = socket->SetKeepAliveOpt(1, 60, 10, 3); });
  stage.ExpectEither(result == 0, result == -1, "the result is wrong");
  Destroy(stage, std::move(socket));
}

std::string ReadAll(Stage& stage, TWSocket& socket, int piece) {
  std::string text;
  std::string buf(static_cast<size_t>(piece), '\0');
  for (;;) {
    int count = -1;
    stage.Run([&] { count = socket.ReadData(buf.data(), piece); });
    if (count == 0) return text + "(end)";
    if (count < 0) return text;
    text.append(buf, 0, static_cast<size_t>(count));
  }
}

// The reply's body behind its head's first line and the rest of the head.
void ExpectReply(Stage& stage, const std::string& text) {
  const size_t head = text.find("\r\n\r\n");
  const std::string rest = head == std::string::npos ? "" : text.substr(head + 4);
  const bool ended = rest.size() >= 5 && rest.compare(rest.size() - 5, 5, "(end)") == 0;
  const std::string body = ended ? rest.substr(0, rest.size() - 5) : rest;
  stage.ExpectEither(ended && body == Body(), !ended && Body().compare(0, body.size(), body) == 0,
                     "what was read is wrong");
}

void Exchange(Stage& stage, Socket socket, int piece) {
  if (socket->Connect() != 0) stage.Expect(false, "no connection");
  const int length = static_cast<int>(strlen(kRequest));
  int written = -2;
  stage.Run([&] { written = socket->WriteData(kRequest, length); });
  stage.ExpectEither(written == length, written < length, "the result of writing is wrong");
  if (written == length) {
    char line[64] = "";
    int count = -2;
    stage.Run([&] { count = socket->ReadToLineEnd(line, sizeof(line)); });
    const std::string first = "HTTP/1.1 200 OK";
    stage.ExpectEither(line == first, count == -1, "the line is wrong");
    if (count > 0) ExpectReply(stage, ReadAll(stage, *socket, piece));
  }
  Destroy(stage, std::move(socket));
}

void ExchangeBuffered(Stage& stage) {
  Exchange(stage, std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, true), 700);
}

void ExchangeDirect(Stage& stage) {
  Exchange(stage, std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, false), 4000);
}

void ExchangeTlsBuffered(Stage& stage) {
  Exchange(stage, std::make_unique<SSLSocket>(kHost, stage.Port(), kTimeout, true), 700);
}

void ExchangeTlsDirect(Stage& stage) {
  Exchange(stage, std::make_unique<SSLSocket>(kHost, stage.Port(), kTimeout, false), 4000);
}

void Probe(Stage& stage) {
  auto socket = std::make_unique<TWSocket>(kHost, stage.Port(), kTimeout, true);
  socket->Connect();
  socket->WriteData(kRequest, static_cast<int>(strlen(kRequest)));
  bool ready = false;
  stage.Run([&] { ready = socket->HasDataToRead(1); });
  stage.ExpectEither(ready, !ready, "there is nothing to read");
  Destroy(stage, std::move(socket));
}

}  // namespace

std::vector<Operation> NetOperations() {
  return {
      {"connect", Peer::kPlain, ConnectWithTimeout},
      {"connect_blocking", Peer::kPlain, ConnectBlocking},
      {"connect_from", Peer::kPlain, ConnectFromAddress},
      {"connect_by_name", Peer::kPlain, ConnectByName},
      {"connect_refused", Peer::kNone, ConnectRefused, true},
      {"keep_alive", Peer::kPlain, KeepAlive},
      {"exchange", Peer::kPlain, ExchangeBuffered},
      {"exchange_direct", Peer::kPlain, ExchangeDirect},
      {"probe", Peer::kPlain, Probe},
      {"handshake", Peer::kTls, Handshake, false, true},
      {"handshake_again", Peer::kTls, Reconnect, false, true},
      {"exchange_tls", Peer::kTls, ExchangeTlsBuffered},
      {"exchange_tls_direct", Peer::kTls, ExchangeTlsDirect},
  };
}
