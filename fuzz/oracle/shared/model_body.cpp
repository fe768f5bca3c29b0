#include "fuzz/oracle/shared/model_body.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <string>

namespace {

constexpr int kPiece = 8192;

int DigitOf(char c) {
  static const char kDigits[] = "00112233445566778899aAbBcCdDeEfF";
  const char* at = c == '\0' ? nullptr : std::strchr(kDigits, c);
  return at == nullptr ? -1 : static_cast<int>(at - kDigits) / 2;
}

uint32_t ReadSize(ModelSocket* socket) {
  std::string line;
  if (socket->ReadLine(kPiece, &line) < 1) return 0;
  uint64_t size = 0;
  for (const char c : line) {
    if (DigitOf(c) < 0) break;
    size = (size * 16 + static_cast<uint64_t>(DigitOf(c))) & 0xffffffff;
  }
  return static_cast<uint32_t>(size);
}

// A socket that does not read ahead may deliver them one by one.
void DropTwoBytes(ModelSocket* socket) {
  std::string dropped;
  const int got = socket->Read(2, &dropped);
  if (got == 1 && !socket->ReadsAhead()) socket->Read(1, &dropped);
}

// Results: false when a read failed.
bool ReadChunk(ModelSocket* socket, uint32_t size, std::string* body) {
  std::string piece;
  for (uint32_t left = size; left > 0;) {
    const int got = socket->Read(static_cast<int>(std::min<uint32_t>(left, kPiece)), &piece);
    if (got < 0) return false;
    *body += piece;
    left -= static_cast<uint32_t>(got);
    if (socket->IsEof()) break;
  }
  return true;
}

}  // namespace

int ReadModelBody(ModelSocket* socket, const std::string& encoding, std::string* body) {
  body->clear();
  std::string piece;
  if (encoding != "chunked") {
    for (;;) {
      const int got = socket->Read(kPiece, &piece);
      if (got < 0) return 3;
      if (got == 0) return 0;
      *body += piece;
    }
  }
  while (const uint32_t size = ReadSize(socket)) {
    if (!ReadChunk(socket, size, body)) return 3;
    DropTwoBytes(socket);
  }
  return 0;
}
