#include "bench/server_stream.h"

#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/x509.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <climits>

#include "bench/contender.h"

namespace {

constexpr int64_t kDay = 86400;

X509* SelfSigned(EVP_PKEY* key) {
  X509* const certificate = X509_new();
  X509_set_version(certificate, 2);
  ASN1_INTEGER_set(X509_get_serialNumber(certificate), 1);
  X509_gmtime_adj(X509_getm_notBefore(certificate), -kDay);
  X509_gmtime_adj(X509_getm_notAfter(certificate), kDay);
  X509_NAME* const name = X509_get_subject_name(certificate);
  X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>("127.0.0.1"), -1, -1, 0);
  X509_set_issuer_name(certificate, name);
  X509_set_pubkey(certificate, key);
  X509_sign(certificate, key, EVP_sha256());
  return certificate;
}

}  // namespace

ServerIdentity::ServerIdentity(bool tls) : m_context(nullptr) {
  if (!tls) return;
  m_context = SSL_CTX_new(TLS_server_method());
  EVP_PKEY* const key = EVP_EC_gen("P-256");
  X509* const certificate = SelfSigned(key);
  Expect(SSL_CTX_use_certificate(m_context, certificate) == 1 &&
             SSL_CTX_use_PrivateKey(m_context, key) == 1,
         "server", "has no certificate");
  X509_free(certificate);
  EVP_PKEY_free(key);
}

ServerStream::ServerStream(int fd, const ServerIdentity& identity) : m_fd(fd) {
  if (identity.Context() == nullptr) return;
  m_ssl = SSL_new(identity.Context());
  SSL_set_fd(m_ssl, m_fd);
  SSL_accept(m_ssl);  // a failed handshake is met by the first read
}

ServerStream::~ServerStream() {
  if (m_ssl != nullptr) SSL_shutdown(m_ssl);
  SSL_free(m_ssl);
  close(m_fd);
}

ssize_t ServerStream::Read(char* to, size_t room) {
  if (m_ssl == nullptr) return read(m_fd, to, room);
  return SSL_read(m_ssl, to, static_cast<int>(std::min<size_t>(room, INT_MAX)));
}

void ServerStream::Write(const char* bytes, size_t size) {
  while (size > 0) {
    const ssize_t count =
        m_ssl == nullptr
            ? send(m_fd, bytes, size, MSG_NOSIGNAL)
            : SSL_write(m_ssl, bytes, static_cast<int>(std::min<size_t>(size, INT_MAX)));
    if (count <= 0) return;
    bytes += count;
    size -= static_cast<size_t>(count);
  }
}
