// The operations of the sockets alone.
#include <cstring>

#include "tarnwick/net/sslsocket.h"
#include "tests/operations/parts.h"

namespace {

std::unique_ptr<TWSocket> NewSocket(const Target& target) {
  if (!target.tls) {
    return std::make_unique<TWSocket>(kPeerHost, target.port, target.timeout, target.buffered);
  }
  return std::make_unique<SSLSocket>(kPeerHost, target.port, target.timeout, target.buffered);
}

template <typename Read>
OperationOutcome BySocket(const Target& target, Read read) {
  const auto socket = NewSocket(target);
  OperationOutcome outcome;
  outcome.result = std::min(socket->Connect(), 0) < 0 ? -1 : 0;
  const int length = static_cast<int>(strlen(kSocketRequest));
  const int written = socket->WriteData(kSocketRequest, length);
  if (written < -1 || written > length) outcome.mistake = "WriteData";
  read(*socket, &outcome);
  socket->Disconnect();
  if (socket->IsConnected()) outcome.mistake = "connected after Disconnect";
  return outcome;
}

}  // namespace

OperationOutcome SocketData(const Target& target) {
  return BySocket(target, [&](TWSocket& socket, OperationOutcome* outcome) {
    ReadAll(socket, target.piece, outcome);
    outcome->has_text = false;  // with the head
  });
}

OperationOutcome SocketLines(const Target& target) {
  return BySocket(target, [&](TWSocket& socket, OperationOutcome* outcome) {
    ReadLines(socket, target.piece, outcome);
  });
}

// The raw read, as a caller of the public virtual functions may use it.
OperationOutcome SocketRaw(const Target& target) {
  return BySocket(target, [&](TWSocket& socket, OperationOutcome* outcome) {
    if (!socket.IsConnected()) return;
    std::string buf(target.piece, '\0');
    for (int reads = 0; reads < 20; ++reads) {
      if (socket.DoSelect(TWSocket::SELECT_READ) < 0) return;
      const int count = socket._Read(buf.data(), static_cast<unsigned>(buf.size()));
      if (count > static_cast<int>(buf.size())) outcome->mistake = "_Read";
      if (count <= 0) return;
    }
  });
}
