// The SOAP POST over the client's own socket.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "tests/http/http_test_util.h"
#include "tests/http/soap_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

const SoapOutcome kNothingRead = {HTTP_RET_IO_ERROR, "old", HTTP_RET_OK};

// The most address space that this process has had, in KiB.
long PeakKib() {
  std::istringstream status(ReadFile("/proc/self/status"));
  for (std::string word; status >> word;) {
    long peak = 0;
    if (word == "VmPeak:" && status >> peak) return peak;
  }
  ADD_FAILURE() << "no peak";
  return 0;
}

// The result of an exchange, made in a process of its own in order to see what memory it takes.
int InLittleMemory(const std::function<int()>& exchange) {
  const ChildResult child = RunInChild([&] {
    const long before = PeakKib();
    const int result = exchange();
    EXPECT_LT(PeakKib() - before, 64 * 1024);
    return result;
  });
  EXPECT_TRUE(child.exited);
  return child.code;
}

}  // namespace

TEST(SendReqBySocketPost, TheAuthorizationStandsBetweenTypeAndLengthAndIsSentOnce) {
  ScriptedPeer peer({Exchange(Soap("ok"))});
  ClientSettings settings;
  settings.path = "soap/svc";
  ClientProbe client(peer.Port(), settings);
  client.m_strHost = "cam";
  client.m_strAuthorization = "Authorization: X";
  std::string reply = "old";
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
  EXPECT_EQ(peer.Received(0),
            "POST /soap/svc HTTP/1.1\r\nHost: cam\r\n"
            "Content-Type: application/soap+xml; charset=utf-8\r\nAuthorization: X\r\n"
            "Content-Length: 1\r\n\r\nx");
  EXPECT_EQ(client.m_strAuthorization, "");
  EXPECT_EQ(reply, "ok");
}

TEST(SendReqBySocketPost, AnEmptyBodyIsAnErrorAndOpensNoConnection) {
  ScriptedPeer peer({});
  ClientProbe client(peer.Port());
  std::string reply = "old";
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendReqBySocketPost("", reply), HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_EQ(reply, "old");
  EXPECT_EQ(client.m_result, HTTP_RET_NOT_READY);
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Empty msg.\n")));
}

TEST(SendReqBySocketPost, AReplyWithALengthOfZeroOrNoneIsAnErrorWithTheResultOk) {
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"), kNothingRead);
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\n\r\nbody"), kNothingRead);
}

TEST(SendReqBySocketPost, TheBodyOfA500IsReadAndOnlyTheLoginVariantTellsTheStatus) {
  const std::string body(120, 'f');
  EXPECT_EQ(SoapOf(Soap(body, "500 Oops")),
            (SoapOutcome{HTTP_RET_OK, body, HTTP_RET_BAD_RESPONSE}));
  ScriptedPeer peer({Exchange(Soap(body, "500 Oops"))});
  ClientProbe client(peer.Port());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_BAD_RESPONSE, body, HTTP_RET_BAD_RESPONSE}));
}

// The request.

TEST(SendReqBySocketPost, Http11IsSentWhateverTheVersionAndNeitherCookieNorLogin) {
  for (const int version : {0, 1, 2, 3}) {
    ScriptedPeer peer({Exchange(Soap("ok"))});
    ClientSettings settings = WithLogin();
    settings.version = static_cast<HTTP_VERSION>(version);
    settings.basic_auth = true;
    ClientProbe client(peer.Port(), settings);
    client.SetCookie("s=1");
    std::string reply;
    EXPECT_EQ(client.SendReqBySocketPost("<e/>", reply), HTTP_RET_OK);
    EXPECT_EQ(peer.Received(0), RequestText("", "<e/>"));
  }
}

TEST(SendReqBySocketPost, AnEnvelopeOfSeveralMebibytesIsSentWhole) {
  const std::string body(3 * kMebibyte, 'e');
  ScriptedPeer peer({Exchange(Soap("ok"))});
  ClientProbe client(peer.Port());
  std::string reply;
  EXPECT_EQ(client.SendReqBySocketPost(body, reply), HTTP_RET_OK);
  EXPECT_TRUE(peer.Received(0) == RequestText("", body));
}

