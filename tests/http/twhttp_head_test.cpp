// Reading a response's head from the connection.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/kept_fields.h"
#include "tests/http/http_test_util.h"
#include "tests/model/response.h"
#include "tests/support/faults.h"

using namespace std::string_literals;
using namespace tarnwick;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The result code of a response's head.
int ResultOf(const std::string& response) {
  return ClientAfter(response)->m_result;
}

std::string WithStatus(const std::string& status) {
  return "HTTP/1.1 " + status + "\r\nContent-Type: x\r\n\r\n";
}

// A response with one header line.
std::unique_ptr<ExposedClient> AfterHeader(const std::string& line) {
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

TEST(CheckContentType, ACookieEndsAfterItsFirstSemicolonAndWithoutOneIsEmpty) {
  EXPECT_EQ(AfterHeader("Set-Cookie: id=42; Path=/")->m_strCookie, "id=42;");
  EXPECT_EQ(AfterHeader("Set-Cookie: id=42")->m_strCookie, "");
}

TEST(CheckContentType, AChallengeKeepsTheSpaceAfterTheColon) {
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
  ExposedClient direct(peer.Port());
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
      {100, HTTP_RET_BAD_RESPONSE}, {199, HTTP_RET_BAD_RESPONSE}, {200, HTTP_RET_OK},
      {201, HTTP_RET_OK},           {206, HTTP_RET_OK},           {299, HTTP_RET_OK},
      {300, HTTP_RET_BAD_RESPONSE}, {301, HTTP_RET_BAD_RESPONSE}, {302, HTTP_RET_REDIRECT},
      {303, HTTP_RET_BAD_RESPONSE}, {304, HTTP_RET_BAD_RESPONSE}, {307, HTTP_RET_BAD_RESPONSE},
      {400, HTTP_RET_BAD_RESPONSE}, {401, HTTP_RET_UNAUTHORIZED}, {402, HTTP_RET_BAD_RESPONSE},
      {403, HTTP_RET_BAD_RESPONSE}, {404, HTTP_RET_BAD_RESPONSE}, {413, HTTP_RET_BAD_RESPONSE},
      {414, HTTP_RET_URI_TOO_LONG}, {415, HTTP_RET_BAD_RESPONSE}, {500, HTTP_RET_BAD_RESPONSE},
      {503, HTTP_RET_BAD_RESPONSE}, {599, HTTP_RET_BAD_RESPONSE}, {0, HTTP_RET_BAD_RESPONSE},
      {20, HTTP_RET_BAD_RESPONSE},  {-200, HTTP_RET_BAD_RESPONSE}};
  for (const auto& [status, result] : table) {
    const auto client = ClientAfter(WithStatus(std::to_string(status)));
    EXPECT_EQ(client->m_result, result) << status;
    EXPECT_EQ(client->m_statusCode, status);
    EXPECT_EQ(client->m_connState, 2);
    EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "x") << status;
  }
}

TEST(CheckHttpResponse, InAnyStateButWrittenItIsNotReadyAndClearsTheStatus) {
  ExposedClient client(80);
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
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.m_pSocket->Connect(), 0);
  client.m_connState = 1;
  EXPECT_EQ(client.CheckHttpResponse(), HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_result, HTTP_RET_NOT_READY);
}

TEST(CheckHttpResponse, AFailingReadIsAnIoError) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n"), DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  Faults faults;
  faults.FailFrom(Call::kRead, 1, ECONNRESET);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  client.m_pSocket->Disconnect();
}

