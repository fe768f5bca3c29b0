// What the tests of the SOAP POST share.
#ifndef TARNWICK_TESTS_HTTP_SOAP_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_SOAP_TEST_UTIL_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/http_test_util.h"

inline constexpr char kSoapType[] = "Content-Type: application/soap+xml; charset=utf-8\r\n";
inline constexpr char kDigest[] = "Digest realm=\"r\", nonce=\"n\"";
inline constexpr int kMebibyte = 1 << 20;

// A response that announces `announced` bytes.
inline std::string Announcing(const std::string& announced, const std::string& body,
                              const std::string& status = "200 OK") {
  return "HTTP/1.1 " + status + "\r\nContent-Length: " + announced + "\r\n\r\n" + body;
}

inline std::string Soap(const std::string& body, const std::string& status = "200 OK") {
  return Announcing(std::to_string(body.size()), body, status);
}

inline std::string Unauthorized(const std::string& challenge, const std::string& body) {
  return Soap(body, "401 No\r\nWWW-Authenticate: " + challenge);
}

inline std::string RequestText(const std::string& authorization, const std::string& body) {
  return "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\n" + std::string(kSoapType) + authorization +
         "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

inline ClientSettings WithCredentials() {
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  return settings;
}

struct SoapOutcome {
  int result = -1;
  std::string response = "old";
  int kept = -1;  // the client's m_result
};

inline bool operator==(const SoapOutcome& a, const SoapOutcome& b) {
  return a.result == b.result && a.response == b.response && a.kept == b.kept;
}

inline std::ostream& operator<<(std::ostream& out, const SoapOutcome& outcome) {
  return out << outcome.result << ", response [" << outcome.response.substr(0, 200) << "] of "
             << outcome.response.size() << " bytes, kept " << outcome.kept;
}

inline SoapOutcome SoapOf(const std::string& response, const ClientSettings& settings = {}) {
  ScriptedPeer peer({Exchange(response)});
  ExposedClient client(peer.Port(), settings);
  SoapOutcome outcome;
  outcome.result = client.SendReqBySocketPost("x", outcome.response);
  outcome.kept = client.m_result;
  return outcome;
}

inline SoapOutcome AuthOf(ExposedClient& client) {
  SoapOutcome outcome;
  outcome.result = client.SendAuthReqBySocketPost("x", outcome.response);
  outcome.kept = client.m_result;
  return outcome;
}

#endif  // TARNWICK_TESTS_HTTP_SOAP_TEST_UTIL_H_
