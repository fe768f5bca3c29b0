// SendRequest: by method, and with one answer to a challenge.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/challenge_words.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace tarnwick;

namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\n\r\nbody";
constexpr char kBasicLine[] = "Authorization: Basic dTpw\r\n";
constexpr char kDigestStart[] = "Authorization: Digest username=\"u\", realm=\"r\", nonce=\"n\"";
constexpr char kDigest[] = "Digest realm=\"r\", nonce=\"n\", qop=\"auth\"";

std::string Unauthorized(const std::string& challenge) {
  return "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: " + challenge +
         "\r\nContent-Length: 6\r\n\r\nunread";
}

Script Challenge(const std::string& challenge) {
  return {ExpectRequest(), Send(Unauthorized(challenge)), DiscardUntilEnd()};
}

ClientSettings WithCredentials(bool basic_auth = false) {
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  settings.basic_auth = basic_auth;
  return settings;
}

const auto kNoAuthorization = Not(HasSubstr("Authorization"));

}  // namespace

TEST(SendRequest, AChallengeOfDigestIsAnsweredWithDigestOnANewConnection) {
  ScriptedPeer peer({Challenge(kDigest), Exchange(kOk)});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  EXPECT_EQ(client.m_statusCode, 200);
  EXPECT_EQ(ReadBody(client), "body");
  EXPECT_THAT(peer.Received(0), kNoAuthorization);
  EXPECT_THAT(peer.Received(1), AllOf(HasSubstr(kDigestStart), HasSubstr("uri=\"/a.cgi\"")));
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendRequest, AChallengeOfBasicInAnyCaseIsAnsweredWithBasic) {
  for (const char* challenge : {"BASIC realm=\"r\"", "basic", "Basic realm=r", "bAsIc"}) {
    ScriptedPeer peer({Challenge(challenge), Exchange(kOk)});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_THAT(peer.Received(0), kNoAuthorization);
    EXPECT_THAT(peer.Received(1), HasSubstr(kBasicLine));
  }
}

TEST(SendRequest, AChallengeOfBearerGetsNoSecondRequestAndStaysUnauthorized) {
  ScriptedPeer peer({Challenge("Bearer realm=\"r\"")});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
  EXPECT_EQ(client.m_statusCode, 401);
  client.m_pSocket->Disconnect();
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendRequest, AnyOtherMethodNeverTouchesTheSocket) {
  for (const int method : {1, 2, -1, 77}) {
    ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n")});
    ClientSettings settings = WithCredentials(true);
    settings.path = "x.cgi?a=1";
    ExposedClient client(peer.Port(), settings);
    Faults faults;
    EXPECT_EQ(client.SendRequest(static_cast<TW_HTTP_METHOD>(method), "?"), HTTP_RET_OK);
    EXPECT_EQ(faults.Count(Call::kConnect), 0);
    EXPECT_EQ(faults.Count(Call::kSocket), 1);  // libcurl's, which connects it
    EXPECT_FALSE(client.m_pSocket->IsConnected());
    EXPECT_EQ(client.m_strAuthorization, "");
    EXPECT_THAT(peer.Received(0), AllOf(StartsWith("POST /x.cgi HTTP/1.1\r\n"), HasSubstr("a=1")));
  }
}

TEST(SendRequest, AfterAnUnauthorizedResponseAFailedConnectIsRetriedWithAuthorization) {
  const std::pair<const char*, const char*> table[] = {{kDigest, kDigestStart},
                                                       {"Basic realm=\"r\"", kBasicLine}};
  for (const auto& [challenge, authorization] : table) {
    ScriptedPeer peer({Challenge(challenge), Challenge(challenge), Exchange(kOk)});
    ExposedClient client(peer.Port(), WithCredentials());
    client.SendRequest(HTTP_METHOD_GET, "?");
    EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
    Faults faults;
    faults.FailNth(Call::kConnect, 1);
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_EQ(faults.Count(Call::kConnect), 2);
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_THAT(peer.Received(2), HasSubstr(authorization));
  }
}

TEST(SendRequest, AfterAnUnauthorizedResponseTwoFailedConnectsAreAnIoError) {
  ScriptedPeer peer({Challenge(kDigest), Challenge(kDigest)});
  ExposedClient client(peer.Port(), WithCredentials());
  client.SendRequest(HTTP_METHOD_GET, "?");
  Faults faults;
  faults.FailFrom(Call::kConnect, 1);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 2);
  EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
}

TEST(ContainsIgnoreCase, EmptyTextsAndAnyCase) {
  EXPECT_FALSE(ContainsIgnoreCase("", ""));
  EXPECT_TRUE(ContainsIgnoreCase("x", ""));
  EXPECT_TRUE(ContainsIgnoreCase("Digest realm", "DIGEST"));
}

TEST(ContainsIgnoreCase, TheWordMayStandAnywhereAndOnlyAsAWhole) {
  EXPECT_TRUE(ContainsIgnoreCase(" xDiGeSt", "digest"));
  EXPECT_TRUE(ContainsIgnoreCase("digdigest", "digest"));
  EXPECT_FALSE(ContainsIgnoreCase("diges t", "digest"));
  EXPECT_FALSE(ContainsIgnoreCase("diges", "digest"));
  EXPECT_FALSE(ContainsIgnoreCase("", "x"));
}

TEST(CharEqualsIgnoreCase, BytesAreComparedAsTheCLibraryLowersThem) {
  for (int a = 0; a < 256; ++a) {
    for (int b = 0; b < 256; ++b) {
      EXPECT_EQ(CharEqualsIgnoreCase(static_cast<char>(a), static_cast<char>(b)),
                tolower(a) == tolower(b));
    }
  }
}

// The decision table, row by row.

