// The SOAP POST over the client's own socket, its login and its XML reply.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/tree.h>

#include <sstream>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kSoapType[] = "Content-Type: application/soap+xml; charset=utf-8\r\n";
constexpr char kDigest[] = "Digest realm=\"r\", nonce=\"n\"";
constexpr int kMebibyte = 1 << 20;

// A reply that announces `announced` bytes.
std::string Announcing(const std::string& announced, const std::string& body,
                       const std::string& status = "200 OK") {
  return "HTTP/1.1 " + status + "\r\nContent-Length: " + announced + "\r\n\r\n" + body;
}

std::string Soap(const std::string& body, const std::string& status = "200 OK") {
  return Announcing(std::to_string(body.size()), body, status);
}

std::string Unauthorized(const std::string& challenge, const std::string& body) {
  return Soap(body, "401 No\r\nWWW-Authenticate: " + challenge);
}

std::string RequestText(const std::string& authorization, const std::string& body) {
  return "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\n" + std::string(kSoapType) + authorization +
         "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

ClientSettings WithLogin() {
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  return settings;
}

struct Outcome {
  int result = -1;
  std::string reply = "old";
  int kept = -1;  // the client's m_result
};

bool operator==(const Outcome& a, const Outcome& b) {
  return a.result == b.result && a.reply == b.reply && a.kept == b.kept;
}

std::ostream& operator<<(std::ostream& out, const Outcome& outcome) {
  return out << outcome.result << ", reply [" << outcome.reply.substr(0, 200) << "] of "
             << outcome.reply.size() << " bytes, kept " << outcome.kept;
}

Outcome SoapOf(const std::string& reply, const ClientSettings& settings = {}) {
  ScriptedPeer peer({Exchange(reply)});
  ClientProbe client(peer.Port(), settings);
  Outcome outcome;
  outcome.result = client.SendReqBySocketPost("x", outcome.reply);
  outcome.kept = client.m_result;
  return outcome;
}

const Outcome kNothingRead = {HTTP_RET_IO_ERROR, "old", HTTP_RET_OK};

Outcome AuthOf(ClientProbe& client) {
  Outcome outcome;
  outcome.result = client.SendAuthReqBySocketPost("x", outcome.reply);
  outcome.kept = client.m_result;
  return outcome;
}

// A document that is freed at the end.
struct OwnedDoc {
  ~OwnedDoc() { xmlFreeDoc(doc); }
  std::string Text() const {
    xmlChar* content = xmlNodeGetContent(xmlDocGetRootElement(doc));
    const std::string text = reinterpret_cast<const char*>(content);
    xmlFree(content);
    return text;
  }
  xmlDoc* doc = nullptr;
};

// The text of the document that a reply's body gives; "(null)" for no document.
std::string XmlTextOf(const std::string& body) {
  ScriptedPeer peer({Exchange(Soap(body))});
  ClientProbe client(peer.Port());
  OwnedDoc reply;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", reply.doc), HTTP_RET_OK);
  return reply.doc != nullptr ? reply.Text() : "(null)";
}

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

std::vector<LogLine> LinesOf(const LogCapture& log, const std::string& function) {
  std::vector<LogLine> lines;
  for (const LogLine& line : log.Lines("http")) {
    if (line.function == function) lines.push_back(line);
  }
  return lines;
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
  EXPECT_EQ(SoapOf(Soap(body, "500 Oops")), (Outcome{HTTP_RET_OK, body, HTTP_RET_BAD_RESPONSE}));
  ScriptedPeer peer({Exchange(Soap(body, "500 Oops"))});
  ClientProbe client(peer.Port());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_BAD_RESPONSE, body, HTTP_RET_BAD_RESPONSE}));
}

TEST(SendAuthReqBySocketPost, AChallengeOfDigestIsAnsweredWithDigestBehindTheType) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "no")), Exchange(Soap("second"))});
  ClientProbe client(peer.Port(), WithLogin());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
  ClientProbe same(1, WithLogin());
  same.m_strAuthenticate = kDigest;
  EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  EXPECT_EQ(peer.Received(1), RequestText(same.GenDigestAccessAuth("POST", "") + "\r\n", "x"));
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendAuthReqBySocketPost, ARetryThatCannotConnectLeavesTheBodyOfThe401) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "denied"))});
  ClientProbe client(peer.Port(), WithLogin());
  Faults faults;
  faults.FailFrom(Call::kConnect, 2);
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_IO_ERROR, "denied", HTTP_RET_UNAUTHORIZED}));
}