TEST(CheckContentType, AFailingReadIsLoggedAndKeepsWhatWasParsed) {
  const std::string start = "HTTP/1.1 200 OK\r\nContent-Type: a\r\nServ";
  ScriptedPeer peer({{ExpectRequest(), Send(start + "er: s"), DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
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

TEST(CheckContentType, ContentFieldsAreTrimmedOfSpacesOnly) {
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

TEST(CheckContentType, ALongerNameWithAKnownPrefixIsTakenForTheKnownOne) {
  const auto client = AfterHeader("Content-Type-Options: nosniff\r\nSet-Cookie2: x=1;");
  EXPECT_EQ(Content(*client, HTTP_CONTENT_TYPE), "nosniff");
  EXPECT_EQ(client->m_strCookie, "x=1;");
}

TEST(CheckContentType, ANewResponseForgetsAllButTheTransferEncoding) {
  ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nContent-Type: a\r\nSet-Cookie: s=1;\r\n"
                              "WWW-Authenticate: Basic\r\nTransfer-Encoding: chunked\r\n\r\n"),
                     Exchange("HTTP/1.1 200 OK\r\n\r\n")});
  ExposedClient client(peer.Port());
  client.SendRequestByGet();
  EXPECT_EQ(client.m_strCookie, "s=1;");
  client.SendRequestByGet();
  EXPECT_THAT(client.m_mapContent, IsEmpty());
  EXPECT_EQ(client.m_strCookie, "");
  EXPECT_EQ(client.m_strAuthenticate, "");
  EXPECT_EQ(client.GetTransferEncoding(), "chunked");
}

TEST(CheckContentType, EachKnownNameWithoutAValueIsNotReady) {
  for (const KeptField& field : kKeptFields) {
    const std::string name(field.name);
    EXPECT_EQ(AfterHeader(name)->m_result, HTTP_RET_NOT_READY) << name;
    EXPECT_EQ(AfterHeader(name + ":")->m_result, HTTP_RET_NOT_READY) << name;
  }
  EXPECT_EQ(AfterHeader("Server:")->m_result, HTTP_RET_OK);
}

// A server may cut its response anywhere.

namespace {

constexpr char kWholeHead[] =
    "HTTP/1.1 200 OK\r\n"    // 17 bytes
    "Content-Length: 5\r\n"  // 19 bytes
    "Set-Cookie: s=1;\r\n"   // 18 bytes
    "\r\n";

// The result of kWholeHead cut after `n` bytes, as the model has it.
int ResultOfCutHead(size_t n) {
  CutReader reader({std::string(kWholeHead, n)}, true);
  std::vector<std::string> log;
  return ReadModelHead(reader, &log).response;
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
  const std::string response = std::string(kWholeHead) + "12345";
  for (size_t n = 1; n < response.size(); ++n) {
    ScriptedPeer peer({ExchangeInPieces({response.substr(0, n), response.substr(n)})});
    ExposedClient client(peer.Port());
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
    ExposedClient client(peer.Port(), settings);
    client.SendRequestByGet();
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    EXPECT_EQ(Content(client, HTTP_CONTENT_LENGTH), "5");
    EXPECT_EQ(ReadBody(client), "12345");
  }
}

TEST(ResponseHead, ResetAtAnyByteItHasADocumentedResult) {
  for (size_t n = 0; n < sizeof(kWholeHead); n += 5) {
    ScriptedPeer peer({{ExpectRequest(), Send(std::string(kWholeHead, n)), Reset()}});
    ExposedClient client(peer.Port());
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_TRUE(client.m_result == HTTP_RET_IO_ERROR || client.m_result == ResultOfCutHead(n)) << n;
  }
}

TEST(ResponseHead, OfASilentServerItIsAnIoErrorAfterTheWaits) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 O"), DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  Faults faults;
  faults.Return(Call::kSelect, 3, INT_MAX, 0);  // each wait ends at once, without a byte
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_GE(faults.Count(Call::kRead), 7);
  client.m_pSocket->Disconnect();
}

// What a server may send instead of a head; tests/hostile/heads_test.cpp has more.

TEST(ResponseHeadBadInput, AnEndlessHeadTakesThirtyLinesAndNoMore) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n"),
                      SendEndlessly(std::string(4096, 'a'), 64 << 20)}});
  ExposedClient client(peer.Port());
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
