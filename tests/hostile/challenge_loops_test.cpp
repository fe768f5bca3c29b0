// Servers that are never content with the credentials, and challenges for libcurl.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tests/hostile/challenge_cases.h"
#include "tests/hostile/hostile_util.h"
#include "tests/model/digest.h"

namespace {

using ::testing::HasSubstr;

// Servers that are never content.
struct LoopCase {
  std::string name;
  int calls;                           // of SendRequest with one client
  std::vector<std::string> responses;  // one a connection
  std::vector<std::string> marks;      // that the request of each connection holds; "": no login
  Outcome last;
  bool basic_first = false;
};

std::ostream& operator<<(std::ostream& out, const LoopCase& test) {
  return out << test.name;
}

std::string DigestRefusal(const std::string& nonce, const std::string& more = "") {
  return Refusal(Line("Digest realm=\"r\", nonce=\"" + nonce + "\"" + more));
}

std::string WithNonce(const std::string& nonce) {
  return "nonce=\"" + nonce + "\"";
}

const Outcome kRefused = Sent(HTTP_RET_UNAUTHORIZED, 401, "");
const std::string kBasicCredentials = "Authorization: Basic dXNlcjpwYXNz\r\n";
const std::string kBasicRefusal = Refusal(Line("Basic realm=\"r\""));

const LoopCase kLoops[] = {
    {"DigestForEver", 1, {DigestRefusal("1"), DigestRefusal("1")}, {"", WithNonce("1")}, kRefused},
    {"BasicForEver", 1, {kBasicRefusal, kBasicRefusal}, {"", kBasicCredentials}, kRefused},
    {"BasicForEverAlthoughSentAtOnce",
     1,
     {kBasicRefusal, kBasicRefusal},
     {kBasicCredentials, kBasicCredentials},
     kRefused,
     true},
    {"NonceThatIsAlwaysStale",
     1,
     {DigestRefusal("1", ", stale=true"), DigestRefusal("2", ", stale=true")},
     {"", WithNonce("1")},
     kRefused},
    {"NonceThatChangesEachTime",
     3,
     {DigestRefusal("1"), DigestRefusal("2"), DigestRefusal("3"), DigestRefusal("4"),
      DigestRefusal("5"), DigestRefusal("6")},
     {"", WithNonce("1"), "", WithNonce("3"), "", WithNonce("5")},
     kRefused},
    {"SchemeThatChangesEachTime",
     2,
     {kBasicRefusal, DigestRefusal("1"), DigestRefusal("2"), kBasicRefusal},
     {"", kBasicCredentials, "", WithNonce("2")},
     kRefused},
    {"A407",
     1,
     {"HTTP/1.1 407 Proxy\r\n" + Line("Basic") + "\r\n"},
     {""},
     Sent(HTTP_RET_BAD_RESPONSE, 407, "")},
    {"A407AfterTheLogin",
     1,
     {kBasicRefusal, "HTTP/1.1 407 Proxy\r\n" + Line("Basic") + "\r\n"},
     {"", kBasicCredentials},
     Sent(HTTP_RET_BAD_RESPONSE, 407, "")},
    {"A401WithinASuccess", 1, {"HTTP/1.1 200 401\r\n" + Line("Basic") + "\r\n"}, {""}, Success("")},
    {"ARedirectAfterTheLogin",
     1,
     {kBasicRefusal, "HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1/\r\n\r\n"},
     {"", kBasicCredentials},
     Sent(HTTP_RET_REDIRECT, 302, "")},
    {"NothingAfterTheLogin",
     1,
     {kBasicRefusal, ""},
     {"", kBasicCredentials},
     Sent(HTTP_RET_IO_ERROR, 0, "")},
    {"ARefusalWithoutAChallengeAfterTheLogin",
     2,
     {kBasicRefusal, Refusal(""), Refusal("")},
     {"", kBasicCredentials, ""},
     kRefused},
};

std::vector<Script> ExchangesOf(const LoopCase& test) {
  std::vector<Script> scripts;
  for (const std::string& response : test.responses) scripts.push_back(Exchange(response));
  return scripts;
}

class ChallengeLoops : public ::testing::TestWithParam<LoopCase> {};

// libcurl answers challenges by itself; what it makes of broken ones is its own business, but for
// the number of its requests, their heads and the result.

struct CurlCase {
  std::string name;
  std::vector<std::string> responses;  // one a request, each on a connection of its own
  int result;
};

std::ostream& operator<<(std::ostream& out, const CurlCase& test) {
  return out << test.name;
}

const std::string kCurlOk = "HTTP/1.1 200 OK\r\nConnection: close\r\nContent-Length: 0\r\n\r\n";

std::string CurlRefusal(const std::string& lines) {
  return Refusal(lines + "Connection: close\r\nContent-Length: 0\r\n");
}

std::vector<CurlCase> CurlTable() {
  const std::string sound = "Digest realm=\"r\", nonce=\"n\", qop=\"auth\"";
  const int ok = HTTP_RET_OK;
  const int refused = HTTP_RET_IO_ERROR;
  return {
      {"Sound", {CurlRefusal(Line(sound)), kCurlOk}, ok},
      {"NoChallenge", {CurlRefusal("")}, refused},
      {"DigestForEver", {CurlRefusal(Line(sound)), CurlRefusal(Line(sound))}, refused},
      {"DigestWithoutANonce", {CurlRefusal(Line("Digest realm=\"r\""))}, refused},
      {"BearerAlone", {CurlRefusal(Line("Bearer realm=\"r\""))}, refused},
      {"UnknownAlgorithm", {CurlRefusal(Line(sound + ", algorithm=QUEN"))}, refused},
      {"AQopOfControlBytes",
       {CurlRefusal(Line("Digest realm=\"r\", nonce=\"n\", qop=\"\x01\x7f\"")), kCurlOk},
       ok},
      {"AQuoteInTheRealm",
       {CurlRefusal(Line("Digest realm=\"a\\\"b\", nonce=\"n\"")), kCurlOk},
       ok},
      {"AChallengeOf64KB",
       {CurlRefusal(Line(sound + ", x=\"" + std::string(kLongest, 'x') + "\"")), kCurlOk},
       ok},
      {"ARedirectThatIsNotFollowed",
       {"HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1:1/\r\nConnection: close\r\n"
        "Content-Length: 0\r\n\r\n"},
       refused},
      {"AProxysChallenge",
       {"HTTP/1.1 407 Proxy\r\nProxy-Authenticate: Basic\r\nConnection: close\r\n"
        "Content-Length: 0\r\n\r\n"},
       refused},
      {"AZeroByteInTheChallenge",
       {Refusal("WWW-Authenticate: Digest realm=\"r" + std::string(1, '\0') + "\"\r\n")},
       refused},
  };
}

class CurlChallenges : public ::testing::TestWithParam<CurlCase> {};

}  // namespace

