#include "fuzz/oracle/shared/model_socket.h"

#include <algorithm>
#include <cerrno>
#include <string>
#include <utility>
#include <vector>

namespace {

constexpr size_t kBuffer = 65536;
constexpr size_t kAhead = 64512;      // one read into the buffer
constexpr size_t kStraight = 1024;    // a request from here on goes past the buffer
constexpr size_t kLargest = 1 << 20;  // no target reads more at once
constexpr int kAttempts = 7;          // of a small read that finds nothing

}  // namespace

ModelSocket::ModelSocket(int timeout, bool buffered, std::vector<Connection> connections,
                         std::vector<size_t> sizes)
    : timeout_(timeout),
      buffered_(buffered),
      connections_(std::move(connections)),
      sizes_(std::move(sizes)) {}

int ModelSocket::Connect() {
  Disconnect();
  Connection next;
  next.dial = Dial::kRefused;
  const size_t n = dialled_.size();
  if (n < connections_.size()) next = connections_[n];
  dialled_.emplace_back(next, sizes_);
  open_ = true;
  connected_ = next.dial == Dial::kAtOnce || next.dial == Dial::kLate;
  return connected_ ? 0 : -1;
}

void ModelSocket::Disconnect() {
  open_ = connected_ = false;
  if (buffered_) ForgetAhead();
}

// What was read ahead stays when the new mode is the direct one, which does not use it.
void ModelSocket::SetUp(bool buffered) {
  buffered_ = buffered;
  eof_ = false;
  Disconnect();
}

void ModelSocket::ForgetAhead() {
  ahead_.clear();
  next_ = 0;
}

int ModelSocket::Wait(int timeout) {
  if (!open_) return -1;
  if (timeout < 0) return 0;
  for (;;) {
    bool strange = false;
    const int ready = dialled_.back().Wait(&strange);
    if ((ready < 0 && errno == EINTR) || strange) continue;
    return ready;
  }
}

long ModelSocket::RawRead(size_t len, std::string* out) {
  static char piece[kLargest];
  if (!open_) return errno = EBADF, -1;
  const long got = dialled_.back().Read(piece, std::min(len, kLargest));
  if (got > 0) out->append(piece, static_cast<size_t>(got));
  return got;
}

int ModelSocket::Read(int len, std::string* out) {
  out->clear();
  eof_ = false;
  return buffered_ ? ReadBuffered(static_cast<size_t>(len), out) : ReadDirect(len, out);
}

int ModelSocket::ReadDirect(int len, std::string* out) {
  if (Wait(timeout_) < 0) return -1;
  const long got = RawRead(static_cast<size_t>(len), out);
  if (got == 0) eof_ = true;
  return static_cast<int>(got);
}

bool ModelSocket::Failed() {
  connected_ = false;
  return true;
}

// The part of a read that goes past the buffer. Results: -1 when the whole read fails, else 0.
int ModelSocket::ReadLarge(size_t len, std::string* out) {
  while (len - out->size() >= kStraight) {
    if (Wait(timeout_) < 0) return -1;
    const long got = RawRead(len - out->size(), out);
    if (got < 0 && out->empty()) return Failed() ? -1 : 0;
    if (got == 0) eof_ = true;
    if (got <= 0) return 0;
  }
  return 0;
}

int ModelSocket::ReadBuffered(size_t len, std::string* out) {
  if (len == 0) return 0;
  int attempts = 0;
  for (;;) {
    const size_t ready = std::min(len - out->size(), ahead_.size() - next_);
    out->append(ahead_, next_, ready);
    next_ += ready;
    if (out->size() == len) return static_cast<int>(len);
    if (ReadLarge(len, out) < 0) return -1;
    if (out->size() == len) return static_cast<int>(len);
    if (Wait(timeout_) < 0) return -1;
    ForgetAhead();
    const long got = RawRead(kAhead, &ahead_);
    if (got > 0) continue;
    if (got == 0) eof_ = true;
    if (got == 0 || !out->empty()) return static_cast<int>(out->size());
    ++attempts;
    const bool again = errno == EAGAIN || errno == EINTR;
    if (!again || attempts == kAttempts) return Failed() ? -1 : 0;
  }
}

int ModelSocket::ReadLine(int bufLen, std::string* out) {
  std::string line;
  for (;;) {
    std::string byte;
    const int got = Read(1, &byte);
    if (got < 0) return -1;
    if (got == 0 || byte == "\n") break;
    if (byte == "\r") {
      if (Read(1, &byte) != 1) return -1;
      break;
    }
    line += byte;
    if (line.size() == static_cast<size_t>(bufLen)) {
      line.pop_back();
      break;
    }
  }
  *out = line;
  return static_cast<int>(line.size());
}

int ModelSocket::Restore(const std::string& data) {
  if (!buffered_) return 0;
  const std::string unread = Unread();
  if (data.size() + unread.size() > kBuffer) return -1;
  ahead_ = data + unread;
  next_ = 0;
  return 0;
}

// A write goes on until all is taken, or the peer fails or takes nothing six times.
int ModelSocket::Write(const std::string& data) {
  if (data.empty() || !open_) return -1;
  size_t done = 0;
  for (int empty = 0; done < data.size() && empty < 6;) {
    const long taken = dialled_.back().Write(data.data() + done, data.size() - done);
    if (taken < 0 && (errno == EAGAIN || errno == EINTR)) continue;
    if (taken < 0) break;
    if (taken == 0) ++empty;
    done += static_cast<size_t>(taken);
  }
  return static_cast<int>(done);
}

bool ModelSocket::HasData(int timeout) {
  return Wait(timeout) > 0;
}
