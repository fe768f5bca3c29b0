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

TEST(SendReqBySocketPost, TheAuthorizationIsBetweenTypeAndLengthAndIsSentOnce) {
  ScriptedPeer peer({Exchange(Soap("ok"))});
  ClientSettings settings;
  settings.path = "soap/svc";
  ExposedClient client(peer.Port(), settings);
  client.m_strHost = "cam";
  client.m_strAuthorization = "Authorization: X";
  std::string response = "old";
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_EQ(peer.Received(0),
            "POST /soap/svc HTTP/1.1\r\nHost: cam\r\n"
            "Content-Type: application/soap+xml; charset=utf-8\r\nAuthorization: X\r\n"
            "Content-Length: 1\r\n\r\nx");
  EXPECT_EQ(client.m_strAuthorization, "");
  EXPECT_EQ(response, "ok");
}

TEST(SendReqBySocketPost, AnEmptyBodyIsAnErrorAndOpensNoConnection) {
  ScriptedPeer peer({});
  ExposedClient client(peer.Port());
  std::string response = "old";
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendReqBySocketPost("", response), HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_EQ(response, "old");
  EXPECT_EQ(client.m_result, HTTP_RET_NOT_READY);
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Empty msg.\n")));
}

TEST(SendReqBySocketPost, AResponseWithALengthOfZeroOrNoneIsAnErrorWithTheResultOk) {
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"), kNothingRead);
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\n\r\nbody"), kNothingRead);
}

TEST(SendReqBySocketPost, TheBodyOfA500IsReadAndOnlyTheVariantWithCredentialsReturnsTheStatus) {
  const std::string body(120, 'f');
  EXPECT_EQ(SoapOf(Soap(body, "500 Oops")),
            (SoapOutcome{HTTP_RET_OK, body, HTTP_RET_BAD_RESPONSE}));
  ScriptedPeer peer({Exchange(Soap(body, "500 Oops"))});
  ExposedClient client(peer.Port());
  EXPECT_EQ(AuthOf(client), (SoapOutcome{HTTP_RET_BAD_RESPONSE, body, HTTP_RET_BAD_RESPONSE}));
}

// The request.

TEST(SendReqBySocketPost, Http11IsSentWhateverTheVersionAndNeitherCookieNorCredentials) {
  for (const int version : {0, 1, 2, 3}) {
    ScriptedPeer peer({Exchange(Soap("ok"))});
    ClientSettings settings = WithCredentials();
    settings.version = static_cast<HTTP_VERSION>(version);
    settings.basic_auth = true;
    ExposedClient client(peer.Port(), settings);
    client.SetCookie("s=1");
    std::string response;
    EXPECT_EQ(client.SendReqBySocketPost("<e/>", response), HTTP_RET_OK);
    EXPECT_EQ(peer.Received(0), RequestText("", "<e/>"));
  }
}

TEST(SendReqBySocketPost, AnEnvelopeOfSeveralMebibytesIsSentWhole) {
  const std::string body(3 * kMebibyte, 'e');
  ScriptedPeer peer({Exchange(Soap("ok"))});
  ExposedClient client(peer.Port());
  std::string response;
  EXPECT_EQ(client.SendReqBySocketPost(body, response), HTTP_RET_OK);
  EXPECT_TRUE(peer.Received(0) == RequestText("", body));
}

TEST(SendReqBySocketPost, AfterAZeroByteNothingOfTheBodyIsSent) {
  const std::string sent = "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\n" + std::string(kSoapType) +
                           "Content-Length: 4\r\n\r\nab";
  ScriptedPeer peer({{ExpectUntil("\r\n\r\nab"), Send(Soap("ok")), DiscardUntilEnd()}});
  {
    ExposedClient client(peer.Port());
    std::string response;
    client.SendReqBySocketPost("ab\0c"s, response);
  }
  // The request's whole length is written; only what stands before the zero byte is text.
  EXPECT_THAT(peer.Received(0), StartsWith(sent));
  EXPECT_THAT(peer.Received(0), Not(HasSubstr("c\0"s)));
  EXPECT_NE(peer.Received(0).back(), 'c');
}

