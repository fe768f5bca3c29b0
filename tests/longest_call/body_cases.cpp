// Reading a body that stops.
#include "tests/longest_call/cases.h"
#include "tests/longest_call/client.h"

namespace {

constexpr char kHead[] = "HTTP/1.1 200 OK\r\n\r\n";
constexpr char kChunkedHead[] = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";

// The result of ReadBody behind a GET whose head is there at once.
int Body(int port) {
  const auto client = NewClient(port);
  if (client->SendRequestByGet() != HTTP_RET_OK) return -2;
  std::string body;
  return client->ReadBody(body);
}

Case Stops(const char* name, const char* bound, double seconds, const std::string& reply,
           int result) {
  return {name, bound, seconds, {SilentBehind(reply)}, Body, result};
}

}  // namespace

std::vector<Case> BodyCases() {
  const std::string head = kHead;
  const std::string chunked = kChunkedHead;
  const std::string part(10, 'x');
  return {
      Stops("ReadBody, silence", "T", 1, head, HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence behind a part", "3 T", 3, head + part, HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence before a chunk's size", "7 T", 7, chunked, HTTP_RET_OK),
      Stops("ReadBody, silence in a chunk, fewer than 1,024 bytes missing", "8 T", 8,
            chunked + "20\r\n" + part, HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence in a chunk, 1,024 bytes or more missing", "3 T", 3,
            chunked + "500\r\n" + part, HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence behind a chunk", "14 T", 14, chunked + "a\r\n" + part, HTTP_RET_OK),
      Stops("ReadBody, silence behind a chunk's carriage return", "15 T", 15,
            chunked + "a\r\n" + part + "\r", HTTP_RET_OK),
  };
}
