// Helpers for the tests of the HTTP client.
#ifndef TARNWICK_TESTS_HTTP_HTTP_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_HTTP_TEST_UTIL_H_

#include <curl/curl.h>
#include <fcntl.h>
#include <gtest/gtest.h>
#include <netinet/in.h>
#include <openssl/ec.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509v3.h>
#include <poll.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/http/twhttp.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/ports.h"
#include "tests/support/process.h"
#include "tests/support/scripted_peer.h"

inline constexpr int kHttpCategory = 26;

struct ClientSettings {
  std::string path = "a.cgi";
  HTTP_VERSION version = HTTP_VERSION_NONE;
  std::string user = {};
  std::string password = {};
  bool basic_auth = false;
  bool encode_query = false;
  std::string keep = {};
  int timeout = 5;
  bool https = false;
  bool buffered = true;
  std::string host = "127.0.0.1";
};

// A client that shows its fields.
class ClientProbe : public TWHttpClient {
 public:
  ClientProbe() = default;
  explicit ClientProbe(int port, const ClientSettings& s = {})
      : TWHttpClient(s.host, port, s.path, s.user, s.password, s.timeout, s.https, s.buffered,
                     s.encode_query, s.basic_auth, s.version, s.keep) {}

  using TWHttpClient::m_bBasicAuth;
  using TWHttpClient::m_bEncodeQuery;
  using TWHttpClient::m_bHttps;
  using TWHttpClient::m_connState;
  using TWHttpClient::m_httpVersion;
  using TWHttpClient::m_mapContent;
  using TWHttpClient::m_pCurlRespFile;
  using TWHttpClient::m_port;
  using TWHttpClient::m_pRespBuf;
  using TWHttpClient::m_pSocket;
  using TWHttpClient::m_respLen;
  using TWHttpClient::m_result;
  using TWHttpClient::m_statusCode;
  using TWHttpClient::m_strAuthenticate;
  using TWHttpClient::m_strAuthorization;
  using TWHttpClient::m_strCookie;
  using TWHttpClient::m_strCurlText;
  using TWHttpClient::m_strEncodeKeep;
  using TWHttpClient::m_strHost;
  using TWHttpClient::m_strPassword;
  using TWHttpClient::m_strPath;
  using TWHttpClient::m_strTransferEncoding;
  using TWHttpClient::m_strUser;
};

// A client that has sent a GET to a peer which answered with `reply` and closed.
inline std::unique_ptr<ClientProbe> ClientAfter(const std::string& reply) {
  ScriptedPeer peer({Exchange(reply)});
  auto client = std::make_unique<ClientProbe>(peer.Port());
  EXPECT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  return client;
}

// Everything up to the end of the stream.
inline std::string ReadBody(TWHttpClient& client) {
  std::string body;
  char piece[4096];
  for (int n; (n = client.ReadData(piece, sizeof(piece))) > 0;) {
    body.append(piece, static_cast<size_t>(n));
  }
  return body;
}

// A header that the client keeps; "(none)" when the response had none.
inline std::string Content(const TWHttpClient& client, HTTP_MAP_KEY key) {
  std::string value;
  return client.GetHttpContent(key, value) == HTTP_RET_OK ? value : "(none)";
}

MATCHER_P3(IsHttpLog, level, function, message, "") {
  return arg.category == "http" && arg.level == level && arg.source == "twhttp" &&
         arg.function == function && arg.message == message;
}

// A server for the tests in which calls fail: each of any number of connections may come to a
// request, or break off before. Requests get `reply`.
class ReplyServer {
 public:
  explicit ReplyServer(std::string reply) : reply_(std::move(reply)) {
    listener_ = BindLoopback(&port_);
    if (listen(listener_, 64) != 0) ADD_FAILURE() << "the server cannot listen";
    thread_ = std::thread([this] { Run(); });
  }

  ~ReplyServer() {
    stopped_ = true;
    thread_.join();
    close(listener_);
  }

  int Port() const { return port_; }

 private:
  void Run() {
    while (!stopped_) {
      if (!Readable(listener_, 10)) continue;
      const int fd = accept4(listener_, nullptr, nullptr, SOCK_CLOEXEC);
      Serve(fd);
      close(fd);
    }
  }

  void Serve(int fd) {
    std::string request;
    char buf[4096];
    while (request.find("\r\n\r\n") == std::string::npos) {
      if (!Readable(fd, 2000)) return;
      const ssize_t n = recv(fd, buf, sizeof(buf), 0);
      if (n <= 0) return;
      request.append(buf, static_cast<size_t>(n));
    }
    send(fd, reply_.data(), reply_.size(), MSG_NOSIGNAL);
  }

  static bool Readable(int fd, int milliseconds) {
    pollfd waiting = {fd, POLLIN, 0};
    return poll(&waiting, 1, milliseconds) > 0;
  }

  const std::string reply_;
  int listener_ = -1;
  int port_ = 0;
  std::atomic<bool> stopped_{false};
  std::thread thread_;
};

