// A certificate authority of the simulator's own, and the certificates that it issues for its
// endpoints.
#ifndef TARNWICK_TOOLS_TWCAMSIM_CERTIFICATES_H_
#define TARNWICK_TOOLS_TWCAMSIM_CERTIFICATES_H_

#include <openssl/ssl.h>

#include <map>
#include <memory>
#include <set>
#include <string>

#include "tools/twcamsim/behaviour.h"

// Threads: any, once Make has returned.
class Certificates {
 public:
  Certificates();
  ~Certificates();
  Certificates(const Certificates&) = delete;
  Certificates& operator=(const Certificates&) = delete;

  // Makes the authority and a certificate of each kind, for all `hosts`, localhost and 127.0.0.1.
  // Results: false with the reason in `error`.
  bool Make(const std::set<std::string>& hosts, std::string* error);

  // Writes the authority's certificate.
  bool WriteAuthority(const std::string& path, std::string* error) const;

  // The TLS settings of an endpoint that shows that certificate.
  SSL_CTX* Context(CertificateKind kind, bool old_tls) const;

 private:
  struct Impl;
  std::unique_ptr<Impl> impl_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_CERTIFICATES_H_
