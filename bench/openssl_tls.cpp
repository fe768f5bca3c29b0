// The floors of TLS: OpenSSL used plainly.
#include <netinet/in.h>
#include <openssl/ssl.h>
#include <sys/socket.h>
#include <unistd.h>

#include "bench/contender.h"
#include "bench/exchange.h"
#include "bench/http_works.h"
#include "bench/request_text.h"
#include "bench/required_calls.h"
#include "bench/server.h"

namespace {

std::string BodyOf(std::string response) {
  Expect(response.rfind("HTTP/1.1 200", 0) == 0, "OpenSSL", "has no success");
  response.erase(0, response.find("\r\n\r\n") + 4);
  return response;
}

SSL* NewClient(SSL_CTX* context, int fd) {
  SSL* const ssl = SSL_new(context);
  SSL_set_fd(ssl, fd);
  Expect(SSL_connect(ssl) == 1, "OpenSSL", "cannot connect");
  return ssl;
}

// socket, connect; SSL_write; SSL_read of 16 KiB until the server closes; SSL_shutdown, close. The
// descriptor blocks, and all connections share one context.
std::string FetchPlainly(const Exchange& exchange) {
  static SSL_CTX* const context = SSL_CTX_new(TLS_client_method());
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  struct sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(ServerPort(true)));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  const auto* const general = reinterpret_cast<const struct sockaddr*>(&address);
  Expect(connect(fd, general, sizeof(address)) == 0, "OpenSSL", "cannot connect");
  SSL* const ssl = NewClient(context, fd);
  const std::string request = RequestText(exchange);
  SSL_write(ssl, request.data(), static_cast<int>(request.size()));
  std::string response;
  char piece[16384];
  for (int count; (count = SSL_read(ssl, piece, sizeof(piece))) > 0;) {
    response.append(piece, static_cast<size_t>(count));
  }
  SSL_shutdown(ssl);
  SSL_free(ssl);
  close(fd);
  return BodyOf(std::move(response));
}

// select unless decrypted bytes are waiting, SSL_read; again after a part of a record
int ReadTls(SSL* ssl, char* to, size_t room) {
  for (;;) {
    if (SSL_pending(ssl) == 0) RequiredWait(SSL_get_fd(ssl), true);
    const int count = SSL_read(ssl, to, static_cast<int>(room));
    if (count > 0 || SSL_get_error(ssl, count) != SSL_ERROR_WANT_READ) return count;
  }
}

// The same in the way that the interface asks for: a context for each client, the calls of
// RequiredConnect, a blocking handshake, ioctl; select twice and SSL_write; select and SSL_read of
// 64,512 bytes for the head and of 8,192 for the body, until the server closes; SSL_shutdown,
// close.
std::string FetchAsRequired(const Exchange& exchange) {
  SSL_CTX* const context = SSL_CTX_new(TLS_client_method());
  SSL_CTX_set_mode(context, SSL_MODE_AUTO_RETRY);
  SSL_CTX_set_options(context, SSL_OP_IGNORE_UNEXPECTED_EOF);
  const int fd = RequiredConnect(ServerPort(true));
  SSL* const ssl = NewClient(context, fd);
  RequiredNonBlocking(fd);
  const std::string request = RequestText(exchange);
  RequiredWait(fd, false);
  RequiredWait(fd, false);
  SSL_write(ssl, request.data(), static_cast<int>(request.size()));
  static char ahead[kReadAhead];
  char piece[kBodyPiece];
  const int first = ReadTls(ssl, ahead, sizeof(ahead));
  Expect(first > 0, kRequired, "cannot read");
  std::string response = BodyOf(std::string(ahead, static_cast<size_t>(first)));
  for (int count; (count = ReadTls(ssl, piece, sizeof(piece))) > 0;) {
    response.append(piece, static_cast<size_t>(count));
  }
  SSL_shutdown(ssl);
  SSL_free(ssl);
  SSL_CTX_free(context);
  close(fd);
  return response;
}

void AddOpenSsl(Registry* registry) {
  AddTlsClient(registry, kFloor, FetchPlainly);
  AddTlsClient(registry, kRequired, FetchAsRequired);
}

const Family kOpenSslTls(AddOpenSsl);

}  // namespace
