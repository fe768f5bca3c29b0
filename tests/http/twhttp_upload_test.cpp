// The streaming upload.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The head that a client sends to "cam", with a line of its own after the host.
std::string Head(int port, const std::string& cookie_line) {
  return "POST /up/x HTTP/1.1\r\nHost: cam:" + std::to_string(port) + "\r\n" + cookie_line +
         "Content-Type: multipart/form-data; boundary=-----------QUENMULTIPART_BOUNDARY-----------"
         "\r\nContent-Length: 137438953472\r\nCache-Control :no-cache\r\n"
         "Connection: keep-alive\r\n\r\n";
}

ClientSettings ForUpload() {
  ClientSettings settings;
  settings.path = "up/x";
  return settings;
}

// Opens an upload and closes it; expects the head alone.
void ExpectHead(const ClientSettings& settings, const std::string& cookie,
                const std::string& cookie_line) {
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), ExpectEof()}});
  {
    ExposedClient client(peer.Port(), settings);
    client.m_strHost = "cam";
    client.SetCookie(cookie);
    client.m_strAuthorization = "Authorization: X";
    EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
    EXPECT_EQ(client.m_connState, 2);
    EXPECT_EQ(client.m_strAuthorization, "Authorization: X");
    EXPECT_EQ(client.m_strCookie, cookie);
  }
  EXPECT_EQ(peer.Received(0), Head(peer.Port(), cookie_line));
}

std::string SeveralMebibytes() {
  std::string data;
  for (int i = 0; data.size() < 4 << 20; ++i) data += std::to_string(i) + '\0';
  return data;
}

// Writes in pieces as a caller does who reads them from somewhere.
void WriteInPieces(TWHttpClient& client, const std::string& data) {
  constexpr size_t kPiece = 60000;
  for (size_t at = 0; at < data.size(); at += kPiece) {
    const int size = static_cast<int>(std::min(kPiece, data.size() - at));
    ASSERT_EQ(client.WriteData(data.data() + at, size), size) << at;
  }
}

}  // namespace

TEST(OpenRawDataUpload, WithAnEmptyCookieTheHeadHasNoCookieLine) {
  ExpectHead(ForUpload(), "", "");
}

TEST(OpenRawDataUpload, ACookieIsBetweenHostAndType) {
  ExpectHead(ForUpload(), "s=1; t=2", "Cookie: s=1; t=2\r\n");
}

TEST(OpenRawDataUpload, Http11IsSentWhateverTheVersionAndNoCredentials) {
  for (const int version : {0, 1, 2, 3}) {
    ClientSettings settings = ForUpload();
    settings.version = static_cast<HTTP_VERSION>(version);
    settings.user = "u";
    settings.password = "p";
    settings.basic_auth = true;
    ExpectHead(settings, "", "");
  }
}

TEST(OpenRawDataUpload, TheCallerStreamsTheBodyAndReadsTheResponse) {
  const std::string data = SeveralMebibytes();
  for (const bool tls : {false, true}) {
    const std::vector<Script> scripts = {{ExpectUntil("\r\n\r\n"), ExpectBytes(data.size()),
                                          Send("HTTP/1.1 200 OK\r\n\r\ntaken"), Close()}};
    const std::unique_ptr<ScriptedPeer> peer =
        tls ? std::make_unique<TlsScriptedPeer>(scripts) : std::make_unique<ScriptedPeer>(scripts);
    ClientSettings settings = ForUpload();
    settings.https = tls;
    ExposedClient client(peer->Port(), settings);
    client.m_strHost = "cam";
    ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
    WriteInPieces(client, data);
    EXPECT_EQ(client.GetResp(), "taken");
    EXPECT_TRUE(peer->Received(0) == Head(peer->Port(), "") + data);
  }
}

TEST(OpenRawDataUpload, DestroyingTheClientEndsTheUpload) {
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), ExpectExactly("part"), ExpectEof()}});
  {
    ExposedClient client(peer.Port());
    ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
    EXPECT_EQ(client.WriteData("part", 4), 4);
  }
  peer.Finish();
}

TEST(OpenRawDataUpload, ASecondUploadRunsOnAFreshConnection) {
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), ExpectEof()}, {ExpectUntil("\r\n\r\n")}});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(OpenRawDataUpload, ItReadsNothingAndKeepsTheLastResponse) {
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), StallUntilFinish()}});
  ExposedClient client(peer.Port());
  client.m_result = HTTP_RET_REDIRECT;
  client.m_statusCode = 302;
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
  peer.Finish();
}

TEST(OpenRawDataUpload, AFailedConnectIsLoggedAtErrorAndLeavesTheState) {
  const ClosedPort port;
  for (const int state : {0, 1, 2}) {
    ExposedClient client(port.Port());
    client.m_connState = state;
    LogCapture log(3);
    EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_connState, state);
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("error", "OpenRawDataUpload", "Connection failed!\n")));
  }
}

TEST(OpenRawDataUpload, AWriteThatFailsOrTakesNothingIsLoggedAtErrorAndLeavesTheState) {
  for (const long written : {-1, 0}) {
    ScriptedPeer peer({{DiscardUntilEnd()}});
    ExposedClient client(peer.Port());
    client.m_connState = 1;
    LogCapture log(3);
    {
      Faults faults;
      faults.FailFrom(Call::kWrite, 1, EPIPE, written);
      EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR);
    }
    client.m_pSocket->Disconnect();
    EXPECT_EQ(client.m_connState, 1);
    EXPECT_EQ(client.WriteData("x", 1), -1);
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("error", "OpenRawDataUpload", "Write data faild.\n")));
  }
}

TEST(OpenRawDataUpload, AShortWriteIsSuccess) {
  ScriptedPeer peer({{DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  Faults faults;
  faults.Limit(Call::kWrite, 10).FailRange(Call::kWrite, 2, 2, EIO);
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.m_connState, 2);
  client.m_pSocket->Disconnect();
  EXPECT_EQ(peer.Received(0), "POST /a.cg");
}

TEST(OpenRawDataUpload, AFailedTlsWriteIsLoggedInTheSameWay) {
  TlsScriptedPeer peer({{Handshake(), DiscardUntilEnd()}});
  ClientSettings settings = ForUpload();
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kSslWrite, 1);
    EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("error", "OpenRawDataUpload", "Write data faild.\n")));
}

TEST(OpenRawDataUpload, AClientWithoutASocketCannotConnect) {
  ExposedClient client;
  LogCapture log(3);
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("error", "OpenRawDataUpload", "Connection failed!\n")));
}

TEST(OpenRawDataUpload, WithTheCategoryOffNothingIsLogged) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  LogCapture log;
  log.SetLevel(kHttpCategory, 0);
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}
