// Certificates for the TLS peer, made at run time.
#ifndef TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_
#define TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_

#include <openssl/ssl.h>

#include <memory>
#include <string>

#include "tests/support/files.h"

struct TlsOptions {
  bool expired = false;     // the certificate's time has passed
  bool wrong_host = false;  // it names another host than 127.0.0.1 and localhost
  int max_version = 0;      // highest protocol, such as TLS1_2_VERSION; 0: what the library offers
  const char* authority = "Test authority";  // the name of who signs
  bool client_certificate = false;           // without one of the client the handshake fails
  bool http2 = false;                        // of the protocols that the client offers it takes h2
};

// A certificate authority, and a server certificate and key that it signed.
// Threads: one thread uses an object at a time.
class TlsIdentity {
 public:
  explicit TlsIdentity(const TlsOptions& options);
  ~TlsIdentity();
  TlsIdentity(const TlsIdentity&) = delete;
  TlsIdentity& operator=(const TlsIdentity&) = delete;

  // A PEM file with the authority's certificate.
  const std::string& CaFile() const { return ca_file_; }

  // A new server context that shows the certificate; the caller frees it.
  SSL_CTX* NewServerContext() const;

 private:
  TempDir folder_;
  std::string ca_file_;
  TlsOptions options_;
  EVP_PKEY* key_ = nullptr;
  X509* certificate_ = nullptr;
};

#endif  // TARNWICK_TESTS_SUPPORT_TLS_IDENTITY_H_
