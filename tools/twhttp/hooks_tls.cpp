// The hooks of OpenSSL: what it hides from the socket's hooks is seen here, decrypted.
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

#include "tarnwick/platform/unique.h"
#include "tools/twhttp/hooks.h"
#include "tools/twhttp/watchdog.h"

namespace {

Connection* Watched(const SSL* ssl) {
  Hooks* const hooks = CurrentHooks();
  return hooks != nullptr ? hooks->trace->Find(ConnectionOf(SSL_get_fd(ssl))) : nullptr;
}

bool IsOffline() {
  return CurrentHooks() != nullptr && CurrentHooks()->peer != nullptr;
}

// OpenSSL's last word, or the system's when it has none. The queue stays for the library.
std::string FailureText(int system_error) {
  const unsigned long code = ERR_peek_last_error();
  if (code == 0) return system_error != 0 ? std::strerror(system_error) : "the peer closed";
  char text[256];
  ERR_error_string_n(code, text, sizeof(text));
  const char* const reason = ERR_reason_error_string(code);
  return reason != nullptr ? reason : text;
}

std::string NameText(X509_NAME* name) {
  char text[256] = "";
  X509_NAME_oneline(name, text, sizeof(text));
  return text;
}

std::string TimeText(const ASN1_TIME* time) {
  BIO* const bio = BIO_new(BIO_s_mem());
  if (bio == nullptr) return "";
  ASN1_TIME_print(bio, time);
  char* data = nullptr;
  const long size = BIO_get_mem_data(bio, &data);
  std::string text(data, static_cast<size_t>(size));
  BIO_free(bio);
  return text;
}

std::string CertificateText(const SSL* ssl) {
  X509* const certificate = SSL_get1_peer_certificate(ssl);
  if (certificate == nullptr) return "";
  std::string text = "subject " + NameText(X509_get_subject_name(certificate)) + ", issuer " +
                     NameText(X509_get_issuer_name(certificate)) + ", valid to " +
                     TimeText(X509_get0_notAfter(certificate));
  if (X509_cmp_current_time(X509_get0_notAfter(certificate)) < 0) text += " (expired)";
  X509_free(certificate);
  return text;
}

void NoteHandshake(SSL* ssl, Connection* connection, int result) {
  const tarnwick::ErrnoSaver keeper;
  Step& step = connection->handshake;
  step.end = CurrentHooks()->Now();
  step.failed = result != 1;
  if (step.failed) {
    step.error = errno;
    step.text = FailureText(errno);
    return;
  }
  connection->tls_facts = std::string(SSL_get_version(ssl)) + ", " + SSL_get_cipher_name(ssl);
  connection->certificate = CertificateText(ssl);
}

void NoteFailedRead(int number, double now) {
  const int error = errno;
  const bool reset = error == ECONNRESET;
  CurrentHooks()->trace->Ended(number, now, reset ? End::kReset : End::kFailed, error,
                               FailureText(error));
}

void NoteRead(SSL* ssl, const void* buf, int count) {
  const tarnwick::ErrnoSaver keeper;
  Hooks* const hooks = CurrentHooks();
  const int number = Watched(ssl)->number;
  const int error = SSL_get_error(ssl, count);
  if (count > 0) {
    hooks->trace->Received(number, hooks->Now(),
                           {static_cast<const char*>(buf), static_cast<size_t>(count)});
    hooks->Moved();
  } else if (count == 0 || error == SSL_ERROR_ZERO_RETURN) {
    hooks->trace->Ended(number, hooks->Now(), End::kClosed, 0, "");
  } else if (error != SSL_ERROR_WANT_READ && error != SSL_ERROR_WANT_WRITE) {
    NoteFailedRead(number, hooks->Now());
  }
}

// The library lets OpenSSL take any close for an orderly one, so the notice itself is looked for.
void OnInfo(const SSL* ssl, int where, int value) {
  constexpr int kAlertMask = 0xff;
  Connection* const connection = Watched(ssl);
  const bool notice = (value & kAlertMask) == SSL_AD_CLOSE_NOTIFY;
  if (where == SSL_CB_READ_ALERT && connection != nullptr && notice) {
    connection->close_notice = true;
  }
}

}  // namespace

extern "C" int __real_SSL_connect(SSL* ssl);
extern "C" int __wrap_SSL_connect(SSL* ssl) {
  Connection* const connection = Watched(ssl);
  if (connection == nullptr) return __real_SSL_connect(ssl);
  connection->tls = true;
  if (IsOffline()) return 1;
  connection->handshake.begin = CurrentHooks()->Now();
  SSL_set_info_callback(ssl, OnInfo);
  const WatchedWait wait;
  const int result = __real_SSL_connect(ssl);
  NoteHandshake(ssl, connection, result);
  return result;
}

extern "C" int __real_SSL_read(SSL* ssl, void* buf, int length);
extern "C" int __wrap_SSL_read(SSL* ssl, void* buf, int length) {
  if (Watched(ssl) == nullptr) return __real_SSL_read(ssl, buf, length);
  if (IsOffline()) {
    return static_cast<int>(read(SSL_get_fd(ssl), buf, static_cast<size_t>(length)));
  }
  const WatchedWait wait;
  const int count = __real_SSL_read(ssl, buf, length);
  NoteRead(ssl, buf, count);
  return count;
}

extern "C" int __real_SSL_write(SSL* ssl, const void* buf, int length);
extern "C" int __wrap_SSL_write(SSL* ssl, const void* buf, int length) {
  const Connection* const connection = Watched(ssl);
  if (connection == nullptr) return __real_SSL_write(ssl, buf, length);
  if (IsOffline()) {
    return static_cast<int>(write(SSL_get_fd(ssl), buf, static_cast<size_t>(length)));
  }
  const double begin = CurrentHooks()->Now();
  StartWatchdog();
  const int count = __real_SSL_write(ssl, buf, length);
  const tarnwick::ErrnoSaver keeper;
  const int error = SSL_get_error(ssl, count);
  const bool waits = error == SSL_ERROR_WANT_READ || error == SSL_ERROR_WANT_WRITE;
  Trace* const trace = CurrentHooks()->trace;
  if (count > 0) {
    StopWatchdog();
    trace->Sent(connection->number, begin, CurrentHooks()->Now(),
                {static_cast<const char*>(buf), static_cast<size_t>(count)});
    CurrentHooks()->Moved();
  } else if (!waits) {
    trace->SendFailed(connection->number, CurrentHooks()->Now(), errno, FailureText(errno));
  }
  return count;
}
