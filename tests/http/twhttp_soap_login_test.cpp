// The SOAP POST with credentials.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/http_test_util.h"
#include "tests/http/soap_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::HasSubstr;
using ::testing::IsEmpty;

}  // namespace

TEST(SendAuthReqBySocketPost, AChallengeOfDigestIsAnsweredWithDigestAfterTheType) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "no")), Exchange(Soap("second"))});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
  ExposedClient same(1, WithCredentials());
  same.m_strAuthenticate = kDigest;
  EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  EXPECT_EQ(peer.Received(1), RequestText(same.GenDigestAccessAuth("POST", "") + "\r\n", "x"));
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendAuthReqBySocketPost, ARetryThatCannotConnectLeavesTheBodyOfThe401) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "denied"))});
  ExposedClient client(peer.Port(), WithCredentials());
  Faults faults;
  faults.FailFrom(Call::kConnect, 2);
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_IO_ERROR, "denied", HTTP_RET_UNAUTHORIZED}));
}

// The credentials.

TEST(SendAuthReqBySocketPost, AResponseThatIsNo401EndsIt) {
  const std::pair<const char*, int> table[] = {{"200 OK", HTTP_RET_OK},
                                               {"302 Found", HTTP_RET_REDIRECT},
                                               {"403 No", HTTP_RET_BAD_RESPONSE},
                                               {"414 Long", HTTP_RET_URI_TOO_LONG}};
  for (const auto& [status, expected] : table) {
    ScriptedPeer peer(
        {Exchange(Soap("body", std::string(status) + "\r\nWWW-Authenticate: " + kDigest))});
    ClientSettings settings = WithCredentials();
    settings.basic_auth = true;  // plays no part here
    ExposedClient client(peer.Port(), settings);
    EXPECT_EQ(AuthOf(client), (SoapOutcome{expected, "body", expected}));
    EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  }
}

TEST(SendAuthReqBySocketPost, AChallengeOfBasicInAnyCaseIsAnsweredWithBasic) {
  for (const char* challenge : {"Basic realm=\"r\"", "BASIC", "x bAsIc"}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "no")), Exchange(Soap("second"))});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
    EXPECT_EQ(peer.Received(1), RequestText("Authorization: Basic dTpw\r\n", "x"));
  }
}

TEST(SendAuthReqBySocketPost, DigestIsTestedBeforeBasicAndAnywhereInTheChallenge) {
  for (const char* challenge : {"Digest realm=\"basic\"", "Basic realm=\"dIgEsT\""}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "no")), Exchange(Soap("second"))});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(AuthOf(client).result, HTTP_RET_OK);
    EXPECT_THAT(peer.Received(1), HasSubstr("utf-8\r\nAuthorization: Digest username=\"u\""));
  }
}

TEST(SendAuthReqBySocketPost, AChallengeOfNeitherGetsNoSecondRequest) {
  ScriptedPeer peer({Exchange(Unauthorized("Bearer x", "no"))});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_UNAUTHORIZED, "no", HTTP_RET_UNAUTHORIZED}));
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendAuthReqBySocketPost, A401WithoutABodyIsAnsweredToo) {
  for (const char* challenge : {kDigest, "Basic x"}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "")), Exchange(Soap("second"))});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
    EXPECT_EQ(peer.Connections(), 2u);
  }
}

TEST(SendAuthReqBySocketPost, A401WithoutABodyAndWithoutAKnownSchemeIsAnIoError) {
  ScriptedPeer peer({Exchange(Unauthorized("Bearer x", ""))});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_UNAUTHORIZED}));
}

TEST(SendAuthReqBySocketPost, ASecond401GoesBackToTheCaller) {
  ScriptedPeer peer(
      {Exchange(Unauthorized(kDigest, "first")), Exchange(Unauthorized(kDigest, "second"))});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_UNAUTHORIZED, "second", HTTP_RET_UNAUTHORIZED}));
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendAuthReqBySocketPost, AnUnreadFirstBodyIsClosedWithItsConnection) {
  ScriptedPeer peer(
      {{ExpectRequest(), Send("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\nunread"),
        DiscardUntilEnd()},
       Exchange(Soap("second"))});
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
}

TEST(SendAuthReqBySocketPost, AfterAnEarlier401AFailedConnectIsRetriedWithTheCredentials) {
  ScriptedPeer peer({Exchange(Soap("late"))});
  ExposedClient client(peer.Port(), WithCredentials());
  client.m_result = HTTP_RET_UNAUTHORIZED;
  client.m_strAuthenticate = " Basic x";
  Faults faults;
  faults.FailNth(Call::kConnect, 1);
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_OK, "late", HTTP_RET_OK}));
  EXPECT_EQ(peer.Received(0), RequestText("Authorization: Basic dTpw\r\n", "x"));
}

TEST(SendAuthReqBySocketPost, AnEmptyBodyIsAnErrorBeforeAndAfterA401) {
  ExposedClient client(1, WithCredentials());
  std::string response = "old";
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendAuthReqBySocketPost("", response), HTTP_RET_IO_ERROR);
  client.m_result = HTTP_RET_UNAUTHORIZED;
  client.m_strAuthenticate = " Basic x";
  EXPECT_EQ(client.SendAuthReqBySocketPost("", response), HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_EQ(response, "old");
  EXPECT_EQ(client.m_strAuthorization, "Authorization: Basic dTpw");
  EXPECT_EQ(log.Messages().size(), 3u);  // the retry says it once more
}

TEST(SendAuthReqBySocketPost, ItLogsNothingOfItsOwn) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "")), Exchange(Unauthorized(kDigest, ""))});
  ExposedClient client(peer.Port(), WithCredentials());
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  AuthOf(client);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}
