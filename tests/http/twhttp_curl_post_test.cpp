// The POST through libcurl that takes its body from the path.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/curl_callbacks.h"
#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace tarnwick;

namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";

// What a client of this path hands to libcurl.
struct UrlAndBody {
  std::string url;
  std::string body;
};

UrlAndBody SplitOf(const std::string& path, const std::string& separators) {
  ClientSettings settings;
  settings.path = path;
  settings.host = "h";
  ExposedClient client(80, settings);
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByPost(separators);
  return {faults.OptionGiven(CURLOPT_URL).text, faults.OptionGiven(CURLOPT_POSTFIELDS).text};
}

ClientSettings WithCredentials(HTTP_VERSION version = HTTP_VERSION_NONE) {
  ClientSettings settings;
  settings.path = "x.cgi?a=1";
  settings.user = "u";
  settings.password = "secret";
  settings.version = version;
  return settings;
}

int ResultOfResponse(const std::string& response) {
  ScriptedPeer peer({Exchange(response)});
  ExposedClient client(peer.Port());
  const int result = client.SendRequestByPost("?");
  EXPECT_EQ(client.m_result, result);
  EXPECT_EQ(client.m_connState, result == HTTP_RET_OK ? 1 : 0);
  return result;
}

std::string Response(const std::string& status) {
  return "HTTP/1.1 " + status + "\r\nContent-Length: 0\r\n\r\n";
}

}  // namespace

TEST(SendRequestByPost, ThePathIsSplitAtTheSeparatorIntoUrlAndBody) {
  UrlAndBody sent = SplitOf("cgi/x.cgi?a=1&b=2", "?");
  EXPECT_EQ(sent.url, "http://h:80/cgi/x.cgi");
  EXPECT_EQ(sent.body, "a=1&b=2");
  sent = SplitOf("cgi/x.cgi", "?");
  EXPECT_EQ(sent.url, "http://h:80/cgi/x.cgi");
  EXPECT_EQ(sent.body, "");
  sent = SplitOf("cgi/x#a?b", "?#");
  EXPECT_EQ(sent.url, "http://h:80/cgi/x");
  EXPECT_EQ(sent.body, "a?b");
}

TEST(SendRequestByPost, A302OrA404IsAnIoErrorAndA200OrA299IsOk) {
  EXPECT_EQ(ResultOfResponse(Response("302 Found\r\nLocation: /elsewhere")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfResponse(Response("404 Not Found")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfResponse(Response("300 x")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfResponse(Response("200 OK")), HTTP_RET_OK);
  EXPECT_EQ(ResultOfResponse(Response("299 Fine")), HTTP_RET_OK);
}

TEST(SendRequestByPost, LibcurlCode60IsAnIoErrorToo) {
  ExposedClient client(80);
  Faults faults;
  faults.FailNth(Call::kCurlEasyPerform, 1, 0, 60);
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
}

TEST(SendRequestByPost, ASeparatorAtEitherEndAndNoSeparators) {
  EXPECT_EQ(SplitOf("?a=1", "?").url, "http://h:80/");
  EXPECT_EQ(SplitOf("?a=1", "?").body, "a=1");
  EXPECT_EQ(SplitOf("x?", "?").url, "http://h:80/x");
  EXPECT_EQ(SplitOf("x?", "?").body, "");
  EXPECT_EQ(SplitOf("x?a=1", "").url, "http://h:80/x?a=1");
  EXPECT_EQ(SplitOf("x?a=1", "").body, "");
  EXPECT_EQ(SplitOf("", "?").url, "http://h:80/");
}

TEST(SendRequestByPost, AnEmptyHostLeavesSchemeAndPathAlone) {
  ExposedClient client(80, {"x/y?a"});
  client.m_strHost = "";
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByPost("?");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://x/y");
}

TEST(SendRequestByPost, TheOptionsAreSetInOrder) {
  for (const HTTP_VERSION version : {HTTP_VERSION_NONE, HTTP_VERSION_1_0, HTTP_VERSION_1_1}) {
    ExposedClient client(80, WithCredentials(version));
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    client.SendRequestByPost("?");
    std::vector<CURLoption> expected = {CURLOPT_USERNAME, CURLOPT_PASSWORD};
    if (version != HTTP_VERSION_NONE) expected.push_back(CURLOPT_HTTP_VERSION);
    expected.insert(expected.end(),
                    {CURLOPT_URL, CURLOPT_POSTFIELDS, CURLOPT_HTTPAUTH, CURLOPT_WRITEFUNCTION});
    EXPECT_THAT(OptionsOf(faults), ElementsAreArray(expected));
    EXPECT_EQ(faults.OptionGiven(CURLOPT_USERNAME).text, "u");
    EXPECT_EQ(faults.OptionGiven(CURLOPT_PASSWORD).text, "secret");
    EXPECT_EQ(faults.OptionGiven(CURLOPT_HTTPAUTH).number, 3);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEFUNCTION).pointer,
              reinterpret_cast<const void*>(&CurlDiscardWrite));
    if (version != HTTP_VERSION_NONE) {
      EXPECT_EQ(faults.OptionGiven(CURLOPT_HTTP_VERSION).number, long{version});
    }
  }
}

TEST(SendRequestByPost, AVersionThatIsNotKnownIsNotHandedOn) {
  ExposedClient client(80, WithCredentials(static_cast<HTTP_VERSION>(3)));
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByPost("?");
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTP_VERSION));
}

