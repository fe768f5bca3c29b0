// Requests through libcurl answer by their result alone. What the last response over the socket has
// left in the client stays: daemons mix both ways on one object and read a status or a cookie
// later.
#include <functional>

#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"

namespace {

constexpr char kFirst[] =
    "HTTP/1.1 206 Part\r\nContent-Type: text/a\r\nContent-Range: bytes 0-1/9\r\n"
    "Set-Cookie: s=1; Path=/\r\nWWW-Authenticate: Digest realm=\"r\"\r\n"
    "Transfer-Encoding: identity\r\n\r\n";
constexpr char kByCurl[] =
    "HTTP/1.1 200 OK\r\nContent-Type: text/b\r\nContent-Length: 2\r\n"
    "Set-Cookie: s=2; Path=/\r\n\r\n{}";

using Request = std::function<int(ExposedClient&)>;

// Each request through libcurl that needs no document.
const Request kRequests[] = {
    [](ExposedClient& client) { return client.SendRequestByCurl(HTTP_METHOD_GET, true, 10); },
    [](ExposedClient& client) { return client.SendRequestByPost("?"); },
    [](ExposedClient& client) { return client.SendReqByXMLGet(10); },
    [](ExposedClient& client) { return client.SendReqByXMLDelete(); },
};

class CurlState : public ::testing::TestWithParam<size_t> {
 protected:
  int Send(ExposedClient& client) { return kRequests[GetParam()](client); }
};
INSTANTIATE_TEST_SUITE_P(Request, CurlState, ::testing::Range<size_t>(0, std::size(kRequests)));

// A GET over the socket, then a request through libcurl that is answered by `response`.
void ExpectHeadStays(const std::string& response, const Request& send) {
  ScriptedPeer peer({Exchange(kFirst), Exchange(response)});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  send(client);
  EXPECT_EQ(client.m_statusCode, 206);
  EXPECT_EQ(client.m_mapContent.at(HTTP_CONTENT_TYPE), "text/a");
  EXPECT_EQ(client.m_mapContent.at(HTTP_CONTENT_RANGE), "bytes 0-1/9");
  EXPECT_EQ(client.m_strCookie, "s=1;");
  EXPECT_EQ(client.m_strAuthenticate, " Digest realm=\"r\"");
  EXPECT_EQ(client.GetTransferEncoding(), "identity");
}

TEST_P(CurlState, AResponseLeavesWhatTheSocketsHeadHasLeft) {
  ExpectHeadStays(kByCurl, [this](ExposedClient& client) { return Send(client); });
}

TEST_P(CurlState, AFailureLeavesWhatTheSocketsHeadHasLeft) {
  ExpectHeadStays("HTTP/1.1 500 No\r\nContent-Length: 0\r\n\r\n",
                  [this](ExposedClient& client) { return Send(client); });
}

TEST_P(CurlState, ASuccessClosesTheSocketsHeadForReading) {
  ScriptedPeer peer({Exchange(kFirst), Exchange(kByCurl)});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(Content(client, HTTP_CONTENT_TYPE), "text/a");
  EXPECT_EQ(Send(client), HTTP_RET_OK);
  std::string value;
  EXPECT_EQ(client.GetHttpContent(HTTP_CONTENT_TYPE, value), HTTP_RET_NOT_READY);
  char byte;
  EXPECT_EQ(client.ReadData(&byte, 1), -1);
}

TEST_P(CurlState, TheResultIsTheLastRequestsAndTheStatusTheSockets) {
  ScriptedPeer peer({Exchange("HTTP/1.1 404 No\r\n\r\n"), Exchange(kByCurl)});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(Send(client), HTTP_RET_OK);
  int status = 0;
  EXPECT_EQ(client.CheckResponse(status), HTTP_RET_OK);
  EXPECT_EQ(status, 404);
}

}  // namespace
