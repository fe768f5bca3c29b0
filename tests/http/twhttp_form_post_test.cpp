// The form POST over the client's own socket.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\n\r\n";
constexpr char kFormType[] = "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n";

ClientSettings WithPath(const std::string& path, HTTP_VERSION version = HTTP_VERSION_NONE) {
  ClientSettings settings;
  settings.path = path;
  settings.version = version;
  return settings;
}

// What a client with these settings sends to the host "cam".
std::string RequestOf(const ClientSettings& settings, const std::string& content,
                      const std::string& cookie = "") {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port(), settings);
  client.m_strHost = "cam";
  client.SetCookie(cookie);
  client.m_strAuthorization = "Authorization: X";
  EXPECT_EQ(client.SendRequestBySocketPost(content), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  EXPECT_EQ(client.m_strAuthorization, "Authorization: X");
  return peer.Received(0);
}

// The result that the client keeps from a response.
int KeptResultOf(const std::string& response) {
  ScriptedPeer peer({Exchange(response)});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  return client.m_result;
}

// A client with results of an earlier request.
std::unique_ptr<ExposedClient> UsedClient(int port) {
  auto client = std::make_unique<ExposedClient>(port);
  client->m_connState = 2;
  client->m_result = HTTP_RET_REDIRECT;
  client->m_statusCode = 302;
  return client;
}

void ExpectEarlierResults(const ExposedClient& client) {
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
}

}  // namespace

TEST(SendRequestBySocketPost, WithoutAVersionItSendsHttp11WithHostTypeLengthAndClose) {
  EXPECT_EQ(RequestOf(WithPath("cgi/set.cgi"), "a=1"),
            "POST /cgi/set.cgi HTTP/1.1\r\nHost: cam\r\n"
            "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n"
            "Content-Length: 3\r\nConnection: close;\r\n\r\na=1");
}

TEST(SendRequestBySocketPost, WithHttp10AndACookieTheCookieFollowsTheHostAndNothingCloses) {
  EXPECT_EQ(RequestOf(WithPath("cgi/set.cgi", HTTP_VERSION_1_0), "a=1", "s=1"),
            "POST /cgi/set.cgi HTTP/1.0\r\nHost: cam\r\nCookie: s=1\r\n"
            "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n"
            "Content-Length: 3\r\n\r\na=1");
}

TEST(SendRequestBySocketPost, EmptyContentIsSentWithALengthOfZero) {
  EXPECT_EQ(RequestOf(WithPath("x"), ""), "POST /x HTTP/1.1\r\nHost: cam\r\n" +
                                              std::string(kFormType) +
                                              "Content-Length: 0\r\nConnection: close;\r\n\r\n");
}

TEST(SendRequestBySocketPost, Http11IsSentForNoneAndHttp11AndHttp10ForEveryOther) {
  const std::string head = "\r\nHost: cam\r\n" + std::string(kFormType) + "Content-Length: 1\r\n";
  for (const int version : {0, 2}) {
    EXPECT_EQ(RequestOf(WithPath("", static_cast<HTTP_VERSION>(version)), "c"),
              "POST / HTTP/1.1" + head + "Connection: close;\r\n\r\nc");
  }
  for (const int version : {1, 3, -1}) {
    EXPECT_EQ(RequestOf(WithPath("", static_cast<HTTP_VERSION>(version)), "c"),
              "POST / HTTP/1.0" + head + "\r\nc");
  }
}

TEST(SendRequestBySocketPost, ACookieIsInAnHttp11RequestToo) {
  EXPECT_EQ(RequestOf(WithPath("x"), "c", "s=1; t=2"),
            "POST /x HTTP/1.1\r\nHost: cam\r\nCookie: s=1; t=2\r\n" + std::string(kFormType) +
                "Content-Length: 1\r\nConnection: close;\r\n\r\nc");
}

TEST(SendRequestBySocketPost, NeitherTheCredentialsNorTheQueryEncodingChangesTheRequest) {
  ClientSettings settings = WithPath("p?a=1 2");
  settings.user = "u";
  settings.password = "p";
  settings.basic_auth = true;
  settings.encode_query = true;
  EXPECT_EQ(RequestOf(settings, "b=3 4"),
            "POST /p?a=1 2 HTTP/1.1\r\nHost: cam\r\n" + std::string(kFormType) +
                "Content-Length: 5\r\nConnection: close;\r\n\r\nb=3 4");
}

TEST(SendRequestBySocketPost, ZeroBytesInTheContentAreSent) {
  EXPECT_EQ(RequestOf(WithPath("x", HTTP_VERSION_1_0), "a\0b"s),
            "POST /x HTTP/1.0\r\nHost: cam\r\n" + std::string(kFormType) +
                "Content-Length: 3\r\n\r\na\0b"s);
}

TEST(SendRequestBySocketPost, ARequestOfSeveralMebibytesIsWrittenWhole) {
  std::string content;
  for (int i = 0; i < 300000; ++i) content += "k" + std::to_string(i) + "=v&";
  const std::string head = "POST /" + std::string(5000, 'p') + " HTTP/1.0\r\nHost: cam\r\n" +
                           kFormType + "Content-Length: " + std::to_string(content.size()) +
                           "\r\n\r\n";
  EXPECT_TRUE(RequestOf(WithPath(std::string(5000, 'p'), HTTP_VERSION_1_0), content) ==
              head + content);
}

