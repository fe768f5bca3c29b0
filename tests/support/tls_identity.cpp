#include "tests/support/tls_identity.h"

#include <gtest/gtest.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <cstdio>

namespace {

constexpr long kDay = 24L * 60 * 60;

void AddExtension(X509* certificate, X509* issuer, int kind, const char* value) {
  X509V3_CTX context;
  X509V3_set_ctx(&context, issuer, certificate, nullptr, nullptr, 0);
  X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, &context, kind, value);
  X509_add_ext(certificate, extension, -1);
  X509_EXTENSION_free(extension);
}

X509* NewCertificate(EVP_PKEY* key, const char* name, long serial, bool expired) {
  X509* certificate = X509_new();
  X509_set_version(certificate, X509_VERSION_3);
  ASN1_INTEGER_set(X509_get_serialNumber(certificate), serial);
  X509_gmtime_adj(X509_getm_notBefore(certificate), -10 * kDay);
  X509_gmtime_adj(X509_getm_notAfter(certificate), expired ? -kDay : kDay);
  X509_NAME_add_entry_by_txt(X509_get_subject_name(certificate), "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>(name), -1, -1, 0);
  X509_set_pubkey(certificate, key);
  return certificate;
}

void WriteCertificate(const std::string& path, X509* certificate) {
  FILE* file = fopen(path.c_str(), "we");
  PEM_write_X509(file, certificate);
  fclose(file);
}

}  // namespace

TlsIdentity::TlsIdentity(const TlsOptions& options)
    : ca_file_(folder_.File("ca.pem")), options_(options), key_(EVP_EC_gen("P-256")) {
  EVP_PKEY* ca_key = EVP_EC_gen("P-256");
  X509* ca = NewCertificate(ca_key, options.authority, 1, false);
  X509_set_issuer_name(ca, X509_get_subject_name(ca));
  AddExtension(ca, ca, NID_basic_constraints, "critical,CA:TRUE");
  X509_sign(ca, ca_key, EVP_sha256());
  WriteCertificate(ca_file_, ca);

  certificate_ = NewCertificate(key_, "Test server", 2, options.expired);
  X509_set_issuer_name(certificate_, X509_get_subject_name(ca));
  AddExtension(certificate_, ca, NID_subject_alt_name,
               options.wrong_host ? "DNS:elsewhere.invalid" : "IP:127.0.0.1,DNS:localhost");
  if (X509_sign(certificate_, ca_key, EVP_sha256()) == 0) ADD_FAILURE() << "no certificate";
  X509_free(ca);
  EVP_PKEY_free(ca_key);
}

TlsIdentity::~TlsIdentity() {
  X509_free(certificate_);
  EVP_PKEY_free(key_);
}

namespace {

int TakeHttp2(SSL*, const unsigned char** taken, unsigned char* length,
              const unsigned char* offered, unsigned int size, void*) {
  static constexpr unsigned char kHttp2[] = {2, 'h', '2'};
  unsigned char* protocol = nullptr;
  const int result =
      SSL_select_next_proto(&protocol, length, kHttp2, sizeof(kHttp2), offered, size);
  *taken = protocol;
  return result == OPENSSL_NPN_NEGOTIATED ? SSL_TLSEXT_ERR_OK : SSL_TLSEXT_ERR_NOACK;
}

}  // namespace

SSL_CTX* TlsIdentity::NewServerContext() const {
  SSL_CTX* context = SSL_CTX_new(TLS_server_method());
  // 20,480 sessions would be kept, which nobody resumes.
  if (context != nullptr) SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
  SSL_CTX_use_certificate(context, certificate_);
  SSL_CTX_use_PrivateKey(context, key_);
  if (options_.max_version != 0) SSL_CTX_set_max_proto_version(context, options_.max_version);
  if (options_.client_certificate) {
    SSL_CTX_set_verify(context, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
  }
  if (options_.http2) SSL_CTX_set_alpn_select_cb(context, TakeHttp2, nullptr);
  return context;
}
