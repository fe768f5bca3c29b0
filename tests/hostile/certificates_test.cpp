// TLS servers with certificates that nobody should trust. The client's own socket does not look at
// them; libcurl does, unless it is told not to.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/evp.h>
#include <openssl/rsa.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>

#include <string>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"

namespace {

constexpr long kDay = 24 * 3600;

// A certificate that its own key has signed.
struct CertificateCase {
  std::string name;
  std::string host = "127.0.0.1";
  long from = -kDay;
  long to = kDay;
  int names = 1;  // alternative names
  EVP_PKEY* (*key)() = [] { return EVP_EC_gen("P-256"); };
  const EVP_MD* (*digest)() = EVP_sha256;
  int version = X509_VERSION_3;
  bool too_long = false;  // for a handshake, whoever checks
};

std::ostream& operator<<(std::ostream& out, const CertificateCase& test) {
  return out << test.name;
}

void AddNames(X509* certificate, const CertificateCase& test) {
  std::string names = "IP:127.0.0.1";
  for (int i = 1; i < test.names; ++i) names += ",DNS:host-" + std::to_string(i) + ".example";
  X509_EXTENSION* const extension =
      X509V3_EXT_conf_nid(nullptr, nullptr, NID_subject_alt_name, names.c_str());
  X509_add_ext(certificate, extension, -1);
  X509_EXTENSION_free(extension);
}

X509* MakeCertificate(const CertificateCase& test, EVP_PKEY* key) {
  X509* const certificate = X509_new();
  X509_set_version(certificate, test.version);
  X509_gmtime_adj(X509_getm_notBefore(certificate), test.from);
  X509_gmtime_adj(X509_getm_notAfter(certificate), test.to);
  X509_NAME* const name = X509_get_subject_name(certificate);
  X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                             reinterpret_cast<const unsigned char*>(test.host.data()),
                             static_cast<int>(test.host.size()), -1, 0);
  X509_set_issuer_name(certificate, name);
  X509_set_pubkey(certificate, key);
  if (test.names > 0) AddNames(certificate, test);
  EXPECT_NE(X509_sign(certificate, key, test.digest()), 0);
  return certificate;
}

SharedTls TlsWith(const CertificateCase& test) {
  EVP_PKEY* const key = test.key();
  X509* const certificate = MakeCertificate(test, key);
  SSL_CTX* const context = SSL_CTX_new(TLS_server_method());
  SSL_CTX_set_security_level(context, 0);
  EXPECT_EQ(SSL_CTX_use_certificate(context, certificate), 1);
  EXPECT_EQ(SSL_CTX_use_PrivateKey(context, key), 1);
  X509_free(certificate);
  EVP_PKEY_free(key);
  return std::make_shared<ServerTls>(TLS1_3_VERSION, context);
}

EVP_PKEY* ShortRsaKey() {
  return EVP_RSA_gen(1024);
}

const CertificateCase kCertificates[] = {
    {"SelfSigned"},
    {"Expired", "127.0.0.1", -3 * kDay, -kDay},
    {"NotYetValid", "127.0.0.1", kDay, 3 * kDay},
    {"ValidBackwards", "127.0.0.1", kDay, -kDay},
    {"OfAnotherHost", "camera.example", -kDay, kDay, 0},
    {"OfNoHost", "", -kDay, kDay, 0},
    {"WithAZeroByteInTheName", std::string("127.0.0.1\0.example", 18), -kDay, kDay, 0},
    {"WithControlBytesInTheName", "127.0.0.1\r\nX: y", -kDay, kDay, 0},
    {"WithAWildcardForAll", "*", -kDay, kDay, 0},
    {"WithAShortKey", "127.0.0.1", -kDay, kDay, 1, ShortRsaKey},
    {"OfAnOldVersion", "127.0.0.1", -kDay, kDay, 0, [] { return EVP_EC_gen("P-256"); }, EVP_sha256,
     X509_VERSION_1},
    {"SignedByAWeakDigest", "127.0.0.1", -kDay, kDay, 1, [] { return EVP_EC_gen("P-256"); },
     EVP_sha1},
    {"With1000Names", "127.0.0.1", -kDay, kDay, 1000},
    {"With10000Names", "127.0.0.1", -kDay, kDay, 10000, [] { return EVP_EC_gen("P-256"); },
     EVP_sha256, X509_VERSION_3, true},
};

const char kReply[] = "HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n{\"success\":true}";

// Serves a request when the client lets it come to that.
Script Serve(const CertificateCase& test, bool accepted) {
  const SharedTls tls = TlsWith(test);
  if (accepted)
    return {FinishHandshake(tls), ExpectTlsRequest(tls), SendTls(tls, kReply),
            SendTlsCloseNotice(tls), DiscardUntilEnd()};
  return {SendFirstFlight(tls), DiscardUntilEnd()};
}

ClientSettings Https() {
  ClientSettings settings;
  settings.https = true;
  return settings;
}

class Certificates : public ::testing::TestWithParam<CertificateCase> {};

}  // namespace

TEST_P(Certificates, DoNotMatterToTheClientsOwnSocket) {
  const bool accepted = !GetParam().too_long;
  ScriptedPeer peer({Serve(GetParam(), accepted)});
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ClientProbe client(peer.Port(), Https());
    outcome = OutcomeOf(client, client.SendRequestByGet());
    outcome.text = ReadBody(client);
  });
  const Outcome refused = {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 0, ""};
  const Outcome served = Success("{\"success\":true}");
  EXPECT_EQ(outcome, accepted ? served : refused);
}

TEST_P(Certificates, DoNotMatterToLibcurlUnverified) {
  const bool accepted = !GetParam().too_long;
  ScriptedPeer peer({Serve(GetParam(), accepted)});
  int result = -1;
  RunOnSmallStack(kSmallStack, [&] {
    result = ClientProbe(peer.Port(), Https()).SendRequestByCurl(HTTP_METHOD_GET, false, 5);
  });
  EXPECT_EQ(result, accepted ? HTTP_RET_OK : HTTP_RET_IO_ERROR);
}

TEST_P(Certificates, AreRefusedByLibcurlVerifying) {
  ScriptedPeer peer({Serve(GetParam(), false)});
  int result = -1;
  RunOnSmallStack(kSmallStack, [&] {
    result = ClientProbe(peer.Port(), Https()).SendRequestByCurl(HTTP_METHOD_GET, true, 5);
  });
  EXPECT_EQ(result, GetParam().too_long ? HTTP_RET_IO_ERROR : HTTP_RET_CERT_ERROR);
}

TEST_P(Certificates, AreRefusedByTheOneCallGet) {
  ScriptedPeer peer({Serve(GetParam(), false)});
  int result = 0;
  RunOnSmallStack(kSmallStack, [&] {
    Json::Value value;
    result = SendHttpsGet("127.0.0.1", peer.Port(), "a.cgi", value, 5);
  });
  EXPECT_EQ(result, GetParam().too_long ? -1 : -2);
}

INSTANTIATE_TEST_SUITE_P(Hostile, Certificates, ::testing::ValuesIn(kCertificates),
                         [](const auto& test) { return test.param.name; });