TEST(SendReqByXMLSocketPost, ABodyThatIsNoXmlGivesANullDocumentAndOk) {
  ScriptedPeer peer({Exchange(Soap("<a>no end"))});
  ClientProbe client(peer.Port());
  OwnedDoc earlier;
  earlier.doc = xmlNewDoc(BAD_CAST "1.0");
  xmlDoc* doc = earlier.doc;  // overwritten, not freed
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", doc), HTTP_RET_OK);
  EXPECT_EQ(doc, nullptr);
}

TEST(SendReqByXMLSocketPost, TextOfTwoLinesIsJoinedWithNothingBetween) {
  EXPECT_EQ(XmlTextOf("<a>one\r\ntwo</a>"), "onetwo");
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
    EXPECT_EQ(SoapOf(Soap("reply"), settings), (Outcome{HTTP_RET_OK, "reply", HTTP_RET_OK}));
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
    EXPECT_EQ(SoapOf(Announcing(length, "body")), (Outcome{HTTP_RET_OK, "body", HTTP_RET_OK}))
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
            (Outcome{HTTP_RET_OK, "bo", HTTP_RET_OK}));
}

TEST(SendReqBySocketPost, AChunkedReplyWithoutALengthIsNeverRead) {
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n2\r\nok\r\n0\r\n\r\n"),
            kNothingRead);
}

TEST(SendReqBySocketPost, AHeadThatIsNoHttpHeadGivesItsResultAndNoBody) {
  EXPECT_EQ(SoapOf("nonsense\r\n"), (Outcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_BAD_RESPONSE}));
  EXPECT_EQ(SoapOf("HTTP/1.1 200 OK\r\nContent-Length:\r\n\r\n"),
            (Outcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_NOT_READY}));
  EXPECT_EQ(SoapOf(""), (Outcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_IO_ERROR}));
}

TEST(SendReqBySocketPost, AShortReadKeepsTheBytesThatCame) {
  for (const bool buffered : {false, true}) {
    ClientSettings settings;
    settings.buffered = buffered;
    EXPECT_EQ(SoapOf(Announcing("100", "abc"), settings),
              (Outcome{HTTP_RET_OK, "abc", HTTP_RET_OK}));
  }
}

TEST(SendReqBySocketPost, TheReplyEndsAtItsFirstZeroByte) {
  EXPECT_EQ(SoapOf(Soap("ab\0cd"s)), (Outcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Announcing("100", "ab\0cd"s)), (Outcome{HTTP_RET_OK, "ab", HTTP_RET_OK}));
  EXPECT_EQ(SoapOf(Soap("\0cd"s)), (Outcome{HTTP_RET_OK, "", HTTP_RET_OK}));
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
  const Outcome outcome = SoapOf(Soap(body));
  EXPECT_EQ(outcome.result, HTTP_RET_OK);
  EXPECT_EQ(outcome.reply.size(), body.size());
  EXPECT_TRUE(outcome.reply == body);
}

TEST(SendReqBySocketPost, RepliesAroundOneMebibyteArriveWhole) {
  for (const int extra : {-1, 0, 1}) {
    const std::string body(static_cast<size_t>(kMebibyte + extra), 'b');
    const Outcome outcome = SoapOf(Soap(body));
    EXPECT_EQ(outcome.result, HTTP_RET_OK);
    EXPECT_TRUE(outcome.reply == body) << outcome.reply.size();
  }
}

TEST(SendReqBySocketPost, AnErrorBehindTheFirstMebibyteKeepsWhatCame) {
  const std::string body(kMebibyte + 500, 'b');
  const Outcome outcome = SoapOf(Announcing(std::to_string(3 * kMebibyte), body));
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

// Its failures.

TEST(SendReqBySocketPost, AFailedConnectIsLoggedAndChangesNoField) {
  const ClosedPort port;
  ClientProbe client(port.Port());
  client.m_strAuthorization = "Authorization: X";
  client.m_result = HTTP_RET_REDIRECT;
  std::string reply = "old";
  LogCapture log;
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_strAuthorization, "Authorization: X");
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_connState, 0);
  EXPECT_EQ(reply, "old");
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Connection failed!\n\n")));
}

