// Certificates for the servers of the tests, made at run time.
#ifndef TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_
#define TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_

#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <memory>
#include <string>

#include "tests/support/files.h"

inline constexpr long kDay = 24L * 60 * 60;

EVP_PKEY* NewEcKey();

// What a certificate says. The defaults are those of a sound one for this machine.
struct CertificateOptions {
  std::string common_name = "Test server";
  long from = -10 * kDay;  // seconds from now
  long to = kDay;
  std::string hosts = "IP:127.0.0.1,DNS:localhost";  // the alternative names; empty: none
  bool authority = false;                            // it may sign others
  EVP_PKEY* (*new_key)() = NewEcKey;
  const EVP_MD* (*digest)() = EVP_sha256;
  int version = X509_VERSION_3;
};

// A certificate with its key.
class Certificate {
 public:
  // Signed by `issuer`, or by its own key.
  explicit Certificate(const CertificateOptions& options, const Certificate* issuer = nullptr);

  // Makes a server context show it.
  void UseIn(SSL_CTX* context) const;

  // Writes a PEM file with the certificate, and with the key before it.
  void Write(const std::string& path) const;
  void WriteWithKey(const std::string& path) const;

 private:
  struct Deleter {
    void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
    void operator()(X509* certificate) const { X509_free(certificate); }
  };

  void AddExtension(int kind, const std::string& value);

  std::unique_ptr<EVP_PKEY, Deleter> key_;
  std::unique_ptr<X509, Deleter> certificate_;
};

// The options of the authority of a test's own.
CertificateOptions AuthorityOptions(const std::string& name = "Test authority");

struct TlsOptions {
  bool expired = false;     // the certificate's time has passed
  bool wrong_host = false;  // it names another host than 127.0.0.1 and localhost
  int max_version = 0;      // highest protocol, such as TLS1_2_VERSION; 0: what the library offers
  const char* authority = "Test authority";  // the name of who signs
  bool client_certificate = false;           // without one of the client the handshake fails
  bool http2 = false;                        // of the protocols that the client offers it takes h2
  bool self_signed = false;                  // the authority has not signed it
};

// A certificate authority, and a server certificate and key that it signed.
// Threads: one thread uses an object at a time.
class TlsIdentity {
 public:
  explicit TlsIdentity(const TlsOptions& options);

  // A PEM file with the authority's certificate.
  const std::string& CaFile() const { return ca_file_; }

  // A new server context that shows the certificate; the caller frees it.
  SSL_CTX* NewServerContext() const;

 private:
  TempDir directory_;
  std::string ca_file_;
  TlsOptions options_;
  Certificate authority_;
  Certificate certificate_;
};

#endif  // TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_
