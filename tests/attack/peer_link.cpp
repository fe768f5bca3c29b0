#include "tests/attack/peer_link.h"

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <openssl/err.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>

namespace {

using Clock = std::chrono::steady_clock;

// More than a client ever waits before it goes on.
constexpr int kLimitMs = 5000;

// In a handshake that is spoilt the client may wait for more of a record, and has no limit.
constexpr int kSpoiltLimitMs = 300;

int MillisecondsUntil(Clock::time_point end) {
  const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now());
  return std::max(static_cast<int>(left.count()), 0);
}

}  // namespace

PeerLink::PeerLink(int fd, int over, SSL_CTX* context, const TlsPlan& plan)
    : fd_(fd), over_(over), plan_(plan) {
  const int on = 1;
  setsockopt(fd_, IPPROTO_TCP, TCP_NODELAY, &on, sizeof(on));
  if (context == nullptr) return;
  ssl_ = SSL_new(context);
  if (plan.only_tls12) SSL_set_max_proto_version(ssl_, TLS1_2_VERSION);
  from_client_ = BIO_new(BIO_s_mem());
  to_client_ = BIO_new(BIO_s_mem());
  SSL_set_bio(ssl_, from_client_, to_client_);
  SSL_set_accept_state(ssl_);
}

PeerLink::~PeerLink() {
  Close();
  SSL_free(ssl_);
  ERR_clear_error();
}

PeerLink::Event PeerLink::WaitFor(short events, int limit_ms) const {
  pollfd waiting[] = {{fd_, events, 0}, {over_, POLLIN, 0}};
  if (poll(waiting, 2, limit_ms) <= 0) return Event::kTimeout;
  return waiting[0].revents != 0 ? Event::kReadable : Event::kOver;
}

// Takes what has arrived. False at the end of the stream.
bool PeerLink::Receive() {
  char piece[16384];
  const ssize_t count = recv(fd_, piece, sizeof(piece), MSG_DONTWAIT);
  if (count <= 0) return false;
  if (ssl_ == nullptr) {
    received_.append(piece, static_cast<size_t>(count));
    return true;
  }
  BIO_write(from_client_, piece, static_cast<int>(count));
  return true;
}

// What the client's records hold.
void PeerLink::Decode() {
  if (ssl_ == nullptr || SSL_is_init_finished(ssl_) == 0) return;
  char piece[16384];
  int count;
  ERR_clear_error();
  while ((count = SSL_read(ssl_, piece, sizeof(piece))) > 0) {
    received_.append(piece, static_cast<size_t>(count));
  }
}

bool PeerLink::Read(int limit_ms) {
  if (spoilt_) limit_ms = std::min(limit_ms, kSpoiltLimitMs);
  if (fd_ < 0 || WaitFor(POLLIN, limit_ms) != Event::kReadable) return false;
  const bool more = Receive();
  Decode();
  return more;
}

std::string PeerLink::TakeOutput() {
  std::string output(BIO_ctrl_pending(to_client_), '\0');
  if (!output.empty()) BIO_read(to_client_, output.data(), static_cast<int>(output.size()));
  return output;
}

bool PeerLink::Send(const std::string& bytes) {
  const auto end = Clock::now() + std::chrono::milliseconds(kLimitMs);
  for (size_t sent = 0; sent < bytes.size();) {
    if (fd_ < 0) return false;
    const ssize_t count =
        send(fd_, bytes.data() + sent, bytes.size() - sent, MSG_DONTWAIT | MSG_NOSIGNAL);
    if (count > 0) {
      sent += static_cast<size_t>(count);
    } else if (errno != EAGAIN || WaitFor(POLLOUT, MillisecondsUntil(end)) != Event::kReadable) {
      return false;
    }
  }
  return true;
}

bool PeerLink::Pause(unsigned milliseconds) {
  const auto end = Clock::now() + std::chrono::milliseconds(milliseconds);
  for (;;) {
    switch (WaitFor(POLLIN, MillisecondsUntil(end))) {
      case Event::kTimeout:
        return true;
      case Event::kOver:
        return false;
      case Event::kReadable:
        if (!Receive()) return false;
        Decode();
    }
  }
}