TEST(SendRequestByPost, EachRefusedOptionHasItsLineAndEndsTheRequest) {
  const ClosedPort port;
  const std::string url = "http://127.0.0.1:" + std::to_string(port.Port()) + "/x.cgi";
  const std::pair<CURLoption, std::string> table[] = {
      {CURLOPT_USERNAME, "Failed to set Usr=u, return value=27\n"},
      {CURLOPT_PASSWORD, "Failed to set Pwd=secret, return value=27\n"},
      {CURLOPT_HTTP_VERSION, "Failed to set http version, return value=27\n"},
      {CURLOPT_URL, "Failed to set url=" + url + ", return value=27\n"},
      {CURLOPT_POSTFIELDS, "Failed to set POST field, return value=27\n"},
      {CURLOPT_HTTPAUTH, "Failed to set auth, return value=27\n"},
      {CURLOPT_WRITEFUNCTION, "Failed to set WRITEFUNCTION, return value=27\n"}};
  for (const auto& [option, message] : table) {
    ExposedClient client(port.Port(), WithCredentials(HTTP_VERSION_1_1));
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(faults.CurlOptions().back().option, option);
    EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
    EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendRequestByPost", message)));
  }
}

TEST(SendRequestByPost, WithoutAHandleTheResultStaysAndALineIsLogged) {
  ExposedClient client(80);
  client.m_result = HTTP_RET_REDIRECT;
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyInit, 1);
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByPost", "Failed to initial libcurl.\n")));
}

TEST(SendRequestByPost, AFailedTransferIsLoggedAtDebug) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  LogCapture log;
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByPost",
                                    "Failed to make http connection, return value=7\n")));
}

TEST(SendRequestByPost, AnotherStatusIsLoggedAtDebug) {
  LogCapture log;
  ResultOfResponse(Response("503 x"));
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByPost",
                                    "Failed to make http connection, response=503\n")));
}

TEST(SendRequestByPost, AStatusThatCannotBeReadIsLoggedAsZero) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port());
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyGetinfo, 1);
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendRequestByPost",
                                                 "Failed to make http connection, response=0\n")));
}

TEST(SendRequestByPost, BelowDebugNothingIsLogged) {
  LogCapture log(4);
  ResultOfResponse(Response("404 x"));
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(SendRequestByPost, TheRequestIsAPlainFormWithoutAnyOfTheClientsHeaders) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientSettings settings = WithCredentials();
  settings.https = true;  // is ignored on this path
  ExposedClient client(peer.Port(), settings);
  client.SetCookie("s=1");
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(0),
              AllOf(StartsWith("POST /x.cgi HTTP/1.1\r\nHost: 127.0.0.1:"), EndsWith("\r\n\r\na=1"),
                    HasSubstr("\r\nContent-Length: 3\r\n"), Not(HasSubstr("Tarnwick")),
                    Not(HasSubstr("Cookie")), Not(HasSubstr("Authorization"))));
  EXPECT_EQ(client.m_strCookie, "s=1");
}

TEST(SendRequestByPost, AnEmptyBodyIsPosted) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port(), {"x.cgi"});
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(0), AllOf(StartsWith("POST /x.cgi HTTP/1.1\r\n"),
                                      HasSubstr("\r\nContent-Length: 0\r\n")));
}

TEST(SendRequestByPost, TheChosenVersionIsSent) {
  ScriptedPeer peer({Exchange("HTTP/1.0 200 OK\r\nContent-Length: 0\r\n\r\n")});
  ExposedClient client(peer.Port(), WithCredentials(HTTP_VERSION_1_0));
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(0), StartsWith("POST /x.cgi HTTP/1.0\r\n"));
}

TEST(SendRequestByPost, AChallengeOfDigestOrBasicIsAnswered) {
  const std::pair<const char*, const char*> table[] = {
      {"Digest realm=\"r\", nonce=\"n\", qop=\"auth\"", "\r\nAuthorization: Digest username=\"u\""},
      {"Basic realm=\"r\"", "\r\nAuthorization: Basic dTpzZWNyZXQ=\r\n"}};
  for (const auto& [challenge, authorization] : table) {
    ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nConnection: close\r\nWWW-Authenticate: " +
                                std::string(challenge) + "\r\nContent-Length: 0\r\n\r\n"),
                       Exchange(kOk)});
    ExposedClient client(peer.Port(), WithCredentials());
    EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_OK);
    EXPECT_THAT(peer.Received(1), AllOf(HasSubstr(authorization), EndsWith("\r\n\r\na=1")));
  }
}

TEST(SendRequestByPost, ANonceThatIsAlwaysStaleIsAskedFor30TimesAtMost) {
  const std::string refusal =
      "HTTP/1.1 401 No\r\nConnection: close\r\nContent-Length: 0\r\n"
      "WWW-Authenticate: Digest realm=\"r\", nonce=\"n\", stale=true\r\n\r\n";
  ScriptedPeer peer(std::vector<Script>(31, Exchange(refusal)));
  ExposedClient client(peer.Port(), WithCredentials());
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
}

TEST(SendRequestByPost, TheBodyOfTheResponseIsThrownAway) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port());
  client.m_strCurlText = "old";
  testing::internal::CaptureStdout();
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_OK);
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
  EXPECT_EQ(client.m_strCurlText, "old");
  EXPECT_EQ(client.m_pRespBuf, nullptr);
}

TEST(SendRequestByPost, EachFailingCallOfLibcurlIsAnIoErrorAndReleasesTheHandle) {
  const DescriptorGuard guard;
  RepeatingPeer server(Exchange(kOk));
  for (const Call call : {Call::kCurlEasySetopt, Call::kCurlEasyPerform, Call::kCurlEasyGetinfo}) {
    ForEachFailingCall(call, [&](Faults& faults) {
      ExposedClient client(server.Port(), {"x"});
      const int result = client.SendRequestByPost("?");
      EXPECT_EQ(result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
      EXPECT_EQ(client.m_result, result);
      EXPECT_EQ(faults.Count(Call::kCurlEasyInit), 1);
      EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
    });
  }
}
