#include "tools/twcamsim/connection.h"

#include <linux/sockios.h>
#include <poll.h>
#include <sys/ioctl.h>

#include <algorithm>
#include <atomic>
#include <boost/asio/buffer.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/ssl.hpp>
#include <boost/asio/steady_timer.hpp>
#include <boost/asio/write.hpp>
#include <optional>

namespace asio = boost::asio;
using asio::ip::tcp;
using boost::system::error_code;

namespace {

constexpr std::chrono::milliseconds kLinger{1000};
constexpr std::chrono::milliseconds kNoticeLimit{300};

bool IsReset(const error_code& code) {
  return code == asio::error::connection_reset || code == asio::error::broken_pipe ||
         code == asio::error::connection_aborted || code == asio::error::not_connected ||
         code == asio::error::bad_descriptor;
}

Io Classify(const error_code& code, std::string* text) {
  if (!code) return Io::kDone;
  if (code == asio::error::eof || code == asio::ssl::error::stream_truncated) return Io::kEnd;
  if (IsReset(code)) return Io::kReset;
  *text = code.message();
  return Io::kError;
}

}  // namespace

struct Connection::Impl {
  explicit Impl(int fd) {
    error_code code;
    socket.assign(tcp::v4(), fd, code);
    const tcp::endpoint remote = socket.remote_endpoint(code);
    if (!code) peer = remote.address().to_string() + ":" + std::to_string(remote.port());
    socket.set_option(tcp::no_delay(true), code);
  }

  // Runs what `start` begins; `start` takes the handler of its end.
  template <typename Start>
  Io Await(Milliseconds limit, size_t* moved, const Start& start) {
    if (stopped) return Io::kStopped;
    bool done = false;
    error_code result;
    start([&](const error_code& code, size_t bytes) {
      done = true;
      result = code;
      *moved = bytes;
    });
    io.restart();
    io.run_for(std::min<Milliseconds>(limit, std::chrono::hours(24)));
    if (!done) {
      Cancel();
      io.restart();
      io.run();
      if (stopped) return Io::kStopped;
      if (result == asio::error::operation_aborted) return Io::kTimeout;
    }
    if (stopped && result == asio::error::operation_aborted) return Io::kStopped;
    return Classify(result, &error);
  }

  void Cancel() {
    error_code ignored;
    socket.cancel(ignored);
    timer.cancel(ignored);
  }

  // Whether one of `events` has come, without waiting. A peer that only closed its direction
  // (POLLRDHUP) may still want its response.
  bool Came(int events) {
    pollfd watched = {socket.native_handle(), POLLRDHUP, 0};
    return poll(&watched, 1, 0) > 0 && (watched.revents & events) != 0;
  }

  asio::io_context io{1};
  tcp::socket socket{io};
  asio::steady_timer timer{io};
  std::optional<asio::ssl::context> context;
  std::optional<asio::ssl::stream<tcp::socket&>> tls;
  std::atomic<bool> stopped{false};
  std::string peer;
  std::string error;
  uint64_t bytes_in = 0;
  uint64_t bytes_out = 0;
};

Connection::Connection(int fd) : impl_(std::make_unique<Impl>(fd)) {}

Connection::~Connection() = default;

void Connection::Stop() {
  impl_->stopped = true;
  asio::post(impl_->io, [impl = impl_.get()] { impl->Cancel(); });
}

Io Connection::Handshake(SSL_CTX* context, Milliseconds limit) {
  SSL_CTX_up_ref(context);  // the context below gives it back
  impl_->context.emplace(context);
  impl_->tls.emplace(impl_->socket, *impl_->context);
  size_t ignored = 0;
  return impl_->Await(limit, &ignored, [this](auto handler) {
    impl_->tls->async_handshake(asio::ssl::stream_base::server,
                                [handler](const error_code& code) { handler(code, 0); });
  });
}

Io Connection::Read(std::string* bytes, size_t most, Milliseconds limit) {
  if (!impl_->tls) {
    const size_t before = bytes->size();
    const Io result = ReadRaw(bytes, most, limit);
    impl_->bytes_in += bytes->size() - before;
    return result;
  }
  std::string piece(most, '\0');
  size_t moved = 0;
  const Io result = impl_->Await(limit, &moved, [&](auto handler) {
    impl_->tls->async_read_some(asio::buffer(piece), handler);
  });
  bytes->append(piece, 0, moved);
  impl_->bytes_in += moved;
  return result;
}