TEST(SendReqBySocketPost, AClientWithoutASocketCannotConnect) {
  ClientProbe client;
  std::string reply = "old";
  EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
  EXPECT_EQ(reply, "old");
}

TEST(SendReqBySocketPost, AWriteThatFailsOrTakesNothingIsLogged) {
  for (const long written : {-1, 0}) {
    ScriptedPeer peer({{DiscardUntilEnd()}});
    ClientProbe client(peer.Port());
    client.m_strAuthorization = "Authorization: X";
    client.m_result = HTTP_RET_REDIRECT;
    std::string reply = "old";
    LogCapture log;
    {
      Faults faults;
      faults.FailFrom(Call::kWrite, 1, EPIPE, written);
      EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
    }
    client.m_pSocket->Disconnect();
    EXPECT_EQ(client.m_strAuthorization, "");
    EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
    EXPECT_EQ(reply, "old");
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Write data faild.\n")));
  }
}

TEST(SendReqBySocketPost, AReadThatFailsOrGivesNothingIsLogged) {
  for (const bool buffered : {false, true}) {
    ScriptedPeer peer({Exchange(Announcing("9", ""))});
    ClientSettings settings;
    settings.buffered = buffered;
    ClientProbe client(peer.Port(), settings);
    std::string reply = "old";
    LogCapture log;
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
    EXPECT_EQ(reply, "old");
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
  ClientProbe client(peer.Port(), settings);
  std::string reply = "old";
  LogCapture log;
  {
    Faults faults;
    faults.FailFrom(Call::kRead, static_cast<int>(head.size()) + 1, ECONNRESET);
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(reply, "old");
  EXPECT_THAT(LinesOf(log, "SendReqBySocketPost"),
              ElementsAre(IsHttpLog("debug", "SendReqBySocketPost", "Read data faild.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheRequestALineNamesItsLengthAndOne) {
  ScriptedPeer peer({{ExpectEof()}});
  ClientProbe client(peer.Port());
  std::string reply = "old";
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kMalloc, 1);
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(reply, "old");
  const size_t needed = RequestText("", "x").size() + 1;
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need " +
                                                           std::to_string(needed) + " bytes.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheReplyALineNamesItsLengthAndOne) {
  LogCapture log(3);
  Faults faults;
  faults.FailFrom(Call::kMalloc, 2).FailFrom(Call::kRealloc, 1);
  EXPECT_EQ(SoapOf(Soap("reply")), kNothingRead);
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need 6 bytes.\n")));
}

TEST(SendReqBySocketPost, WithoutMemoryForTheRestOfTheReplyNothingOfItIsShown) {
  const std::string body(3 * kMebibyte, 'b');
  LogCapture log(3);
  for (const Call call : {Call::kMalloc, Call::kRealloc}) {
    ForEachFailingCall(call, [&](Faults& faults) {
      ScriptedPeer peer({{SendEndlessly(Soap(body), body.size())}});
      ClientProbe client(peer.Port());
      std::string reply = "old";
      log.Clear();
      const int result = client.SendReqBySocketPost("x", reply);
      client.m_pSocket->Disconnect();
      EXPECT_EQ(result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
      EXPECT_EQ(reply == "old", faults.Struck());
      EXPECT_EQ(log.Lines("http").size(), faults.Struck() ? 1u : 0u);
    });
  }
}

TEST(SendReqBySocketPost, TheLineOfALaterPieceNamesTheAnnouncedLengthAndOne) {
  ScriptedPeer peer({{ExpectRequest(), SendEndlessly(Soap(std::string(3 * kMebibyte, 'b')), 1)}});
  ClientProbe client(peer.Port());
  std::string reply = "old";
  LogCapture log(3);
  {
    Faults faults;
    faults.FailFrom(Call::kRealloc, 1).FailFrom(Call::kMalloc, 3);
    EXPECT_EQ(client.SendReqBySocketPost("x", reply), HTTP_RET_IO_ERROR);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(reply, "old");
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsHttpLog("error", "SendReqBySocketPost",
                                                       "Out of memory. Need 3145729 bytes.\n")));
}

// The login.

TEST(SendAuthReqBySocketPost, AReplyThatIsNo401EndsIt) {
  const std::pair<const char*, int> table[] = {{"200 OK", HTTP_RET_OK},
                                               {"302 Found", HTTP_RET_REDIRECT},
                                               {"403 No", HTTP_RET_BAD_RESPONSE},
                                               {"414 Long", HTTP_RET_URI_TOO_LONG}};
  for (const auto& [status, expected] : table) {
    ScriptedPeer peer(
        {Exchange(Soap("body", std::string(status) + "\r\nWWW-Authenticate: " + kDigest))});
    ClientSettings settings = WithLogin();
    settings.basic_auth = true;  // plays no part here
    ClientProbe client(peer.Port(), settings);
    EXPECT_EQ(AuthOf(client), (Outcome{expected, "body", expected}));
    EXPECT_EQ(peer.Received(0), RequestText("", "x"));
  }
}

TEST(SendAuthReqBySocketPost, AChallengeOfBasicInAnyCaseIsAnsweredWithBasic) {
  for (const char* challenge : {"Basic realm=\"r\"", "BASIC", "x bAsIc"}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "no")), Exchange(Soap("second"))});
    ClientProbe client(peer.Port(), WithLogin());
    EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
    EXPECT_EQ(peer.Received(1), RequestText("Authorization: Basic dTpw\r\n", "x"));
  }
}

