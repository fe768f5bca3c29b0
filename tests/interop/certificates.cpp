#include "tests/interop/certificates.h"

#include "tests/support/tls_identity.h"

CertificateFolder::CertificateFolder() {
  const Certificate authority(AuthorityOptions());
  authority.Write(CaFile());
  CertificateOptions options;
  Certificate(options, &authority).WriteWithKey(File("good"));
  Certificate(options).WriteWithKey(File("self-signed"));
  options.to = -kDay;
  Certificate(options, &authority).WriteWithKey(File("expired"));
  options.to = kDay;
  options.hosts = "DNS:elsewhere.invalid";
  Certificate(options, &authority).WriteWithKey(File("wrong-host"));
}

const CertificateFolder& Certificates() {
  static const CertificateFolder directory;
  return directory;
}
