#include "tests/attack/peer_thread.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>

#include "tests/attack/figures.h"
#include "tests/attack/peer_link.h"
#include "tests/attack/request_check.h"
#include "tests/support/ports.h"

namespace {

using Clock = std::chrono::steady_clock;

constexpr int kBacklog = 64;
constexpr int kRequestLimitMs = 5000;
constexpr int kNextRequestMs = 100;

constexpr char kHttp2Preface[] = "PRI * HTTP/2.0";

TlsOptions Stranger() {
  TlsOptions options;
  options.authority = "Another authority";
  options.wrong_host = true;
  return options;
}

int TakeHttp2(SSL* /*ssl*/, const unsigned char** taken, unsigned char* length,
              const unsigned char* offered, unsigned int size, void* /*context*/) {
  static constexpr unsigned char kHttp2[] = {2, 'h', '2'};
  unsigned char* protocol = nullptr;
  const int result =
      SSL_select_next_proto(&protocol, length, kHttp2, sizeof(kHttp2), offered, size);
  *taken = protocol;
  return result == OPENSSL_NPN_NEGOTIATED ? SSL_TLSEXT_ERR_OK : SSL_TLSEXT_ERR_NOACK;
}

void Signal(int event) {
  const uint64_t one = 1;
  if (write(event, &one, sizeof(one)) != sizeof(one)) abort();
}

void WaitAndReset(int event) {
  uint64_t count = 0;
  while (read(event, &count, sizeof(count)) != sizeof(count)) {
  }
}

double SecondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

// Plays the deliveries of one exchange over its connections.
class Player {
 public:
  Player(const HostileExchange& exchange, PeerRecord* record)
      : exchange_(exchange), record_(record) {}

  void Serve(PeerLink* link);

 private:
  bool TakeRequest(PeerLink* link, size_t* taken) const;
  bool Deliver(PeerLink* link, const Delivery& delivery);

  const HostileExchange& exchange_;
  PeerRecord* const record_;
};

bool Player::TakeRequest(PeerLink* link, size_t* taken) const {
  const int limit = *taken == 0 ? kRequestLimitMs : kNextRequestMs;
  for (;;) {
    const std::string& all = link->Received();
    if (all.compare(0, sizeof(kHttp2Preface) - 1, kHttp2Preface) == 0) return *taken == 0;
    const std::string rest = all.substr(std::min(*taken, all.size()));
    if (IsWholeRequest(rest, *exchange_.operation)) {
      *taken += RequestLength(rest, *exchange_.operation);
      return true;
    }
    if (!link->Read(limit)) return false;
  }
}

// False when the client has gone, or the last bytes are not to be sent.
bool Player::Deliver(PeerLink* link, const Delivery& delivery) {
  const std::vector<std::string> segments = link->Segments(delivery);
  for (size_t i = 0; i < segments.size(); ++i) {
    if (static_cast<long>(i) == delivery.stall_piece) {
      record_->stalls_ms.push_back(delivery.stall_ms);
      if (!link->Pause(delivery.stall_ms)) return false;
    }
    const auto start = Clock::now();
    if (i > 0 && delivery.delay_us > 0) usleep(delivery.delay_us);
    const bool sent = link->Send(segments[i]);
    record_->sending += SecondsSince(start);
    if (!sent) return false;
  }
  return delivery.missing == 0;
}

void Player::Serve(PeerLink* link) {
  const bool faulty = exchange_.tls.fault != HandshakeFault::kNone &&
                      exchange_.tls.connection == record_->connections.size();
  if (faulty && exchange_.tls.fault == HandshakeFault::kStall) {
    record_->stalls_ms.push_back(exchange_.tls.stall_ms);
  }
  if (!link->Open(faulty)) {
    // The client may wait for more of the handshake, without a limit.
    link->Finish(exchange_.deliveries[0].end == End::kReset ? End::kReset : End::kNoNotice);
    return;
  }
  size_t taken = 0;
  while (record_->deliveries < kMostDeliveries) {
    const int number =
        std::min(record_->deliveries, static_cast<int>(exchange_.deliveries.size()) - 1);
    const Delivery& delivery = exchange_.deliveries[static_cast<size_t>(number)];
    const bool early = delivery.before_request && taken == 0;
    if (!early && !TakeRequest(link, &taken)) break;
    ++record_->deliveries;
    record_->last_delivery = number;
    record_->whole = false;
    const bool delivered = Deliver(link, delivery);
    record_->whole = delivered && !early && delivery.end == End::kHalfClose;
    if (delivered && delivery.end == End::kKeep && !early) continue;
    link->Finish(delivery.end == End::kKeep ? End::kHalfClose : delivery.end);
    return;
  }
  link->Finish(End::kClose);
}

}  // namespace

PeerContexts::PeerContexts()
    : identity_(TlsOptions()),
      stranger_(Stranger()),
      trusted_(identity_.NewServerContext()),
      http2_(identity_.NewServerContext()),
      strange_(stranger_.NewServerContext()) {
  SSL_CTX_set_alpn_select_cb(http2_, TakeHttp2, nullptr);
}

PeerContexts::~PeerContexts() {
  SSL_CTX_free(trusted_);
  SSL_CTX_free(http2_);
  SSL_CTX_free(strange_);
}

SSL_CTX* PeerContexts::For(const TlsPlan& plan) const {
  if (plan.stranger) return strange_;
  return plan.http2 ? http2_ : trusted_;
}

PeerThread::PeerThread(const PeerContexts& contexts) : contexts_(contexts) {
  listener_ = BindLoopback(&port_);
  if (listener_ < 0 || listen(listener_, kBacklog) != 0) {
    perror("the hostile server cannot listen");
    exit(2);
  }
  begin_ = eventfd(0, EFD_CLOEXEC);
  over_ = eventfd(0, EFD_CLOEXEC);
  ready_ = eventfd(0, EFD_CLOEXEC);
  thread_ = std::thread([this] { Run(); });
}

PeerThread::~PeerThread() {
  exchange_ = nullptr;
  Signal(begin_);
  thread_.join();
  for (const int fd : {listener_, begin_, over_, ready_}) close(fd);
}

void PeerThread::Begin(const HostileExchange& exchange) {
  exchange_ = &exchange;
  record_ = PeerRecord();
  Signal(begin_);
}

PeerRecord PeerThread::Finish() {
  Signal(over_);
  WaitAndReset(ready_);
  return std::move(record_);
}

void PeerThread::Run() {
  for (;;) {
    WaitAndReset(begin_);
    if (exchange_ == nullptr) return;
    const double before = SecondsWithoutProcessor();
    Play();
    record_.without_processor = SecondsWithoutProcessor() - before;
    WaitAndReset(over_);
    Signal(ready_);
  }
}

// Connections one after the other, until the client's call is over and none is left.
void PeerThread::Play() {
  SSL_CTX* const context = exchange_->target.https ? contexts_.For(exchange_->tls) : nullptr;
  Player player(*exchange_, &record_);
  for (;;) {
    pollfd waiting[] = {{listener_, POLLIN, 0}, {over_, POLLIN, 0}};
    poll(waiting, 2, -1);
    if (waiting[0].revents == 0) return;
    const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0) continue;
    PeerLink link(fd, over_, context, exchange_->tls);
    player.Serve(&link);
    const std::string& received = link.Received();
    if (received.compare(0, sizeof(kHttp2Preface) - 1, kHttp2Preface) == 0) {
      record_.spoke_http2 = true;
    }
    record_.connections.push_back(received);
  }
}
