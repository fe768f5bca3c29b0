// The certificates that the servers of the tests show.
#ifndef TARNWICK_TESTS_INTEROP_CERTIFICATES_H_
#define TARNWICK_TESTS_INTEROP_CERTIFICATES_H_

#include <string>

#include "tests/support/files.h"

// An authority of its own, and certificates for 127.0.0.1 that it signed.
class CertificateFolder {
 public:
  CertificateFolder();

  // A PEM file with the authority's certificate.
  std::string CaFile() const { return directory_.File("ca.pem"); }

  // A PEM file with key and certificate. `kind`: good, expired, wrong-host or self-signed.
  std::string File(const std::string& kind) const { return directory_.File(kind + ".pem"); }

 private:
  TempDir directory_;
};

// Made on the first call; one for the program.
const CertificateFolder& Certificates();

#endif  // TARNWICK_TESTS_INTEROP_CERTIFICATES_H_
