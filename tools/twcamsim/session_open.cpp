// The opening of a connection: taking it up, and TLS.
#include "tools/twcamsim/session.h"

namespace {

// No TLS record begins like this, and no HTTP response either.
constexpr char kGarbage[] = "\x7f\x03 not a record of TLS \x02\x01\r\n\r\n";

// The record and message heads of a ServerHello of 118 bytes, and the first of these.
std::string HalfServerHello(Random* random) {
  std::string bytes("\x16\x03\x03\x00\x7a\x02\x00\x00\x76\x03\x03", 11);
  for (int i = 0; i < 20; ++i) bytes += static_cast<char>(random->Below(256));
  return bytes;
}

std::string Alert(int number) {
  std::string bytes("\x15\x03\x03\x00\x02\x02", 6);
  return bytes + static_cast<char>(number);
}

}  // namespace

bool Session::Open() {
  if (behaviour_.accept_delay.count() > 0) {
    const Io result = connection_.Pause(behaviour_.accept_delay);
    if (result != Io::kDone) return End(result);
  }
  switch (behaviour_.opening) {
    case Opening::kServe:
      return !endpoint_->tls || OpenTls();
    case Opening::kClose:
      return CloseNow();
    case Opening::kReset:
      return ResetNow();
    case Opening::kNeverRead:
      return End(connection_.WaitUnread(shared_->hold));
  }
  return false;
}

bool Session::OpenTls() {
  switch (behaviour_.tls) {
    case TlsOpening::kHandshake:
      return Shake();
    case TlsOpening::kPlain:
      return true;
    case TlsOpening::kStall:
      return StallUntilPeerLeaves();
    case TlsOpening::kGarbage:
      OpenWithBytes(std::string(kGarbage, sizeof(kGarbage) - 1), false);
      return false;
    case TlsOpening::kAlert:
      OpenWithBytes(Alert(behaviour_.tls_alert), false);
      return false;
    case TlsOpening::kCut:
      OpenWithBytes(HalfServerHello(&random_), false);
      return false;
    case TlsOpening::kClose:
      OpenWithBytes("", false);
      return false;
    case TlsOpening::kReset:
      OpenWithBytes("", true);
      return false;
  }
  return false;
}

bool Session::Shake() {
  SSL_CTX* context = shared_->certificates.Context(behaviour_.certificate, behaviour_.old_tls);
  const Io result = connection_.Handshake(context, shared_->idle);
  if (result == Io::kDone) return true;
  End(result == Io::kError ? "tls-failed" : "tls-broken");
  connection_.Close(false);
  return false;
}

// Responds to the client's first message with bytes that are no handshake, and ends.
void Session::OpenWithBytes(const std::string& bytes, bool reset) {
  std::string hello;
  const Io result = connection_.ReadRaw(&hello, 65536, shared_->idle);
  if (result != Io::kDone) {
    End(result);
    return;
  }
  if (!bytes.empty()) connection_.WriteRaw(bytes, shared_->idle);
  if (reset) {
    ResetNow();
  } else {
    CloseNow();
  }
}