TEST(SendAuthReqBySocketPost, DigestIsTestedBeforeBasicAndAnywhereInTheChallenge) {
  for (const char* challenge : {"Digest realm=\"basic\"", "Basic realm=\"dIgEsT\""}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "no")), Exchange(Soap("second"))});
    ClientProbe client(peer.Port(), WithLogin());
    EXPECT_EQ(AuthOf(client).result, HTTP_RET_OK);
    EXPECT_THAT(peer.Received(1), HasSubstr("utf-8\r\nAuthorization: Digest username=\"u\""));
  }
}

TEST(SendAuthReqBySocketPost, AChallengeOfNeitherGetsNoSecondRequest) {
  ScriptedPeer peer({Exchange(Unauthorized("Bearer x", "no"))});
  ClientProbe client(peer.Port(), WithLogin());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_UNAUTHORIZED, "no", HTTP_RET_UNAUTHORIZED}));
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendAuthReqBySocketPost, A401WithoutABodyIsAnsweredToo) {
  for (const char* challenge : {kDigest, "Basic x"}) {
    ScriptedPeer peer({Exchange(Unauthorized(challenge, "")), Exchange(Soap("second"))});
    ClientProbe client(peer.Port(), WithLogin());
    EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
    EXPECT_EQ(peer.Connections(), 2u);
  }
}

TEST(SendAuthReqBySocketPost, A401WithoutABodyAndWithoutAKnownSchemeIsAnIoError) {
  ScriptedPeer peer({Exchange(Unauthorized("Bearer x", ""))});
  ClientProbe client(peer.Port(), WithLogin());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_IO_ERROR, "old", HTTP_RET_UNAUTHORIZED}));
}

TEST(SendAuthReqBySocketPost, ASecond401GoesBackToTheCaller) {
  ScriptedPeer peer(
      {Exchange(Unauthorized(kDigest, "first")), Exchange(Unauthorized(kDigest, "second"))});
  ClientProbe client(peer.Port(), WithLogin());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_UNAUTHORIZED, "second", HTTP_RET_UNAUTHORIZED}));
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 2u);
}

TEST(SendAuthReqBySocketPost, AnUnreadFirstBodyIsClosedWithItsConnection) {
  ScriptedPeer peer(
      {{ExpectRequest(), Send("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\nunread"),
        DiscardUntilEnd()},
       Exchange(Soap("second"))});
  ClientProbe client(peer.Port(), WithLogin());
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_OK, "second", HTTP_RET_OK}));
}

