// The operations of the sockets alone.
#include "tarnwick/net/sslsocket.h"
#include "tests/operations/parts.h"

namespace {

std::unique_ptr<TWSocket> SocketOf(const OperationSettings& settings) {
  std::unique_ptr<TWSocket> socket;
  if (settings.https) {
    socket = std::make_unique<SSLSocket>(settings.host, settings.port, settings.timeout,
                                         settings.buffered);
  } else {
    socket = std::make_unique<TWSocket>(settings.host, settings.port, settings.timeout,
                                        settings.buffered);
  }
  if (settings.address != 0) socket->SetRemoteAddr(settings.address);
  return socket;
}

void ConnectTo(const OperationSettings& settings, TWSocket& socket, OperationResult* result) {
  settings.Step([&] { result->result = socket.Connect(); });
  const bool connected = result->result == 0;
  if (result->result > 0) result->mistake = "Connect: " + std::to_string(result->result);
  if (socket.IsConnected() != connected) result->mistake = "the state does not fit the result";
  if (!connected) result->result = -1;
}

template <typename Use>
OperationResult BySocket(const OperationSettings& settings, Use use) {
  auto socket = SocketOf(settings);
  OperationResult result;
  ConnectTo(settings, *socket, &result);
  if (result.result == 0 || settings.go_on) use(*socket, &result);
  settings.Step([&] { socket->Disconnect(); });
  if (socket->IsConnected()) result.mistake = "connected after Disconnect";
  settings.Step([&] { socket.reset(); });
  return result;
}

// Writes settings.body, and reads by `read` what comes.
template <typename Read>
OperationResult WriteAndRead(const OperationSettings& settings, Read read) {
  return BySocket(settings, [&](TWSocket& socket, OperationResult* result) {
    const bool written = WritePieces(settings, socket, settings.body, result);
    if (written || settings.go_on) read(socket, result);
  });
}

// Pushes the front of what was read back, and reads it again.
void ReadAgain(const OperationSettings& settings, TWSocket& socket, OperationResult* result) {
  std::string front = result->first.substr(0, 1000);
  std::string again(front.size(), '\0');
  const int size = static_cast<int>(front.size());
  settings.Step([&] {
    if (socket.RestoreData(front.data(), size) != 0) result->mistake = "RestoreData";
    if (socket.ReadData(again.data(), size) != size || again != front) {
      result->mistake = "other bytes than were pushed back";
    }
  });
}

}  // namespace

OperationResult Connect(const OperationSettings& settings) {
  return BySocket(settings, [](TWSocket& /*socket*/, OperationResult* /*result*/) {});
}

// Ends the connection that is there first.
OperationResult Reconnect(const OperationSettings& settings) {
  return BySocket(settings, [&](TWSocket& socket, OperationResult* result) {
    ConnectTo(settings, socket, result);
  });
}

OperationResult KeepAlive(const OperationSettings& settings) {
  return BySocket(settings, [&](TWSocket& socket, OperationResult* result) {
    settings.Step([&] { result->read = socket.SetKeepAliveOpt(1, 60, 10, 3); });
    result->healthy = result->read == 0;
    if (result->read != 0 && result->read != -1) result->mistake = "SetKeepAliveOpt";
  });
}

OperationResult Probe(const OperationSettings& settings) {
  return WriteAndRead(settings, [&](TWSocket& socket, OperationResult* result) {
    settings.Step([&] { result->healthy = socket.HasDataToRead(settings.limit); });
    result->read = result->healthy ? 1 : 0;
  });
}

// A line, and everything after it. Over TLS what comes first may be no data.
OperationResult SocketExchange(const OperationSettings& settings) {
  return WriteAndRead(settings, [&](TWSocket& socket, OperationResult* result) {
    settings.Step([&] { result->healthy = socket.SetKeepAliveOpt(1, 60, 10, 3) == 0; });
    bool ready = true;
    if (!settings.https) settings.Step([&] { ready = socket.HasDataToRead(settings.limit); });
    result->healthy = result->healthy && ready;
    std::string line(std::max<size_t>(settings.piece, 64) + 1, '\0');
    const int size = static_cast<int>(line.size());
    settings.Step([&] { result->read = socket.ReadToLineEnd(line.data(), size); });
    if (result->read <= 0) return;
    result->first = line.substr(0, static_cast<size_t>(result->read));
    if (settings.buffered) ReadAgain(settings, socket, result);
    ReadPieces(settings, socket, result);
  });
}

OperationResult SocketData(const OperationSettings& settings) {
  return WriteAndRead(settings, [&](TWSocket& socket, OperationResult* result) {
    ReadPieces(settings, socket, result);
  });
}

OperationResult SocketLines(const OperationSettings& settings) {
  return WriteAndRead(settings, [&](TWSocket& socket, OperationResult* result) {
    ReadLines(settings, socket, result);
  });
}

// The raw read, as a caller of the public virtual functions may use it.
OperationResult SocketRaw(const OperationSettings& settings) {
  return WriteAndRead(settings, [&](TWSocket& socket, OperationResult* result) {
    constexpr int kMostReads = 20;
    if (!socket.IsConnected()) return;
    std::string buf(settings.piece, '\0');
    for (int reads = 0; reads < kMostReads; ++reads) {
      const unsigned size = static_cast<unsigned>(buf.size());
      settings.Step([&] {
        result->read =
            socket.DoSelect(TWSocket::SELECT_READ) < 0 ? -1 : socket._Read(buf.data(), size);
      });
      if (result->read > static_cast<int>(buf.size())) result->mistake = "_Read";
      if (result->read <= 0) return;
    }
  });
}
