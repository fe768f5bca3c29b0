// Helpers for the tests of the HTTP client.
#ifndef TARNWICK_TESTS_HTTP_HTTP_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_HTTP_TEST_UTIL_H_

#include <curl/curl.h>
#include <gtest/gtest.h>
#include <sys/mount.h>

#include <memory>
#include <string>
#include <vector>

#include "tarnwick/http/twhttp.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
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
class ExposedClient : public TWHttpClient {
 public:
  ExposedClient() = default;
  explicit ExposedClient(int port, const ClientSettings& s = {})
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

// A client that has sent a GET to a peer which answered with `response` and closed.
inline std::unique_ptr<ExposedClient> ClientAfter(const std::string& response) {
  ScriptedPeer peer({Exchange(response)});
  auto client = std::make_unique<ExposedClient>(peer.Port());
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

// What one function of the client has logged, without the lines of others.
inline std::vector<LogLine> LinesOf(const LogCapture& log, const std::string& function) {
  std::vector<LogLine> lines;
  for (const LogLine& line : log.Lines("http")) {
    if (line.function == function) lines.push_back(line);
  }
  return lines;
}

MATCHER_P3(IsHttpLog, level, function, message, "") {
  return arg.category == "http" && arg.level == level && arg.source == "twhttp" &&
         arg.function == function && arg.message == message;
}

// Makes libcurl trust one authority and no other: covers the system's certificate directory, inside
// the sandbox, for as long as it lives.
class TrustedAuthority {
 public:
  explicit TrustedAuthority(const std::string& ca_file) {
    const char* bundle = curl_version_info(CURLVERSION_NOW)->cainfo;
    const std::string path = bundle != nullptr ? bundle : "/etc/ssl/certs/ca-certificates.crt";
    directory_ = path.substr(0, path.rfind('/'));
    if (mount("tmpfs", directory_.c_str(), "tmpfs", 0, "mode=755") != 0) {
      ADD_FAILURE() << "cannot cover " << directory_ << " (the package openssl makes it)";
      directory_.clear();
      return;
    }
    WriteFile(path, ReadFile(ca_file));
  }

  ~TrustedAuthority() {
    if (!directory_.empty()) umount2(directory_.c_str(), MNT_DETACH);
  }

  TrustedAuthority(const TrustedAuthority&) = delete;
  TrustedAuthority& operator=(const TrustedAuthority&) = delete;

 private:
  std::string directory_;
};

// Over TLS: the client breaks the handshake off.
inline Step ExpectRefusedHandshake() {
  return {"ExpectRefusedHandshake()",
          [](PeerConnection& peer, std::string* error) {
            std::string reason;
            if (!peer.Handshake(&reason)) return true;
            // The client's refusal may come after its part of the handshake.
            if (peer.ReadMore() != PeerConnection::Read::kData) return true;
            *error = "the client accepted the certificate";
            return false;
          },
          false};
}

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
