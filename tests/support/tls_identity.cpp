#include "tests/support/tls_identity.h"

#include <gtest/gtest.h>
#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/pem.h>

#include <atomic>
#include <cstdio>

EVP_PKEY* NewEcKey() {
  return EVP_EC_gen("P-256");
}

Certificate::Certificate(const CertificateOptions& options, const Certificate* issuer)
    : key_(options.new_key()), certificate_(X509_new()) {
  static std::atomic<long> serial{0};
  X509* const certificate = certificate_.get();
  X509_set_version(certificate, options.version);
  ASN1_INTEGER_set(X509_get_serialNumber(certificate), ++serial);
  X509_gmtime_adj(X509_getm_notBefore(certificate), options.from);
  X509_gmtime_adj(X509_getm_notAfter(certificate), options.to);
  X509_NAME_add_entry_by_txt(X509_get_subject_name(certificate), "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>(options.common_name.data()),
                             static_cast<int>(options.common_name.size()), -1, 0);
  X509_set_pubkey(certificate, key_.get());
  if (options.authority) AddExtension(NID_basic_constraints, "critical,CA:TRUE");
  if (!options.hosts.empty()) AddExtension(NID_subject_alt_name, options.hosts);
  const Certificate& signer = issuer != nullptr ? *issuer : *this;
  X509_set_issuer_name(certificate, X509_get_subject_name(signer.certificate_.get()));
  if (X509_sign(certificate, signer.key_.get(), options.digest()) == 0) {
    ADD_FAILURE() << "no certificate";
  }
}

void Certificate::AddExtension(int kind, const std::string& value) {
  X509_EXTENSION* extension = X509V3_EXT_conf_nid(nullptr, nullptr, kind, value.c_str());
  X509_add_ext(certificate_.get(), extension, -1);
  X509_EXTENSION_free(extension);
}

void Certificate::UseIn(SSL_CTX* context) const {
  EXPECT_EQ(SSL_CTX_use_certificate(context, certificate_.get()), 1);
  EXPECT_EQ(SSL_CTX_use_PrivateKey(context, key_.get()), 1);
}

void Certificate::Write(const std::string& path) const {
  FILE* file = fopen(path.c_str(), "we");
  PEM_write_X509(file, certificate_.get());
  fclose(file);
}

void Certificate::WriteWithKey(const std::string& path) const {
  FILE* file = fopen(path.c_str(), "we");
  PEM_write_PrivateKey(file, key_.get(), nullptr, nullptr, 0, nullptr, nullptr);
  PEM_write_X509(file, certificate_.get());
  fclose(file);
}

CertificateOptions AuthorityOptions(const std::string& name) {
  CertificateOptions options;
  options.common_name = name;
  options.hosts = "";
  options.authority = true;
  return options;
}

namespace {

CertificateOptions ServerOptions(const TlsOptions& tls) {
  CertificateOptions options;
  if (tls.expired) options.to = -kDay;
  if (tls.wrong_host) options.hosts = "DNS:elsewhere.invalid";
  return options;
}

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

TlsIdentity::TlsIdentity(const TlsOptions& options)
    : ca_file_(directory_.File("ca.pem")),
      options_(options),
      authority_(AuthorityOptions(options.authority)),
      certificate_(ServerOptions(options), options.self_signed ? nullptr : &authority_) {
  authority_.Write(ca_file_);
}

SSL_CTX* TlsIdentity::NewServerContext() const {
  SSL_CTX* context = SSL_CTX_new(TLS_server_method());
  // 20,480 sessions would be kept, which nobody resumes.
  if (context != nullptr) SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
  certificate_.UseIn(context);
  if (options_.max_version != 0) SSL_CTX_set_max_proto_version(context, options_.max_version);
  if (options_.client_certificate) {
    SSL_CTX_set_verify(context, SSL_VERIFY_PEER | SSL_VERIFY_FAIL_IF_NO_PEER_CERT, nullptr);
  }
  if (options_.http2) SSL_CTX_set_alpn_select_cb(context, TakeHttp2, nullptr);
  return context;
}
