// The required floor of the requests: exactly the system calls that the interface asks for, in the
// order in which the library makes them, and no work beside them but copying the body. Each
// function says which.
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

#include "bench/http_works.h"
#include "bench/request_text.h"
#include "bench/required_calls.h"
#include "bench/server.h"

namespace {

// A response while it is read: the head and the first of the body come with one read-ahead.
struct Response {
  int fd;
  char buffer[kReadAhead + 1];
  const char* unread;
  size_t left;
};

// The calls of RequiredConnect; ioctl; select, write; close is the caller's.
int Send(const std::string& request) {
  const int fd = RequiredConnect(ServerPort(false));
  RequiredNonBlocking(fd);
  RequiredWrite(fd, request.data(), request.size());
  return fd;
}

// select, read of 64,512 bytes
void ReadHead(Response* response) {
  const ssize_t count = RequiredRead(response->fd, response->buffer, kReadAhead);
  Expect(count > 0, kRequired, "cannot read");
  response->buffer[count] = '\0';
  const char* const end = std::strstr(response->buffer, "\r\n\r\n");
  Expect(end != nullptr, kRequired, "has no whole head");
  response->unread = end + 4;
  response->left = static_cast<size_t>(response->buffer + count - response->unread);
}

// select, read of 8,192 bytes until the server closes. The end of the stream is met by the call
// that delivers the last bytes and by the one that finds none, and each of them looks once more,
// with a read-ahead: 8,192, 64,512; 8,192, 64,512.
void ReadToEnd(Response* response, std::string* body) {
  char piece[kBodyPiece];
  body->assign(response->unread, response->left);
  for (;;) {
    const ssize_t count = RequiredRead(response->fd, piece, sizeof(piece));
    if (count <= 0) break;
    body->append(piece, static_cast<size_t>(count));
  }
  for (const size_t room : {kReadAhead, kBodyPiece, kReadAhead}) {
    RequiredRead(response->fd, response->buffer, room);
  }
}

// What there is of a chunk and of the CRLF after it, which is dropped.
void TakeChunk(Response* response, size_t* rest, std::string* body) {
  const size_t taken = std::min(*rest, response->left);
  body->append(response->unread, *rest > 2 ? std::min(taken, *rest - 2) : 0);
  response->unread += taken;
  response->left -= taken;
  *rest -= taken;
}

// What there is of a chunk's size. Results: true when that was all of it.
bool TakeSize(Response* response, std::string* digits) {
  while (response->left > 0) {
    const char c = *response->unread++;
    --response->left;
    if (c == '\n') return true;
    *digits += c;
  }
  return false;
}

// select, read of 64,512 bytes until the last chunk has come; one pass over the chunks
void ReadChunks(Response* response, std::string* body) {
  std::string digits;
  size_t rest = 0;  // of the chunk, with the CRLF after it
  for (;;) {
    if (response->left == 0) {
      const ssize_t count = RequiredRead(response->fd, response->buffer, kReadAhead);
      Expect(count > 0, kRequired, "misses chunks");
      response->unread = response->buffer;
      response->left = static_cast<size_t>(count);
    } else if (rest > 0) {
      TakeChunk(response, &rest, body);
    } else if (TakeSize(response, &digits)) {
      const size_t size = std::strtoul(digits.c_str(), nullptr, 16);
      if (size == 0) return;
      rest = size + 2;
      digits.clear();
    }
  }
}

// The response of a SOAP post has a length: select, read of what is missing, if anything is.
void ReadLength(Response* response, size_t length, std::string* body) {
  body->resize(length);
  size_t done = std::min(response->left, length);
  std::memcpy(&(*body)[0], response->unread, done);
  while (done < length) {
    const ssize_t count = RequiredRead(response->fd, &(*body)[done], length - done);
    Expect(count > 0, kRequired, "misses bytes");
    done += static_cast<size_t>(count);
  }
}

// Send; ReadHead; what the kind of response asks for; close
std::string Exchanged(const Exchange& exchange, const std::string& request) {
  static Response response;
  std::string body;
  response.fd = Send(request);
  ReadHead(&response);
  Expect(std::strncmp(response.buffer, "HTTP/1.1 200", 12) == 0, kRequired, "has no success");
  if (exchange.kind == Exchange::kSoap) {
    ReadLength(&response, exchange.response.size(), &body);
  } else if (exchange.chunked) {
    ReadChunks(&response, &body);
  } else if (exchange.kind != Exchange::kForm) {
    ReadToEnd(&response, &body);
  }
  close(response.fd);
  return body;
}

// With Digest credentials there is a first exchange, of which the head alone is read. The
// credentials are computed beforehand.
std::string Fetch(const Exchange& exchange) {
  if (exchange.kind != Exchange::kDigestGet) return Exchanged(exchange, RequestText(exchange));
  static Response challenge;
  challenge.fd = Send(RequestText(exchange));
  ReadHead(&challenge);
  close(challenge.fd);
  return Exchanged(exchange, AuthorizedText(exchange));
}

// Send; ReadHead; select and read into 64 KiB until these are full or the server closes; close
void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  static Response response;
  static char piece[kPieceSize];
  response.fd = Send(RequestText(exchange));
  ReadHead(&response);
  size_t done = response.left;
  std::memcpy(piece, response.unread, done);
  for (ssize_t count; (count = RequiredRead(response.fd, piece + done, kPieceSize - done)) > 0;) {
    done += static_cast<size_t>(count);
    if (done < kPieceSize) continue;
    take(piece, done);
    done = 0;
  }
  take(piece, done);
  close(response.fd);
}

// Send; select and write for each piece; select and read of the response; close
std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  static Response response;
  std::string body;
  response.fd = Send(RequestText(exchange));
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    RequiredWrite(response.fd, piece.data(), piece.size());
  }
  ReadHead(&response);
  ReadToEnd(&response, &body);
  close(response.fd);
  return body;
}

void AddRequired(Registry* registry) {
  HttpClient client;
  client.name = kRequired;
  client.fetch = Fetch;
  client.digest = true;
  client.fetchPieces = FetchPieces;
  client.upload = UploadPieces;
  AddHttpClient(registry, client);
}

const Family kRequiredHttp(AddRequired);

}  // namespace
