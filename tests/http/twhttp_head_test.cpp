// Reading a response's head from the connection.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/kept_fields.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace std::string_literals;
using namespace tarnwick;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The result code of a response's head.
int ResultOf(const std::string& reply) {
  return ClientAfter(reply)->m_result;
}

std::string WithStatus(const std::string& status) {
  return "HTTP/1.1 " + status + "\r\nContent-Type: x\r\n\r\n";
}

// A response with one header line.
std::unique_ptr<ClientProbe> AfterHeader(const std::string& line) {
  return ClientAfter("HTTP/1.1 200 OK\r\n" + line + "\r\n\r\n");
}

std::string NumberedLines(int from, int to) {
  std::string lines;
  for (int i = from; i <= to; ++i) lines += "H" + std::to_string(i) + ": x\r\n";
  return lines;
}

}  // namespace

TEST(CheckHttpResponse, A204WithoutHeadersIsOkWithAnEmptyMap) {
  const auto client = ClientAfter("HTTP/1.1 204 No Content\r\n\r\n");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(client->m_statusCode, 204);
  EXPECT_EQ(client->m_connState, 2);
  EXPECT_THAT(client->m_mapContent, IsEmpty());
}

TEST(CheckHttpResponse, Http2AndLowerCaseVersionsAreBadResponses) {
  EXPECT_EQ(ResultOf("HTTP/2 200 OK\r\n\r\n"), HTTP_RET_BAD_RESPONSE);
  const auto client = ClientAfter("http/1.1 200 OK\r\n\r\n");
  EXPECT_EQ(client->m_result, HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(client->m_statusCode, 0);
  EXPECT_EQ(client->m_connState, 1);
}

TEST(CheckHttpResponse, AStatusLineOfTheVersionAloneIsAnIoErrorWithStatusZero) {
  const auto client = ClientAfter("HTTP/1.1\r\n\r\n");
  EXPECT_EQ(client->m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(client->m_statusCode, 0);
}

TEST(CheckContentType, AContentTypeIsStoredWithItsParameters) {
  const auto client = AfterHeader("Content-Type: text/html; charset=utf-8");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "text/html; charset=utf-8");
}

TEST(CheckContentType, ACookieEndsBehindItsFirstSemicolonAndWithoutOneIsEmpty) {
  EXPECT_EQ(AfterHeader("Set-Cookie: id=42; Path=/")->m_strCookie, "id=42;");
  EXPECT_EQ(AfterHeader("Set-Cookie: id=42")->m_strCookie, "");
}

TEST(CheckContentType, AChallengeKeepsTheSpaceBehindTheColon) {
  const auto client = AfterHeader("WWW-Authenticate: Digest realm=\"r\", nonce=\"n\"  ");
  EXPECT_EQ(client->m_strAuthenticate, " Digest realm=\"r\", nonce=\"n\"  ");
}

TEST(CheckContentType, AContentLengthWithoutAValueIsNotReadyFromBothFunctions) {
  const std::string head = "Content-Type: a\r\nContent-Length:\r\nServer: s\r\n\r\n";
  const auto client = ClientAfter("HTTP/1.1 200 OK\r\n" + head);
  EXPECT_EQ(client->m_result, HTTP_RET_NOT_READY);
  EXPECT_EQ(client->m_connState, 1);
  EXPECT_EQ(client->m_statusCode, 200);
  EXPECT_EQ(client->m_mapContent.at(HTTP_CONTENT_TYPE), "a");
  ScriptedPeer peer({SendThenClose(head)});
  ClientProbe direct(peer.Port());
  ASSERT_EQ(direct.m_pSocket->Connect(), 0);
  direct.m_connState = 1;
  EXPECT_EQ(direct.CheckContentType(), HTTP_RET_NOT_READY);
  EXPECT_EQ(direct.m_connState, 1);
}

TEST(CheckContentType, Of40HeaderLinesThe31stBeginsTheBody) {
  const auto client =
      ClientAfter("HTTP/1.1 200 OK\r\n" + NumberedLines(1, 29) + "Content-Type: a\r\n" +
                  "Content-Length: 4\r\n" + NumberedLines(32, 40) + "\r\nbody");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(client->m_connState, 2);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "a");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "(none)");
  EXPECT_EQ(ReadBody(*client), "Content-Length: 4\r\n" + NumberedLines(32, 40) + "\r\nbody");
}

