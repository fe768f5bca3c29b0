// The floor of the requests: blocking system calls and nothing else. Each function says which.
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "bench/http_works.h"
#include "bench/request_text.h"
#include "bench/server.h"

namespace {

constexpr size_t kReadSize = 64 << 10;

// socket, connect
int Connect() {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  struct sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(ServerPort(false)));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const auto* const general = reinterpret_cast<const struct sockaddr*>(&address);
  Expect(connect(fd, general, sizeof(address)) == 0, kFloor, "cannot connect");
  return fd;
}

// write
void Write(int fd, const char* bytes, size_t size) {
  Expect(write(fd, bytes, size) == static_cast<ssize_t>(size), kFloor, "cannot write");
}

// read until the server closes, appending to a string
std::string ReadAll(int fd) {
  static char piece[kReadSize];
  std::string response;
  for (ssize_t count; (count = read(fd, piece, sizeof(piece))) > 0;) {
    response.append(piece, static_cast<size_t>(count));
  }
  return response;
}

// socket, connect, write, read until the server closes, close
std::string Exchanged(const std::string& request) {
  const int fd = Connect();
  Write(fd, request.data(), request.size());
  std::string response = ReadAll(fd);
  close(fd);
  return response;
}

// What follows the head, in place.
std::string BodyOf(std::string response) {
  Expect(response.rfind("HTTP/1.1 200", 0) == 0, kFloor, "has no success");
  response.erase(0, response.find("\r\n\r\n") + 4);
  return response;
}

// One pass over the chunks, in place.
std::string WithoutChunks(std::string body) {
  char* out = &body[0];
  for (const char* at = body.data();;) {
    char* end = nullptr;
    const size_t size = std::strtoul(at, &end, 16);
    if (size == 0) break;
    std::memmove(out, end + 2, size);
    out += size;
    at = end + 2 + size + 2;
  }
  body.resize(static_cast<size_t>(out - body.data()));
  return body;
}

// One exchange; two with Digest credentials, which are computed beforehand.
std::string Fetch(const Exchange& exchange) {
  std::string response = Exchanged(RequestText(exchange));
  if (exchange.kind == Exchange::kDigestGet) response = Exchanged(AuthorizedText(exchange));
  response = BodyOf(std::move(response));
  return exchange.chunked ? WithoutChunks(std::move(response)) : response;
}

// socket, connect, write, read of 64 KiB at most until the server closes, close
void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  static char piece[kPieceSize];
  const std::string request = RequestText(exchange);
  const int fd = Connect();
  Write(fd, request.data(), request.size());
  const ssize_t first = read(fd, piece, sizeof(piece) - 1);
  Expect(first > 0, kFloor, "cannot read");
  piece[first] = '\0';
  const char* const body = std::strstr(piece, "\r\n\r\n") + 4;
  take(body, static_cast<size_t>(piece + first - body));
  for (ssize_t count; (count = read(fd, piece, sizeof(piece))) > 0;) {
    take(piece, static_cast<size_t>(count));
  }
  close(fd);
}

// socket, connect, write of the head and of each piece, read until the server closes, close
std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  const std::string request = RequestText(exchange);
  const int fd = Connect();
  Write(fd, request.data(), request.size());
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    Write(fd, piece.data(), piece.size());
  }
  std::string response = BodyOf(ReadAll(fd));
  close(fd);
  return response;
}

void AddFloor(Registry* registry) {
  HttpClient client;
  client.name = kFloor;
  client.fetch = Fetch;
  client.digest = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  AddHttpClient(registry, client);
}

const Family kFloorHttp(AddFloor);

}  // namespace
