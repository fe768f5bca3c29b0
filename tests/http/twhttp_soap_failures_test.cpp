// The SOAP POST: its failures, each with its log line.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/http_test_util.h"
#include "tests/http/soap_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;

const SoapOutcome kNothingRead = {HTTP_RET_IO_ERROR, "old", HTTP_RET_OK};

}  // namespace

// Its failures.

TEST(SendReqBySocketPost, AFailedConnectIsLoggedAndChangesNoField) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  client.m_strAuthorization = "Authorization: X";
  client.m_result = HTTP_RET_REDIRECT;
  std::string response = "old";
  LogCapture log;
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_strAuthorization, "Authorization: X");
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_connState, 0);
  EXPECT_EQ(response, "old");
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Connection failed!\n\n")));
}

TEST(SendReqBySocketPost, AClientWithoutASocketCannotConnect) {
  ExposedClient client;
  std::string response = "old";
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
  EXPECT_EQ(response, "old");
}

TEST(SendReqBySocketPost, AWriteThatFailsOrTakesNothingIsLogged) {
  for (const long written : {-1, 0}) {
    ScriptedPeer peer({{DiscardUntilEnd()}});
    ExposedClient client(peer.Port());
    client.m_strAuthorization = "Authorization: X";
    client.m_result = HTTP_RET_REDIRECT;
    std::string response = "old";
    LogCapture log;
    {
      Faults faults;
      faults.FailFrom(Call::kWrite, 1, EPIPE, written);
      EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
    }
    client.m_pSocket->Disconnect();
    EXPECT_EQ(client.m_strAuthorization, "");
    EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
    EXPECT_EQ(response, "old");
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Write data faild.\n")));
  }
}

TEST(SendReqBySocketPost, AReadThatFailsOrDeliversNothingIsLogged) {
  for (const bool buffered : {false, true}) {
    ScriptedPeer peer({Exchange(Announcing("9", ""))});
    ClientSettings settings;
    settings.buffered = buffered;
    ExposedClient client(peer.Port(), settings);
    std::string response = "old";
    LogCapture log;
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
    EXPECT_EQ(response, "old");
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_THAT(LinesOf(log, "SendReqBySocketPost"),
                ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Read data faild.\n")));
  }
}

TEST(SendReqBySocketPost, AReadErrorInPlaceOfTheBodyIsLogged) {
  const std::string head = Announcing("9", "");
  ScriptedPeer peer({{ExpectRequest(), Send(head + "body"), DiscardUntilEnd()}});
  ClientSettings settings;
  settings.buffered = false;  // a read for each byte of the head, so the next one is the body's
  ExposedClient client(peer.Port(), settings);
  std::string response = "old";
  LogCapture log;
  {
    Faults faults;
    faults.FailFrom(Call::kRead, static_cast<int>(head.size()) + 1, ECONNRESET);
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(response, "old");
  EXPECT_THAT(LinesOf(log, "SendReqBySocketPost"),
              ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Read data faild.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheRequestALineNamesItsLengthAndOne) {
  ScriptedPeer peer({{ExpectEof()}});
  ExposedClient client(peer.Port());
  std::string response = "old";
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kMalloc, 1);
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(response, "old");
  const size_t needed = RequestText("", "x").size() + 1;
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need " +
                                                           std::to_string(needed) + " bytes.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheResponseALineNamesItsLengthAndOne) {
  LogCapture log(3);
  Faults faults;
  faults.FailFrom(Call::kMalloc, 2).FailFrom(Call::kRealloc, 1);
  EXPECT_EQ(SoapOf(Soap("words")), kNothingRead);
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need 6 bytes.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheRestOfTheResponseNoneOfItIsReturned) {
  const std::string body(3 * kMebibyte, 'b');
  LogCapture log(3);
  for (const Call call : {Call::kMalloc, Call::kRealloc}) {
    ForEachFailingCall(call, [&](Faults& faults) {
      ScriptedPeer peer({{SendEndlessly(Soap(body), body.size())}});
      ExposedClient client(peer.Port());
      std::string response = "old";
      log.Clear();
      const int result = client.SendReqBySocketPost("x", response);
      client.m_pSocket->Disconnect();
      EXPECT_EQ(result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
      EXPECT_EQ(response == "old", faults.Struck());
      EXPECT_EQ(log.Lines("http").size(), faults.Struck() ? 1u : 0u);
    });
  }
}

TEST(SendReqBySocketPost, TheLineOfALaterPieceNamesTheAnnouncedLengthAndOne) {
  ScriptedPeer peer({{ExpectRequest(), SendEndlessly(Soap(std::string(3 * kMebibyte, 'b')), 1)}});
  ExposedClient client(peer.Port());
  std::string response = "old";
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kRealloc, 1).FailFrom(Call::kMalloc, 3);
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(response, "old");
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need 3145729 bytes.\n")));
}