TEST(CheckContentType, OfTwoContentLengthLinesTheFirstIsKept) {
  const auto client = AfterHeader("Content-Length: 5\r\nContent-Length: 7");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "5");
}

TEST(CheckContentType, AfterExactly30LinesTheEmptyLineStaysInFrontOfTheBody) {
  const auto client = ClientAfter("HTTP/1.1 200 OK\r\n" + NumberedLines(1, 30) + "\r\nbody");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(ReadBody(*client), "\r\nbody");
}

TEST(CheckContentType, After29LinesTheBodyFollowsTheEmptyLine) {
  const auto client = ClientAfter("HTTP/1.1 200 OK\r\n" + NumberedLines(1, 29) + "\r\nbody");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(ReadBody(*client), "body");
}

TEST(CheckHttpResponse, EachStatusHasItsResult) {
  const std::pair<int, int> table[] = {
      {100, 5}, {199, 5}, {200, 0}, {201, 0}, {206, 0}, {299, 0}, {300, 5}, {301, 5}, {302, 7},
      {303, 5}, {304, 5}, {307, 5}, {400, 5}, {401, 4}, {402, 5}, {403, 5}, {404, 5}, {413, 5},
      {414, 8}, {415, 5}, {500, 5}, {503, 5}, {599, 5}, {0, 5},   {20, 5},  {-200, 5}};
  for (const auto& [status, result] : table) {
    const auto client = ClientAfter(WithStatus(std::to_string(status)));
    EXPECT_EQ(client->m_result, result) << status;
    EXPECT_EQ(client->m_statusCode, status);
    EXPECT_EQ(client->m_connState, 2);
    EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "x") << status;
  }
}

TEST(CheckHttpResponse, AStatusThatIsNoNumberIsABadResponseOfStatusZero) {
  const auto client = ClientAfter(WithStatus("OK"));
  EXPECT_EQ(client->m_result, HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(client->m_statusCode, 0);
  EXPECT_EQ(client->m_connState, 2);
}

TEST(CheckHttpResponse, InAnyStateButWrittenItIsNotReadyAndClearsTheStatus) {
  ClientProbe client(80);
  for (const int state : {0, 2, -1, 3}) {
    client.m_connState = state;
    client.m_statusCode = 200;
    EXPECT_EQ(client.CheckHttpResponse(), HTTP_RET_NOT_READY);
    EXPECT_EQ(client.m_statusCode, 0);
    EXPECT_EQ(client.m_connState, state);
  }
}

TEST(CheckHttpResponse, ItsCodeIsNotStored) {
  ScriptedPeer peer({SendThenClose("HTTP/1.1 302 Found\r\n\r\n")});
  ClientProbe client(peer.Port());
  ASSERT_EQ(client.m_pSocket->Connect(), 0);
  client.m_connState = 1;
  EXPECT_EQ(client.CheckHttpResponse(), HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_result, HTTP_RET_NOT_READY);
}

TEST(CheckHttpResponse, APeerThatClosesWithoutAByteIsAnIoError) {
  ScriptedPeer peer({RequestThenClose()});
  ClientProbe client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 1);
}

TEST(CheckHttpResponse, AFailingReadIsAnIoError) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n"), DiscardUntilEnd()}});
  ClientProbe client(peer.Port());
  Faults faults;
  faults.FailFrom(Call::kRead, 1, ECONNRESET);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  client.m_pSocket->Disconnect();
}

TEST(CheckContentType, AFailingReadIsLoggedAndKeepsWhatWasParsed) {
  const std::string start = "HTTP/1.1 200 OK\r\nContent-Type: a\r\nServ";
  ScriptedPeer peer({{ExpectRequest(), Send(start + "er: s"), DiscardUntilEnd()}});
  ClientProbe client(peer.Port());
  LogCapture log;
  {
    Faults faults;
    faults.Limit(Call::kRead, start.size()).FailFrom(Call::kRead, 2, ECONNRESET);
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  }
  client.m_pSocket->Disconnect();
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 1);
  EXPECT_EQ(client.m_statusCode, 200);
  EXPECT_EQ(client.m_mapContent.at(HTTP_CONTENT_TYPE), "a");
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug3", "CheckContentType", "Content-Type: a\n"),
                          IsHttpLog("debug", "CheckContentType", "Connect failed!\n\n")));
}

