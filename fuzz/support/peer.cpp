#include "fuzz/support/peer.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

Peer::Peer(Connection connection, std::vector<size_t> sizes)
    : connection_(std::move(connection)), sizes_(std::move(sizes)) {}

long Peer::Fail(int error) {
  errno = error;
  return -1;
}

// True when `event` comes next, without any byte in front of it.
bool Peer::Happens(Event event) const {
  return offset_ == Now().bytes.size() && Now().event == event;
}

void Peer::NextPiece() {
  ++piece_;
  offset_ = 0;
}

int Peer::Wait(bool* strange) {
  *strange = false;
  if (connection_.dial >= Dial::kRefused) return 1;  // there is an error to be read
  if (Happens(Event::kWait) || Happens(Event::kStall)) return 0;
  if (Happens(Event::kSignal) || Happens(Event::kBroken)) {
    errno = Now().event == Event::kSignal ? EINTR : EBADF;
    NextPiece();
    return -1;
  }
  if (Happens(Event::kStrange)) {
    NextPiece();
    *strange = true;
  }
  return 1;
}

long Peer::Read(char* buf, size_t len) {
  const size_t limit = sizes_.empty() ? len : sizes_[reads_made_++ % sizes_.size()];
  reads_ += std::to_string(len) + ' ';
  if (len == 0) return 0;
  if (connection_.dial >= Dial::kRefused) return Fail(ENOTCONN);
  // What only a wait meets does not stop a read.
  while (Happens(Event::kSignal) || Happens(Event::kStrange)) NextPiece();
  const size_t size = std::min({len, limit, Now().bytes.size() - offset_});
  if (size == 0) return ReadAtEvent();
  std::memcpy(buf, Now().bytes.data() + offset_, size);
  offset_ += size;
  return static_cast<long>(size);
}

long Peer::ReadAtEvent() {
  const Event event = Now().event;
  if (event == Event::kClose) return 0;
  if (event == Event::kStall) return Fail(EAGAIN);
  if (event == Event::kReset) {
    connection_.pieces[piece_].event = Event::kClose;  // the error is told once
    return Fail(ECONNRESET);
  }
  NextPiece();
  if (event == Event::kBroken) return Fail(EIO);
  return Fail(event == Event::kIntr ? EINTR : EAGAIN);
}

long Peer::Write(const char* buf, size_t len) {
  if (connection_.dial >= Dial::kRefused || connection_.intake == Intake::kBrokenPipe) {
    return Fail(EPIPE);
  }
  if (connection_.intake == Intake::kNothing) return 0;
  if (connection_.intake == Intake::kFullOnce && !std::exchange(was_full_, true)) {
    return Fail(EAGAIN);
  }
  const size_t taken = connection_.intake == Intake::kHalves ? (len + 1) / 2 : len;
  written_.append(buf, taken);
  return static_cast<long>(taken);
}
