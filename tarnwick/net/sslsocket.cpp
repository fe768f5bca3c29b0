// The TLS socket's life: OpenSSL's objects, connecting and disconnecting.
#define TW_LOG_SOURCE "sslsocket"

#include "tarnwick/net/sslsocket.h"

#include <openssl/err.h>
#include <openssl/ssl.h>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/signal_guard.h"

using namespace tarnwick;

namespace {

// Daemons expect TLS to be usable from any thread as soon as the library is there.
__attribute__((constructor)) void InitOpenSSL() {
  SSL_library_init();
  SSL_load_error_strings();
}

}  // namespace

SSLSocket::SSLSocket() : m_pSSLCtx(nullptr), m_pSSL(nullptr) {
  InitSSL();
}

SSLSocket::SSLSocket(const std::string& host, int port, int timeout, bool buffered)
    : TWSocket(host, port, timeout, buffered), m_pSSLCtx(nullptr), m_pSSL(nullptr) {
  InitSSL();
}

SSLSocket::~SSLSocket() {
  SSL_free(m_pSSL);
  SSL_CTX_free(m_pSSLCtx);
}

void SSLSocket::InitSSL() {
  const NoCancel no_cancel;
  m_pSSLCtx = SSL_CTX_new(SSLv23_client_method());
  if (m_pSSLCtx == nullptr) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Failed to create SSL context object.\n");
  } else {
    SSL_CTX_set_mode(m_pSSLCtx, SSL_MODE_AUTO_RETRY);
#ifdef SSL_OP_IGNORE_UNEXPECTED_EOF
    // A close without a close notice ends the stream as a plain close does; OpenSSL 3 takes it for
    // an error otherwise. Pinned by SServer.EndsABodyWithoutACloseNotice.
    SSL_CTX_set_options(m_pSSLCtx, SSL_OP_IGNORE_UNEXPECTED_EOF);
#endif
    m_pSSL = SSL_new(m_pSSLCtx);
  }
  if (m_pSSL == nullptr) {
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR, "Failed to create SSL object.\n");
  }
}

int SSLSocket::Connect() {
  const int result = ConnectSocket();
  if (result != 0) return result;
  const int handshake = Handshake();
  if (handshake != 1) {
    char text[256];
    const int error = m_pSSL != nullptr ? SSL_get_error(m_pSSL, handshake) : SSL_ERROR_SSL;
    ERR_error_string_n(ERR_get_error(), text, sizeof(text));
    TW_LOG(LOG_CATEG_SOCKET, LOG_LEVEL_ERROR,
           "Failed to established SSL conn. with error [%d] [%s].\n", error, text);
    Disconnect();
    return -1;
  }
  PostConnect();
  return 0;
}

// Results: those of SSL_connect.
int SSLSocket::Handshake() {
  ERR_clear_error();
  if (m_pSSL == nullptr) return -1;
  // A connection that failed was not shut down, and its state would spoil this one.
  SSL_clear(m_pSSL);
  SSL_set_fd(m_pSSL, m_sockFd);
  const NoCancel no_cancel;
  SignalGuard guard(SIGPIPE);
  const int result = SSL_connect(m_pSSL);
  if (result != 1) guard.DiscardPending();
  return result;
}

void SSLSocket::Disconnect() {
  if (IsConnected() && m_pSSL != nullptr) {
    ERR_clear_error();
    const NoCancel no_cancel;
    SignalGuard guard(SIGPIPE);
    if (SSL_shutdown(m_pSSL) < 0) guard.DiscardPending();
    SSL_clear(m_pSSL);
  }
  TWSocket::Disconnect();
}
