// Connecting, waiting, reading and writing.
#include <memory>

#include "tarnwick/net/sslsocket.h"
#include "tests/longest_call/cases.h"
#include "tests/longest_call/slow_bytes.h"

namespace {

// A little less than the limit of the seven waits of a small buffered read.
constexpr double kJustInSeven = 6.9;

// More than the buffers of both ends hold.
constexpr size_t kLarge = 16 << 20;

constexpr char kRequest[] = "GET /info.json HTTP/1.0\r\n\r\n";

template <typename Socket>
std::unique_ptr<Socket> Connected(int port, bool buffered, int timeout = kTimeout) {
  auto socket = std::make_unique<Socket>("127.0.0.1", port, timeout, buffered);
  return socket->Connect() == 0 ? std::move(socket) : nullptr;
}

// Connects and sends a request: the camera's faults are those of an answer.
template <typename Socket>
std::unique_ptr<Socket> Asking(int port, bool buffered) {
  auto socket = Connected<Socket>(port, buffered);
  const int size = sizeof(kRequest) - 1;
  if (socket == nullptr || socket->WriteData(kRequest, size) != size) return nullptr;
  return socket;
}

template <typename Socket>
auto Connecting(int timeout = kTimeout) {
  return [=](int port) { return Connected<Socket>(port, true, timeout) != nullptr ? 0 : -1; };
}

// The result of one read of `size` bytes.
template <typename Socket>
int Read(int port, bool buffered, int size) {
  const auto socket = Asking<Socket>(port, buffered);
  if (socket == nullptr) return -2;
  std::string bytes(static_cast<size_t>(size), '\0');
  return socket->ReadData(&bytes[0], size);
}

template <typename Socket>
auto Reading(bool buffered, int size) {
  return [=](int port) { return Read<Socket>(port, buffered, size); };
}

// The result of one read of `size` bytes behind a line that is there at once. With it come the
// session tickets of TLS, which would let the read's first wait pass.
int ReadBehindALine(int port, bool buffered, int size) {
  const auto socket = Asking<SSLSocket>(port, buffered);
  char line[64];
  if (socket == nullptr || socket->ReadToLineEnd(line, sizeof(line)) <= 0) return -2;
  std::string bytes(static_cast<size_t>(size), '\0');
  return socket->ReadData(&bytes[0], size);
}

auto ReadingBehindALine(bool buffered, int size) {
  return [=](int port) { return ReadBehindALine(port, buffered, size); };
}

// The result of reading a line into a buffer of `size` bytes.
int ReadLine(int port, bool buffered, int size) {
  const auto socket = Asking<TWSocket>(port, buffered);
  if (socket == nullptr) return -2;
  std::string line(static_cast<size_t>(size), '\0');
  return socket->ReadToLineEnd(&line[0], size);
}

auto ReadingALine(bool buffered, int size) {
  return [=](int port) { return ReadLine(port, buffered, size); };
}

// The peer that gives way takes the rest or resets the connection, so the result tells nothing.
template <typename Socket>
int Write(int port) {
  const auto socket = Connected<Socket>(port, true);
  if (socket == nullptr) return -2;
  const std::string bytes(kLarge, 'x');
  socket->WriteData(bytes.data(), static_cast<int>(bytes.size()));
  return 0;
}

int Wait(int port) {
  const auto socket = Asking<TWSocket>(port, true);
  if (socket == nullptr) return -2;
  return socket->HasDataToRead(2) ? 1 : 0;
}

int LookUp(int /*port*/) {
  return TWSocket("camera.example.", 80, kTimeout, true).Connect();
}

std::vector<Case> ConnectCases() {
  const Peer nobody = Camera("json,fault=black-hole");
  return {
      {"Connect, nobody answers", "T", 1, nobody, Connecting<TWSocket>(), -1},
      {"Connect, nobody answers, T negative", "the system's: 3 s here, 127 s by default", 3, nobody,
       Connecting<TWSocket>(-1), -1},
      {"Connect to a name, the name server is silent",
       "the resolver's: 2 s here, 10 s by default",
       2,
       {},
       LookUp,
       -1},
      {"SSLSocket::Connect, silence in the handshake", "none", 0,
       Camera("json,tls,fault=tls-stall"), Connecting<SSLSocket>(), -1},
  };
}

std::vector<Case> ReadCases() {
  const Peer silent = Camera("json,fault=stall-after-request");
  return {
      {"HasDataToRead(t), silence", "t", 2, silent, Wait, 0},
      {"ReadData below 1,024 bytes, silence", "7 T", 7, silent, Reading<TWSocket>(true, 1), -1},
      {"ReadData from 1,024 bytes, silence", "T", 1, silent, Reading<TWSocket>(true, 4096), -1},
      {"ReadData from 1,024 bytes, silence behind a part", "2 T", 2,
       Camera("json,fault=stall-in-status"), Reading<TWSocket>(true, 4096), 8},
      {"ReadData without read-ahead, silence", "T", 1, silent, Reading<TWSocket>(false, 1), -1},
      {"ReadData of 3 bytes, each just in time", "7 T and T for each further byte", 9,
       Camera("json,fault=stall-before-status:6900,fault=slow:1:950"), Reading<TWSocket>(true, 3),
       3},
      // The camera's shortest line would take more than a minute.
      {"ReadToLineEnd into 2 bytes, each byte just in time", "7 T (size + 1)", 21,
       Scripted({Drip("a\r\n", kJustInSeven)}), ReadingALine(true, 2), 1},
      {"ReadToLineEnd into 9 bytes without read-ahead, each byte just in time", "T (size + 1)", 10,
       Camera("json,fault=no-code,fault=stall-before-status:950,fault=slow:1:950"),
       ReadingALine(false, 9), 8},
  };
}

std::vector<Case> TlsReadCases() {
  const Peer silent = Camera("json,tls,fault=stall-after-status");
  return {
      {"ReadData over TLS below 1,024 bytes, silence", "14 T", 14, silent,
       ReadingBehindALine(true, 1), -1},
      {"ReadData over TLS from 1,024 bytes, silence", "2 T", 2, silent,
       ReadingBehindALine(true, 4096), -1},
      {"ReadData over TLS without read-ahead, silence", "2 T", 2, silent,
       ReadingBehindALine(false, 1), -1},
      {"ReadData of 1 byte over TLS, 10 bytes of its record just in time",
       "T for each byte of the record", kSlowBytes,
       Scripted({{ExpectRequest(), Send("a"), StallUntilFinish()}}, true),
       Reading<SSLSocket>(false, 1), 1},
  };
}

std::vector<Case> WriteCases() {
  return {
      {"WriteData, the peer reads nothing", "none", 0, Camera("json,fault=never-read"),
       Write<TWSocket>, 0},
      {"WriteData over TLS, the peer reads nothing", "none", 0,
       Camera("json,tls,fault=read-slowly:1:17000,fault=close-in-request:1"), Write<SSLSocket>, 0},
  };
}

}  // namespace

std::vector<Case> SocketCases() {
  std::vector<Case> all = ConnectCases();
  for (const auto& group : {ReadCases(), TlsReadCases(), WriteCases()}) {
    all.insert(all.end(), group.begin(), group.end());
  }
  return all;
}