Io Connection::ReadRaw(std::string* bytes, size_t most, Milliseconds limit) {
  std::string piece(most, '\0');
  size_t moved = 0;
  const Io result = impl_->Await(limit, &moved, [&](auto handler) {
    impl_->socket.async_read_some(asio::buffer(piece), handler);
  });
  bytes->append(piece, 0, moved);
  return result;
}

Io Connection::Write(std::string_view bytes, Milliseconds limit) {
  if (bytes.empty()) return Io::kDone;
  size_t moved = 0;
  const asio::const_buffer buffer(bytes.data(), bytes.size());
  const Io result = impl_->Await(limit, &moved, [&](auto handler) {
    if (impl_->tls) {
      asio::async_write(*impl_->tls, buffer, handler);
    } else {
      asio::async_write(impl_->socket, buffer, handler);
    }
  });
  impl_->bytes_out += moved;
  return result;
}

Io Connection::WriteRaw(std::string_view bytes, Milliseconds limit) {
  size_t moved = 0;
  const asio::const_buffer buffer(bytes.data(), bytes.size());
  return impl_->Await(limit, &moved,
                      [&](auto handler) { asio::async_write(impl_->socket, buffer, handler); });
}

Io Connection::Pause(Milliseconds span) {
  const auto end = std::chrono::steady_clock::now() + span;
  constexpr Milliseconds kStep{100};  // how late a break is noticed
  for (;;) {
    const auto left = std::chrono::ceil<Milliseconds>(end - std::chrono::steady_clock::now());
    if (left.count() <= 0) return Io::kDone;
    if (impl_->Came(POLLERR | POLLHUP)) return Io::kReset;
    size_t ignored = 0;
    impl_->timer.expires_after(std::min(left, kStep));
    const Io result = impl_->Await(Milliseconds::max(), &ignored, [this](auto handler) {
      impl_->timer.async_wait([handler](const error_code& code) { handler(code, 0); });
    });
    if (result != Io::kDone) return result;
  }
}

Io Connection::WaitUntilPeerLeaves(Milliseconds limit) {
  const auto end = std::chrono::steady_clock::now() + limit;
  for (;;) {
    const auto left = std::chrono::ceil<Milliseconds>(end - std::chrono::steady_clock::now());
    if (left.count() <= 0) return Io::kTimeout;
    std::string ignored;
    const Io result = ReadRaw(&ignored, 65536, left);
    if (result != Io::kDone) return result;
  }
}

// The end of what nobody reads is not to be read either.
Io Connection::WaitUnread(Milliseconds limit) {
  constexpr Milliseconds kStep{100};
  for (Milliseconds left = limit; left.count() > 0; left -= kStep) {
    if (impl_->Came(POLLRDHUP)) return Io::kEnd;
    const Io result = Pause(std::min(left, kStep));
    if (result != Io::kDone) return result;
  }
  return Io::kTimeout;
}

void Connection::Close(bool close_notice) {
  if (!IsOpen()) return;
  size_t ignored = 0;
  if (impl_->tls && close_notice) {
    impl_->Await(kNoticeLimit, &ignored, [this](auto handler) {
      impl_->tls->async_shutdown([handler](const error_code& code) { handler(code, 0); });
    });
  }
  error_code code;
  impl_->socket.shutdown(tcp::socket::shutdown_send, code);
  if (!code) WaitUntilPeerLeaves(kLinger);
  impl_->socket.close(code);
}

// The peer is to get what was written before the reset, which throws away what is still on its way.
void Connection::Reset() {
  constexpr Milliseconds kStep{5};
  int unsent = 0;
  for (int i = 0; i < 200 && ioctl(impl_->socket.native_handle(), SIOCOUTQ, &unsent) == 0; ++i) {
    if (unsent == 0 || Pause(kStep) != Io::kDone) break;
  }
  error_code ignored;
  impl_->socket.set_option(asio::socket_base::linger(true, 0), ignored);
  impl_->socket.close(ignored);
}

bool Connection::IsOpen() const {
  return impl_->socket.is_open();
}

std::string Connection::Peer() const {
  return impl_->peer;
}

std::string Connection::TlsVersion() const {
  return impl_->tls ? SSL_get_version(impl_->tls->native_handle()) : "";
}

const std::string& Connection::ErrorText() const {
  return impl_->error;
}

uint64_t Connection::BytesIn() const {
  return impl_->bytes_in;
}

uint64_t Connection::BytesOut() const {
  return impl_->bytes_out;
}
