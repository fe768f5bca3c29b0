#include "tools/twcamsim/certificates.h"

#include <arpa/inet.h>
#include <fcntl.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/x509v3.h>

#include <cerrno>
#include <cstring>

#include "tools/common/private_file.h"

namespace {

struct Free {
  void operator()(EVP_PKEY* key) const { EVP_PKEY_free(key); }
  void operator()(X509* certificate) const { X509_free(certificate); }
  void operator()(X509_EXTENSION* extension) const { X509_EXTENSION_free(extension); }
  void operator()(SSL_CTX* context) const { SSL_CTX_free(context); }
};

using Key = std::unique_ptr<EVP_PKEY, Free>;
using Certificate = std::unique_ptr<X509, Free>;
using Settings = std::unique_ptr<SSL_CTX, Free>;

constexpr long kDay = 86400;

struct Authority {
  Key key;
  Certificate certificate;
};

// What a certificate is to say.
struct Request {
  std::string name;
  std::string alternatives;  // empty: an authority's
  long from = -kDay;         // seconds from now
  long until = 30 * kDay;
};

bool AddExtension(X509* certificate, X509* issuer, int id, const char* value) {
  X509V3_CTX context;
  X509V3_set_ctx_nodb(&context);
  X509V3_set_ctx(&context, issuer, certificate, nullptr, nullptr, 0);
  const std::unique_ptr<X509_EXTENSION, Free> extension(
      X509V3_EXT_conf_nid(nullptr, &context, id, value));
  return extension && X509_add_ext(certificate, extension.get(), -1) == 1;
}

bool AddExtensions(X509* certificate, X509* issuer, const Request& request) {
  if (request.alternatives.empty()) {
    return AddExtension(certificate, issuer, NID_basic_constraints, "critical,CA:TRUE") &&
           AddExtension(certificate, issuer, NID_key_usage, "critical,keyCertSign,cRLSign") &&
           AddExtension(certificate, issuer, NID_subject_key_identifier, "hash");
  }
  return AddExtension(certificate, issuer, NID_basic_constraints, "critical,CA:FALSE") &&
         AddExtension(certificate, issuer, NID_ext_key_usage, "serverAuth") &&
         AddExtension(certificate, issuer, NID_subject_alt_name, request.alternatives.c_str());
}

// Signed by `issuer`, or by itself when that is nullptr.
Certificate Sign(const Request& request, EVP_PKEY* key, const Authority* issuer) {
  Certificate certificate(X509_new());
  if (!certificate) return nullptr;
  uint64_t serial = 0;
  RAND_bytes(reinterpret_cast<unsigned char*>(&serial), sizeof(serial));
  X509_set_version(certificate.get(), 2);
  ASN1_INTEGER_set_uint64(X509_get_serialNumber(certificate.get()), serial >> 1);
  X509_gmtime_adj(X509_getm_notBefore(certificate.get()), request.from);
  X509_gmtime_adj(X509_getm_notAfter(certificate.get()), request.until);
  X509_set_pubkey(certificate.get(), key);
  X509_NAME* name = X509_get_subject_name(certificate.get());
  X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_UTF8,
                             reinterpret_cast<const unsigned char*>(request.name.c_str()), -1, -1,
                             0);
  X509* above = issuer ? issuer->certificate.get() : certificate.get();
  X509_set_issuer_name(certificate.get(), X509_get_subject_name(above));
  if (!AddExtensions(certificate.get(), above, request)) return nullptr;
  EVP_PKEY* signer = issuer ? issuer->key.get() : key;
  return X509_sign(certificate.get(), signer, EVP_sha256()) > 0 ? std::move(certificate) : nullptr;
}

bool MakeAuthority(const char* name, Authority* authority) {
  authority->key.reset(EVP_EC_gen("P-256"));
  if (!authority->key) return false;
  Request request;
  request.name = name;
  authority->certificate = Sign(request, authority->key.get(), nullptr);
  return authority->certificate != nullptr;
}

