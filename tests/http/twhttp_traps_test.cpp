// What surprises callers and is kept: the rows of docs/limits.md that a peer's habits bring about.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <climits>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kErrorText[] = "{\"error\":true}";
constexpr char kPage[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\npage";

// The head of a response of `count` header lines, the last of which is `last`.
std::string HeadOf(int count, const std::string& last) {
  std::string head = "HTTP/1.1 200 OK\r\n";
  for (int i = 1; i < count; ++i) head += "X-" + std::to_string(i) + ": x\r\n";
  return head + last + "\r\n\r\n";
}

// Answers and keeps the connection open, as after a request of HTTP/1.1.
Script AnswerAndKeep(const std::string& response) {
  return {ExpectUntil("\r\n\r\n"), Send(response), DiscardUntilEnd()};
}

ClientSettings WithCredentials() {
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  return settings;
}

}  // namespace

TEST(ReadBody, AfterAHeadOfExactly30LinesAChunkedBodyIsEmpty) {
  for (const int lines : {29, 30}) {
    const auto client =
        ClientAfter(HeadOf(lines, "Transfer-Encoding: chunked") + "4\r\npage\r\n0\r\n\r\n");
    std::string body = "old";
    EXPECT_EQ(client->ReadBody(body), HTTP_RET_OK) << lines;
    EXPECT_EQ(body, lines == 29 ? "page" : "") << lines;
  }
}

TEST(SendReqBySocketPost, AfterAHeadOfExactly30LinesTheResponseBeginsWithTheEmptyLine) {
  ScriptedPeer peer({Exchange(HeadOf(30, "Content-Length: 5") + "<a/>\n")});
  ExposedClient client(peer.Port());
  std::string response;
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_EQ(response, "\r\n<a/");
}

TEST(SendAuthReqBySocketPost, TheLastOfSeveralChallengesDecides) {
  ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nWWW-Authenticate: Digest realm=\"r\"\r\n"
                              "WWW-Authenticate: Basic realm=\"r\"\r\n\r\n"),
                     Exchange(kPage)});
  ExposedClient client(peer.Port(), WithCredentials());
  std::string response;
  EXPECT_EQ(client.SendAuthReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_THAT(peer.Received(1), HasSubstr("\r\nAuthorization: Basic "));
}

TEST(SendRequestBySocketPost, OfAPeerThatKeepsTheConnectionTheBodyIsReadAndThenThreeWaitsFail) {
  ScriptedPeer peer({AnswerAndKeep(kPage)});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.SendRequestBySocketPost(""), HTTP_RET_OK);
  std::string body;
  {
    Faults faults;
    faults.Return(Call::kSelect, 1, INT_MAX, 0);  // each wait ends at once, without a byte
    EXPECT_EQ(client.ReadBody(body), HTTP_RET_IO_ERROR);
    EXPECT_EQ(faults.Count(Call::kSelect), 3);
  }
  EXPECT_EQ(body, "page");
  client.m_pSocket->Disconnect();
}

TEST(SendRequestBySocketPost, WithHttp10TheRequestAsksForNoConnectionAndTheCloseEndsTheBody) {
  ScriptedPeer peer({Exchange(kPage)});
  ClientSettings settings;
  settings.version = HTTP_VERSION_1_0;
  ExposedClient client(peer.Port(), settings);
  ASSERT_EQ(client.SendRequestBySocketPost(""), HTTP_RET_OK);
  std::string body;
  EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
  EXPECT_EQ(body, "page");
  EXPECT_THAT(peer.Received(0), Not(HasSubstr("Connection")));
}

TEST(GetResp, AfterAnUploadAPeerThatKeepsTheConnectionReturnsTheErrorText) {
  ScriptedPeer peer({AnswerAndKeep(kPage)});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_TRUE(client.HasDataToRead(10));
  {
    Faults faults;
    faults.Return(Call::kSelect, 1, INT_MAX, 0);
    EXPECT_EQ(client.GetResp(), kErrorText);
  }
  int status = 0;
  client.CheckResponse(status);
  EXPECT_EQ(status, 200);
  client.m_pSocket->Disconnect();
}

TEST(GetResp, AfterAnUploadASecondResponseIsInTheBodyOfTheFirst) {
  const std::string second = "HTTP/1.1 400 Bad Request\r\nConnection: close\r\n\r\n";
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), Send(kPage), Send(second), Close()}});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.GetResp(), "page" + second);
}

TEST(SendHttpGet, ChunksAreTakenForTheDocument) {
  const std::string head = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";
  ScriptedPeer peer({Exchange(head + "10\r\n{\"success\":true}\r\n0\r\n\r\n")});
  Json::Value response;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "a", response, 5, false), -2);
}

TEST(SendHttpGet, NamesNoHost) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\n{\"success\":true}")});
  Json::Value response;
  EXPECT_EQ(SendHttpGet("localhost", peer.Port(), "a", response, 5, false), 0);
  EXPECT_THAT(peer.Received(0), Not(HasSubstr("Host:")));
}

// libcurl offers h2 by itself; the version that the client was made with does not hold it back.
TEST(SendRequestByCurlTls, AServerThatTakesHttp2GetsIt) {
  TlsOptions tls;
  tls.http2 = true;
  const bool offers = (curl_version_info(CURLVERSION_NOW)->features & CURL_VERSION_HTTP2) != 0;
  const std::string begin = offers ? "PRI * HTTP/2.0\r\n" : "GET /a.cgi HTTP/1.1\r\n";
  TlsScriptedPeer peer({{ExpectExactly(begin), Reset()}}, tls);
  ClientSettings settings;
  settings.https = true;
  settings.version = HTTP_VERSION_1_0;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_IO_ERROR);
  EXPECT_THAT(peer.Received(0), StartsWith(begin));
}
