// Response heads of every broken shape, and heads without an end.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/kept_fields.h"
#include "tarnwick/platform/unique.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/peak_memory.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

constexpr char kOk[] = "HTTP/1.1 200 OK\r\n";
constexpr char kReadFailed[] = "CheckContentType: Connect failed!\n\n";

std::string Lines(int count) {
  return Repeated(count, "X: y\r\n");
}

// The last word of the field's name: "type" of Content-Type.
std::string NameOf(HTTP_MAP_KEY key) {
  for (const KeptField& field : kKeptFields) {
    if (field.as != KeptAs::kContent || field.key != key) continue;
    std::string word(field.name.substr(field.name.rfind('-') + 1));
    word[0] = static_cast<char>(tolower(word[0]));
    return word;
  }
  return "unknown";
}

// What the head left in the client: "name=value" each.
std::string Kept(const ExposedClient& client) {
  std::string kept;
  for (const auto& [key, value] : client.m_mapContent) kept += NameOf(key) + "=" + value + "|";
  if (!client.m_strCookie.empty()) kept += "cookie=" + client.m_strCookie + "|";
  if (!client.m_strAuthenticate.empty()) kept += "challenge=" + client.m_strAuthenticate + "|";
  if (!client.m_strTransferEncoding.empty()) {
    kept += "encoding=" + client.m_strTransferEncoding + "|";
  }
  return kept;
}

// A GET; the text is what its head left.
Outcome Head(ExposedClient& client) {
  const int result = client.SendRequestByGet();
  return OutcomeOf(client, result, Kept(client));
}

// A GET; the text is what is left on the connection after the head.
Outcome Rest(ExposedClient& client) {
  const int result = client.SendRequestByGet();
  return OutcomeOf(client, result, ReadBody(client));
}

// Status lines, with an empty line after them: the status that is read, and what comes of it.
struct StatusLineRow {
  const char* name;
  std::string line;
  int response;  // what CheckResponse returns
  int status;    // and the status that it stores
};

