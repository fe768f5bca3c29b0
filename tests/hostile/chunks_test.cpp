// Chunked bodies that are none, and how each reader of a body ends with them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <libxml/tree.h>

#include "tarnwick/platform/unique.h"
#include "tests/hostile/hostile_util.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

constexpr char kHead[] = "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n";

// What the client's own readers make of the chunks, which is always a success, and what libcurl
// makes of them: its code and the body until then.
struct ChunkRow {
  const char* name;
  std::string chunks;
  std::string body;
  CURLcode curl_code;
  std::string curl_body;
  std::string trailer = "";  // libcurl hands it on as header lines, and a file gets these as well
};

const ChunkRow kChunks[] = {
    {"TwoChunks", "4\r\nWiki\r\n5\r\npedia\r\n0\r\n\r\n", "Wikipedia", CURLE_OK, "Wikipedia"},
    {"DigitsOfBothCases", "a\r\n0123456789\r\nA\r\n0123456789\r\n0\r\n\r\n", "01234567890123456789",
     CURLE_OK, "01234567890123456789"},
    {"NothingAtAll", "", "", CURLE_PARTIAL_FILE, ""},
    {"TheLastChunkAlone", "0\r\n\r\n", "", CURLE_OK, ""},

    // Sizes.
    {"ASizeOf80000000", "80000000\r\nabc", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"ASizeOfFfffffff", "ffffffff\r\nabc", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"ASizeOf100000001", "100000001\r\nabc", "a", CURLE_PARTIAL_FILE, "abc"},
    {"ASizeOf100000000", "100000000\r\nabc", "", CURLE_PARTIAL_FILE, "abc"},
    {"ASizeOfSixteenF", "ffffffffffffffff\r\nabc", "abc", CURLE_RECV_ERROR, ""},
    {"ASizeOfAHundredF", std::string(100, 'f') + "\r\nabc", "abc", CURLE_RECV_ERROR, ""},
    {"ANegativeSize", "-2\r\nabc", "", CURLE_RECV_ERROR, ""},
    {"APlusSign", "+3\r\nabc\r\n0\r\n\r\n", "", CURLE_RECV_ERROR, ""},
    {"AHexadecimalPrefix", "0x10\r\nabc\r\n\r\n", "", CURLE_BAD_FUNCTION_ARGUMENT, ""},
    {"ABlankInFront", " 3\r\nabc\r\n0\r\n\r\n", "", CURLE_RECV_ERROR, ""},
    {"FourThousandZeros", std::string(4096, '0') + "\r\n\r\n", "", CURLE_RECV_ERROR, ""},
    {"FourThousandZerosAndAThree", std::string(4096, '0') + "3\r\nabc\r\n0\r\n\r\n", "abc",
     CURLE_RECV_ERROR, ""},
    {"ZerosBeyondTheBuffer", std::string(9000, '0') + "3\r\nabc\r\n0\r\n\r\n", "", CURLE_RECV_ERROR,
     ""},
    {"AText", "hello\r\nabc", "", CURLE_RECV_ERROR, ""},
    {"ATextOfDigits", "decade\r\nabc", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"AnEmptyLineForASize", "\r\nabc", "", CURLE_RECV_ERROR, ""},
    {"AZeroByteAfterTheSize", "3\0\r\nabc\r\n0\r\n\r\n"s, "abc", CURLE_OK, "abc"},
    {"AZeroByteBeforeTheSize", "\0"s + "3\r\nabc\r\n0\r\n\r\n", "", CURLE_RECV_ERROR, ""},
    {"ControlBytesForASize", "\x01\x02\x03\r\nabc", "", CURLE_RECV_ERROR, ""},

    // Extensions.
    {"AnExtension", "3;a=b\r\nabc\r\n0;c\r\n\r\n", "abc", CURLE_OK, "abc"},
    {"AnExtensionAfterABlank", "3 a=b\r\nabc\r\n0\r\n\r\n", "abc", CURLE_OK, "abc"},
    {"AnExtensionAlone", ";a=b\r\nabc\r\n0\r\n\r\n", "", CURLE_RECV_ERROR, ""},
    {"AnExtensionBeyondTheBuffer", "3;" + std::string(9000, 'x') + "\r\nabc\r\n0\r\n\r\n", "xxx",
     CURLE_OK, "abc"},

    // Sizes that lie, and other bytes in place of CRLF.
    {"ASizeTooSmall", "3\r\nabcde\r\n0\r\n\r\n", "abc", CURLE_RECV_ERROR, "abc"},
    {"ASizeTooLarge", "8\r\nabcde\r\n0\r\n\r\n", "abcde\r\n0", CURLE_RECV_ERROR, "abcde\r\n0"},
    {"NoLineEndAfterAChunk", "3\r\nabc3\r\ndef\r\n0\r\n\r\n", "abc", CURLE_RECV_ERROR, "abc"},
    {"AnotherPairAfterAChunk", "3\r\nabcXY3\r\ndef\r\n0\r\n\r\n", "abcdef", CURLE_RECV_ERROR,
     "abc"},
    {"BareLineFeeds", "3\nabc\n0\n\n", "abc", CURLE_OK, "abc"},
    {"BareCarriageReturns", "3\rabc\r0\r\r", "bc\r", CURLE_PARTIAL_FILE, ""},

    // Ends.
    {"NoLastChunk", "3\r\nabc\r\n", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"CutInAChunk", "5\r\nabc", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"CutInASize", "5", "", CURLE_PARTIAL_FILE, ""},
    {"CutInASizesLineEnd", "5\r", "", CURLE_PARTIAL_FILE, ""},
    {"CutAfterASize", "5\r\n", "", CURLE_PARTIAL_FILE, ""},
    {"CutInAChunksLineEnd", "3\r\nabc\r", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"CutInTheLastSize", "3\r\nabc\r\n0", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"CutAfterTheLastSize", "3\r\nabc\r\n0\r\n", "abc", CURLE_PARTIAL_FILE, "abc"},
    {"ATrailer", "3\r\nabc\r\n0\r\nX: y\r\n\r\n", "abc", CURLE_OK, "abc", "X: y\r\n"},
    {"AnotherReplyAfterTheLastChunk", "3\r\nabc\r\n0\r\n\r\nHTTP/1.1 500 No\r\n\r\n", "abc",
     CURLE_OK, "abc"},

    // Data.
    {"ZeroBytesInAChunk", "3\r\n\0\0\0\r\n0\r\n\r\n"s, "\0\0\0"s, CURLE_OK, "\0\0\0"s},
    {"AChunkOfManyBuffers", "4e20\r\n" + std::string(20000, 'x') + "\r\n0\r\n\r\n",
     std::string(20000, 'x'), CURLE_OK, std::string(20000, 'x')},
    {"AThousandChunksOfAByte", Repeated(1000, "1\r\nx\r\n") + "0\r\n\r\n", std::string(1000, 'x'),
     CURLE_OK, std::string(1000, 'x')},
};