TEST(SendReqBySocketPost, AfterAZeroByteNothingOfTheBodyIsSent) {
  const std::string sent = "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\n" + std::string(kSoapType) +
                           "Content-Length: 4\r\n\r\nab";
  ScriptedPeer peer({{ExpectUntil("\r\n\r\nab"), Send(Soap("ok")), DiscardUntilEnd()}});
  {
    ClientProbe client(peer.Port());
    std::string reply;
    client.SendReqBySocketPost("ab\0c"s, reply);
  }
  // The request's whole length is written; only what stands before the zero byte is text.
  EXPECT_THAT(peer.Received(0), StartsWith(sent));
  EXPECT_THAT(peer.Received(0), Not(HasSubstr("c\0"s)));
  EXPECT_NE(peer.Received(0).back(), 'c');
}

TEST(SendReqBySocketPost, AShortWriteCountsAsSuccess) {
  ScriptedPeer peer({{ExpectBytes(10), Send(Soap("ok")), DiscardUntilEnd()}});
  ClientProbe client(peer.Port());
  std::string reply;
  {
    Faults faults;
    faults.Limit(Call::kWrite, 10).FailRange(Call::kWrite, 2, 2, EIO);
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(reply, "ok");
}

TEST(SendReqBySocketPost, EveryTransportCarriesTheSameExchange) {
  for (const bool buffered : {false, true}) {
    ClientSettings settings;
    settings.buffered = buffered;
    EXPECT_EQ(SoapOf(Soap("reply"), settings), (SoapOutcome{HTTP_RET_OK, "reply", HTTP_RET_OK}));
    TlsScriptedPeer peer({Exchange(Soap("reply"))});
    settings.https = true;
    ClientProbe client(peer.Port(), settings);
    std::string reply;
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
    EXPECT_EQ(reply, "reply");
    EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  }
}

// The reply.

TEST(SendReqBySocketPost, TheStateAndTheResultAreThoseOfTheHead) {
  ScriptedPeer peer({Exchange(Soap("ok", "302 Found"))});
  ClientProbe client(peer.Port());
  std::string reply;
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
}

TEST(SendReqBySocketPost, BytesBehindTheAnnouncedLengthStayUnread) {
  ScriptedPeer peer({Exchange(Announcing("3", "abcdef"))});
  ClientProbe client(peer.Port());
  std::string reply = "a longer text than the new one";
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
  EXPECT_EQ(reply, "abc");
  EXPECT_EQ(ReadBody(client), "def");
}

TEST(SendReqBySocketPost, TheLengthIsTheLeadingDecimalNumber) {
  for (const char* length : {"4", "+4", "004", "4 bytes", "4.9"}) {
    EXPECT_EQ(SoapOf(Announcing(length, "body")), (SoapOutcome{HTTP_RET_OK, "body", HTTP_RET_OK}))
        << length;
  }
}

TEST(SendReqBySocketPost, ALengthThatIsNegativeOrNoNumberIsAnErrorWithoutALine) {
  for (const char* length : {"0", "-1", "-4", "four", "0x4", ";", "-2147483648"}) {
    LogCapture log;
    EXPECT_EQ(SoapOf(Announcing(length, "body")), kNothingRead) << length;
    EXPECT_THAT(LinesOf(log, "SendReqBySocketPost"), IsEmpty()) << length;
  }
}

TEST(SendReqBySocketPost, TheFirstOfSeveralLengthsCounts) {
  EXPECT_EQ(SoapOf(Announcing("2\r\nContent-Length: 4", "body")),
            (SoapOutcome{HTTP_RET_OK, "bo", HTTP_RET_OK}));
}

TEST(SendReqBySocketPost, AChunkedReplyWithoutALengthIsNeverRead) {
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n2\r\nok\r\n0\r\n\r\n"),
            kNothingRead);
}

TEST(SendReqBySocketPost, AHeadThatIsNoHttpHeadGivesItsResultAndNoBody) {
  EXPECT_EQ(SoapOf("nonsense\r\n"), (SoapOutcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_BAD_RESPONSE}));
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nContent-Length:\r\n\r\n"),
            (SoapOutcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_NOT_READY}));
  EXPECT_EQ(SoapOf(""), (SoapOutcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_IO_ERROR}));
}

TEST(SendReqBySocketPost, AShortReadKeepsTheBytesThatCame) {
  for (const bool buffered : {false, true}) {
    ClientSettings settings;
    settings.buffered = buffered;
    EXPECT_EQ(SoapOf(Announcing("100", "abc"), settings),
              (SoapOutcome{HTTP_RET_OK, "abc", HTTP_RET_OK}));
  }
}