// The server's part of the handshake, up to the byte that the fault is for.
bool PeerLink::SendFaulty(const std::string& bytes) {
  const size_t before = handshake_sent_;
  handshake_sent_ += bytes.size();
  const bool here = faulty_ && plan_.at >= before && plan_.at < handshake_sent_;
  if (!here) return Send(bytes);
  std::string spoilt = bytes;
  const size_t at = plan_.at - before;
  spoilt_ = true;
  if (plan_.fault == HandshakeFault::kFlip) spoilt[at] = static_cast<char>(~spoilt[at]);
  if (plan_.fault != HandshakeFault::kCut) return Send(spoilt);
  Send(spoilt.substr(0, at));
  return false;
}

// What comes in place of a handshake. True when it goes on all the same.
bool PeerLink::Spoil() {
  switch (plan_.fault) {
    case HandshakeFault::kNoise:
      Send(plan_.noise);
      return false;
    case HandshakeFault::kPlainText:
      Send("HTTP/1.1 400 Bad Request\r\nContent-Length: 0\r\n\r\n");
      return false;
    case HandshakeFault::kAlertRecord:
      Send(std::string("\x15\x03\x03\x00\x02\x02\x28", 7));
      return false;
    case HandshakeFault::kStall:
      return Pause(plan_.stall_ms);
    default:
      return true;
  }
}

bool PeerLink::Open(bool faulty) {
  if (ssl_ == nullptr) return true;
  faulty_ = faulty;
  if (faulty && !Spoil()) return false;
  for (;;) {
    ERR_clear_error();
    const int result = SSL_do_handshake(ssl_);
    if (!SendFaulty(TakeOutput())) return false;
    if (result == 1) {
      Decode();  // a request may have come with the client's last part
      return true;
    }
    if (SSL_get_error(ssl_, result) != SSL_ERROR_WANT_READ) return false;
    const int limit = spoilt_ ? kSpoiltLimitMs : kLimitMs;
    if (WaitFor(POLLIN, limit) != Event::kReadable || !Receive()) return false;
  }
}

std::vector<std::string> PeerLink::Segments(const Delivery& delivery) {
  const std::string& bytes = delivery.response.bytes;
  std::vector<std::string> segments;
  size_t at = 0;
  for (const size_t size : delivery.pieces) {
    if (at >= bytes.size()) break;
    segments.push_back(bytes.substr(at, size));
    at += segments.back().size();
  }
  if (at < bytes.size() || segments.empty()) segments.push_back(bytes.substr(at));
  if (ssl_ == nullptr) return segments;
  if (delivery.key_update) SSL_key_update(ssl_, SSL_KEY_UPDATE_REQUESTED);
  std::string all;
  for (std::string& segment : segments) {
    if (!segment.empty()) SSL_write(ssl_, segment.data(), static_cast<int>(segment.size()));
    segment = TakeOutput();
    all += segment;
  }
  if (delivery.cut_records) {
    at = 0;
    for (std::string& segment : segments) {
      // The last one takes the rest; the others are a byte longer or shorter than their records.
      const bool last = &segment == &segments.back();
      const size_t size = last ? all.size() - at : std::max<size_t>(segment.size(), 8) - 7;
      segment = all.substr(at, size);
      at += segment.size();
    }
  }
  std::string& last = segments.back();
  last.resize(last.size() - std::min(last.size(), delivery.missing));
  return segments;
}

void PeerLink::Close() {
  if (fd_ >= 0) close(fd_);
  fd_ = -1;
}

void PeerLink::Finish(End end) {
  if (end == End::kKeep || fd_ < 0) return;
  const bool opened = ssl_ != nullptr && SSL_is_init_finished(ssl_) != 0;
  if (end == End::kAlert && opened) {
    BIO_write(from_client_, "no record of TLS", 16);
    char byte;
    SSL_read(ssl_, &byte, 1);
    Send(TakeOutput());
  }
  if (end == End::kHalfClose && opened) {
    SSL_shutdown(ssl_);
    Send(TakeOutput());
  }
  if (end == End::kReset) {
    const linger at_once = {1, 0};
    setsockopt(fd_, SOL_SOCKET, SO_LINGER, &at_once, sizeof(at_once));
  }
  if (end == End::kHalfClose || end == End::kNoNotice || end == End::kAlert) {
    shutdown(fd_, SHUT_WR);
    // What the client still sends would turn the close into a reset.
    while (Read(kLimitMs)) {
    }
  }
  Close();
}
