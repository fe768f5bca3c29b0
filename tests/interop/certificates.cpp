#include "tests/interop/certificates.h"

#include <gtest/gtest.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <cstdio>
#include <memory>

namespace {

constexpr long kDay = 24L * 60 * 60;

struct KeyDeleter {
  void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
};
struct CertificateDeleter {
  void operator()(X509* certificate) const { X509_free(certificate); }
};
using Key = std::unique_ptr<EVP_PKEY, KeyDeleter>;
using Certificate = std::unique_ptr<X509, CertificateDeleter>;

struct Kind {
  const char* name;
  const char* host;  // as the certificate names it
  bool expired;
  bool self_signed;
};

constexpr Kind kKinds[] = {{"good", "IP:127.0.0.1", false, false},
                           {"expired", "IP:127.0.0.1", true, false},
                           {"wrong-host", "DNS:elsewhere.invalid", false, false},
                           {"self-signed", "IP:127.0.0.1", false, true}};

Key NewKey() {
  return Key(EVP_EC_gen("P-256"));
}

Certificate NewCertificate(EVP_PKEY* key, const char* name, long serial, bool expired) {
  Certificate certificate(X509_new());
  X509_set_version(certificate.get(), X509_VERSION_3);
  ASN1_INTEGER_set(X509_get_serialNumber(certificate.get()), serial);
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), -10 * kDay);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), expired ? -kDay : kDay);
  X509_NAME_add_entry_by_txt(X509_get_subject_name(certificate.get()), "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>(name), -1, -1, 0);
  X509_set_pubkey(certificate.get(), key);
  return certificate;
}

void AddExtension(X509* certificate, int kind, const char* value) {
  X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, nullptr, kind, value);
  X509_add_ext(certificate, extension, -1);
  X509_EXTENSION_free(extension);
}

void Sign(X509* certificate, X509* issuer, EVP_PKEY* key) {
  X509_set_issuer_name(certificate, X509_get_subject_name(issuer));
  if (X509_sign(certificate, key, EVP_sha256()) == 0) ADD_FAILURE() << "no certificate";
}

void WritePem(const std::string& path, EVP_PKEY* key, X509* certificate) {
  FILE* file = fopen(path.c_str(), "we");
  if (key != nullptr) PEM_write_PrivateKey(file, key, nullptr, nullptr, 0, nullptr, nullptr);
  PEM_write_X509(file, certificate);
  fclose(file);
}

}  // namespace

CertificateFolder::CertificateFolder() {
  const Key ca_key = NewKey();
  const Certificate ca = NewCertificate(ca_key.get(), "Test authority", 1, false);
  AddExtension(ca.get(), NID_basic_constraints, "critical,CA:TRUE");
  Sign(ca.get(), ca.get(), ca_key.get());
  WritePem(CaFile(), nullptr, ca.get());
  long serial = 2;
  for (const Kind& kind : kKinds) {
    const Key key = NewKey();
    const Certificate made = NewCertificate(key.get(), kind.name, serial++, kind.expired);
    AddExtension(made.get(), NID_subject_alt_name, kind.host);
    Sign(made.get(), kind.self_signed ? made.get() : ca.get(),
         kind.self_signed ? key.get() : ca_key.get());
    WritePem(File(kind.name), key.get(), made.get());
  }
}

const CertificateFolder& Certificates() {
  static const CertificateFolder folder;
  return folder;
}
