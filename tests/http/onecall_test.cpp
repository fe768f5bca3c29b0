// SendHttpGet and SendHttpsGet.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>

#include "tarnwick/log/twdebuglog.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;

std::string Ok(const std::string& body) {
  return "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

// The result of SendHttpGet when the server answers with `response`.
int GetOf(const std::string& response) {
  ScriptedPeer peer({Exchange(response)});
  Json::Value result;
  return SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false);
}

// The result of SendHttpsGet when the server answers with `response`.
int HttpsGetOf(const std::string& response) {
  TlsScriptedPeer peer({Exchange(response)});
  const TrustedAuthority trusted(peer.CaFile());
  Json::Value result;
  return SendHttpsGet("127.0.0.1", peer.Port(), "api", result, 10);
}

// The request target that SendHttpGet sends for a path.
std::string TargetOf(const std::string& path, bool encode_query) {
  ScriptedPeer peer({Exchange(Ok("{\"success\":true}"))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), path, result, 5, encode_query), 0);
  const std::string request = peer.Received(0);
  return request.substr(4, request.find(" HTTP/1.0\r\n") - 4);
}

}  // namespace

TEST(SendHttpGet, SuccessTrueFalseMissingAndNoJson) {
  EXPECT_EQ(GetOf(Ok("{\"success\":true}")), 0);
  EXPECT_EQ(GetOf(Ok("{\"success\":false}")), -2);
  EXPECT_EQ(GetOf(Ok("{\"data\":1}")), -2);
  EXPECT_EQ(GetOf(Ok("no json")), -2);
}

TEST(SendHttpsGet, SuccessTrueFalseMissingAndNoJson) {
  EXPECT_EQ(HttpsGetOf(Ok("{\"success\":true}")), 0);
  EXPECT_EQ(HttpsGetOf(Ok("{\"success\":false}")), -3);
  EXPECT_EQ(HttpsGetOf(Ok("{\"data\":1}")), -3);
  EXPECT_EQ(HttpsGetOf(Ok("no json")), -3);
}

TEST(SendHttpGet, AnEmptyBodyIsAFailureAndLogged) {
  LogCapture log;
  EXPECT_EQ(GetOf(Ok("")), -1);
  EXPECT_THAT(LinesOf(log, "SendHttpGet"),
              ElementsAre(IsHttpLog("error", "SendHttpGet", "Read Buffer Error\n")));
}

TEST(SendHttpsGet, AnEmptyBodyIsSuccessAndLeavesTheResult) {
  TlsScriptedPeer peer({Exchange(Ok(""))});
  const TrustedAuthority trusted(peer.CaFile());
  Json::Value result = "kept";
  EXPECT_EQ(SendHttpsGet("127.0.0.1", peer.Port(), "api", result, 10), 0);
  EXPECT_EQ(result.asString(), "kept");
}

TEST(SendHttpGet, WithoutEncodingLineFeedsAreRemovedFromThePath) {
  EXPECT_EQ(TargetOf("\na\nb?x=\n1 2\n", false), "/ab?x=1 2");
}

TEST(SendHttpGet, WithEncodingLineFeedsStayAndTheValuesAreEncoded) {
  EXPECT_EQ(TargetOf("a\nb?x=\n1 2/", true), "/a\nb?x=%201%202%2F");
}

TEST(SendHttpsGet, AServerWithASelfSignedCertificateIsMinusTwo) {
  TlsOptions tls;
  tls.self_signed = true;
  TlsScriptedPeer peer({{ExpectRefusedHandshake()}}, tls);
  const TrustedAuthority trusted(peer.CaFile());
  Json::Value result;
  LogCapture log;
  EXPECT_EQ(SendHttpsGet("127.0.0.1", peer.Port(), "api", result, 10), -2);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByCurl",
                                    "Failed to make http connection, return value=60\n")));
}

TEST(SendHttpGet, TheResponseIsHandedOver) {
  ScriptedPeer peer({Exchange(Ok("{\"success\":true,\"data\":[1,\"\xc3\xa4\"]}"))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "/api?x=1", result, 5, false), 0);
  EXPECT_EQ(result["data"][1].asString(), "\xc3\xa4");
  EXPECT_EQ(peer.Received(0),
            "GET /api?x=1 HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n"
            "Authorization: Basic Og==\r\n\r\n");
}