// A GET, and the whole body after it.
Outcome GetAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

// A request that the caller has written, and the whole response to it.
Outcome GetResponse(ExposedClient& client) {
  const std::string request = "GET /own HTTP/1.1\r\n\r\n";
  client.m_pSocket->Connect();
  client.m_pSocket->WriteData(request.data(), static_cast<int>(request.size()));
  const std::string text = client.GetResp();
  return OutcomeOf(client, 0, text);
}

// A form, and the whole body after it.
Outcome PostAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

// A GET, read by the caller in pieces, which leaves the chunks as they are.
Outcome GetInPieces(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  return OutcomeOf(client, 0, ReadBody(client));
}

Outcome CurlToText(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 10);
  return OutcomeOf(client, result, client.m_strCurlText);
}

// The text is what the file holds.
Outcome CurlToFile(int port) {
  ExposedClient client(port);
  const UniqueFile file(tmpfile());
  client.SetCurlRespFile(file.get());
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 10);
  std::string content(static_cast<size_t>(ftell(file.get())), '\0');
  rewind(file.get());
  EXPECT_EQ(fread(content.data(), 1, content.size(), file.get()), content.size());
  return OutcomeOf(client, result, content);
}

// The text is what was collected for the document.
Outcome XmlGet(int port) {
  ExposedClient client(port);
  const int result = client.SendReqByXMLGet(10);
  const std::string text = client.m_pRespBuf == nullptr
                               ? std::string()
                               : std::string(client.m_pRespBuf, client.m_respLen);
  return OutcomeOf(client, result, text);
}