TEST(SendReqBySocketPost, AShortWriteIsSuccess) {
  ScriptedPeer peer({{ExpectBytes(10), Send(Soap("ok")), DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  std::string response;
  {
    Faults faults;
    faults.Limit(Call::kWrite, 10).FailRange(Call::kWrite, 2, 2, EIO);
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(response, "ok");
}

TEST(SendReqBySocketPost, EveryTransportCarriesTheSameExchange) {
  for (const bool buffered : {false, true}) {
    ClientSettings settings;
    settings.buffered = buffered;
    EXPECT_EQ(SoapOf(Soap("words"), settings), (SoapOutcome{HTTP_RET_OK, "words", HTTP_RET_OK}));
    TlsScriptedPeer peer({Exchange(Soap("words"))});
    settings.https = true;
    ExposedClient client(peer.Port(), settings);
    std::string response;
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
    EXPECT_EQ(response, "words");
    EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  }
}

// The response.

TEST(SendReqBySocketPost, TheStateAndTheResultAreThoseOfTheHead) {
  ScriptedPeer peer({Exchange(Soap("ok", "302 Found"))});
  ExposedClient client(peer.Port());
  std::string response;
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_statusCode, 302);
}

TEST(SendReqBySocketPost, BytesAfterTheAnnouncedLengthStayUnread) {
  ScriptedPeer peer({Exchange(Announcing("3", "abcdef"))});
  ExposedClient client(peer.Port());
  std::string response = "a longer text than the new one";
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_EQ(response, "abc");
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

TEST(SendReqBySocketPost, TheFirstOfSeveralLengthsIsTaken) {
  EXPECT_EQ(SoapOf(Announcing("2\r\nContent-Length: 4", "body")),
            (SoapOutcome{HTTP_RET_OK, "bo", HTTP_RET_OK}));
}

TEST(SendReqBySocketPost, AChunkedResponseWithoutALengthIsNeverRead) {
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n2\r\nok\r\n0\r\n\r\n"),
            kNothingRead);
}

TEST(SendReqBySocketPost, AHeadThatIsNoHttpHeadHasItsResultAndNoBody) {
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

TEST(SendReqBySocketPost, TheResponseEndsAtItsFirstZeroByte) {
  EXPECT_EQ(SoapOf(Soap("ab\0cd"s)), (SoapOutcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Announcing("100", "ab\0cd"s)), (SoapOutcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Soap("\0cd"s)), (SoapOutcome{HTTP_RET_OK, "", HTTP_RET_OK}));
}

TEST(SendReqBySocketPost, ADirectReadIsNotRepeated) {
  const std::string head = Announcing("6", "");
  ScriptedPeer peer({{ExpectRequest(), Send(head + "abc"), DiscardUntilEnd()}});
  ClientSettings settings;
  settings.buffered = false;
  ExposedClient client(peer.Port(), settings);
  std::string response;
  {
    Faults faults;
    EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
    EXPECT_EQ(faults.Count(Call::kRead), static_cast<int>(head.size()) + 1);
  }
  EXPECT_EQ(response, "abc");
  client.m_pSocket->Disconnect();
}

TEST(SendReqBySocketPost, ABufferedResponseInPiecesArrivesWhole) {
  ScriptedPeer peer({ExchangeByteByByte(Soap("in pieces"))});
  ExposedClient client(peer.Port());
  std::string response;
  EXPECT_EQ(client.SendReqBySocketPost("x", response), HTTP_RET_OK);
  EXPECT_EQ(response, "in pieces");
}

TEST(SendReqBySocketPost, ABufferedResponseOfFiveMebibytesArrivesWhole) {
  std::string body;
  for (int i = 0; body.size() < 5 * kMebibyte; ++i) body += std::to_string(i) + " ";
  const SoapOutcome outcome = SoapOf(Soap(body));
  EXPECT_EQ(outcome.result, HTTP_RET_OK);
  EXPECT_EQ(outcome.response.size(), body.size());
  EXPECT_TRUE(outcome.response == body);
}

TEST(SendReqBySocketPost, ResponsesAroundOneMebibyteArriveWhole) {
  for (const int extra : {-1, 0, 1}) {
    const std::string body(static_cast<size_t>(kMebibyte + extra), 'b');
    const SoapOutcome outcome = SoapOf(Soap(body));
    EXPECT_EQ(outcome.result, HTTP_RET_OK);
    EXPECT_TRUE(outcome.response == body) << outcome.response.size();
  }
}

TEST(SendReqBySocketPost, AnErrorAfterTheFirstMebibyteKeepsWhatCame) {
  const std::string body(kMebibyte + 500, 'b');
  const SoapOutcome outcome = SoapOf(Announcing(std::to_string(3 * kMebibyte), body));
  EXPECT_EQ(outcome.result, HTTP_RET_OK);
  EXPECT_TRUE(outcome.response == body) << outcome.response.size();
}

TEST(SendReqBySocketPost, ALengthThatDoesNotFitIsAnErrorAndTakesNoMemory) {
  for (const std::string& length :
       {"2147483647"s, "2147483648"s, "4294967295"s, "4294967297"s, "9223372036854775807"s,
        std::string(30, '9'), "-"s + std::string(30, '9'), "-4294967292"s}) {
    ScriptedPeer peer({Exchange(Announcing(length, "body"))});
    EXPECT_EQ(InLittleMemory([&] {
                ExposedClient client(peer.Port());
                std::string response = "old";
                const int result = client.SendReqBySocketPost("x", response);
                EXPECT_EQ(response, "old");
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
                ExposedClient client(peer.Port());
                std::string response;
                const int result = client.SendReqBySocketPost("x", response);
                EXPECT_TRUE(response == body) << response.size();
                return result;
              }),
              HTTP_RET_OK)
        << announced;
  }
}