TEST(SendHttpGet, ABodyOfManyPiecesIsReadToItsEnd) {
  const std::string body = "{\"success\":true,\"x\":\"" + std::string(300000, 'x') + "\"}";
  ScriptedPeer peer({Exchange(Ok(body))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), 0);
  EXPECT_EQ(result["x"].asString().size(), 300000u);
}

TEST(SendHttpGet, AResponseCutAtEveryByteHasADocumentedResult) {
  const std::string response = "HTTP/1.1 200 OK\r\nA: b\r\n\r\n{\"success\":true}";
  const size_t body_at = response.find('{');
  for (size_t n = 0; n <= response.size(); ++n) {
    const int expected = n == response.size() ? 0 : n > body_at ? -2 : -1;
    EXPECT_EQ(GetOf(response.substr(0, n)), expected) << n;
  }
}

TEST(SendHttpGet, ItReadsAhead) {
  ScriptedPeer peer({Exchange(Ok("{\"success\":true}"))});
  Json::Value result;
  Faults faults;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), 0);
  EXPECT_EQ(faults.Sizes(Call::kRead).front(), 64512u);
}

TEST(SendHttpGet, AResponseByteByByteIsReadWhole) {
  ScriptedPeer peer({ExchangeByteByByte(Ok("{\"success\":true}"))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), 0);
}

TEST(SendHttpGet, AFailedRequestIsLoggedAtInfo) {
  const ClosedPort port;
  LogCapture log;
  Json::Value result = "kept";
  EXPECT_EQ(SendHttpGet("127.0.0.1", port.Port(), "api", result, 5, false), -1);
  EXPECT_EQ(result.asString(), "kept");
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug", "SendRequestByGet", "Connection failed!\n"),
                          IsHttpLog("info", "SendHttpGet", "Failed to send request: 3\n")));
}

TEST(SendHttpGet, AnotherStatusIsLoggedAtInfoWithStatusAndResult) {
  const std::pair<const char*, const char*> table[] = {
      {"HTTP/1.1 404 No\r\n\r\n", "Failed to check response[404]: 5\n"},
      {"HTTP/1.1 302 Found\r\n\r\n", "Failed to check response[302]: 7\n"},
      {"HTTP/1.1 414 Long\r\n\r\n", "Failed to check response[414]: 8\n"},
      {"HTTP/1.1 401 No\r\n\r\n", "Failed to check response[401]: 4\n"},
      {"HTTP/1.1 200 OK\r\n:\r\n\r\n", "Failed to check response[200]: 1\n"},
      {"HTTP/1.1\r\n\r\n", "Failed to check response[0]: 3\n"}};
  for (const auto& [response, message] : table) {
    LogCapture log;
    EXPECT_EQ(GetOf(response), -1);
    EXPECT_THAT(LinesOf(log, "SendHttpGet"),
                ElementsAre(IsHttpLog("info", "SendHttpGet", message)));
  }
}

TEST(SendHttpGet, AFailedReadIsLoggedAtInfoWithErrno) {
  const std::string head = "HTTP/1.1 200 OK\r\n\r\n";
  ScriptedPeer peer({{ExpectRequest(), Send(head + "{}"), DiscardUntilEnd()}});
  LogCapture log;
  Json::Value result;
  {
    Faults faults;
    faults.Limit(Call::kRead, head.size()).FailFrom(Call::kRead, 2, ECONNRESET);
    EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), -1);
  }
  EXPECT_THAT(LinesOf(log, "SendHttpGet"),
              ElementsAre(IsHttpLog("info", "SendHttpGet", "Failed to read data: 104\n")));
}

TEST(SendHttpGet, AReadThatFailsAfterAPartOfTheBodyFailsTheCall) {
  const std::string start = "HTTP/1.1 200 OK\r\n\r\n{\"success\"";
  ScriptedPeer peer({{ExpectRequest(), Send(start + ":true}"), DiscardUntilEnd()}});
  Json::Value result = "kept";
  Faults faults;
  faults.Limit(Call::kRead, start.size()).FailFrom(Call::kRead, 2, ECONNRESET);
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), -1);
  EXPECT_EQ(result.asString(), "kept");
}

