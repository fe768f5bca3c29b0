#include "tests/attack/response.h"

#include <algorithm>
#include <cstdio>

namespace {

enum class Framing { kClose, kLength, kChunked };

constexpr int kStatuses[] = {201, 202, 206, 299, 300, 302, 400, 403, 404, 414, 500, 503, 599};

std::string Hex(size_t number) {
  char text[32];
  snprintf(text, sizeof(text), "%zx", number);
  return text;
}

size_t PieceOf(const std::string& content, Dice* dice) {
  return dice->Between(1, std::max<size_t>(content.size() / (1 + dice->Below(5)), 1));
}

std::string Chunked(const std::string& content, Dice* dice) {
  std::string bytes;
  for (size_t at = 0; at < content.size();) {
    const std::string piece = content.substr(at, PieceOf(content, dice));
    bytes += Hex(piece.size()) + "\r\n" + piece + "\r\n";
    at += piece.size();
  }
  return bytes + "0\r\n\r\n";
}

const char* const kChunkSizes[] = {"-1",
                                   "0x5",
                                   "ffffffff",
                                   "100000000",
                                   "7fffffff",
                                   "80000000",
                                   "fffffffffffffffff",
                                   "zz",
                                   "",
                                   " 5",
                                   "5 ",
                                   "+5",
                                   "5;name=value",
                                   "5;\x1b[2J",
                                   "00000000000000000000005",
                                   "5\r",
                                   "G",
                                   "0;x",
                                   "1,000",
                                   "05\t"};

// Sizes that are none, too large or too small, extensions, ends that are missing, trailers.
std::string HostilelyChunked(const std::string& content, Dice* dice) {
  std::string bytes;
  for (size_t at = 0; at < content.size();) {
    const std::string piece = content.substr(at, PieceOf(content, dice));
    std::string size = Hex(piece.size());
    if (dice->OneIn(3)) size = dice->Pick(kChunkSizes);
    if (dice->OneIn(8)) size = Hex(piece.size() + dice->Below(2000));
    if (dice->OneIn(8)) size += ";" + std::string(dice->Below(10000), 'e');
    const char* const end = dice->OneIn(8) ? "\n" : "\r\n";
    bytes += size + end + piece + (dice->OneIn(8) ? "" : end);
    at += piece.size();
  }
  if (dice->OneIn(3)) return bytes;
  bytes += "0\r\n";
  for (size_t i = dice->Below(4); i > 0; --i) bytes += HostileHeaderLine(dice) + "\r\n";
  return bytes + "\r\n";
}

void SetCleanStatus(Response* response, Dice* dice) {
  const size_t chance = dice->Below(100);
  response->status = chance < 60 ? 200 : chance < 80 ? 401 : dice->Pick(kStatuses);
}

std::string CleanHeaderLines(const Response& response, Dice* dice) {
  std::string lines;
  if (dice->OneIn(2)) lines += "Server: camera/1." + std::to_string(dice->Below(9)) + "\r\n";
  if (dice->OneIn(2)) lines += "Content-Type: application/" + dice->Letters(4) + "\r\n";
  if (dice->OneIn(3)) lines += "Set-Cookie: id=" + dice->Letters(8) + "; path=/\r\n";
  for (size_t i = dice->Below(8); i > 0; --i) {
    lines += "X-" + dice->Letters(4) + ": " + dice->Letters(dice->Between(1, 30)) + "\r\n";
  }
  if (response.status == 401) lines += "WWW-Authenticate: " + CleanChallenge(dice) + "\r\n";
  return lines;
}

const char* LineEnd(Dice* dice) {
  static constexpr const char* kEnds[] = {"\n", "\r", "\n\r", "\r\r\n", "", "\r\n\r\n"};
  return dice->OneIn(25) ? dice->Pick(kEnds) : "\r\n";
}

std::string InterimResponses(Dice* dice) {
  static constexpr const char* kInterim[] = {
      "HTTP/1.1 100 Continue\r\n\r\n", "HTTP/1.1 102 Processing\r\nX: y\r\n\r\n",
      "HTTP/1.1 103 Early Hints\r\nSet-Cookie: early=1;\r\n\r\n",
      "HTTP/1.1 101 Switching Protocols\r\nUpgrade: x\r\n\r\n"};
  std::string bytes;
  for (size_t i = dice->OneIn(10) ? 200 : dice->Between(1, 5); i > 0; --i) {
    bytes += dice->Pick(kInterim);
  }
  return bytes;
}

// How many header lines: mostly a few, now and then more than a client reads.
size_t LineCount(Dice* dice) {
  if (dice->OneIn(15)) return dice->Between(28, 45);
  if (dice->OneIn(300)) return dice->Between(100, 3000);
  return dice->Below(8);
}

std::string HostileHead(const std::string& body, bool chunked, Dice* dice) {
  std::string head = dice->OneIn(12) ? InterimResponses(dice) : "";
  Response base;
  SetCleanStatus(&base, dice);
  const std::string right =
      "HTTP/1." + std::to_string(dice->Below(2)) + " " + std::to_string(base.status) + " Status";
  head += (dice->PerCent(25) ? HostileStatusLine(dice) : right) + LineEnd(dice);
  for (size_t i = LineCount(dice); i > 0; --i) {
    const bool hostile = dice->OneIn(2);
    head += (hostile ? HostileHeaderLine(dice) : "X-" + dice->Letters(4) + ": y") + LineEnd(dice);
  }
  if (base.status == 401) head += "WWW-Authenticate: " + HostileChallenge(dice) + LineEnd(dice);
  if (chunked) head += std::string("Transfer-Encoding: chunked") + LineEnd(dice);
  if (dice->OneIn(chunked ? 4 : 2)) {
    const size_t wrong = dice->OneIn(3) ? dice->Below(3000) : 0;
    head += "Content-Length: " + std::to_string(body.size() + wrong) + LineEnd(dice);
  }
  return head + (dice->OneIn(30) ? "" : LineEnd(dice));
}

}  // namespace

