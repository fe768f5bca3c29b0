// Requests through libcurl over TLS, and on several threads.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";

}  // namespace

TEST(SendRequestByCurlTls, ATrustedAuthorityIsVerified) {
  TlsScriptedPeer peer({Exchange(kOk)});
  const TrustedAuthority trusted(peer.CaFile());
  ClientSettings settings;
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
  EXPECT_THAT(peer.Received(0), StartsWith("GET /a.cgi HTTP/1.1\r\n"));
}

TEST(SendRequestByCurlTls, AnUnknownAuthorityIsACertificateError) {
  TlsScriptedPeer peer({{ExpectRefusedHandshake()}});
  TlsOptions options;
  options.authority = "Another authority";
  const TlsIdentity other(options);
  const TrustedAuthority trusted(other.CaFile());
  ClientSettings settings;
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_CERT_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_CERT_ERROR);
}

TEST(SendRequestByCurlTls, AnExpiredCertificateOrAnotherHostsIsACertificateError) {
  TlsOptions options[2];
  options[0].expired = true;
  options[1].wrong_host = true;
  for (const TlsOptions& tls : options) {
    TlsScriptedPeer peer({{ExpectRefusedHandshake()}}, tls);
    const TrustedAuthority trusted(peer.CaFile());
    ClientSettings settings;
    settings.https = true;
    ExposedClient client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_CERT_ERROR);
  }
}

TEST(SendRequestByCurlTls, WithoutVerificationAnyCertificateIsTaken) {
  TlsOptions tls;
  tls.expired = tls.wrong_host = true;
  TlsScriptedPeer peer({Exchange(kOk)}, tls);
  ClientSettings settings;
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
}

TEST(SendRequestByCurlTls, APeerThatSpeaksNoTlsIsAnIoError) {
  ScriptedPeer peer({{ExpectBytes(1), Send("HTTP/1.1 400 No\r\n\r\n"), DiscardUntilEnd()}});
  ClientSettings settings;
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_IO_ERROR);
}

TEST(HttpThreads, SeparateClientsMayWorkAtTheSameTime) {
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
      ExposedClient client(peer.Port());
      EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
      EXPECT_EQ(ReadBody(client), "body");
      EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
      EXPECT_EQ(client.m_strCurlText, "body");
    });
  }
  for (std::thread& thread : threads) thread.join();
}