TEST(SendHttpGet, ASilentServerFailsTheCallAfterTheTimeout) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n\r\n"), DiscardUntilEnd()}});
  LogCapture log;
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 1, false), -1);
  EXPECT_THAT(LinesOf(log, "SendHttpGet"),
              ElementsAre(IsHttpLog("info", "SendHttpGet", "Failed to read data: 11\n")));
}

TEST(SendHttpGet, ABodyWithoutSuccessIsLoggedAtError) {
  LogCapture log;
  EXPECT_EQ(GetOf(Ok("{\"data\":1}")), -2);
  EXPECT_THAT(
      LinesOf(log, "SendHttpGet"),
      ElementsAre(IsHttpLog("error", "SendHttpGet", "Failed to parse json [{\"data\":1}].\n")));
}

TEST(SendHttpGet, ABodyThatIsNoJsonIsLoggedByTheParserAndAtError) {
  LogCapture log;
  log.SetLevel(kHttpCategory, 4);
  EXPECT_EQ(GetOf(Ok("%s no json")), -2);
  const std::vector<LogLine> http = log.Lines("http");
  EXPECT_THAT(
      http, ElementsAre(IsHttpLog("error", "SendHttpGet", "Failed to parse json [%s no json].\n")));
  EXPECT_THAT(log.Text(), HasSubstr(":JsonParse(): Failed to parse json: [%s no json] with error"));
}

TEST(SendHttpGet, AMissingSuccessLeavesTheParsedResponse) {
  ScriptedPeer peer({Exchange(Ok("{\"error\":7}"))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), -2);
  EXPECT_EQ(result["error"].asInt(), 7);
}

TEST(SendHttpGet, WithoutARecordItsErrorsAreWrittenAndItsInfoLinesAreNot) {
  ASSERT_EQ(g_pDbgLogCfg, nullptr);
  unlink(kMainLog);
  EXPECT_EQ(GetOf("HTTP/1.1 404 No\r\n\r\n"), -1);
  EXPECT_EQ(ReadFile(kMainLog), "");
  EXPECT_EQ(GetOf(Ok("")), -1);
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)),
              ElementsAre(IsHttpLog("error", "SendHttpGet", "Read Buffer Error\n")));
}

TEST(SendHttpGet, ADigestChallengeIsAnsweredOnASecondConnection) {
  ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nWWW-Authenticate: Digest realm=\"r\", "
                              "nonce=\"n\"\r\n\r\n"),
                     Exchange(Ok("{\"success\":true}"))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), 0);
  EXPECT_THAT(peer.Received(0), HasSubstr("\r\nAuthorization: Basic Og==\r\n"));
  EXPECT_THAT(peer.Received(1), HasSubstr("\r\nAuthorization: Digest username=\"\", realm=\"r\""));
}

TEST(SendHttpGet, AWrongKindOrDeepNestingThrowsNothing) {
  for (const char* body : {"[]", "\"x\"", "{\"success\":\"true\"}", "{\"success\":[]}"}) {
    EXPECT_NO_THROW(EXPECT_EQ(GetOf(Ok(body)), -2)) << body;
  }
  EXPECT_NO_THROW(EXPECT_EQ(GetOf(Ok(std::string(100000, '['))), -2));
}

TEST(SendHttpGet, DeepNestingPassesOnASmallStack) {
  ScriptedPeer peer({Exchange(Ok(std::string(100000, '[')))});
  RunOnSmallStack(64 << 10, [&] {
    Json::Value result;
    EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), -2);
  });
}

TEST(SendHttpsGet, TheRequestIsAGetWithEmptyCredentials) {
  TlsScriptedPeer peer({Exchange(Ok("{\"success\":true,\"d\":5}"))});
  const TrustedAuthority trusted(peer.CaFile());
  Json::Value result;
  Faults faults;
  EXPECT_EQ(SendHttpsGet("localhost", peer.Port(), "//api?x=1&y=2", result, 10), 0);
  EXPECT_EQ(result["d"].asInt(), 5);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "https://localhost/api?x=1&y=2");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_TIMEOUT).number, 10);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_USERNAME).text, "");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_PASSWORD).text, "");
  EXPECT_FALSE(faults.HasOption(CURLOPT_SSL_VERIFYPEER));
  EXPECT_FALSE(faults.HasOption(CURLOPT_SSL_VERIFYHOST));
}