TEST(SendAuthReqBySocketPost, AfterAnEarlier401AFailedConnectIsRetriedWithTheLogin) {
  ScriptedPeer peer({Exchange(Soap("late"))});
  ClientProbe client(peer.Port(), WithLogin());
  client.m_result = HTTP_RET_UNAUTHORIZED;
  client.m_strAuthenticate = " Basic x";
  Faults faults;
  faults.FailNth(Call::kConnect, 1);
  EXPECT_EQ(AuthOf(client), (Outcome{HTTP_RET_OK, "late", HTTP_RET_OK}));
  EXPECT_EQ(peer.Received(0), RequestText("Authorization: Basic dTpw\r\n", "x"));
}

TEST(SendAuthReqBySocketPost, AnEmptyBodyIsAnErrorBeforeAndAfterA401) {
  ClientProbe client(1, WithLogin());
  std::string reply = "old";
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendAuthReqBySocketPost("", reply), HTTP_RET_IO_ERROR);
  client.m_result = HTTP_RET_UNAUTHORIZED;
  client.m_strAuthenticate = " Basic x";
  EXPECT_EQ(client.SendAuthReqBySocketPost("", reply), HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_EQ(reply, "old");
  EXPECT_EQ(client.m_strAuthorization, "Authorization: Basic dTpw");
  EXPECT_EQ(log.Messages().size(), 3u);  // the retry says it once more
}

TEST(SendAuthReqBySocketPost, ItLogsNothingOfItsOwn) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "")), Exchange(Unauthorized(kDigest, ""))});
  ClientProbe client(peer.Port(), WithLogin());
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  AuthOf(client);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

// The XML reply.

TEST(SendReqByXMLSocketPost, CarriageReturnsAndLineFeedsAreRemovedEverywhere) {
  EXPECT_EQ(XmlTextOf("\n\r<?xml version=\"1.0\"?>\r\n<a\n>\rone\n\ntwo \r\n three</a>\n"),
            "onetwo  three");
}

TEST(SendReqByXMLSocketPost, AFaultWithStatus500IsADocument) {
  ScriptedPeer peer({Exchange(Soap("<fault>f</fault>", "500 Oops"))});
  ClientProbe client(peer.Port());
  OwnedDoc reply;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", reply.doc), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_BAD_RESPONSE);
  ASSERT_NE(reply.doc, nullptr);
  EXPECT_EQ(reply.Text(), "f");
  EXPECT_EQ(peer.Received(0), RequestText("", "x"));
}

TEST(SendReqByXMLSocketPost, AFailureLeavesTheDocument) {
  const ClosedPort port;
  ClientProbe client(port.Port());
  OwnedDoc earlier;
  earlier.doc = xmlNewDoc(BAD_CAST "1.0");
  xmlDoc* doc = earlier.doc;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", doc), HTTP_RET_IO_ERROR);
  EXPECT_EQ(doc, earlier.doc);
  EXPECT_EQ(client.SendReqByXMLSocketPost("", doc), HTTP_RET_IO_ERROR);
  EXPECT_EQ(doc, earlier.doc);
}

TEST(SendReqByXMLSocketPost, A401IsNotAnswered) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "<no/>"))});
  ClientProbe client(peer.Port(), WithLogin());
  OwnedDoc reply;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", reply.doc), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
  EXPECT_NE(reply.doc, nullptr);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendReqByXMLSocketPost, ABodyOfLineEndsAloneIsNoDocument) {
  EXPECT_EQ(XmlTextOf("\r\n\r\n"), "(null)");
}

TEST(SendReqByXMLSocketPost, SixteenMebibytesOfShortLinesAreJoined) {
  const std::string line(48, 'x');
  std::string lines;
  while (lines.size() < 4 * kMebibyte) lines += line + "\r\n";
  const std::string body =
      "<r><a>" + lines + "</a><a>" + lines + "</a><a>" + lines + "</a><a>" + lines + "</a></r>";
  const std::string text = XmlTextOf(body);
  EXPECT_EQ(text.size(), 4 * (lines.size() / 50) * 48);
  EXPECT_EQ(text.find_first_not_of('x'), std::string::npos);
}

TEST(SendReqByXMLSocketPost, ItLogsNothingOfItsOwn) {
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  XmlTextOf("no document");
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}