TEST(SendRequestBySocketPost, TheBodyIsLeftOnTheConnection) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.m_statusCode, 200);
  EXPECT_EQ(ReadBody(client), "body");
}

TEST(SendRequestBySocketPost, TheOutcomeOfTheResponseIsKeptAndNotReturned) {
  EXPECT_EQ(KeptResultOf("HTTP/1.1 204 No Content\r\n\r\n"), HTTP_RET_OK);
  EXPECT_EQ(KeptResultOf("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\n"),
            HTTP_RET_UNAUTHORIZED);
  EXPECT_EQ(KeptResultOf("HTTP/1.1 302 Found\r\n\r\n"), HTTP_RET_REDIRECT);
  EXPECT_EQ(KeptResultOf("HTTP/1.1 414 Long\r\n\r\n"), HTTP_RET_URI_TOO_LONG);
  EXPECT_EQ(KeptResultOf("HTTP/1.1 500 Oops\r\n\r\n"), HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(KeptResultOf("HTTP/2 200\r\n\r\n"), HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(KeptResultOf("HTTP/1.1\r\n\r\n"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(KeptResultOf("HTTP/1.1 200 OK\r\nContent-Length:\r\n\r\n"), HTTP_RET_NOT_READY);
}

TEST(SendRequestBySocketPost, AServerThatClosesWithoutAResponseIsAnOutcomeToo) {
  ScriptedPeer peer({RequestThenClose()});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 1);
  EXPECT_EQ(client.m_statusCode, 0);
}

TEST(SendRequestBySocketPost, A401IsNotAnsweredByASecondRequest) {
  ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\n")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendRequestBySocketPost, EachRequestRunsOnAFreshConnection) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n\r\nunread"), DiscardUntilEnd()},
                     Exchange("HTTP/1.1 200 OK\r\n\r\nsecond")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestBySocketPost("a=2"), HTTP_RET_OK);
  EXPECT_EQ(ReadBody(client), "second");
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendRequestBySocketPost, OverTlsTheSameBytesAreSent) {
  for (const bool buffered : {false, true}) {
    TlsScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\nbody")});
    ClientSettings settings = WithPath("x");
    settings.https = true;
    settings.buffered = buffered;
    ExposedClient client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_EQ(ReadBody(client), "body");
    EXPECT_EQ(peer.Received(0), "POST /x HTTP/1.1\r\nHost: 127.0.0.1\r\n" + std::string(kFormType) +
                                    "Content-Length: 3\r\nConnection: close;\r\n\r\na=1");
  }
}

TEST(SendRequestBySocketPost, AFailedConnectIsLoggedAtInfoAndChangesNoField) {
  const ClosedPort port;
  const auto client = UsedClient(port.Port());
  client->SetPath("x%s");
  LogCapture log;
  EXPECT_EQ(client->SendRequestBySocketPost("a=%s%n"), HTTP_RET_IO_ERROR);
  ExpectEarlierResults(*client);
  EXPECT_THAT(
      log.Lines("http"),
      ElementsAre(IsHttpLog("info", "SendRequestBySocketPost",
                            "Connection failed. host [127.0.0.1:" + std::to_string(port.Port()) +
                                "], path [x%s], content [a=%s%n].\n")));
}

TEST(SendRequestBySocketPost, BelowInfoAFailedConnectIsNotLogged) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  LogCapture log(3);
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(SendRequestBySocketPost, AFailedWriteIsLoggedWithItsCountAndTheLength) {
  ScriptedPeer peer({{DiscardUntilEnd()}});
  const auto client = UsedClient(peer.Port());
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kWrite, 1, EPIPE);
    EXPECT_EQ(client->SendRequestBySocketPost("a=1"), HTTP_RET_IO_ERROR);
  }
  client->m_pSocket->Disconnect();
  ExpectEarlierResults(*client);
  const size_t length = RequestOf(WithPath("a.cgi"), "a=1").size() + strlen("127.0.0.1") - 3;
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendRequestBySocketPost",
                                                       "Write data faild, write 0/" +
                                                           std::to_string(length) + ".\n")));
}

TEST(SendRequestBySocketPost, AShortWriteIsAFailureAndLoggedWithItsCount) {
  ScriptedPeer peer({{DiscardUntilEnd()}});
  const auto client = UsedClient(peer.Port());
  LogCapture log(3);
  {
    Faults faults;
    faults.Limit(Call::kWrite, 10).FailRange(Call::kWrite, 2, 2, EIO);
    EXPECT_EQ(client->SendRequestBySocketPost("a=1"), HTTP_RET_IO_ERROR);
  }
  client->m_pSocket->Disconnect();
  ExpectEarlierResults(*client);
  ASSERT_EQ(log.Lines("http").size(), 1u);
  EXPECT_THAT(log.Lines("http")[0].message, ::testing::StartsWith("Write data faild, write 10/1"));
}

TEST(SendRequestBySocketPost, AFailedTlsWriteIsLoggedInTheSameWay) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  ClientSettings settings = WithPath("a.cgi");
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kSslWrite, 1);
    EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(client.m_connState, 0);
  ASSERT_EQ(log.Lines("http").size(), 1u);
  EXPECT_THAT(log.Lines("http")[0].message, ::testing::StartsWith("Write data faild, write -1/"));
}

TEST(SendRequestBySocketPost, AClientWithoutASocketCannotConnect) {
  ExposedClient client;
  LogCapture log;
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("info", "SendRequestBySocketPost",
                                    "Connection failed. host [:0], path [], content [a=1].\n")));
}
