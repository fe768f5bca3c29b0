#include "tests/support/peer_steps.h"

#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <chrono>
#include <cstdlib>

namespace {

using Read = PeerConnection::Read;

std::string Shown(const std::string& bytes) {
  constexpr size_t kMost = 300;
  std::string shown = "\"";
  for (const char c : bytes.substr(0, kMost)) {
    if (c == '\r') {
      shown += "\\r";
    } else if (c == '\n') {
      shown += "\\n";
    } else {
      shown += isprint(static_cast<unsigned char>(c)) != 0 ? c : '?';
    }
  }
  return shown + (bytes.size() > kMost ? "\"..." : "\"");
}

// Reads until `enough(pending)`.
template <typename Enough>
bool ReadUntil(PeerConnection& peer, Enough enough, std::string* error) {
  while (!enough(peer.Pending())) {
    const Read read = peer.ReadMore();
    if (read == Read::kData) continue;
    *error = std::string(ReadName(read)) + " " + peer.ErrorText() + " with " +
             Shown(peer.Pending()) + " read";
    return false;
  }
  return true;
}

// The length of the request at the start of `text`, npos while its head is not complete.
size_t RequestLength(const std::string& text) {
  const size_t head_end = text.find("\r\n\r\n");
  if (head_end == std::string::npos) return std::string::npos;
  std::string head = text.substr(0, head_end);
  std::transform(head.begin(), head.end(), head.begin(),
                 [](unsigned char c) { return static_cast<char>(tolower(c)); });
  const size_t field = head.find("\r\ncontent-length:");
  if (field == std::string::npos) return head_end + 4;
  return head_end + 4 + strtoul(head.c_str() + field + 17, nullptr, 10);
}

bool SendAll(PeerConnection& peer, const std::string& bytes, std::string* error) {
  if (peer.Write(bytes)) return true;
  *error = peer.ErrorText();
  return false;
}

bool NothingPending(PeerConnection& peer, std::string* error) {
  if (peer.Pending().empty()) return true;
  *error = "bytes that no step expected: " + Shown(peer.Pending());
  return false;
}

// Long enough that the client sees the piece on its own, short enough for thousands of pieces.
constexpr useconds_t kBetweenPieces = 200;

}  // namespace

Step ExpectUntil(const std::string& mark) {
  return {"ExpectUntil(" + Shown(mark) + ")", [mark](PeerConnection& peer, std::string* error) {
            const auto found = [&](const std::string& bytes) {
              return bytes.find(mark) != std::string::npos;
            };
            if (!ReadUntil(peer, found, error)) return false;
            peer.Pending().erase(0, peer.Pending().find(mark) + mark.size());
            return true;
          }};
}

Step ExpectBytes(size_t count) {
  return {"ExpectBytes(" + std::to_string(count) + ")",
          [count](PeerConnection& peer, std::string* error) {
            const auto enough = [&](const std::string& bytes) { return bytes.size() >= count; };
            if (!ReadUntil(peer, enough, error)) return false;
            peer.Pending().erase(0, count);
            return true;
          }};
}

Step ExpectExactly(const std::string& text) {
  return {"ExpectExactly(" + Shown(text) + ")", [text](PeerConnection& peer, std::string* error) {
            const auto enough = [&](const std::string& bytes) {
              return bytes.size() >= text.size();
            };
            if (!ReadUntil(peer, enough, error)) return false;
            const std::string got = peer.Pending().substr(0, text.size());
            peer.Pending().erase(0, text.size());
            if (got != text) *error = "got " + Shown(got);
            return got == text;
          }};
}

Step ExpectRequest() {
  return {"ExpectRequest()", [](PeerConnection& peer, std::string* error) {
            const auto whole = [](const std::string& bytes) {
              const size_t length = RequestLength(bytes);
              return length != std::string::npos && bytes.size() >= length;
            };
            if (!ReadUntil(peer, whole, error)) return false;
            peer.Pending().erase(0, RequestLength(peer.Pending()));
            return true;
          }};
}

Step ExpectEof() {
  return {"ExpectEof()", [](PeerConnection& peer, std::string* error) {
            if (!NothingPending(peer, error)) return false;
            const Read read = peer.ReadMore();
            if (read == Read::kEof) return true;
            *error = std::string(ReadName(read)) + " " + Shown(peer.Pending());
            return false;
          }};
}

Step ExpectCloseNotice() {
  Step step = ExpectEof();
  step.name = "ExpectCloseNotice()";
  step.play = [eof = step.play](PeerConnection& peer, std::string* error) {
    if (!eof(peer, error)) return false;
    if (!peer.SawCloseNotice()) *error = "closed without a notice";
    return peer.SawCloseNotice();
  };
  return step;
}

