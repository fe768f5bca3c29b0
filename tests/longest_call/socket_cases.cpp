// Connecting, waiting, reading and writing.
#include "tests/longest_call/cases.h"
#include "tests/longest_call/slow_bytes.h"

namespace {

// A little less than the limit of the seven waits of a small buffered read.
constexpr double kJustInSeven = 6.9;

// More than the buffers of both ends hold.
constexpr size_t kLarge = 16 << 20;

auto Connecting(bool https, int timeout = kTimeout) {
  return Operation("connect", [=](OperationSettings& settings) {
    settings.https = https;
    settings.timeout = timeout;
  });
}

// One read into a buffer of `size` bytes, after a request: the camera's faults are those of a
// response.
auto Reading(const char* operation, bool https, bool buffered, size_t size) {
  return Operation(operation, [=](OperationSettings& settings) {
    settings.https = https;
    settings.buffered = buffered;
    settings.piece = size;
    settings.most = 1;
  });
}

auto ReadingData(bool buffered, size_t size) {
  return Reading("socket_data", false, buffered, size);
}

auto ReadingALine(bool buffered, size_t size) {
  return Reading("socket_lines", false, buffered, size - 1);
}

// One read after a line that is there at once. With it come the session tickets of TLS, which would
// let the read's first wait pass.
auto ReadingOverTls(bool buffered, size_t size) {
  return Reading("socket_exchange", true, buffered, size);
}

// The peer that gives way takes the rest or resets the connection, so the result tells nothing.
auto Writing(bool https) {
  const auto write = Operation("socket_data", [=](OperationSettings& settings) {
    settings.https = https;
    settings.body.assign(kLarge, 'x');
    settings.piece = kLarge;
    settings.most = 0;
  });
  return [write](int port) {
    write(port);
    return 0;
  };
}

void ForTwoSeconds(OperationSettings& settings) {
  settings.limit = 2;
}

void ToAName(OperationSettings& settings) {
  settings.host = "camera.example.";
}

std::vector<Case> ConnectCases() {
  const CasePeer nobody = Camera("json,fault=black-hole");
  return {
      {"Connect, nobody answers", "T", 1, nobody, Connecting(false), -1},
      {"Connect, nobody answers, T negative", "the system's: 3 s here, 127 s by default", 3, nobody,
       Connecting(false, -1), -1},
      {"Connect to a name, the name server is silent",
       "the resolver's: 2 s here, 10 s by default",
       2,
       {},
       Operation("connect", ToAName),
       -1},
      {"SSLSocket::Connect, silence in the handshake", "none", 0,
       Camera("json,tls,fault=tls-stall"), Connecting(true), -1},
  };
}

std::vector<Case> ReadCases() {
  const CasePeer silent = Camera("json,fault=stall-after-request");
  return {
      {"HasDataToRead(t), silence", "t", 2, silent, Operation("probe", ForTwoSeconds), 0},
      {"ReadData below 1,024 bytes, silence", "7 T", 7, silent, ReadingData(true, 1), -1},
      {"ReadData from 1,024 bytes, silence", "T", 1, silent, ReadingData(true, 4096), -1},
      {"ReadData from 1,024 bytes, silence after a part", "2 T", 2,
       Camera("json,fault=stall-in-status"), ReadingData(true, 4096), 8},
      {"ReadData without read-ahead, silence", "T", 1, silent, ReadingData(false, 1), -1},
      {"ReadData of 3 bytes, each just in time", "7 T and T for each further byte", 9,
       Camera("json,fault=stall-before-status:6900,fault=slow:1:950"), ReadingData(true, 3), 3},
      // The camera's shortest line would take more than a minute.
      {"ReadToLineEnd into 2 bytes, each byte just in time", "7 T (size + 1)", 21,
       Scripted({Drip("a\r\n", kJustInSeven)}), ReadingALine(true, 2), 1},
      {"ReadToLineEnd into 9 bytes without read-ahead, each byte just in time", "T (size + 1)", 10,
       Camera("json,fault=no-code,fault=stall-before-status:950,fault=slow:1:950"),
       ReadingALine(false, 9), 8},
  };
}

std::vector<Case> TlsReadCases() {
  const CasePeer silent = Camera("json,tls,fault=stall-after-status");
  return {
      {"ReadData over TLS below 1,024 bytes, silence", "14 T", 14, silent, ReadingOverTls(true, 1),
       -1},
      {"ReadData over TLS from 1,024 bytes, silence", "2 T", 2, silent, ReadingOverTls(true, 4096),
       -1},
      {"ReadData over TLS without read-ahead, silence", "2 T", 2, silent, ReadingOverTls(false, 1),
       -1},
      {"ReadData of 1 byte over TLS, 10 bytes of its record just in time",
       "T for each byte of the record", kSlowBytes,
       Scripted({{ExpectRequest(), Send("a"), StallUntilFinish()}}, true),
       Reading("socket_data", true, false, 1), 1},
  };
}

std::vector<Case> WriteCases() {
  return {
      {"WriteData, the peer reads nothing", "none", 0, Camera("json,fault=never-read"),
       Writing(false), 0},
      {"WriteData over TLS, the peer reads nothing", "none", 0,
       Camera("json,tls,fault=read-slowly:1:17000,fault=close-in-request:1"), Writing(true), 0},
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
