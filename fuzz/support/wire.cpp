#include "fuzz/support/wire.h"

#include <fcntl.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <utility>
#include <vector>

namespace {

constexpr int kFirstFd = 700;

Wire* g_wire;

int Fail(int error) {
  errno = error;
  return -1;
}

}  // namespace

long g_fuzz_time = -1;

Wire::Wire(std::vector<Connection> connections, std::vector<size_t> sizes)
    : connections_(std::move(connections)), sizes_(std::move(sizes)) {
  g_wire = this;
}

Wire::~Wire() {
  g_wire = nullptr;
}

Wire* Wire::Current() {
  return g_wire;
}

bool Wire::IsOurs(int fd) {
  return g_wire != nullptr && fd >= kFirstFd && fd < kFirstFd + kDescriptors;
}

Wire::Descriptor* Wire::At(int fd) {
  Descriptor* descriptor = &descriptors_[fd - kFirstFd];
  if (descriptor->open) return descriptor;
  std::fprintf(stderr, "descriptor %d is used, but not open\n", fd);
  std::abort();
}

int Wire::Socket() {
  for (int i = 0; i < kDescriptors; ++i) {
    if (descriptors_[i].open) continue;
    descriptors_[i] = Descriptor();
    descriptors_[i].open = true;
    ++open_;
    return kFirstFd + i;
  }
  return Fail(EMFILE);
}

int Wire::Close(int fd) {
  At(fd)->open = false;
  --open_;
  return 0;
}

int Wire::Connect(int fd) {
  Connection refusing;
  refusing.dial = Dial::kRefused;
  const size_t n = dialled_.size();
  dialled_.emplace_back(n < connections_.size() ? connections_[n] : refusing, sizes_);
  Descriptor* descriptor = At(fd);
  descriptor->peer = &dialled_.back();
  const Dial dial = descriptor->peer->HowToDial();
  if (dial == Dial::kAtOnce) return 0;
  if (dial == Dial::kRefused) return Fail(ECONNREFUSED);
  descriptor->connecting = (descriptor->flags & O_NONBLOCK) != 0;
  if (descriptor->connecting) return Fail(EINPROGRESS);
  if (dial == Dial::kLate) return 0;
  return Fail(dial == Dial::kLost ? EHOSTUNREACH : ETIMEDOUT);
}

int Wire::SocketError(int fd) const {
  const Descriptor& descriptor = descriptors_[fd - kFirstFd];
  const bool lost = descriptor.peer == nullptr || descriptor.peer->HowToDial() == Dial::kLost;
  return lost ? EHOSTUNREACH : 0;
}

int Wire::Control(int fd, int command, int argument) {
  Descriptor* descriptor = At(fd);
  if (command == F_GETFL) return descriptor->flags;
  if (command == F_SETFL) descriptor->flags = argument;
  return 0;
}

int Wire::SelectConnecting(const Descriptor& descriptor, fd_set* readable) {
  FD_ZERO(readable);
  return descriptor.peer->HowToDial() == Dial::kSilent ? 0 : 1;
}

// The library waits for one descriptor, the highest of its sets. The sets are left as they are
// where the kernel would set the same bits again.
int Wire::Select(int nfds, fd_set* readable, fd_set* writable, fd_set* exceptional) {
  Descriptor* descriptor = At(nfds - 1);
  if (exceptional != nullptr) FD_ZERO(exceptional);
  if (readable == nullptr) return 1;  // there is always room to write
  if (descriptor->peer == nullptr) return Fail(EBADF);
  int ready = 0;
  bool strange = false;
  if (writable != nullptr) {
    ready = SelectConnecting(*descriptor, readable);
    descriptor->connecting = false;
  } else {
    ready = descriptor->peer->Wait(&strange);
  }
  if (ready == 0 && writable != nullptr) FD_ZERO(writable);
  if (ready == 0 || strange) FD_ZERO(readable);
  return ready;
}

long Wire::Read(int fd, void* buf, size_t len) {
  Peer* peer = At(fd)->peer;
  return peer != nullptr ? peer->Read(static_cast<char*>(buf), len) : Fail(ENOTCONN);
}

long Wire::Write(int fd, const void* buf, size_t len) {
  Peer* peer = At(fd)->peer;
  return peer != nullptr ? peer->Write(static_cast<const char*>(buf), len) : Fail(ENOTCONN);
}