Response CleanResponse(BodyKind kind, Dice* dice) {
  Response response;
  response.clean_head = true;
  response.clean_body = true;
  SetCleanStatus(&response, dice);
  response.content = CleanBody(kind, dice);
  const auto framing = static_cast<Framing>(dice->Below(3));
  const bool http10 = framing != Framing::kChunked && dice->OneIn(2);
  response.bytes = std::string(http10 ? "HTTP/1.0 " : "HTTP/1.1 ") +
                   std::to_string(response.status) + " Status\r\n" +
                   CleanHeaderLines(response, dice);
  std::string body = response.content;
  if (framing == Framing::kLength) {
    response.bytes += "Content-Length: " + std::to_string(body.size()) + "\r\n";
  }
  if (framing == Framing::kChunked) {
    response.bytes += "Transfer-Encoding: chunked\r\n";
    body = Chunked(response.content, dice);
    response.chunked = true;
  }
  response.bytes += "Connection: close\r\n\r\n" + body;
  return response;
}

Response HostileResponse(BodyKind kind, Dice* dice) {
  Response response;
  const std::string content = dice->OneIn(4) ? CleanBody(kind, dice) : HostileBody(kind, dice);
  const bool chunked = dice->OneIn(3);
  const std::string body = !chunked         ? content
                           : dice->OneIn(3) ? Chunked(content, dice)
                                            : HostilelyChunked(content, dice);
  response.bytes = HostileHead(body, chunked, dice) + body;
  if (dice->OneIn(15)) {
    Response second = dice->OneIn(2) ? CleanResponse(kind, dice) : HostileResponse(kind, dice);
    response.bytes += second.bytes;
  }
  if (dice->OneIn(3)) Mutate(&response.bytes, dice);
  return response;
}

void Mutate(std::string* bytes, Dice* dice) {
  for (size_t i = dice->Between(1, 4); i > 0; --i) {
    if (bytes->empty()) *bytes = dice->Bytes(10);
    const size_t at = dice->Below(bytes->size());
    const size_t length = dice->Below(std::min<size_t>(bytes->size() - at, 200) + 1);
    switch (dice->Below(7)) {
      case 0:
        (*bytes)[at] = static_cast<char>((*bytes)[at] ^ (1 << dice->Below(8)));
        break;
      case 1:
        bytes->resize(at);
        break;
      case 2:
        bytes->insert(at, bytes->substr(at, length));
        break;
      case 3:
        bytes->insert(at, dice->Bytes(dice->Between(1, 20)));
        break;
      case 4:
        bytes->erase(at, length);
        break;
      case 5:
        std::swap((*bytes)[at], (*bytes)[dice->Below(bytes->size())]);
        break;
      default:
        (*bytes)[at] = static_cast<char>(dice->Next() >> 56);
    }
  }
}