// Makes libcurl trust one authority and no other: covers the system's certificate folder, inside
// the sandbox, for as long as it lives.
class TrustedAuthority {
 public:
  explicit TrustedAuthority(const std::string& ca_file) {
    const char* bundle = curl_version_info(CURLVERSION_NOW)->cainfo;
    const std::string path = bundle != nullptr ? bundle : "/etc/ssl/certs/ca-certificates.crt";
    folder_ = path.substr(0, path.rfind('/'));
    if (mount("tmpfs", folder_.c_str(), "tmpfs", 0, "mode=755") != 0) {
      ADD_FAILURE() << "cannot cover " << folder_ << " (the package openssl makes it)";
      folder_.clear();
      return;
    }
    WriteFile(path, ReadFile(ca_file));
  }

  ~TrustedAuthority() {
    if (!folder_.empty()) umount2(folder_.c_str(), MNT_DETACH);
  }

  TrustedAuthority(const TrustedAuthority&) = delete;
  TrustedAuthority& operator=(const TrustedAuthority&) = delete;

 private:
  std::string folder_;
};

// Over TLS: the client breaks the handshake off.
inline Step ExpectRefusedHandshake() {
  return {"ExpectRefusedHandshake()",
          [](PeerConnection& peer, std::string* error) {
            std::string reason;
            if (!peer.Handshake(&reason)) return true;
            // The client's refusal may come behind its part of the handshake.
            if (peer.ReadMore() != PeerConnection::Read::kData) return true;
            *error = "the client accepted the certificate";
            return false;
          },
          false};
}

// A certificate that nobody but its own key signed, for 127.0.0.1.
class SelfSignedCertificate {
 public:
  SelfSignedCertificate() : key_(EVP_EC_gen("P-256")), certificate_(X509_new()) {
    X509_set_version(certificate_, X509_VERSION_3);
    X509_gmtime_adj(X509_getm_notBefore(certificate_), -3600);
    X509_gmtime_adj(X509_getm_notAfter(certificate_), 3600);
    X509_NAME* name = X509_get_subject_name(certificate_);
    X509_NAME_add_entry_by_txt(name, "CN", MBSTRING_ASC,
                               reinterpret_cast<const unsigned char*>("127.0.0.1"), -1, -1, 0);
    X509_set_issuer_name(certificate_, name);
    X509_set_pubkey(certificate_, key_);
    if (X509_sign(certificate_, key_, EVP_sha256()) == 0) ADD_FAILURE() << "no certificate";
    FILE* file = fopen(File().c_str(), "we");
    PEM_write_X509(file, certificate_);
    fclose(file);
  }

  ~SelfSignedCertificate() {
    X509_free(certificate_);
    EVP_PKEY_free(key_);
  }

  SelfSignedCertificate(const SelfSignedCertificate&) = delete;
  SelfSignedCertificate& operator=(const SelfSignedCertificate&) = delete;

  std::string File() const { return folder_.File("self.pem"); }
  X509* Certificate() const { return certificate_; }
  EVP_PKEY* Key() const { return key_; }

 private:
  TempDir folder_;
  EVP_PKEY* key_;
  X509* certificate_;
};

// A TLS server that shows a self-signed certificate to one client, which must refuse it.
class SelfSignedServer {
 public:
  SelfSignedServer() {
    const int listener = BindLoopback(&port_);
    listen(listener, 1);
    thread_ = std::thread([this, listener] { Run(listener); });
  }

  ~SelfSignedServer() { thread_.join(); }

  int Port() const { return port_; }

 private:
  void Run(int listener) {
    pollfd waiting = {listener, POLLIN, 0};
    const int fd = poll(&waiting, 1, 10000) > 0 ? accept(listener, nullptr, nullptr) : -1;
    SSL_CTX* context = SSL_CTX_new(TLS_server_method());
    SSL_CTX_use_certificate(context, certificate_.Certificate());
    SSL_CTX_use_PrivateKey(context, certificate_.Key());
    SSL* ssl = SSL_new(context);
    SSL_set_fd(ssl, fd);
    if (SSL_accept(ssl) == 1) ADD_FAILURE() << "the client accepted the certificate";
    SSL_free(ssl);
    SSL_CTX_free(context);
    if (fd >= 0) close(fd);
    close(listener);
  }

  const SelfSignedCertificate certificate_;
  int port_ = 0;
  std::thread thread_;
};

// For tests of what happens once in a process. False: the test ran in a process of its own, and
// this call has checked its result; the caller is done.
inline bool InFreshProcess() {
  const ::testing::UnitTest* all = ::testing::UnitTest::GetInstance();
  if (all->test_to_run_count() == 1) return true;
  const ::testing::TestInfo* test = all->current_test_info();
  const std::string name = std::string(test->test_suite_name()) + "." + test->name();
  std::string output;
  const ChildResult result =
      RunProgram({"/proc/self/exe", "--gtest_filter=" + name, "--gtest_output="}, &output);
  EXPECT_EQ(result.code, 0) << output;
  return false;
}

#endif  // TARNWICK_TESTS_HTTP_HTTP_TEST_UTIL_H_
