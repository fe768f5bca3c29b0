// SendHttpPost.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/log/twdebuglog.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n";
constexpr char kFormType[] = "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n";
constexpr char kNoCookie[] = "[Warning] Cannot set balnk cookie\n";

int PostTo(int port, const std::string& cookie = "s=1") {
  return SendHttpPost("127.0.0.1", port, "api/set", "a=1", cookie, 5);
}

int PostOf(const std::string& response) {
  ScriptedPeer peer({Exchange(response)});
  return PostTo(peer.Port());
}

}  // namespace

TEST(SendHttpPost, WithAnEmptyCookieTheRequestIsSentAfterOneWarning) {
  ScriptedPeer peer({Exchange(kOk)});
  LogCapture log;
  EXPECT_EQ(PostTo(peer.Port(), ""), 0);
  EXPECT_EQ(peer.Received(0), "POST /api/set HTTP/1.1\r\nHost: 127.0.0.1\r\n" +
                                  std::string(kFormType) +
                                  "Content-Length: 3\r\nConnection: close;\r\n\r\na=1");
  EXPECT_THAT(LinesOf(log, "SendHttpPost"),
              ElementsAre(IsHttpLog("warn", "SendHttpPost", kNoCookie)));
}

TEST(SendHttpPost, ACookieIsSentAfterTheHostWithoutAWarning) {
  ScriptedPeer peer({Exchange(kOk)});
  LogCapture log;
  EXPECT_EQ(PostTo(peer.Port(), "s=1; t=2"), 0);
  EXPECT_EQ(peer.Received(0), "POST /api/set HTTP/1.1\r\nHost: 127.0.0.1\r\nCookie: s=1; t=2\r\n" +
                                  std::string(kFormType) +
                                  "Content-Length: 3\r\nConnection: close;\r\n\r\na=1");
  EXPECT_THAT(LinesOf(log, "SendHttpPost"), IsEmpty());
}

TEST(SendHttpPost, PathAndBodyAreSentAsTheyStandButLeadingSlashes) {
  ScriptedPeer peer({Exchange(kOk)});
  EXPECT_EQ(SendHttpPost("localhost", peer.Port(), "//p?a=1 2", "b=3 4", "s=1", 5), 0);
  EXPECT_EQ(peer.Received(0), "POST /p?a=1 2 HTTP/1.1\r\nHost: localhost\r\nCookie: s=1\r\n" +
                                  std::string(kFormType) +
                                  "Content-Length: 5\r\nConnection: close;\r\n\r\nb=3 4");
}

TEST(SendHttpPost, AnyResponseIsSuccess) {
  EXPECT_EQ(PostOf("HTTP/1.1 500 Oops\r\nContent-Length: 4\r\n\r\noops"), 0);
  EXPECT_EQ(PostOf("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\n"), 0);
  EXPECT_EQ(PostOf("no answer of the protocol\r\n"), 0);
  ScriptedPeer silent({RequestThenClose()});
  EXPECT_EQ(PostTo(silent.Port()), 0);
}

TEST(SendHttpPost, TheBodyOfTheResponseIsNotWaitedFor) {
  ScriptedPeer peer(
      {{ExpectRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\n"), ExpectEof()}});
  EXPECT_EQ(PostTo(peer.Port()), 0);
}

TEST(SendHttpPost, AFailedConnectIsMinusOneAndLoggedAtError) {
  const ClosedPort port;
  LogCapture log;
  EXPECT_EQ(PostTo(port.Port()), -1);
  EXPECT_THAT(
      log.Lines("http"),
      ElementsAre(IsHttpLog("info", "SendRequestBySocketPost",
                            "Connection failed. host [127.0.0.1:" + std::to_string(port.Port()) +
                                "], path [api/set], content [a=1].\n"),
                  IsHttpLog("error", "SendHttpPost", "Send HTTP Request Error\n")));
}

TEST(SendHttpPost, AFailedWriteIsMinusOneAndLoggedAtError) {
  ScriptedPeer peer({{DiscardUntilEnd()}});
  LogCapture log;
  Faults faults;
  faults.FailFrom(Call::kWrite, 1, EPIPE);
  EXPECT_EQ(PostTo(peer.Port()), -1);
  EXPECT_THAT(LinesOf(log, "SendHttpPost"),
              ElementsAre(IsHttpLog("error", "SendHttpPost", "Send HTTP Request Error\n")));
}

TEST(SendHttpPost, TheTimeoutLimitsConnecting) {
  const BlackHolePort port;
  EXPECT_EQ(SendHttpPost("127.0.0.1", port.Port(), "api", "a=1", "s=1", 1), -1);
}

TEST(SendHttpPost, WithoutARecordItsWarningAndItsErrorAreWritten) {
  ASSERT_EQ(g_pDbgLogCfg, nullptr);
  unlink(kMainLog);
  const ClosedPort port;
  EXPECT_EQ(PostTo(port.Port(), ""), -1);
  std::vector<LogLine> http;
  for (const LogLine& line : ParseLog(ReadFile(kMainLog))) {
    if (line.category == "http") http.push_back(line);
  }
  EXPECT_THAT(http, ElementsAre(IsHttpLog("warn", "SendHttpPost", kNoCookie),
                                IsHttpLog("error", "SendHttpPost", "Send HTTP Request Error\n")));
}
