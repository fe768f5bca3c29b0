// GetResp: the whole response to a request that the caller has written.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/body_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// Connects and writes a request, as a caller does who builds it himself.
void WriteOwnRequest(ExposedClient& client) {
  const std::string request = "GET /own HTTP/1.1\r\n\r\n";
  ASSERT_EQ(client.m_pSocket->Connect(), 0);
  ASSERT_EQ(client.m_pSocket->WriteData(request.data(), static_cast<int>(request.size())),
            static_cast<int>(request.size()));
}

std::string GetRespOf(const std::string& response, const Transport& transport = {false, true}) {
  const auto peer = NewPeer(transport, {Exchange(response)});
  ExposedClient client(peer->Port(), SettingsOf(transport));
  WriteOwnRequest(client);
  return client.GetResp();
}

}  // namespace

TEST(GetResp, AChunkedBodyIsDecoded) {
  EXPECT_EQ(GetRespOf(Chunked(kWikipedia)), "Wikipedia");
}

TEST(GetResp, AChunkExtensionIsIgnored) {
  EXPECT_EQ(GetRespOf(Chunked("1A;ext=1\r\nabcdefghijklmnopqrstuvwxyz\r\n0\r\n\r\n")),
            "abcdefghijklmnopqrstuvwxyz");
}

TEST(GetResp, ChunkedWithACapitalIsNotDecoded) {
  EXPECT_EQ(GetRespOf("HTTP/1.1 200 OK\r\nTransfer-Encoding: Chunked\r\n\r\n"s + kWikipedia),
            kWikipedia);
}

TEST(GetResp, AStatusThatIsNo2xxReturnsTheErrorTextAndLeavesTheBody) {
  for (const char* status : {"404 No", "302 Found", "401 No", "414 Long", "500 Oops", "199 x"}) {
    ScriptedPeer peer({Exchange("HTTP/1.1 "s + status + "\r\n\r\nunread")});
    ExposedClient client(peer.Port());
    WriteOwnRequest(client);
    EXPECT_EQ(client.GetResp(), kErrorText) << status;
    EXPECT_EQ(ReadBody(client), "unread");
  }
}

TEST(GetResp, AServerThatClosesInTheMiddleOfAChunkReturnsTheBytesThatCame) {
  ForEachTransport([](const Transport& transport) {
    EXPECT_EQ(GetRespOf(Chunked("4\r\nWiki\r\n9\r\npedi"), transport), "Wikipedi");
    EXPECT_EQ(GetRespOf(Chunked("ffff\r\n"), transport), "");
  });
}

TEST(GetResp, ItServesAfterARequestThatTheCallerHasWritten) {
  ForEachTransport([](const Transport& transport) {
    EXPECT_EQ(GetRespOf(Plain("Wikipedia"), transport), "Wikipedia");
    EXPECT_EQ(GetRespOf(Chunked(kWikipedia), transport), "Wikipedia");
  });
}

TEST(GetResp, ItServesAfterAnUpload) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {{ExpectUntil("\r\n\r\n"), ExpectExactly("multipart"),
                                           Send(Chunked(kWikipedia)), Close()}});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
    EXPECT_EQ(client.WriteData("multipart", 9), 9);
    EXPECT_EQ(client.GetResp(), "Wikipedia");
  });
}

TEST(GetResp, AfterASenderThatHasReadTheHeadItReturnsTheErrorText) {
  ForEachTransport([](const Transport& transport) {
    const auto peer = NewPeer(transport, {Exchange(Plain("body")), Exchange(Plain("body"))});
    ExposedClient client(peer->Port(), SettingsOf(transport));
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(client.GetResp(), kErrorText);
    EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
    EXPECT_EQ(client.GetResp(), kErrorText);
  });
}

TEST(GetResp, WithoutAConnectionItReturnsTheErrorText) {
  ExposedClient without_socket;
  EXPECT_EQ(without_socket.GetResp(), kErrorText);
  ExposedClient unconnected(1);
  EXPECT_EQ(unconnected.GetResp(), kErrorText);
}

TEST(GetResp, TheHeadIsKeptAsAfterASender) {
  ScriptedPeer peer({Exchange("HTTP/1.1 206 Part\r\nContent-Type: text/x\r\n\r\nbody")});
  ExposedClient client(peer.Port());
  WriteOwnRequest(client);
  EXPECT_EQ(client.GetResp(), "body");
  EXPECT_EQ(client.m_statusCode, 206);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(Content(client, HTTP_CONTENT_TYPE), "text/x");
}

TEST(GetResp, AHeadThatCannotBeReadIsLoggedAtDebug) {
  for (const char* response :
       {"", "HTTP/1.1\r\n\r\n", "HTTP/2 200\r\n\r\n", "HTTP/1.1 404 No\r\n\r\n",
        "HTTP/1.1 200 OK\r\nContent-Type:\r\n\r\n"}) {
    LogCapture log;
    EXPECT_EQ(GetRespOf(response), kErrorText);
    EXPECT_THAT(LinesOf(log, "GetResp"),
                ElementsAre(IsHttpLog("debug", "GetResp", "Http Resp error\n")));
  }
}

TEST(GetResp, TheBodyIsLoggedAtDebug2) {
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  EXPECT_EQ(GetRespOf(Chunked(kWikipedia)), "Wikipedia");
  EXPECT_EQ(GetRespOf(Plain("%s%n")), "%s%n");
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("debug2", "GetResp", "strRet = Wikipedia\n"),
                                             IsHttpLog("debug2", "GetResp", "strRet = %s%n\n")));
  log.Clear();
  log.SetLevel(kHttpCategory, 5);
  GetRespOf(Plain("body"));
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(GetResp, AReadErrorReturnsTheErrorTextAndALine) {
  const std::string head = Plain("");
  const int head_size = static_cast<int>(head.size());
  for (const std::string& response : {Plain("part"), Chunked("9\r\npart")}) {
    ScriptedPeer peer({Exchange(response)});
    ExposedClient client(peer.Port(), SettingsOf({false, false}));
    WriteOwnRequest(client);
    LogCapture log;
    log.SetLevel(kHttpCategory, 6);
    {
      Faults faults;  // a direct client reads the head byte by byte, then "part" at once
      faults.FailFrom(Call::kRead, static_cast<int>(response.size()) - 4 + 2);
      EXPECT_EQ(client.GetResp(), kErrorText);
      EXPECT_GT(faults.Count(Call::kRead), head_size);
    }
    EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("debug", "GetResp", "Read data error\n")));
  }
}
