// Connecting, waiting, reading and writing.
#include <memory>

#include "tarnwick/net/sslsocket.h"
#include "tests/longest_call/cases.h"
#include "tests/longest_call/slow_bytes.h"

namespace {

// A little less than the limits of one wait and of the seven of a small buffered read.
constexpr double kJustInTime = 0.95;
constexpr double kJustInSeven = 6.9;

// More than the buffers of both ends hold.
constexpr size_t kLarge = 16 << 20;

template <typename Socket>
std::unique_ptr<Socket> Connected(int port, bool buffered, int timeout = kTimeout) {
  auto socket = std::make_unique<Socket>("127.0.0.1", port, timeout, buffered);
  return socket->Connect() == 0 ? std::move(socket) : nullptr;
}

template <typename Socket>
auto Connecting(int timeout = kTimeout) {
  return [=](int port) { return Connected<Socket>(port, true, timeout) != nullptr ? 0 : -1; };
}

// The result of one read of `size` bytes.
template <typename Socket>
int Read(int port, bool buffered, int size) {
  const auto socket = Connected<Socket>(port, buffered);
  if (socket == nullptr) return -2;
  std::string bytes(static_cast<size_t>(size), '\0');
  return socket->ReadData(&bytes[0], size);
}

template <typename Socket>
auto Reading(bool buffered, int size) {
  return [=](int port) { return Read<Socket>(port, buffered, size); };
}

// A line into a buffer of two bytes: it holds one character.
int ReadLine(int port, bool buffered) {
  const auto socket = Connected<TWSocket>(port, buffered);
  if (socket == nullptr) return -2;
  char line[2];
  return socket->ReadToLineEnd(line, sizeof(line));
}

template <typename Socket>
int Write(int port) {
  const auto socket = Connected<Socket>(port, true);
  if (socket == nullptr) return -2;
  const std::string bytes(kLarge, 'x');
  return socket->WriteData(bytes.data(), static_cast<int>(bytes.size())) <
         static_cast<int>(bytes.size());
}

int Wait(int port) {
  const auto socket = Connected<TWSocket>(port, true);
  return socket != nullptr && socket->HasDataToRead(2) ? 1 : 0;
}

int LookUp(int /*port*/) {
  return TWSocket("camera.example.", 80, kTimeout, true).Connect();
}

std::vector<Case> ConnectCases() {
  return {
      {"Connect, nobody answers", "T", 1, {}, Connecting<TWSocket>(), -1, Peer::kBlackHole},
      {"Connect, nobody answers, T negative",
       "the system's: 3 s here, 127 s by default",
       3,
       {},
       Connecting<TWSocket>(-1),
       -1,
       Peer::kBlackHole},
      {"Connect to a name, the name server is silent",
       "the resolver's: 2 s here, 10 s by default",
       2,
       {},
       LookUp,
       -1},
      {"SSLSocket::Connect, silence in the handshake",
       "none",
       0,
       {GivesWay()},
       Connecting<SSLSocket>(),
       -1},
  };
}

std::vector<Case> ReadCases() {
  const Script silent = {StallUntilFinish()};
  return {
      {"HasDataToRead(t), silence", "t", 2, {silent}, Wait, 0},
      {"ReadData below 1,024 bytes, silence", "7 T", 7, {silent}, Reading<TWSocket>(true, 1), -1},
      {"ReadData from 1,024 bytes, silence", "T", 1, {silent}, Reading<TWSocket>(true, 4096), -1},
      {"ReadData from 1,024 bytes, silence behind a part",
       "2 T",
       2,
       {{Send("part"), StallUntilFinish()}},
       Reading<TWSocket>(true, 4096),
       4},
      {"ReadData without read-ahead, silence", "T", 1, {silent}, Reading<TWSocket>(false, 1), -1},
      {"ReadData of 3 bytes, each just in time",
       "7 T and T for each further byte",
       9,
       {{Pause(kJustInSeven), Send("a"), Pause(kJustInTime), Send("b"), Pause(kJustInTime),
         Send("c"), StallUntilFinish()}},
       Reading<TWSocket>(true, 3),
       3},
      {"ReadToLineEnd into 2 bytes, each byte just in time",
       "7 T (size + 1)",
       21,
       {Drip("a\r\n", kJustInSeven)},
       [](int port) { return ReadLine(port, true); },
       1},
      {"ReadToLineEnd into 2 bytes without read-ahead, each byte just in time",
       "T (size + 1)",
       3,
       {Drip("a\r\n", kJustInTime)},
       [](int port) { return ReadLine(port, false); },
       1},
  };
}

std::vector<Case> TlsReadCases() {
  const Script silent = {Handshake(), StallUntilFinish()};
  return {
      {"ReadData over TLS below 1,024 bytes, silence",
       "14 T",
       14,
       {silent},
       Reading<SSLSocket>(true, 1),
       -1,
       Peer::kTls},
      {"ReadData over TLS from 1,024 bytes, silence",
       "2 T",
       2,
       {silent},
       Reading<SSLSocket>(true, 4096),
       -1,
       Peer::kTls},
      {"ReadData over TLS without read-ahead, silence",
       "2 T",
       2,
       {silent},
       Reading<SSLSocket>(false, 1),
       -1,
       Peer::kTls},
      {"ReadData of 1 byte over TLS, 10 bytes of its record just in time",
       "T for each byte of the record",
       kSlowBytes,
       {{Handshake(), Send("a"), StallUntilFinish()}},
       Reading<SSLSocket>(false, 1),
       1,
       Peer::kTlsByteByByte},
  };
}

std::vector<Case> WriteCases() {
  return {
      {"WriteData, the peer reads nothing", "none", 0, {GivesWay()}, Write<TWSocket>, 1},
      {"WriteData over TLS, the peer reads nothing",
       "none",
       0,
       {{Handshake(), Pause(kHold), Reset()}},
       Write<SSLSocket>,
       1,
       Peer::kTls},
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