TEST(CheckContentType, EachHeaderLineIsLoggedAtDebug3AndTheOthersAreNot) {
  LogCapture log;
  AfterHeader("Server: a %s %n b\r\nContent-Type: text/html");
  EXPECT_THAT(log.Lines("http"),
              ElementsAre(IsHttpLog("debug3", "CheckContentType", "Server: a %s %n b\n"),
                          IsHttpLog("debug3", "CheckContentType", "Content-Type: text/html\n")));
}

TEST(CheckContentType, BelowDebug3NoHeaderLineIsLogged) {
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  AfterHeader("Server: a");
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(CheckContentType, BelowDebugAFailingReadIsNotLogged) {
  LogCapture log(4);
  ResultOf("HTTP/1.1 200 OK\r\nServer: a\r");
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}

TEST(CheckContentType, TheThreeMapHeadersAreTrimmedOfSpacesOnly) {
  const auto client =
      AfterHeader("content-type:   a b  \r\nCONTENT-LENGTH: 12 \r\nContent-Range:\tbytes 0-1/2\t");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "a b");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "12");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_RANGE), "\tbytes 0-1/2\t");
}

TEST(CheckContentType, ARepeatedMapHeaderKeepsItsFirstValueEvenAnEmptyOne) {
  const auto client =
      AfterHeader("Content-Type:  \r\nContent-Type: b\r\nContent-Range: 1\r\nContent-Range: 2");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_RANGE), "1");
}

TEST(CheckContentType, TheOtherRepeatedHeadersKeepTheirLastValue) {
  const auto client = AfterHeader(
      "Set-Cookie: a=1;\r\nSet-Cookie: b=2;\r\nWWW-Authenticate: Digest d\r\n"
      "WWW-Authenticate: Basic b\r\nTransfer-Encoding: gzip\r\nTransfer-Encoding: chunked ");
  EXPECT_EQ(client->m_strCookie, "b=2;");
  EXPECT_EQ(client->m_strAuthenticate, " Basic b");
  EXPECT_EQ(client->GetTransferEncoding(), "chunked");
}

TEST(CheckContentType, ALaterCookieWithoutASemicolonEmptiesTheEarlierOne) {
  EXPECT_EQ(AfterHeader("Set-Cookie: a=1;\r\nSet-Cookie: b=2")->m_strCookie, "");
}

TEST(CheckContentType, ALongerNameWithAKnownPrefixCountsAsTheKnownOne) {
  const auto client = AfterHeader("Content-Type-Options: nosniff\r\nSet-Cookie2: x=1;");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "nosniff");
  EXPECT_EQ(client->m_strCookie, "x=1;");
}

TEST(CheckContentType, ANewResponseForgetsAllButTheTransferEncoding) {
  ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nContent-Type: a\r\nSet-Cookie: s=1;\r\n"
                              "WWW-Authenticate: Basic\r\nTransfer-Encoding: chunked\r\n\r\n"),
                     Exchange("HTTP/1.1 200 OK\r\n\r\n")});
  ClientProbe client(peer.Port());
  client.SendRequestByGet();
  EXPECT_EQ(client.m_strCookie, "s=1;");
  client.SendRequestByGet();
  EXPECT_THAT(client.m_mapContent, IsEmpty());
  EXPECT_EQ(client.m_strCookie, "");
  EXPECT_EQ(client.m_strAuthenticate, "");
  EXPECT_EQ(client.GetTransferEncoding(), "chunked");
}

TEST(CheckContentType, AHeaderLineWithoutANameIsNotReady) {
  for (const char* line : {":", " : ", "=;", "   "}) {
    const auto client = AfterHeader("Content-Type: a\r\n"s + line + "\r\nContent-Length: 1");
    EXPECT_EQ(client->m_result, HTTP_RET_NOT_READY) << line;
    EXPECT_EQ(client->m_connState, 1);
    EXPECT_EQ(client->m_mapContent.count(HTTP_CONTENT_LENGTH), 0u);
  }
}