std::vector<ResponseScenario> SocketTable(Outcome (*operation)(ExposedClient&)) {
  std::vector<ResponseScenario> table;
  for (const ChunkRow& row : kChunks) {
    table.push_back({row.name, kHead + row.chunks, operation, Success(row.body)});
  }
  return table;
}

std::vector<Scenario> CurlTable(const std::string& function, Outcome (*operation)(int),
                                std::string (*text)(const ChunkRow&)) {
  std::vector<Scenario> table;
  for (const ChunkRow& row : kChunks) {
    const int result = row.curl_code == CURLE_OK ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
    std::vector<std::string> log;
    if (row.curl_code != CURLE_OK) {
      log.push_back(function + ": Failed to make http connection, return value=" +
                    std::to_string(row.curl_code) + "\n");
    }
    table.push_back({row.name,
                     {{ExpectRequest(), SendWhileRead(kHead + row.chunks), Close()}},
                     operation,
                     {result, result, 0, text(row)},
                     log});
  }
  return table;
}

std::string BodyOf(const ChunkRow& row) {
  return row.curl_body;
}

// What is left of the head, the body, and the trailer.
std::string FileOf(const ChunkRow& row) {
  return "\r\n" + row.curl_body + row.trailer;
}

// Responses whose chunks a reader takes for the body itself.
const char kChunkedJson[] = "10\r\n{\"success\":true}\r\n0\r\n\r\n";

std::string Under(const std::string& lines, const std::string& body) {
  return "HTTP/1.1 200 OK\r\n" + lines + "\r\n" + body;
}

const ResponseScenario kUndecoded[] = {
    {"ChunkedWithACapital", Under("Transfer-Encoding: Chunked\r\n", "3\r\nabc\r\n0\r\n\r\n"),
     GetAndReadBody, Success("3\r\nabc\r\n0\r\n\r\n")},
    {"ChunkedAfterAnotherCoding",
     Under("Transfer-Encoding: gzip, chunked\r\n", "3\r\nabc\r\n0\r\n\r\n"), GetAndReadBody,
     Success("3\r\nabc\r\n0\r\n\r\n")},
    {"ChunkedAmongBlanks", Under("Transfer-Encoding:   chunked  \r\n", "3\r\nabc\r\n0\r\n\r\n"),
     GetAndReadBody, Success("abc")},
    {"ChunkedTakenBack",
     Under("Transfer-Encoding: chunked\r\nTransfer-Encoding: identity\r\n", "3\r\nabc\r\n"),
     GetAndReadBody, Success("3\r\nabc\r\n")},
    {"ChunkedAfterALengthLine",
     Under("Content-Length: 2\r\nTransfer-Encoding: chunked\r\n", "3\r\nabc\r\n0\r\n\r\n"),
     GetAndReadBody, Success("abc")},
    {"AnErrorStatusIsReadAllTheSame",
     "HTTP/1.1 500 No\r\nTransfer-Encoding: chunked\r\n\r\n3\r\nabc\r\n0\r\n\r\n", GetAndReadBody,
     Sent(HTTP_RET_BAD_RESPONSE, 500, "abc")},
    {"AnErrorStatusIsNoResponse",
     "HTTP/1.1 500 No\r\nTransfer-Encoding: chunked\r\n\r\n3\r\nabc\r\n0\r\n\r\n",
     GetResponse,
     Sent(HTTP_RET_BAD_RESPONSE, 500, "{\"error\":true}"),
     {"GetResp: Http Resp error\n"}},
    {"PiecesAreNotDecoded", std::string(kHead) + "3\r\nabc\r\n0\r\n\r\n", GetInPieces,
     Success("3\r\nabc\r\n0\r\n\r\n")},
    {"AFormsReplyIsDecoded", std::string(kHead) + "3\r\nabc\r\n0\r\n\r\n", PostAndReadBody,
     Success("abc")},
};