Step DiscardUntilEnd() {
  return {"DiscardUntilEnd()", [](PeerConnection& peer, std::string* error) {
            Read read = Read::kData;
            while (read == Read::kData) {
              read = peer.ReadMore();
              peer.Pending().clear();
            }
            if (read == Read::kEof || read == Read::kReset) return true;
            *error = std::string(ReadName(read)) + " " + peer.ErrorText();
            return false;
          }};
}

Step Send(const std::string& bytes) {
  return {"Send(" + Shown(bytes) + ")", [bytes](PeerConnection& peer, std::string* error) {
            return SendAll(peer, bytes, error);
          }};
}

Step SendByteByByte(const std::string& bytes) {
  std::vector<std::string> pieces;
  for (const char byte : bytes) pieces.emplace_back(1, byte);
  Step step = SendPieces(pieces);
  step.name = "SendByteByByte(" + Shown(bytes) + ")";
  return step;
}

Step SendPieces(const std::vector<std::string>& pieces) {
  return {"SendPieces()", [pieces](PeerConnection& peer, std::string* error) {
            for (const std::string& piece : pieces) {
              if (!SendAll(peer, piece, error)) return false;
              usleep(kBetweenPieces);
            }
            return true;
          }};
}

Step Close() {
  return {"Close()",
          [](PeerConnection& peer, std::string* error) {
            peer.Close();
            return NothingPending(peer, error);
          },
          false};
}

Step ShutdownWrite() {
  return {"ShutdownWrite()",
          [](PeerConnection& peer, std::string*) {
            peer.ShutdownWrite();
            return true;
          },
          false};
}

Step Reset() {
  return {"Reset()",
          [](PeerConnection& peer, std::string*) {
            peer.Reset();
            return true;
          },
          false};
}

Step WaitFor(const Flag& flag) {
  return {"WaitFor()",
          [flag](PeerConnection& peer, std::string* error) {
            while (!flag.Wait(std::chrono::milliseconds(10))) {
              if (!peer.DeadlinePassed()) continue;
              *error = "the flag was not set in time";
              return false;
            }
            return true;
          },
          false};
}

Step StallUntilFinish() {
  return {"StallUntilFinish()",
          [](PeerConnection& peer, std::string* error) {
            while (!peer.Stopped()) {
              usleep(2000);
              if (!peer.DeadlinePassed()) continue;
              *error = "the test did not end in time";
              return false;
            }
            return true;
          },
          false};
}

Step SetFlag(const Flag& flag) {
  return {"SetFlag()",
          [flag](PeerConnection&, std::string*) {
            flag.Set();
            return true;
          },
          false};
}

Step SendEndlessly(const std::string& bytes, size_t most) {
  return {"SendEndlessly()", [bytes, most](PeerConnection& peer, std::string* error) {
            for (size_t sent = 0; sent < most; sent += bytes.size()) {
              if (!peer.Write(bytes)) break;
            }
            if (peer.DeadlinePassed()) *error = "deadline passed";
            return !peer.DeadlinePassed();
          }};
}

Step Handshake() {
  return {"Handshake()", [](PeerConnection&, std::string*) { return true; }};
}

Step SendCloseNotice() {
  return {"SendCloseNotice()", [](PeerConnection& peer, std::string*) {
            peer.SendCloseNotice();
            return true;
          }};
}

Step CloseWithoutNotice() {
  return {"CloseWithoutNotice()", [](PeerConnection& peer, std::string* error) {
            peer.TakeArrived();
            peer.CloseRaw();
            return NothingPending(peer, error);
          }};
}

Step SendRaw(const std::string& bytes) {
  return {"SendRaw(" + Shown(bytes) + ")",
          [bytes](PeerConnection& peer, std::string* error) {
            if (peer.SendRaw(bytes)) return true;
            *error = peer.ErrorText();
            return false;
          },
          false};
}

Step ExpectRawBytes(size_t count) {
  return {"ExpectRawBytes(" + std::to_string(count) + ")",
          [count](PeerConnection& peer, std::string* error) {
            std::string bytes;
            while (bytes.size() < count) {
              const Read read = peer.ReadRaw(&bytes);
              if (read == Read::kData) continue;
              *error = ReadName(read);
              return false;
            }
            return true;
          },
          false};
}

Step SendRecordByteByByte(const std::string& bytes) {
  return {"SendRecordByteByByte()", [bytes](PeerConnection& peer, std::string* error) {
            return peer.SendRecordByteByByte(bytes, error);
          }};
}

Script Exchange(const std::string& response) {
  return {ExpectRequest(), Send(response), Close()};
}

Script ExchangeByteByByte(const std::string& response) {
  return {ExpectRequest(), SendByteByByte(response), Close()};
}

Script ExchangeInPieces(const std::vector<std::string>& pieces) {
  return {ExpectRequest(), SendPieces(pieces), Close()};
}

Script RequestThenClose() {
  return {ExpectRequest(), Close()};
}

Script SendThenClose(const std::string& bytes) {
  return {Send(bytes), Close()};
}