TEST(CheckContentType, EachKnownNameWithoutAValueIsNotReady) {
  for (const KeptField& field : kKeptFields) {
    const std::string name(field.name);
    EXPECT_EQ(AfterHeader(name)->m_result, HTTP_RET_NOT_READY) << name;
    EXPECT_EQ(AfterHeader(name + ":")->m_result, HTTP_RET_NOT_READY) << name;
  }
  EXPECT_EQ(AfterHeader("Server:")->m_result, HTTP_RET_OK);
}

TEST(CheckContentType, LineFeedsAloneEndLinesToo) {
  const auto client = ClientAfter("HTTP/1.1 200 OK\nContent-Type: a\n\nbody");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "a");
  EXPECT_EQ(ReadBody(*client), "body");
}

// A server may cut its answer anywhere.

namespace {

constexpr char kWholeHead[] =
    "HTTP/1.1 200 OK\r\n"    // 17 bytes
    "Content-Length: 5\r\n"  // 19 bytes
    "Set-Cookie: s=1;\r\n"   // 18 bytes
    "\r\n";

// The documented result of kWholeHead cut after `n` bytes. A carriage return must have its line
// feed; a line may end with the stream, and an empty one ends the head.
int ResultOfCutHead(size_t n) {
  const std::string cut(kWholeHead, n);
  if (n == 0) return HTTP_RET_IO_ERROR;
  if (cut.back() == '\r') return HTTP_RET_IO_ERROR;
  if (n < 8) return HTTP_RET_BAD_RESPONSE;   // no version yet
  if (n < 10) return HTTP_RET_IO_ERROR;      // no status yet
  if (n < 12) return HTTP_RET_BAD_RESPONSE;  // status 2 or 20
  for (const char* name : {"Content-Length", "Content-Length:", "Set-Cookie", "Set-Cookie:"}) {
    const std::string end = "\r\n"s + name;
    if (n > end.size() && cut.compare(n - end.size(), end.size(), end) == 0) {
      return HTTP_RET_NOT_READY;
    }
  }
  return HTTP_RET_OK;
}

}  // namespace

TEST(ResponseHead, CutAtEveryByteItHasTheDocumentedResult) {
  for (size_t n = 0; n < sizeof(kWholeHead); ++n) {
    const auto client = ClientAfter(std::string(kWholeHead, n));
    EXPECT_EQ(client->m_result, ResultOfCutHead(n)) << n << " bytes";
    const bool read = client->m_connState == 2;
    EXPECT_EQ(read, client->m_result == HTTP_RET_OK || (10 <= n && n < 12)) << n << " bytes";
  }
}

TEST(ResponseHead, InTwoPiecesItIsReadAsInOne) {
  const std::string reply = std::string(kWholeHead) + "12345";
  for (size_t n = 1; n < reply.size(); ++n) {
    ScriptedPeer peer({ExchangeInPieces({reply.substr(0, n), reply.substr(n)})});
    ClientProbe client(peer.Port());
    client.SendRequestByGet();
    EXPECT_EQ(client.m_result, HTTP_RET_OK) << n;
    EXPECT_EQ(Content(client, HTTP_CONTENT_LENGTH), "5") << n;
    EXPECT_EQ(client.m_strCookie, "s=1;") << n;
    EXPECT_EQ(ReadBody(client), "12345") << n;
  }
}

TEST(ResponseHead, ByteByByteItIsReadAsInOne) {
  for (const bool buffered : {true, false}) {
    ScriptedPeer peer({ExchangeByteByByte(std::string(kWholeHead) + "12345")});
    ClientSettings settings;
    settings.buffered = buffered;
    ClientProbe client(peer.Port(), settings);
    client.SendRequestByGet();
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_EQ(Content(client, HTTP_CONTENT_LENGTH), "5");
    EXPECT_EQ(ReadBody(client), "12345");
  }
}

TEST(ResponseHead, ResetAtAnyByteItHasADocumentedResult) {
  for (size_t n = 0; n < sizeof(kWholeHead); n += 5) {
    ScriptedPeer peer({{ExpectRequest(), Send(std::string(kWholeHead, n)), Reset()}});
    ClientProbe client(peer.Port());
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_TRUE(client.m_result == HTTP_RET_IO_ERROR || client.m_result == ResultOfCutHead(n)) << n;
  }
}