TEST(SendReqBySocketPost, TheReplyEndsAtItsFirstZeroByte) {
  EXPECT_EQ(SoapOf(Soap("ab\0cd"s)), (SoapOutcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Announcing("100", "ab\0cd"s)), (SoapOutcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Soap("\0cd"s)), (SoapOutcome{HTTP_RET_OK, "", HTTP_RET_OK}));
}

TEST(SendReqBySocketPost, ADirectReadIsNotRepeated) {
  const std::string head = Announcing("6", "");
  ScriptedPeer peer({{ExpectRequest(), Send(head + "abc"), DiscardUntilEnd()}});
  ClientSettings settings;
  settings.buffered = false;
  ClientProbe client(peer.Port(), settings);
  std::string reply;
  {
    Faults faults;
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
    EXPECT_EQ(faults.Count(Call::kRead), static_cast<int>(head.size()) + 1);
  }
  EXPECT_EQ(reply, "abc");
  client.m_pSocket->Disconnect();
}

TEST(SendReqBySocketPost, ABufferedReplyInPiecesArrivesWhole) {
  ScriptedPeer peer({ExchangeByteByByte(Soap("in pieces"))});
  ClientProbe client(peer.Port());
  std::string reply;
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_OK);
  EXPECT_EQ(reply, "in pieces");
}

TEST(SendReqBySocketPost, ABufferedReplyOfFiveMebibytesArrivesWhole) {
  std::string body;
  for (int i = 0; body.size() < 5 * kMebibyte; ++i) body += std::to_string(i) + " ";
  const SoapOutcome outcome = SoapOf(Soap(body));
  EXPECT_EQ(outcome.result, HTTP_RET_OK);
  EXPECT_EQ(outcome.reply.size(), body.size());
  EXPECT_TRUE(outcome.reply == body);
}

TEST(SendReqBySocketPost, RepliesAroundOneMebibyteArriveWhole) {
  for (const int extra : {-1, 0, 1}) {
    const std::string body(static_cast<size_t>(kMebibyte + extra), 'b');
    const SoapOutcome outcome = SoapOf(Soap(body));
    EXPECT_EQ(outcome.result, HTTP_RET_OK);
    EXPECT_TRUE(outcome.reply == body) << outcome.reply.size();
  }
}

TEST(SendReqBySocketPost, AnErrorBehindTheFirstMebibyteKeepsWhatCame) {
  const std::string body(kMebibyte + 500, 'b');
  const SoapOutcome outcome = SoapOf(Announcing(std::to_string(3 * kMebibyte), body));
  EXPECT_EQ(outcome.result, HTTP_RET_OK);
  EXPECT_TRUE(outcome.reply == body) << outcome.reply.size();
}

TEST(SendReqBySocketPost, ALengthThatDoesNotFitIsAnErrorAndTakesNoMemory) {
  for (const std::string& length :
       {"2147483647"s, "2147483648"s, "4294967295"s, "4294967297"s, "9223372036854775807"s,
        std::string(30, '9'), "-"s + std::string(30, '9'), "-4294967292"s}) {
    ScriptedPeer peer({Exchange(Announcing(length, "body"))});
    EXPECT_EQ(InLittleMemory([&] {
                ClientProbe client(peer.Port());
                std::string reply = "old";
                const int result = client.SendReqBySocketPost("x", reply);
                EXPECT_EQ(reply, "old");
                EXPECT_EQ(client.m_result, HTTP_RET_OK);
                return result;
              }),
              HTTP_RET_IO_ERROR)
        << length;
  }
}

TEST(SendReqBySocketPost, MemoryGrowsWithWhatArrivesAndNotWithWhatIsAnnounced) {
  const std::string body(3 * kMebibyte, 'b');
  for (const char* announced : {"536870912", "2147483646"}) {
    ScriptedPeer peer({Exchange(Announcing(announced, body))});
    EXPECT_EQ(InLittleMemory([&] {
                ClientProbe client(peer.Port());
                std::string reply;
                const int result = client.SendReqBySocketPost("x", reply);
                EXPECT_TRUE(reply == body) << reply.size();
                return result;
              }),
              HTTP_RET_OK)
        << announced;
  }
}