Outcome JsonGet(int port) {
  Json::Value value = "untouched";
  const int result = SendHttpGet("127.0.0.1", port, "a.cgi", value, 5, true);
  return OneCall(result, value.toStyledString());
}

Outcome Soap(int port) {
  ExposedClient client(port);
  std::string response = "untouched";
  const int result = client.SendReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

Outcome XmlSoap(int port) {
  ExposedClient client(port);
  xmlDoc untouched;
  xmlDoc* doc = &untouched;
  const int result = client.SendReqByXMLSocketPost("<a/>", doc);
  const bool stays = doc == &untouched;
  if (!stays) xmlFreeDoc(doc);
  return OutcomeOf(client, result, stays ? "untouched" : doc == nullptr ? "none" : "a document");
}

Script Response(const std::string& response) {
  return {ExpectRequest(), SendWhileRead(response), Close()};
}

const Scenario kOtherReaders[] = {
    {"JsonTakesTheChunksForTheBody",
     {Response(std::string(kHead) + kChunkedJson)},
     JsonGet,
     OneCall(-2, "10\n"),
     {"SendHttpGet: Failed to parse json [" + std::string(kChunkedJson) + "].\n"}},
    {"SoapNeverReadsChunks",
     {Response(std::string(kHead) + "4\r\n<a/>\r\n0\r\n\r\n")},
     Soap,
     BodyFailed("untouched")},
    {"SoapWithALengthTakesTheChunksForTheBody",
     {Response(
         Under("Transfer-Encoding: chunked\r\nContent-Length: 7\r\n", "4\r\n<a/>\r\n0\r\n\r\n"))},
     Soap,
     Success("4\r\n<a/>")},
    {"XmlSoapNeverReadsChunks",
     {Response(std::string(kHead) + "4\r\n<a/>\r\n0\r\n\r\n")},
     XmlSoap,
     BodyFailed("untouched")},
    {"XmlSoapWithALengthTakesTheChunksForTheBody",
     {Response(
         Under("Transfer-Encoding: chunked\r\nContent-Length: 7\r\n", "4\r\n<a/>\r\n0\r\n\r\n"))},
     XmlSoap,
     Success("none")},
};

}  // namespace

class Chunks : public ::testing::TestWithParam<ResponseScenario> {};

TEST_P(Chunks, EndAsTheTableSays) {
  RunInEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(ReadBody, Chunks, ::testing::ValuesIn(SocketTable(GetAndReadBody)),
                         ResponseName);
INSTANTIATE_TEST_SUITE_P(GetResp, Chunks, ::testing::ValuesIn(SocketTable(GetResponse)),
                         ResponseName);
INSTANTIATE_TEST_SUITE_P(Codings, Chunks, ::testing::ValuesIn(kUndecoded), ResponseName);

class ChunkReaders : public ::testing::TestWithParam<Scenario> {};

TEST_P(ChunkReaders, EndAsTheTableSays) {
  RunScenario(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Text, ChunkReaders,
                         ::testing::ValuesIn(CurlTable("SendRequestByCurl", CurlToText, BodyOf)),
                         ScenarioName);
INSTANTIATE_TEST_SUITE_P(File, ChunkReaders,
                         ::testing::ValuesIn(CurlTable("SendRequestByCurl", CurlToFile, FileOf)),
                         ScenarioName);
INSTANTIATE_TEST_SUITE_P(Xml, ChunkReaders,
                         ::testing::ValuesIn(CurlTable("SendReqByXMLGet", XmlGet, BodyOf)),
                         ScenarioName);
INSTANTIATE_TEST_SUITE_P(Others, ChunkReaders, ::testing::ValuesIn(kOtherReaders), ScenarioName);
