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

// A reply while it is read: the head and the first of the body come with one read-ahead.
struct Reply {
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
void ReadHead(Reply* reply) {
  const ssize_t count = RequiredRead(reply->fd, reply->buffer, kReadAhead);
  Expect(count > 0, kRequired, "cannot read");
  reply->buffer[count] = '\0';
  const char* const end = std::strstr(reply->buffer, "\r\n\r\n");
  Expect(end != nullptr, kRequired, "has no whole head");
  reply->unread = end + 4;
  reply->left = static_cast<size_t>(reply->buffer + count - reply->unread);
}

// select, read of 8,192 bytes until the server closes. The end of the stream is met by the call
// that delivers the last bytes and by the one that finds none, and each of them looks once more,
// with a read-ahead: 8,192, 64,512; 8,192, 64,512.
void ReadToEnd(Reply* reply, std::string* body) {
  char piece[kBodyPiece];
  body->assign(reply->unread, reply->left);
  for (;;) {
    const ssize_t count = RequiredRead(reply->fd, piece, sizeof(piece));
    if (count <= 0) break;
    body->append(piece, static_cast<size_t>(count));
  }
  for (const size_t room : {kReadAhead, kBodyPiece, kReadAhead}) {
    RequiredRead(reply->fd, reply->buffer, room);
  }
}

// What there is of a chunk and of the two bytes behind it, which are dropped.
void TakeChunk(Reply* reply, size_t* rest, std::string* body) {
  const size_t taken = std::min(*rest, reply->left);
  body->append(reply->unread, *rest > 2 ? std::min(taken, *rest - 2) : 0);
  reply->unread += taken;
  reply->left -= taken;
  *rest -= taken;
}

// What there is of a chunk's size. Results: true when that was all of it.
bool TakeSize(Reply* reply, std::string* digits) {
  while (reply->left > 0) {
    const char c = *reply->unread++;
    --reply->left;
    if (c == '\n') return true;
    *digits += c;
  }
  return false;
}

// select, read of 64,512 bytes until the last chunk has come; one pass over the chunks
void ReadChunks(Reply* reply, std::string* body) {
  std::string digits;
  size_t rest = 0;  // of the chunk, with the two bytes behind it
  for (;;) {
    if (reply->left == 0) {
      const ssize_t count = RequiredRead(reply->fd, reply->buffer, kReadAhead);
      Expect(count > 0, kRequired, "misses chunks");
      reply->unread = reply->buffer;
      reply->left = static_cast<size_t>(count);
    } else if (rest > 0) {
      TakeChunk(reply, &rest, body);
    } else if (TakeSize(reply, &digits)) {
      const size_t size = std::strtoul(digits.c_str(), nullptr, 16);
      if (size == 0) return;
      rest = size + 2;
      digits.clear();
    }
  }
}

// The reply of a SOAP post has a length: select, read of what is missing, if anything is.
void ReadLength(Reply* reply, size_t length, std::string* body) {
  body->resize(length);
  size_t done = std::min(reply->left, length);
  std::memcpy(&(*body)[0], reply->unread, done);
  while (done < length) {
    const ssize_t count = RequiredRead(reply->fd, &(*body)[done], length - done);
    Expect(count > 0, kRequired, "misses bytes");
    done += static_cast<size_t>(count);
  }
}

// Send; ReadHead; what the kind of reply asks for; close
std::string Exchanged(const Exchange& exchange, const std::string& request) {
  static Reply reply;
  std::string body;
  reply.fd = Send(request);
  ReadHead(&reply);
  Expect(std::strncmp(reply.buffer, "HTTP/1.1 200", 12) == 0, kRequired, "has no success");
  if (exchange.kind == Exchange::kSoap) {
    ReadLength(&reply, exchange.reply.size(), &body);
  } else if (exchange.chunked) {
    ReadChunks(&reply, &body);
  } else if (exchange.kind != Exchange::kForm) {
    ReadToEnd(&reply, &body);
  }
  close(reply.fd);
  return body;
}

// For a login a first exchange, of which the head alone is read. The login is worked out
// beforehand.
std::string Fetch(const Exchange& exchange) {
  if (exchange.kind != Exchange::kDigestGet) return Exchanged(exchange, RequestText(exchange));
  static Reply challenge;
  challenge.fd = Send(RequestText(exchange));
  ReadHead(&challenge);
  close(challenge.fd);
  return Exchanged(exchange, LoginText(exchange));
}

// Send; ReadHead; select and read into 64 KiB until these are full or the server closes; close
void FetchPieces(const Exchange& exchange, const HttpClient::Take& take) {
  static Reply reply;
  static char piece[kPieceSize];
  reply.fd = Send(RequestText(exchange));
  ReadHead(&reply);
  size_t done = reply.left;
  std::memcpy(piece, reply.unread, done);
  for (ssize_t count; (count = RequiredRead(reply.fd, piece + done, kPieceSize - done)) > 0;) {
    done += static_cast<size_t>(count);
    if (done < kPieceSize) continue;
    take(piece, done);
    done = 0;
  }
  take(piece, done);
  close(reply.fd);
}

// Send; select and write for each piece; select and read of the answer; close
std::string UploadPieces(const Exchange& exchange, const std::string& piece) {
  static Reply reply;
  std::string body;
  reply.fd = Send(RequestText(exchange));
  for (size_t done = 0; done < kUploadSize; done += piece.size()) {
    RequiredWrite(reply.fd, piece.data(), piece.size());
  }
  ReadHead(&reply);
  ReadToEnd(&reply, &body);
  close(reply.fd);
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