TEST(ResponseHead, OfASilentServerItIsAnIoErrorAfterTheWaits) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 O"), DiscardUntilEnd()}});
  ClientProbe client(peer.Port());
  Faults faults;
  faults.Return(Call::kSelect, 3, INT_MAX, 0);  // each wait ends at once, without a byte
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_GE(faults.Count(Call::kRead), 7);
  client.m_pSocket->Disconnect();
}

// What a server may send instead of a head.

TEST(ResponseHeadBadInput, AStatusBeyondAnIntIsABadResponse) {
  for (const char* status : {"99999999999", "4294967496", "4294967697", "18446744073709551816"}) {
    EXPECT_EQ(ResultOf(WithStatus(status)), HTTP_RET_BAD_RESPONSE) << status;
  }
}

TEST(ResponseHeadBadInput, AHeaderLineOf5000BytesIsReadInPiecesAndTheNextOneIsFound) {
  const auto client = AfterHeader("X-Long: " + std::string(4992, 'a') + "\r\nContent-Length: 5");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "5");
}

TEST(ResponseHeadBadInput, AKnownHeaderLineOf5000BytesIsKeptUpToTheLineLimit) {
  const auto client = AfterHeader("Content-Type:" + std::string(4987, 'a'));
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), std::string(2047 - 13, 'a'));
}

TEST(ResponseHeadBadInput, AnEndlessHeadTakesThirtyLinesAndNoMore) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n"),
                      SendEndlessly(std::string(4096, 'a'), 64 << 20)}});
  ClientProbe client(peer.Port());
  LogCapture log;
  log.SetLevel(57, 0);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  EXPECT_EQ(log.Lines("http").size(), 30u);
  client.m_pSocket->Disconnect();
}

TEST(ResponseHeadBadInput, AnEndlessStatusLineIsCutAtTheLineLimit) {
  const auto client = ClientAfter("HTTP/1.1 " + std::string(3000, '2') + "\r\n\r\n");
  EXPECT_EQ(client->m_result, HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(ResultOf(std::string(5000, ' ') + "\r\n\r\n"), HTTP_RET_IO_ERROR);
}

TEST(ResponseHeadBadInput, ZeroBytesInLinesEndInAResult) {
  const auto client = AfterHeader("Content-Type: a\0b"s + "\r\nContent-Length: 5");
  EXPECT_EQ(client->m_result, HTTP_RET_OK);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE).substr(0, 1), "a");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "5");
  const auto known =
      ::testing::AnyOf(HTTP_RET_OK, HTTP_RET_NOT_READY, HTTP_RET_IO_ERROR, HTTP_RET_BAD_RESPONSE);
  EXPECT_THAT(ResultOf("HTTP/1.1\0 200 OK\r\n\r\n"s), known);
  EXPECT_THAT(ResultOf("\0HTTP/1.1 200 OK\r\n\r\n"s), known);
  EXPECT_THAT(ResultOf("HTTP/1.1 200 OK\r\n\0\r\nServer: s\r\n\r\n"s), known);
  EXPECT_EQ(ResultOf("HTTP/1.1 200\0 OK\r\n\r\n"s), HTTP_RET_OK);
}

TEST(ResponseHeadBadInput, EveryByteValueIsTakenInNamesAndValues) {
  for (int first = 1; first < 256; first += 14) {
    std::string head = "HTTP/1.1 200 OK\r\n";
    for (int byte = first; byte < first + 14 && byte < 256; ++byte) {
      if (byte == '\r' || byte == '\n') continue;
      const std::string b(1, static_cast<char>(byte));
      head += "X" + b + "Y: z\r\nX-Value: v" + b + "w\r\n";
    }
    const auto client = ClientAfter(head + "Content-Length: 4\r\n\r\nbody");
    EXPECT_EQ(client->m_result, HTTP_RET_OK) << first;
    EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "4") << first;
    EXPECT_EQ(ReadBody(*client), "body") << first;
  }
}

TEST(ResponseHeadBadInput, GarbageIsABadResponseOrAnIoError) {
  EXPECT_EQ(ResultOf("\x16\x03\x01\x02\r\n"), HTTP_RET_BAD_RESPONSE);
  EXPECT_EQ(ResultOf("\r\n\r\nHTTP/1.1 200 OK\r\n\r\n"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOf("<html></html>"), HTTP_RET_BAD_RESPONSE);
}
