#include "bench/required_calls.h"

#include <fcntl.h>
#include <netdb.h>
#include <sys/ioctl.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "bench/contender.h"
#include "bench/exchange.h"

namespace {

struct addrinfo* Resolve(int port) {
  struct addrinfo hints = {};
  hints.ai_family = AF_INET;
  hints.ai_socktype = SOCK_STREAM;
  struct addrinfo* list = nullptr;
  char service[16];
  std::snprintf(service, sizeof(service), "%d", port);
  Expect(getaddrinfo(kHost, service, &hints, &list) == 0, kRequired, "cannot resolve the host");
  return list;
}

// select for reading and writing, getsockopt
void WaitForConnect(int fd) {
  fd_set readable, writable;
  FD_ZERO(&readable);
  FD_ZERO(&writable);
  FD_SET(fd, &readable);
  FD_SET(fd, &writable);
  struct timeval left = {kTimeout, 0};
  Expect(select(fd + 1, &readable, &writable, nullptr, &left) > 0, kRequired, "cannot select");
  int error = 0;
  socklen_t size = sizeof(error);
  getsockopt(fd, SOL_SOCKET, SO_ERROR, &error, &size);
  Expect(error == 0, kRequired, "cannot connect");
}

}  // namespace

int RequiredConnect(int port) {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  struct addrinfo* const list = Resolve(port);
  const int flags = fcntl(fd, F_GETFL);
  fcntl(fd, F_SETFL, flags | O_NONBLOCK);
  if (connect(fd, list->ai_addr, list->ai_addrlen) != 0) {
    Expect(errno == EINPROGRESS, kRequired, "cannot connect");
    WaitForConnect(fd);
  }
  fcntl(fd, F_SETFL, flags);
  freeaddrinfo(list);
  return fd;
}

void RequiredNonBlocking(int fd) {
  int on = 1;
  ioctl(fd, FIONBIO, &on);
}

void RequiredWait(int fd, bool forReading) {
  fd_set wanted, exceptional;
  FD_ZERO(&wanted);
  FD_ZERO(&exceptional);
  FD_SET(fd, &wanted);
  FD_SET(fd, &exceptional);
  struct timeval left = {kTimeout, 0};
  const int ready = select(fd + 1, forReading ? &wanted : nullptr, forReading ? nullptr : &wanted,
                           &exceptional, &left);
  Expect(ready > 0, kRequired, "cannot select");
}

ssize_t RequiredRead(int fd, char* to, size_t room) {
  RequiredWait(fd, true);
  return read(fd, to, room);
}

void RequiredWrite(int fd, const char* bytes, size_t size) {
  RequiredWait(fd, false);
  while (size > 0) {
    const ssize_t count = write(fd, bytes, size);
    if (count < 0) {
      Expect(errno == EAGAIN, kRequired, "cannot write");
      RequiredWait(fd, false);
      continue;
    }
    bytes += count;
    size -= static_cast<size_t>(count);
  }
}