TEST(SendHttpsGet, AnyOtherFailureIsMinusOneWithoutALineOfItsOwn) {
  const ClosedPort port;
  LogCapture log;
  Json::Value result = "kept";
  EXPECT_EQ(SendHttpsGet("127.0.0.1", port.Port(), "api", result, 5), -1);
  EXPECT_EQ(HttpsGetOf("HTTP/1.1 404 No\r\nContent-Length: 0\r\n\r\n"), -1);
  EXPECT_EQ(result.asString(), "kept");
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to make http connection, return value=7\n",
                                          "Failed to make http connection, response=404\n"));
}

TEST(SendHttpsGet, ABodyWithoutSuccessIsLoggedAtError) {
  LogCapture log;
  EXPECT_EQ(HttpsGetOf(Ok("{\"data\":1}")), -3);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("error", "SendHttpsGet",
                                    "Failed to parse json. Result is [{\"data\":1}]\n")));
}

TEST(SendHttpsGet, AMissingHandleIsMinusOne) {
  Faults faults;
  faults.FailNth(Call::kCurlEasyInit, 1);
  Json::Value result;
  EXPECT_EQ(SendHttpsGet("127.0.0.1", 1, "api", result, 5), -1);
}

// The n-th call fails.

TEST(SendHttpGetFaults, WhicheverSystemCallFailsTheResultIsDocumentedAndNothingIsLeft) {
  const DescriptorGuard guard;
  RepeatingPeer server(Exchange(Ok("{\"success\":true}")));
  const Call calls[] = {Call::kSocket, Call::kGetaddrinfo, Call::kFcntl,         Call::kConnect,
                        Call::kSelect, Call::kGetsockopt,  Call::kSetsockopt,    Call::kIoctl,
                        Call::kWrite,  Call::kRead,        Call::kPthreadSigmask};
  for (const Call call : calls) {
    ForEachFailingCall(call, [&](Faults& faults) {
      Json::Value result;
      const int code = SendHttpGet("127.0.0.1", server.Port(), "api", result, 5, false);
      EXPECT_TRUE(code == 0 || (code == -1 && faults.Struck())) << code;
      EXPECT_EQ(code == 0, result["success"].asBool());
    });
  }
}

TEST(SendHttpGetFaults, AFailingSocketLookupConnectWriteOrReadFailsTheCall) {
  RepeatingPeer server(Exchange(Ok("{\"success\":true}")));
  for (const Call call :
       {Call::kSocket, Call::kGetaddrinfo, Call::kConnect, Call::kWrite, Call::kRead}) {
    Faults faults;
    faults.FailFrom(call, 1);
    Json::Value result;
    EXPECT_EQ(SendHttpGet("127.0.0.1", server.Port(), "api", result, 5, false), -1)
        << CallName(call);
  }
}

TEST(SendHttpGetFaults, WhicheverAllocationFailsTheResultIsDocumentedAndNothingIsThrown) {
  const DescriptorGuard guard;
  RepeatingPeer server(Exchange(Ok("{\"success\":true}")));
  for (const Call call : {Call::kMalloc, Call::kCalloc, Call::kRealloc, Call::kStrdup}) {
    ForEachFailingCall(call, [&](Faults& faults) {
      Json::Value result;
      int code = 1;
      EXPECT_NO_THROW(code = SendHttpGet("127.0.0.1", server.Port(), "api", result, 5, false));
      EXPECT_TRUE(code == 0 || (code == -1 && faults.Struck())) << code;
    });
  }
}

TEST(SendHttpGetFaults, WhicheverCallOfTheLogFailsTheResultIsTheSame) {
  RepeatingPeer server(Exchange(Ok("{\"success\":true}")));
  const LogCapture log;
  for (const Call call : {Call::kOpen, Call::kFopen, Call::kFlock, Call::kLocaltimeR}) {
    Faults faults;
    faults.FailFrom(call, 1);
    Json::Value result;
    EXPECT_EQ(SendHttpGet("127.0.0.1", server.Port(), "api", result, 5, false), 0)
        << CallName(call);
  }
}
