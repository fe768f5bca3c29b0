// The TLS socket's waits, reads and writes.
#define TW_LOG_SOURCE "sslsocket"

#include <openssl/err.h>
#include <openssl/ssl.h>

#include <algorithm>
#include <cerrno>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/signal_guard.h"

using namespace tarnwick;

namespace {

constexpr unsigned int kMaxPiece = 32000;

// One call of OpenSSL, with the two things that its error codes are made of as they should be: an
// empty error queue and a fresh errno.
struct TlsResult {
  int count;
  int error;  // SSL_ERROR_...
};

template <typename Operation>
TlsResult CallSsl(SSL* ssl, Operation operation) {
  ERR_clear_error();
  if (ssl == nullptr) return {-1, SSL_ERROR_SSL};
  const NoCancel no_cancel;
  SignalGuard guard(SIGPIPE);
  errno = 0;
  const int count = operation(ssl);
  const int error = SSL_get_error(ssl, count);
  if (count <= 0) guard.DiscardPending();
  return {count, error};
}

bool WouldBlock(int error) {
  return error == SSL_ERROR_WANT_READ || error == SSL_ERROR_WANT_WRITE;
}

struct ErrorText {
  ErrorText() { ERR_error_string_n(ERR_get_error(), text, sizeof(text)); }
  char text[256];
};

}  // namespace

int SSLSocket::DoSelect(SELECT_TYPE type) {
  if (m_sockFd < 0) return -1;
  // 0, not the count: what is decrypted already makes the descriptor no more readable.
  if (type == SELECT_READ && m_pSSL != nullptr && SSL_pending(m_pSSL) > 0) return 0;
  return TWSocket::DoSelect(type);
}

int SSLSocket::_Read(void* buf, unsigned int len) {
  for (;;) {
    // After a disconnect OpenSSL's object still holds the number of a descriptor that is gone.
    const TlsResult result = CallSsl(m_sockFd < 0 ? nullptr : m_pSSL, [&](SSL* ssl) {
      return SSL_read(ssl, buf, static_cast<int>(len));
    });
    m_bStreamEnded = m_pSSL != nullptr && (SSL_get_shutdown(m_pSSL) & SSL_RECEIVED_SHUTDOWN) != 0;
    if (WouldBlock(result.error)) {
      // A loop, because a record that comes byte by byte takes thousands of rounds.
      if (DoSelect(SELECT_READ) > 0) continue;
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Select read op error.\n");
    } else if (result.count < 0 || (result.count == 0 && ERR_peek_error() != 0)) {
      // For a peer's fatal alert SSL_read returns 0 with a reason, and ends the stream.
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Read error [%d] [%s].\n", result.error,
             ErrorText().text);
    }
    return result.count;
  }
}

int SSLSocket::_Write(const void* buf, unsigned int len) {
  const char* const bytes = static_cast<const char*>(buf);
  unsigned int written = 0;
  while (written < len) {
    if (DoSelect(SELECT_WRITE) < 0) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Select write op error.\n");
      return -1;
    }
    const int piece = static_cast<int>(std::min(len - written, kMaxPiece));
    const TlsResult result =
        CallSsl(m_pSSL, [&](SSL* ssl) { return SSL_write(ssl, bytes + written, piece); });
    if (result.error == SSL_ERROR_NONE) {
      written += static_cast<unsigned int>(result.count);
    } else if (!WouldBlock(result.error)) {
      TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Write error [%d] [%s].\n", result.error,
             ErrorText().text);
      return -1;
    }
  }
  return static_cast<int>(written);
}
