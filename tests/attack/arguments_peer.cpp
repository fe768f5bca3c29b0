#include "tests/attack/arguments_peer.h"

#include <openssl/ssl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <iterator>
#include <string>

namespace {

// How long it waits for a request's first byte, in milliseconds, and for the rest of a handshake.
constexpr int kFirstByte = 3;
constexpr int kHandshake = 200;

constexpr const char* kResponses[] = {
    "HTTP/1.1 200 OK\r\nContent-Type: application/json\r\nContent-Length: 16\r\n\r\n"
    "{\"success\":true}",
    "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\nSet-Cookie: id=7; Path=/\r\n\r\n"
    "6\r\n<a><b>\r\n8\r\n</b></a>\r\n0\r\n\r\n",
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Digest realm=\"r\", nonce=\"n\", "
    "qop=\"auth\"\r\n"
    "Content-Length: 2\r\n\r\nno",
    "HTTP/1.0 401 Unauthorized\r\nWWW-Authenticate: Basic realm=\"r\"\r\n\r\n",
    "HTTP/1.1 302 Found\r\nLocation: /other\r\nContent-Length: 0\r\n\r\n",
    "HTTP/1.1 100 Continue\r\n\r\nHTTP/1.1 200 OK\r\nContent-Length: 99999\r\n\r\n<a/>",
    "HTTP/1.0 200 OK\r\n\r\nline\r\nline\nline\r",
    "HTTP/1.1 200 OK\r\nContent-Length: -1\r\n\r\n\xff",
    "no response at all",
    "",
};
constexpr size_t kKinds = std::size(kResponses);

void SetReadLimit(int fd) {
  timeval limit = {};
  limit.tv_usec = kHandshake * 1000;
  setsockopt(fd, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof(limit));
}

bool HasRequest(int fd) {
  pollfd wait = {fd, POLLIN, 0};
  return poll(&wait, 1, kFirstByte) > 0;
}

void AnswerPlain(int fd, const std::string& response) {
  char request[65536];
  if (HasRequest(fd) && recv(fd, request, sizeof(request), MSG_DONTWAIT) < 0) return;
  send(fd, response.data(), response.size(), MSG_NOSIGNAL);
}

void AnswerTls(SSL_CTX* context, int fd, const std::string& response) {
  if (!HasRequest(fd)) return;
  SetReadLimit(fd);
  SSL* tls = SSL_new(context);
  SSL_set_fd(tls, fd);
  char request[16384];
  if (SSL_accept(tls) == 1) {
    if (HasRequest(fd)) SSL_read(tls, request, sizeof(request));
    if (!response.empty()) {
      SSL_write(tls, response.data(), static_cast<int>(response.size()));
      SSL_shutdown(tls);
    }
  }
  SSL_free(tls);
}

}  // namespace

ArgumentsPeer::ArgumentsPeer() : identity_(TlsOptions()) {
  for (size_t i = 0; i < 2 * kKinds; ++i) {
    Listener listener = {};
    listener.fd = BindLoopback(&listener.port);
    if (listener.fd < 0 || listen(listener.fd, 64) != 0) {
      perror("listen");
      exit(2);
    }
    listeners_.push_back(listener);
  }
  child_ = std::make_unique<Child>([this] { return Serve(); });
  for (const Listener& listener : listeners_) close(listener.fd);
}

int ArgumentsPeer::TlsPort(unsigned number) const {
  return listeners_[kKinds + number % kKinds].port;
}

bool ArgumentsPeer::Runs() const {
  return kill(child_->Pid(), 0) == 0;
}

void ArgumentsPeer::ServeOne(size_t number) {
  static SSL_CTX* const context = identity_.NewServerContext();
  const int fd = accept4(listeners_[number].fd, nullptr, nullptr, SOCK_CLOEXEC);
  if (fd < 0) return;
  const char* response = kResponses[number % kKinds];
  if (number < kKinds) {
    AnswerPlain(fd, response);
  } else {
    AnswerTls(context, fd, response);
  }
  close(fd);
}

int ArgumentsPeer::Serve() {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  signal(SIGPIPE, SIG_IGN);
  for (;;) {
    pollfd waits[2 * kKinds] = {};
    for (size_t i = 0; i < 2 * kKinds; ++i) waits[i] = {listeners_[i].fd, POLLIN, 0};
    if (poll(waits, 2 * kKinds, -1) < 0) return 1;
    for (size_t i = 0; i < 2 * kKinds; ++i) {
      if (waits[i].revents != 0) ServeOne(i);
    }
  }
}
