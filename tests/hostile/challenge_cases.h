// Challenges, and the requests that must follow them.
#ifndef TARNWICK_TESTS_HOSTILE_CHALLENGE_CASES_H_
#define TARNWICK_TESTS_HOSTILE_CHALLENGE_CASES_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/evp.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/model/digest.h"

inline constexpr size_t kLongest = 64 << 10;
inline constexpr size_t kLineLimit = 2047;     // of a header line that the client reads
inline constexpr size_t kRequestLimit = 2047;  // of a GET that it sends
inline constexpr char kPath[] = "a.cgi";
inline constexpr char kSoapBody[] = "<q/>";

enum class Scheme { kNone, kBasic, kDigest };

// What the client has to understand of a challenge.
struct Challenge {
  Scheme scheme = Scheme::kNone;
  std::string realm = {};
  std::string nonce = {};
  std::string qop = {};
  std::string opaque = {};
  std::string algorithm = {};
};

struct ChallengeCase {
  std::string name;
  std::string lines;                     // the header lines of the 401
  Challenge challenge;                   // as the client must take it; kNone: no request follows
  int response = HTTP_RET_UNAUTHORIZED;  // what CheckResponse returns when none follows
  std::string cookie = {};               // that the request that follows carries
  std::string user = "user";
  std::string password = "pass";
};

inline std::ostream& operator<<(std::ostream& out, const ChallengeCase& test) {
  return out << test.name;
}

inline std::string Line(const std::string& challenge) {
  return "WWW-Authenticate: " + challenge + "\r\n";
}

inline std::string Ha2(const std::string& method, const std::string& qop) {
  const std::string uri = std::string("/") + kPath;
  return qop == "auth-int" ? AuthIntHa2(method, uri) : Md5(method + ":" + uri);
}

inline std::string ResponseOf(const ChallengeCase& test, const std::string& method,
                              const std::string& cnonce) {
  const Challenge& challenge = test.challenge;
  const bool counted = challenge.qop == "auth" || challenge.qop == "auth-int";
  return Md5(Md5(test.user + ":" + challenge.realm + ":" + test.password) + ":" + challenge.nonce +
             (counted ? ":00000001:" + cnonce + ":" + challenge.qop : "") + ":" +
             Ha2(method, challenge.qop));
}

inline std::string DigestLine(const ChallengeCase& test, const std::string& method,
                              const std::string& cnonce) {
  const Challenge& challenge = test.challenge;
  std::string line = "Authorization: Digest username=\"" + test.user + "\", realm=\"" +
                     challenge.realm + "\", nonce=\"" + challenge.nonce + "\", uri=\"/" + kPath +
                     "\", response=\"" + ResponseOf(test, method, cnonce) + "\"";
  if (!challenge.qop.empty()) {
    line += ", qop=" + challenge.qop + ", nc=00000001, cnonce=\"" + cnonce + "\"";
  }
  if (!challenge.algorithm.empty()) line += ", algorithm=\"" + challenge.algorithm + "\"";
  if (!challenge.opaque.empty()) line += ", opaque=\"" + challenge.opaque + "\"";
  return line + "\r\n";
}

inline std::string BasicLine(const ChallengeCase& test) {
  const std::string pair = test.user + ":" + test.password;
  const std::string text = pair.c_str();  // up to its first zero byte
  std::string encoded((text.size() + 2) / 3 * 4, '\0');
  EVP_EncodeBlock(reinterpret_cast<unsigned char*>(encoded.data()),
                  reinterpret_cast<const unsigned char*>(text.data()),
                  static_cast<int>(text.size()));
  return "Authorization: Basic " + encoded + "\r\n";
}

// The client's nonce in a request; one of its length when the request was cut before it.
inline std::string ClientNonce(const std::string& request) {
  static const std::string mark = "cnonce=\"";
  const size_t found = request.find(mark);
  return found == std::string::npos ? std::string(32, '0')
                                    : request.substr(found + mark.size(), 32);
}

inline std::string AuthorizationLine(const ChallengeCase& test, const std::string& method,
                                     const std::string& request) {
  if (test.challenge.scheme == Scheme::kNone) return "";
  if (test.challenge.scheme == Scheme::kBasic) return BasicLine(test);
  return DigestLine(test, method, ClientNonce(request));
}

// The GET that follows; `sent` is what came, for the client's own nonce in it.
inline std::string ExpectedGet(const ChallengeCase& test, const std::string& sent) {
  const std::string cookie = test.cookie.empty() ? "" : "Cookie: " + test.cookie + "\r\n";
  const std::string request = std::string("GET /") + kPath +
                              " HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n" + cookie +
                              AuthorizationLine(test, "GET", sent) + "\r\n";
  // A zero byte ends the text that is sent.
  return std::string(request.c_str()).substr(0, kRequestLimit);
}

inline std::string ExpectedPost(const ChallengeCase& test, const std::string& sent) {
  std::string request = std::string("POST /") + kPath +
                        " HTTP/1.1\r\nHost: 127.0.0.1\r\n"
                        "Content-Type: application/soap+xml; charset=utf-8\r\n" +
                        AuthorizationLine(test, "POST", sent) + "Content-Length: 4\r\n\r\n" +
                        kSoapBody;
  // The length stays, and zero bytes stand in for what a zero byte has ended.
  std::fill(std::find(request.begin(), request.end(), '\0'), request.end(), '\0');
  return request;
}

// Nothing that came from the server may end the head of a request, or a line of it.
inline void ExpectOneHead(const ChallengeCase& test, const std::string& request) {
  const std::string ends("\r\n\0", 3);
  const bool spoilt_by_daemon = test.user.find_first_of(ends) != std::string::npos;
  const bool cut = request.size() == kRequestLimit;
  if (spoilt_by_daemon || cut) return;
  const size_t end = request.find("\r\n\r\n");
  ASSERT_NE(end, std::string::npos);
  std::string head = request.substr(0, end);
  for (size_t i; (i = head.find("\r\n")) != std::string::npos;) head.erase(i, 2);
  EXPECT_THAT(head, ::testing::Not(::testing::HasSubstr("\r")));
  EXPECT_THAT(head, ::testing::Not(::testing::HasSubstr("\n")));
  EXPECT_THAT(head, ::testing::Not(::testing::HasSubstr(std::string(1, '\0'))));
}

inline std::string Refusal(const std::string& lines) {
  return "HTTP/1.1 401 Unauthorized\r\n" + lines + "\r\n";
}

template <typename Case>
inline std::string NameOf(const ::testing::TestParamInfo<Case>& info) {
  return info.param.name;
}

#endif  // TARNWICK_TESTS_HOSTILE_CHALLENGE_CASES_H_
