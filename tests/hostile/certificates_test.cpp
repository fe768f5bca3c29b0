// TLS servers with certificates that nobody should trust. The client's own socket does not look at
// them; libcurl does, unless it is told not to.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/rsa.h>
#include <openssl/ssl.h>

#include <string>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"
#include "tests/support/tls_identity.h"

namespace {

constexpr char kHost[] = "127.0.0.1";
constexpr char kAlternatives[] = "IP:127.0.0.1";

// A certificate that its own key has signed.
struct CertificateCase {
  std::string name;
  CertificateOptions certificate;  // common name, seconds from and to, alternative names, ...
  bool too_long = false;           // for a handshake, whoever checks
};

std::ostream& operator<<(std::ostream& out, const CertificateCase& test) {
  return out << test.name;
}

std::string Alternatives(int count) {
  std::string names = kAlternatives;
  for (int i = 1; i < count; ++i) names += ",DNS:host-" + std::to_string(i) + ".example";
  return names;
}

EVP_PKEY* NewShortRsaKey() {
  return EVP_RSA_gen(1024);
}

SharedTls TlsWith(const CertificateCase& test) {
  SSL_CTX* const context = SSL_CTX_new(TLS_server_method());
  SSL_CTX_set_security_level(context, 0);
  Certificate(test.certificate).UseIn(context);
  return std::make_shared<ServerTls>(TLS1_3_VERSION, context);
}

const CertificateCase kCertificates[] = {
    {"SelfSigned", {kHost, -kDay, kDay, kAlternatives}},
    {"Expired", {kHost, -3 * kDay, -kDay, kAlternatives}},
    {"NotYetValid", {kHost, kDay, 3 * kDay, kAlternatives}},
    {"ValidBackwards", {kHost, kDay, -kDay, kAlternatives}},
    {"OfAnotherHost", {"camera.example", -kDay, kDay, ""}},
    {"OfNoHost", {"", -kDay, kDay, ""}},
    {"WithAZeroByteInTheName", {std::string("127.0.0.1\0.example", 18), -kDay, kDay, ""}},
    {"WithControlBytesInTheName", {"127.0.0.1\r\nX: y", -kDay, kDay, ""}},
    {"WithAWildcardForAll", {"*", -kDay, kDay, ""}},
    {"WithAShortKey", {kHost, -kDay, kDay, kAlternatives, false, NewShortRsaKey}},
    {"OfAnOldVersion", {kHost, -kDay, kDay, "", false, NewEcKey, EVP_sha256, X509_VERSION_1}},
    {"SignedByAWeakDigest", {kHost, -kDay, kDay, kAlternatives, false, NewEcKey, EVP_sha1}},
    {"With1000Names", {kHost, -kDay, kDay, Alternatives(1000)}},
    {"With10000Names", {kHost, -kDay, kDay, Alternatives(10000)}, true},
};

const char kResponse[] = "HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n{\"success\":true}";

// Serves a request when the client lets it come to that.
Script Serve(const CertificateCase& test, bool accepted) {
  const SharedTls tls = TlsWith(test);
  if (accepted)
    return {FinishHandshake(tls), ExpectTlsRequest(tls), SendTls(tls, kResponse),
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
    ExposedClient client(peer.Port(), Https());
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
    result = ExposedClient(peer.Port(), Https()).SendRequestByCurl(HTTP_METHOD_GET, false, 5);
  });
  EXPECT_EQ(result, accepted ? HTTP_RET_OK : HTTP_RET_IO_ERROR);
}

TEST_P(Certificates, AreRefusedByLibcurlVerifying) {
  ScriptedPeer peer({Serve(GetParam(), false)});
  int result = -1;
  RunOnSmallStack(kSmallStack, [&] {
    result = ExposedClient(peer.Port(), Https()).SendRequestByCurl(HTTP_METHOD_GET, true, 5);
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