TEST_P(ChallengeLoops, EndAfterOneAuthorizationPerCall) {
  const LoopCase& test = GetParam();
  ScriptedPeer peer(ExchangesOf(test));
  Outcome outcome;
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.user = "user";
    settings.password = "pass";
    settings.basic_auth = test.basic_first;
    ExposedClient client(peer.Port(), settings);
    for (int i = 0; i < test.calls; ++i) {
      outcome = OutcomeOf(client, client.SendRequest(HTTP_METHOD_GET, ""));
    }
  });
  EXPECT_EQ(outcome, test.last);
  for (size_t i = 0; i < test.marks.size(); ++i) {
    const std::string request = peer.Received(i);
    EXPECT_THAT(request, HasSubstr(test.marks[i])) << i;
    EXPECT_EQ(request.find("Authorization") == std::string::npos, test.marks[i].empty()) << i;
  }
}

INSTANTIATE_TEST_SUITE_P(Hostile, ChallengeLoops, ::testing::ValuesIn(kLoops), NameOf<LoopCase>);

TEST_P(CurlChallenges, EndAsTheTableSays) {
  const CurlCase& test = GetParam();
  std::vector<Script> scripts;
  for (const std::string& response : test.responses) scripts.push_back(Exchange(response));
  ScriptedPeer peer(scripts);
  int result = -1;
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.user = "user";
    settings.password = "pass";
    result = ExposedClient(peer.Port(), settings).SendReqByXMLGet(5);
  });
  EXPECT_EQ(result, test.result);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), test.responses.size());
  for (size_t i = 0; i < test.responses.size(); ++i) ExpectOneHead({}, peer.Received(i));
}

INSTANTIATE_TEST_SUITE_P(Hostile, CurlChallenges, ::testing::ValuesIn(CurlTable()),
                         NameOf<CurlCase>);