TEST(SendRequestTable, OtherMethodReturnsTheResultOfTheCurlPost) {
  const ClosedPort port;
  ExposedClient client(port.Port(), WithCredentials(true));
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_POST, "?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
}

TEST(SendRequestTable, OtherMethodPassesItsArgumentAsTheSeparators) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n")});
  ClientSettings settings;
  settings.path = "x?a#b=1";
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_POST, "#"), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(0),
              AllOf(StartsWith("POST /x?a HTTP/1.1\r\n"), ::testing::EndsWith("\r\n\r\nb=1")));
}

TEST(SendRequestTable, WithoutBasicAuthAResponseThatIsNo401EndsIt) {
  for (const char* status : {"200 OK", "403 Forbidden", "302 Found", "500 Oops"}) {
    ScriptedPeer peer({Exchange("HTTP/1.1 " + std::string(status) +
                                "\r\nWWW-Authenticate: Digest realm=\"r\"\r\n\r\n")});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_EQ(peer.Received(0), "GET /a.cgi HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n\r\n");
  }
}

TEST(SendRequestTable, WithBasicAuthTheFirstGetCarriesBasic) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port(), WithCredentials(true));
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  EXPECT_EQ(peer.Received(0), "GET /a.cgi HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n" +
                                  std::string(kBasicLine) + "\r\n");
  EXPECT_EQ(client.m_strAuthorization, "");
}

TEST(SendRequestTable, A401OfDigestGetsASecondGetWithOrWithoutBasicAuth) {
  for (const bool basic_auth : {false, true}) {
    for (const char* challenge : {kDigest, "DIGEST realm=\"r\", nonce=\"n\""}) {
      ScriptedPeer peer({Challenge(challenge), Exchange(kOk)});
      ExposedClient client(peer.Port(), WithCredentials(basic_auth));
      EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
      EXPECT_EQ(peer.Received(0).find(kBasicLine) != std::string::npos, basic_auth);
      EXPECT_THAT(peer.Received(1), AllOf(HasSubstr(kDigestStart), Not(HasSubstr("Basic"))));
    }
  }
}

TEST(SendRequestTable, A401OfBasicGetsASecondGetWithOrWithoutBasicAuth) {
  for (const bool basic_auth : {false, true}) {
    ScriptedPeer peer({Challenge("Basic realm=\"r\""), Exchange(kOk)});
    ExposedClient client(peer.Port(), WithCredentials(basic_auth));
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_EQ(peer.Received(0).find(kBasicLine) != std::string::npos, basic_auth);
    EXPECT_THAT(peer.Received(1), HasSubstr(kBasicLine));
  }
}

TEST(SendRequestTable, A401OfNeitherEndsItWithOrWithoutBasicAuth) {
  for (const bool basic_auth : {false, true}) {
    ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\n\r\n")});
    ExposedClient client(peer.Port(), WithCredentials(basic_auth));
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
    EXPECT_EQ(client.m_strAuthenticate, "");
    peer.Finish();
    EXPECT_EQ(peer.Connections(), 1u);
  }
}

TEST(SendRequestTable, DigestIsTestedBeforeBasicAndAnywhereInTheChallenge) {
  const std::pair<const char*, const char*> table[] = {
      {"Digest realm=\"r\", nonce=\"n\", opaque=\"basic\"", "Authorization: Digest "},
      {"Basic realm=\"digest\"", "Authorization: Digest "},
      {"Negotiate x=\"baSic\"", "Authorization: Basic "},
      {"Bearer realm=\"adigestb\"", "Authorization: Digest "}};
  for (const auto& [challenge, authorization] : table) {
    ScriptedPeer peer({Challenge(challenge), Exchange(kOk)});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
    EXPECT_THAT(peer.Received(1), HasSubstr(authorization)) << challenge;
  }
}

TEST(SendRequest, TheLastOfSeveralChallengesDecides) {
  ScriptedPeer peer(
      {Challenge("Digest realm=\"r\"\r\nWWW-Authenticate: Basic realm=\"r\""), Exchange(kOk)});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(1), HasSubstr(kBasicLine));
}

TEST(SendRequest, ASecond401GoesBackToTheCaller) {
  ScriptedPeer peer({Challenge(kDigest), Challenge(kDigest)});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
  int status = 0;
  EXPECT_EQ(client.CheckResponse(status), HTTP_RET_UNAUTHORIZED);
  EXPECT_EQ(status, 401);
  client.m_pSocket->Disconnect();
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendRequest, TheRetryReturnsItsOwnFailure) {
  ScriptedPeer peer({Challenge(kDigest)});
  ExposedClient client(peer.Port(), WithCredentials());
  Faults faults;
  faults.FailFrom(Call::kConnect, 2);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
  EXPECT_THAT(client.m_strAuthorization, StartsWith(kDigestStart));
}

TEST(SendRequest, ItLogsNothingOfItsOwn) {
  ScriptedPeer peer({Challenge("Bearer x")});
  ExposedClient client(peer.Port(), WithCredentials());
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  client.SendRequest(HTTP_METHOD_GET, "?");
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(SendRequest, ForAGetTheArgumentIsIgnored) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientSettings settings;
  settings.path = "x?a=1";
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(0), StartsWith("GET /x?a=1 HTTP/1.0\r\n"));
}

TEST(SendRequest, WithoutMemoryForTheBasicCredentialsItIsAnIoErrorAndNothingIsThrown) {
  const ClosedPort port;
  ExposedClient client(port.Port(), WithCredentials(true));
  Faults faults;
  faults.FailFrom(Call::kMalloc, 1);
  int result = -1;
  EXPECT_NO_THROW(result = client.SendRequest(HTTP_METHOD_GET, "?"));
  EXPECT_EQ(result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
}