// Each once, with the kind of name it is.
std::string Alternatives(std::set<std::string> hosts) {
  hosts.insert({"127.0.0.1", "localhost"});
  std::string text;
  for (const std::string& host : hosts) {
    in_addr ignored;
    const bool number = inet_pton(AF_INET, host.c_str(), &ignored) == 1;
    text += (text.empty() ? "" : ",") + std::string(number ? "IP:" : "DNS:") + host;
  }
  return text;
}

Request RequestFor(CertificateKind kind, const std::set<std::string>& hosts) {
  Request request;
  request.name = hosts.empty() ? "127.0.0.1" : *hosts.begin();
  request.alternatives = Alternatives(hosts);
  if (kind == CertificateKind::kExpired) {
    request.from = -800 * kDay;
    request.until = -400 * kDay;
  } else if (kind == CertificateKind::kNotYet) {
    request.from = 400 * kDay;
    request.until = 800 * kDay;
  } else if (kind == CertificateKind::kWrongName) {
    request.name = "other-camera.example";
    request.alternatives = "DNS:other-camera.example";
  }
  return request;
}

Settings MakeContext(EVP_PKEY* key, X509* certificate, bool old_tls) {
  Settings context(SSL_CTX_new(TLS_server_method()));
  if (!context) return nullptr;
  if (old_tls) {
    // Today's security level refuses these versions.
    SSL_CTX_set_security_level(context.get(), 0);
    SSL_CTX_set_min_proto_version(context.get(), TLS1_VERSION);
    SSL_CTX_set_max_proto_version(context.get(), TLS1_1_VERSION);
  }
  const bool good = SSL_CTX_use_certificate(context.get(), certificate) == 1 &&
                    SSL_CTX_use_PrivateKey(context.get(), key) == 1;
  return good ? std::move(context) : nullptr;
}

std::string OpenSslError() {
  char text[256];
  ERR_error_string_n(ERR_get_error(), text, sizeof(text));
  return text;
}

}  // namespace

struct Certificates::Impl {
  bool Add(CertificateKind kind, const std::set<std::string>& hosts, const Authority* issuer) {
    const Certificate certificate = Sign(RequestFor(kind, hosts), key.get(), issuer);
    if (!certificate) return false;
    for (const bool old_tls : {false, true}) {
      Settings context = MakeContext(key.get(), certificate.get(), old_tls);
      if (!context) return false;
      contexts[{kind, old_tls}] = std::move(context);
    }
    return true;
  }

  Authority own;
  Authority foreign;
  Key key;
  std::map<std::pair<CertificateKind, bool>, Settings> contexts;
};

Certificates::Certificates() : impl_(std::make_unique<Impl>()) {}

Certificates::~Certificates() = default;

bool Certificates::Make(const std::set<std::string>& hosts, std::string* error) {
  impl_->key.reset(EVP_EC_gen("P-256"));
  bool good = impl_->key && MakeAuthority("Simulated camera authority", &impl_->own) &&
              MakeAuthority("Another authority", &impl_->foreign);
  for (const CertificateKind kind : {CertificateKind::kGood, CertificateKind::kExpired,
                                     CertificateKind::kNotYet, CertificateKind::kWrongName}) {
    good = good && impl_->Add(kind, hosts, &impl_->own);
  }
  good = good && impl_->Add(CertificateKind::kForeign, hosts, &impl_->foreign) &&
         impl_->Add(CertificateKind::kSelfSigned, hosts, nullptr);
  if (!good) *error = "no certificates: " + OpenSslError();
  return good;
}

bool Certificates::WriteAuthority(const std::string& path, std::string* error) const {
  tarnwick::UniqueFd fd =
      OpenOwnFile(path, O_WRONLY | O_TRUNC, 0644, error);  // clients of other users read it
  if (!fd.Valid()) return false;
  FILE* file = fdopen(fd.Get(), "w");
  if (file) fd.Release();
  bool good = file && PEM_write_X509(file, impl_->own.certificate.get()) == 1;
  if (file) good = std::fclose(file) == 0 && good;
  if (!good) *error = path + ": " + std::strerror(errno);
  return good;
}

SSL_CTX* Certificates::Context(CertificateKind kind, bool old_tls) const {
  return impl_->contexts.at({kind, old_tls}).get();
}