const StatusLineRow kStatusLines[] = {
    {"AnEmptyLine", "", HTTP_RET_IO_ERROR, 0},
    {"BlanksAlone", "     ", HTTP_RET_IO_ERROR, 0},
    {"AVersionAlone", "HTTP/1.1", HTTP_RET_IO_ERROR, 0},
    {"AVersionAndABlank", "HTTP/1.1 ", HTTP_RET_IO_ERROR, 0},
    {"ALaterMinorVersion", "HTTP/1.2 200 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"AnotherMajorVersion", "HTTP/2 200 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"AVersionInLowerCase", "http/1.1 200 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"AVersionWithOneDigitMore", "HTTP/1.10 200 OK", HTTP_RET_OK, 200},
    {"AVersionOfLettersAlone", "HTTP 200 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"AnotherProtocol", "SSH-2.0-server 200", HTTP_RET_BAD_RESPONSE, 0},
    {"ATlsAlert", "\x15\x03\x01\x01\x02\x02\x28", HTTP_RET_BAD_RESPONSE, 0},
    {"ATabForABlank", "HTTP/1.1\t200 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"TwoBlanksInEachPlace", "HTTP/1.1  200  OK", HTTP_RET_OK, 200},
    {"ABlankInFront", " HTTP/1.1 200 OK", HTTP_RET_OK, 200},
    {"NoReason", "HTTP/1.1 200", HTTP_RET_OK, 200},
    {"NoBlankAfterTheNumber", "HTTP/1.1 200OK", HTTP_RET_OK, 200},
    {"LettersForDigits", "HTTP/1.1 2OO OK", HTTP_RET_BAD_RESPONSE, 2},
    {"ATextForTheNumber", "HTTP/1.1 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"ANegativeNumber", "HTTP/1.1 -200 OK", HTTP_RET_BAD_RESPONSE, -200},
    {"APlusSign", "HTTP/1.1 +200 OK", HTTP_RET_OK, 200},
    {"AZeroInFront", "HTTP/1.1 0200 OK", HTTP_RET_OK, 200},
    {"AHexadecimalNumber", "HTTP/1.1 0xC8 OK", HTTP_RET_BAD_RESPONSE, 0},
    {"AFraction", "HTTP/1.1 200.9 OK", HTTP_RET_OK, 200},
    {"TwoDigits", "HTTP/1.1 20 OK", HTTP_RET_BAD_RESPONSE, 20},
    {"FourDigits", "HTTP/1.1 2000 OK", HTTP_RET_BAD_RESPONSE, 2000},
    {"ThirtyTwoBitsAndTwoHundredMore", "HTTP/1.1 4294967496 OK", HTTP_RET_BAD_RESPONSE, 2147483647},
    {"SixtyFourBitsAndTwoHundredMore", "HTTP/1.1 18446744073709551816 OK", HTTP_RET_BAD_RESPONSE,
     2147483647},
    {"AHugeNegativeNumber", "HTTP/1.1 -99999999999999999999 OK", HTTP_RET_BAD_RESPONSE,
     -2147483647 - 1},
    {"AZeroByteInTheNumber", "HTTP/1.1 2\0"s + "00 OK", HTTP_RET_BAD_RESPONSE, 2},
    {"AZeroByteAfterTheNumber", "HTTP/1.1 200\0"s + " OK", HTTP_RET_OK, 200},
    {"AZeroByteAfterTheVersion", "HTTP/1.1\0"s + " 200 OK", HTTP_RET_IO_ERROR, 0},
    {"AZeroByteInFront", "\0HTTP/1.1 200 OK"s, HTTP_RET_IO_ERROR, 0},
    {"ControlBytesInTheReason", "HTTP/1.1 200 \x1b[2J\x07\x7f", HTTP_RET_OK, 200},
    {"AReasonOfFourThousandBytes", "HTTP/1.1 200 " + std::string(4000, 'r'), HTTP_RET_OK, 200},
    {"BlanksOfAWholeBuffer", std::string(2048, ' ') + "HTTP/1.1 200 OK", HTTP_RET_IO_ERROR, 0},
    {"AContinue", "HTTP/1.1 100 Continue", HTTP_RET_BAD_RESPONSE, 100},
};

std::vector<ResponseScenario> StatusLineTable() {
  std::vector<ResponseScenario> table;
  for (const StatusLineRow& row : kStatusLines) {
    table.push_back({row.name, row.line + "\r\n\r\n", Head, Sent(row.response, row.status, "")});
  }
  return table;
}

const ResponseScenario kHeadTable[] = {
    // Line ends.
    {"NothingAtAll", "", Head, Sent(HTTP_RET_IO_ERROR, 0, "")},
    {"BareLineFeeds", "HTTP/1.1 200 OK\nContent-Type: a\n\n", Head, Success("type=a|")},
    {"BareCarriageReturnsCostAByteEach", "HTTP/1.1 200 OK\rContent-Type: a\r\r", Head, Success("")},
    {"LineFeedsBeforeCarriageReturns", "HTTP/1.1 200 OK\n\rContent-Type: a\n\r\n\r", Rest,
     Success("ontent-Type: a\n\r\n\r")},
    {"AStatusLineCutAfterItsCarriageReturn", "HTTP/1.1 200 OK\r", Head,
     Sent(HTTP_RET_IO_ERROR, 0, "")},
    {"AHeaderLineCutAfterItsCarriageReturn",
     kOk + "Content-Type: a\r"s,
     Head,
     Sent(HTTP_RET_IO_ERROR, 200, ""),
     {kReadFailed}},
    {"AHeaderLineCutInItsMiddle", kOk + "Content-Type: a"s, Head, Success("type=a|")},
    {"NoEmptyLine", kOk + "Content-Type: a\r\n"s, Head, Success("type=a|")},
    {"CarriageReturnsWithoutEnd", kOk + std::string(5000, '\r') + "body", Rest,
     Success(std::string(4998, '\r') + "body")},

    // Names.
    {"NoColon", kOk + "Content-Type text\r\n\r\n"s, Head, Success("type=text|")},
    {"AnEqualsSignForTheColon", kOk + "Content-Type=text\r\n\r\n"s, Head, Success("type=text|")},
    {"AColonAlone", kOk + ":\r\n\r\n"s, Head, Sent(HTTP_RET_NOT_READY, 200, "")},
    {"TwoThousandColons", kOk + std::string(2000, ':') + "\r\n\r\n", Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"EveryDelimiterAndNoName", kOk + " :;= \r\n\r\n"s, Head, Sent(HTTP_RET_NOT_READY, 200, "")},
    {"AColonInFrontOfTheName", kOk + ": Content-Length: 5\r\n\r\n"s, Head, Success("length=5|")},
    {"AnUnknownNameAlone", kOk + "Server\r\n\r\n"s, Head, Success("")},
    {"AKnownNameAlone", kOk + "Content-Type\r\nContent-Length: 1\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"ATypeWithoutAValue", kOk + "Content-Length: 1\r\nContent-Type:\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "length=1|")},
    {"ALengthWithoutAValue", kOk + "Content-Length:\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"ARangeWithoutAValue", kOk + "Content-Range:\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"ACookieWithoutAValue", kOk + "Set-Cookie:\r\n\r\n"s, Head, Sent(HTTP_RET_NOT_READY, 200, "")},
    {"AChallengeWithoutAValue", kOk + "WWW-Authenticate:\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"AnEncodingWithoutAValue", kOk + "Transfer-Encoding:\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"ABlankForAValue", kOk + "Content-Type: \r\n\r\n"s, Head, Success("type=|")},
    {"NamesInMixedCase", kOk + "cOnTeNt-TyPe: a\r\nTRANSFER-ENCODING: b\r\n\r\n"s, Head,
     Success("type=a|encoding=b|")},
    {"ALongerNameWithAKnownPrefix", kOk + "Content-Lengthiness: 9\r\n\r\n"s, Head,
     Success("length=9|")},

    // Folded lines are lines of their own.
    {"AFoldedValue", kOk + "Content-Type: a;\r\n charset=b\r\n\r\n"s, Head, Success("type=a;|")},
    {"AKnownNameInAFold", kOk + "X: y\r\n Content-Length: 7\r\n\r\n"s, Head, Success("length=7|")},
    {"AFoldOfABlank", kOk + "X: y\r\n \r\n\r\n"s, Head, Sent(HTTP_RET_NOT_READY, 200, "")},
    {"AFoldOfATab", kOk + "X: y\r\n\t\r\n\r\n"s, Head, Success("")},

    // Repetitions.
    {"TwoOfEachKeptOnce",
     kOk + "Content-Type: a\r\nContent-Type: b\r\nContent-Length: 1\r\nContent-Length: 2\r\n"
           "Content-Range: c\r\nContent-Range: d\r\n\r\n"s,
     Head, Success("type=a|length=1|range=c|")},
    {"TwoOfEachReplaced",
     kOk + "Set-Cookie: a;\r\nSet-Cookie: b;\r\nWWW-Authenticate: c\r\nWWW-Authenticate: d\r\n"
           "Transfer-Encoding: e\r\nTransfer-Encoding: f\r\n\r\n"s,
     Head, Success("cookie=b;|challenge= d|encoding=f|")},

    // Bytes that are no text.
    {"AZeroByteInAValue", kOk + "Content-Type: a\0b\r\n\r\n"s, Head, Success("type=a|")},
    {"AZeroByteInAName", kOk + "Content\0-Type: a\r\n\r\n"s, Head, Success("")},
    {"AZeroByteForALine", kOk + "\0\r\nContent-Type: a\r\n\r\n"s, Head,
     Sent(HTTP_RET_NOT_READY, 200, "")},
    {"ControlBytesInAValue", kOk + "Content-Type: \x01\x1b[2J\x7f\r\n\r\n"s, Head,
     Success("type=\x01\x1b[2J\x7f|")},
    {"HighBytesInAValue", kOk + "Content-Type: \xff\xfe\x80\r\n\r\n"s, Head,
     Success("type=\xff\xfe\x80|")},
    {"PrintfDirectivesInAValue", kOk + "Content-Type: %s%n%s\r\n\r\n"s, Head,
     Success("type=%s%n%s|")},

    // Many lines and long ones: 30 lines are read, of at most 2,047 bytes.
    {"ThirtyLinesLeaveTheEmptyOne", kOk + Lines(30) + "\r\nbody", Rest, Success("\r\nbody")},
    {"AThousandLinesLeaveTheOthers", kOk + Lines(1000) + "\r\nbody", Rest,
     Success(Lines(970) + "\r\nbody")},
    {"ALineThatFits", kOk + "X: "s + std::string(2044, 'v') + "\r\nContent-Type: a\r\n\r\n", Head,
     Success("type=a|")},
    {"ALineOfTheBuffersLengthEndsTheHead",
     kOk + "X: "s + std::string(2045, 'v') + "\r\nContent-Type: a\r\n\r\n", Rest,
     Success("Content-Type: a\r\n\r\n")},
    {"ALineOf5000BytesHasALineAfterIt",
     kOk + "X: "s + std::string(4997, 'v') + "\r\nContent-Length: 5\r\n\r\n", Head,
     Success("length=5|")},
    {"ALongValueIsCut", kOk + "Content-Type: "s + std::string(3000, 'v') + "\r\n\r\n", Head,
     Success("type=" + std::string(2033, 'v') + "|")},
    {"ALineIsHiddenAfterALongOne",
     kOk + "X: "s + std::string(2045, 'v') + "Content-Length: 3\r\n\r\n", Head,
     Success("length=3|")},
};

// Heads without an end come over plain connections alone: the bytes after them are counted, and
// the client may not keep any.
Outcome GetAndCount(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByGet();
  char piece[8192];
  size_t total = 0;
  for (int n; (n = client.ReadData(piece, sizeof(piece))) > 0;) total += static_cast<size_t>(n);
  return OutcomeOf(client, result, std::to_string(total));
}

Outcome FormPost(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestBySocketPost("a=1");
  return OutcomeOf(client, result);
}

Outcome Soap(int port) {
  ExposedClient client(port);
  std::string response = "untouched";
  const int result = client.SendReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

Outcome SoapWithLogin(int port) {
  ExposedClient client(port);
  std::string response = "untouched";
  const int result = client.SendAuthReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

Outcome CurlGet(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 20);
  return OutcomeOf(client, result, client.m_strCurlText);
}

Outcome CurlGetToFile(int port) {
  ExposedClient client(port);
  const UniqueFile file(tmpfile());
  client.SetCurlRespFile(file.get());
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 20);
  return OutcomeOf(client, result, ftell(file.get()) < (1 << 20) ? "a short file" : "a long file");
}

Outcome CurlPost(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByPost("?");
  return OutcomeOf(client, result);
}

Outcome XmlGet(int port) {
  ExposedClient client(port);
  const int result = client.SendReqByXMLGet(20);
  return OutcomeOf(client, result, client.m_pRespBuf != nullptr ? client.m_pRespBuf : "");
}

// Of the 60 to 100 MiB that come. The peer holds its block of a mebibyte, and the address sanitizer
// keeps freed memory for a while.
constexpr size_t kMostGrowthInKilobytes = 16 << 10;

constexpr size_t kMega = 1 << 20;
constexpr size_t kHundred = 100 * kMega;

// Sends about a mebibyte of `bytes` at a time, `total` bytes in all; the block is made when it is
// needed.
Step SendOver(const std::string& bytes, size_t total) {
  return {"SendOver()", [bytes, total](PeerConnection& peer, std::string* error) {
            const std::string block = Repeated(static_cast<int>(kMega / bytes.size()), bytes);
            return SendEndlessly(block, total / block.size() * block.size()).play(peer, error);
          }};
}

// `before`, then `bytes` over and over until 100 MiB have gone.
Script Endless(const std::string& before, const std::string& bytes) {
  return {ExpectRequest(), Send(before), SendOver(bytes, kHundred), Close()};
}

// Ten million header lines, in blocks of 100,000.
Script TenMillionLines() {
  const Step lines = {"ten million lines", [](PeerConnection& peer, std::string* error) {
                        return SendEndlessly(Lines(100000), 60000000).play(peer, error);
                      }};
  return {ExpectRequest(), Send(kOk), lines, Close()};
}

std::string FailedBy(const std::string& function, CURLcode code) {
  return function + ": Failed to make http connection, return value=" + std::to_string(code) + "\n";
}

const std::string kLongLine = std::string("HTTP/1.1 200 OK\r\nX: ");
constexpr size_t kThirtyPieces = 30 * 2048;

const Scenario kEndlessTable[] = {
    Meets("ALineOf100Mebibytes", Endless(kLongLine, "v"), GetAndCount,
          Success(std::to_string(3 + kHundred - kThirtyPieces))),
    Meets("AStatusLineOf100Mebibytes", Endless("HTTP/1.1 200 ", "v"), GetAndCount,
          Success(std::to_string(13 + kHundred - 31 * 2048))),
    Meets("BlanksOf100Mebibytes", Endless("", " "), GetAndCount, Sent(HTTP_RET_IO_ERROR, 0, "0")),
    Meets("ZeroBytesOf100Mebibytes", Endless(kOk, "\0"s), GetAndCount,
          Sent(HTTP_RET_NOT_READY, 200, "0")),
    Meets("LineFeedsOf100Mebibytes", Endless(kOk, "\n"), GetAndCount,
          Success(std::to_string(kHundred - 1))),
    Meets("TenMillionLines", TenMillionLines(), GetAndCount, Success("59999820")),
    Meets("AContinueForEver", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"), GetAndCount,
          Sent(HTTP_RET_BAD_RESPONSE, 100, "104857475")),
    Meets("ALineOf100MebibytesForAForm", Endless(kLongLine, "v"), FormPost, Success("")),
    Meets("ALineOf100MebibytesForSoap", Endless(kLongLine, "v"), Soap, BodyFailed("untouched")),
    Meets("TenMillionLinesForSoap", TenMillionLines(), Soap, BodyFailed("untouched")),
    Meets("AContinueForEverForSoap", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"), Soap,
          {HTTP_RET_IO_ERROR, HTTP_RET_BAD_RESPONSE, 100, "untouched"}),
    Meets("AContinueForEverForSoapWithALogin", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"),
          SoapWithLogin, {HTTP_RET_IO_ERROR, HTTP_RET_BAD_RESPONSE, 100, "untouched"}),
};

// libcurl ends a line of over 100 KiB (CURLE_OUT_OF_MEMORY) and a head of over 300 KiB
// (CURLE_RECV_ERROR).
const Scenario kEndlessCurlTable[] = {
    Meets("ALineOf100MebibytesForCurl", Endless(kLongLine, "v"), CurlGet, NoResponse(),
          {FailedBy("SendRequestByCurl", CURLE_OUT_OF_MEMORY)}),
    Meets("TenMillionLinesForCurl", TenMillionLines(), CurlGet, NoResponse(),
          {FailedBy("SendRequestByCurl", CURLE_RECV_ERROR)}),
    Meets("TenMillionLinesForAFile", TenMillionLines(), CurlGetToFile, NoResponse("a short file"),
          {FailedBy("SendRequestByCurl", CURLE_RECV_ERROR)}),
    Meets("TenMillionLinesForCurlPost", TenMillionLines(), CurlPost, NoResponse(),
          {FailedBy("SendRequestByPost", CURLE_RECV_ERROR)}),
    Meets("TenMillionLinesForXml", TenMillionLines(), XmlGet, NoResponse(),
          {FailedBy("SendReqByXMLGet", CURLE_RECV_ERROR)}),
    Meets("AContinueForEverForCurl", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"), CurlGet,
          NoResponse(), {FailedBy("SendRequestByCurl", CURLE_RECV_ERROR)}),
    Meets("AContinueForEverForCurlPost", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"), CurlPost,
          NoResponse(), {FailedBy("SendRequestByPost", CURLE_RECV_ERROR)}),
    Meets("AContinueForEverForXml", Endless("", "HTTP/1.1 100 Continue\r\n\r\n"), XmlGet,
          NoResponse(), {FailedBy("SendReqByXMLGet", CURLE_RECV_ERROR)}),
};

}  // namespace

class StatusLines : public ::testing::TestWithParam<ResponseScenario> {};

TEST_P(StatusLines, EndAsTheTableSays) {
  RunInEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Hostile, StatusLines, ::testing::ValuesIn(StatusLineTable()),
                         ResponseName);

class Heads : public ::testing::TestWithParam<ResponseScenario> {};

TEST_P(Heads, EndAsTheTableSays) {
  RunInEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Hostile, Heads, ::testing::ValuesIn(kHeadTable), ResponseName);

class EndlessHeads : public ::testing::TestWithParam<Scenario> {};

TEST_P(EndlessHeads, EndAsTheTableSaysInConstantMemory) {
  const PeakMemory memory;
  RunScenario(GetParam());
  RecordProperty("growth_in_kilobytes", std::to_string(memory.GrowthInKilobytes()));
  EXPECT_LT(memory.GrowthInKilobytes(), kMostGrowthInKilobytes);
}

INSTANTIATE_TEST_SUITE_P(Hostile, EndlessHeads, ::testing::ValuesIn(kEndlessTable), ScenarioName);
INSTANTIATE_TEST_SUITE_P(HostileCurl, EndlessHeads, ::testing::ValuesIn(kEndlessCurlTable),
                         ScenarioName);

TEST(PeakMemory, SeesMemoryThatHasBeenGivenBack) {
  const PeakMemory memory;
  std::string(4 * kMostGrowthInKilobytes << 10, 'x').clear();
  EXPECT_GT(memory.GrowthInKilobytes(), 3 * kMostGrowthInKilobytes);
}
