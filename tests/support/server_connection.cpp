#include "tests/support/server_connection.h"

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/time.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

namespace {

// More than the time-out of the requests that meet a stall, and the end for those without one.
constexpr int kStallMs = 2500;

constexpr int kGoodbyeMs = 2000;

// Waits until the client has closed.
void WaitForEnd(int fd, int limit_ms) {
  char rest[4096];
  pollfd waiting = {fd, POLLIN, 0};
  while (poll(&waiting, 1, limit_ms) > 0 && recv(fd, rest, sizeof(rest), 0) > 0) {
  }
}

}  // namespace

ServerConnection::ServerConnection(int fd, SSL_CTX* context, int limit_seconds) : fd_(fd) {
  const timeval limit = {limit_seconds, 0};
  const int on = 1;
  setsockopt(fd_, SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof(limit));
  setsockopt(fd_, SOL_SOCKET, SO_SNDTIMEO, &limit, sizeof(limit));
  setsockopt(fd_, IPPROTO_TCP, TCP_NODELAY, &on, sizeof(on));
  if (context == nullptr) return;
  ssl_ = SSL_new(context);
  SSL_set_fd(ssl_, fd_);
}

ServerConnection::~ServerConnection() {
  SSL_free(ssl_);
  if (fd_ >= 0) close(fd_);
}

bool ServerConnection::Open() {
  return ssl_ == nullptr || SSL_accept(ssl_) == 1;
}

bool ServerConnection::ReadMore() {
  char piece[16384];
  const int size = static_cast<int>(sizeof(piece));
  const int count = ssl_ != nullptr ? SSL_read(ssl_, piece, size)
                                    : static_cast<int>(recv(fd_, piece, sizeof(piece), 0));
  if (count <= 0) return false;
  pending_.append(piece, static_cast<size_t>(count));
  return true;
}

bool ServerConnection::ReadUntil(const std::string& mark, std::string* bytes) {
  size_t searched = 0;
  size_t found;
  while ((found = pending_.find(mark, searched)) == std::string::npos) {
    searched = pending_.size() < mark.size() ? 0 : pending_.size() - mark.size();
    if (!ReadMore()) return false;
  }
  return ReadBytes(found + mark.size(), bytes);
}

bool ServerConnection::ReadBytes(size_t count, std::string* bytes) {
  while (pending_.size() < count) {
    if (!ReadMore()) return false;
  }
  *bytes = pending_.substr(0, count);
  pending_.erase(0, count);
  return true;
}

bool ServerConnection::ReadRequest(std::string* head, std::string* body) {
  constexpr size_t kUpload = 1 << 20;
  constexpr char kName[] = "Content-Length:";
  if (!ReadUntil("\r\n\r\n", head)) return false;
  const size_t found = head->find(kName);
  const size_t length =
      found == std::string::npos ? 0 : strtoul(head->c_str() + found + strlen(kName), nullptr, 10);
  if (length > 0 && length < kUpload) return ReadBytes(length, body);
  body->clear();
  return true;
}

bool ServerConnection::Write(const std::string& bytes) {
  if (ssl_ == nullptr) return WriteBelowTls(bytes);
  return bytes.empty() || SSL_write(ssl_, bytes.data(), static_cast<int>(bytes.size())) > 0;
}

bool ServerConnection::WriteBelowTls(const std::string& bytes) const {
  for (size_t sent = 0; sent < bytes.size();) {
    const ssize_t count = send(fd_, bytes.data() + sent, bytes.size() - sent, MSG_NOSIGNAL);
    if (count <= 0) return false;
    sent += static_cast<size_t>(count);
  }
  return true;
}

void ServerConnection::Notify() {
  if (ssl_ != nullptr) SSL_shutdown(ssl_);
}

void ServerConnection::Close() {
  Notify();
  shutdown(fd_, SHUT_WR);
  WaitForEnd(fd_, kGoodbyeMs);
}

void ServerConnection::Cut() {
  shutdown(fd_, SHUT_WR);
  WaitForEnd(fd_, kGoodbyeMs);
}

void ServerConnection::Reset() {
  const linger at_once = {1, 0};
  setsockopt(fd_, SOL_SOCKET, SO_LINGER, &at_once, sizeof(at_once));
  close(fd_);
  fd_ = -1;
}

void ServerConnection::Stall() const {
  WaitForEnd(fd_, kStallMs);
}
