#include "tests/support/ports.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace {

sockaddr_in Loopback(int port) {
  sockaddr_in address = {};
  address.sin_family = AF_INET;
  address.sin_port = htons(static_cast<uint16_t>(port));
  address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
  return address;
}

}  // namespace

int BindLoopback(int* port) {
  const int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_in address = Loopback(0);
  socklen_t length = sizeof(address);
  auto* generic = reinterpret_cast<sockaddr*>(&address);
  if (bind(fd, generic, length) != 0 || getsockname(fd, generic, &length) != 0) {
    ADD_FAILURE() << "no loopback port: " << strerror(errno);
    close(fd);
    return -1;
  }
  *port = ntohs(address.sin_port);
  return fd;
}

ClosedPort::ClosedPort() : fd_(-1), port_(0) {
  fd_ = BindLoopback(&port_);
}

ClosedPort::~ClosedPort() {
  close(fd_);
}

BlackHolePort::BlackHolePort() : fd_(-1), port_(0) {
  fd_ = BindLoopback(&port_);
  EXPECT_EQ(listen(fd_, 0), 0);
  const sockaddr_in address = Loopback(port_);
  constexpr int kMoreThanTheQueueHolds = 4;
  for (int i = 0; i < kMoreThanTheQueueHolds; ++i) {
    const int filler = socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK | SOCK_CLOEXEC, 0);
    // Under way or done: either way it takes a place in the queue.
    static_cast<void>(
        connect(filler, reinterpret_cast<const sockaddr*>(&address), sizeof(address)));
    fillers_.push_back(filler);
  }
}

BlackHolePort::~BlackHolePort() {
  for (const int filler : fillers_) close(filler);
  close(fd_);
}
