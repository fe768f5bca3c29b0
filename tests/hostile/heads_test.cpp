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
std::string Kept(const ClientProbe& client) {
  std::string kept;
  for (const auto& [key, value] : client.m_mapContent) kept += NameOf(key) + "=" + value + "|";
  if (!client.m_strCookie.empty()) kept += "cookie=" + client.m_strCookie + "|";
  if (!client.m_strAuthenticate.empty()) kept += "challenge=" + client.m_strAuthenticate + "|";
  if (!client.m_strTransferEncoding.empty()) {
    kept += "encoding=" + client.m_strTransferEncoding + "|";
  }
  return kept;
}

// A GET; the text is what its head left behind.
Outcome Head(ClientProbe& client) {
  const int result = client.SendRequestByGet();
  return OutcomeOf(client, result, Kept(client));
}

// A GET; the text is what is left on the connection behind the head.
Outcome Rest(ClientProbe& client) {
  const int result = client.SendRequestByGet();
  return OutcomeOf(client, result, ReadBody(client));
}

// Status lines, with an empty line behind them: the status that is read, and what comes of it.
struct StatusLineRow {
  const char* name;
  std::string line;
  int response;
  int status;
};

const StatusLineRow kStatusLines[] = {
    {"AnEmptyLine", "", 3, 0},
    {"BlanksAlone", "     ", 3, 0},
    {"AVersionAlone", "HTTP/1.1", 3, 0},
    {"AVersionAndABlank", "HTTP/1.1 ", 3, 0},
    {"ALaterMinorVersion", "HTTP/1.2 200 OK", 5, 0},
    {"AnotherMajorVersion", "HTTP/2 200 OK", 5, 0},
    {"AVersionInLowerCase", "http/1.1 200 OK", 5, 0},
    {"AVersionWithOneDigitMore", "HTTP/1.10 200 OK", 0, 200},
    {"AVersionOfLettersAlone", "HTTP 200 OK", 5, 0},
    {"AnotherProtocol", "SSH-2.0-server 200", 5, 0},
    {"ATlsAlert", "\x15\x03\x01\x01\x02\x02\x28", 5, 0},
    {"ATabForABlank", "HTTP/1.1\t200 OK", 5, 0},
    {"TwoBlanksInEachPlace", "HTTP/1.1  200  OK", 0, 200},
    {"ABlankInFront", " HTTP/1.1 200 OK", 0, 200},
    {"NoReason", "HTTP/1.1 200", 0, 200},
    {"NoBlankBehindTheNumber", "HTTP/1.1 200OK", 0, 200},
    {"LettersForDigits", "HTTP/1.1 2OO OK", 5, 2},
    {"ATextForTheNumber", "HTTP/1.1 OK", 5, 0},
    {"ANegativeNumber", "HTTP/1.1 -200 OK", 5, -200},
    {"APlusSign", "HTTP/1.1 +200 OK", 0, 200},
    {"AZeroInFront", "HTTP/1.1 0200 OK", 0, 200},
    {"AHexadecimalNumber", "HTTP/1.1 0xC8 OK", 5, 0},
    {"AFraction", "HTTP/1.1 200.9 OK", 0, 200},
    {"TwoDigits", "HTTP/1.1 20 OK", 5, 20},
    {"FourDigits", "HTTP/1.1 2000 OK", 5, 2000},
    {"ThirtyTwoBitsAndTwoHundredMore", "HTTP/1.1 4294967496 OK", 5, 2147483647},
    {"SixtyFourBitsAndTwoHundredMore", "HTTP/1.1 18446744073709551816 OK", 5, 2147483647},
    {"AHugeNegativeNumber", "HTTP/1.1 -99999999999999999999 OK", 5, -2147483647 - 1},
    {"AZeroByteInTheNumber", "HTTP/1.1 2\0"s + "00 OK", 5, 2},
    {"AZeroByteBehindTheVersion", "HTTP/1.1\0"s + " 200 OK", 3, 0},
    {"AZeroByteInFront", "\0HTTP/1.1 200 OK"s, 3, 0},
    {"ControlBytesInTheReason", "HTTP/1.1 200 \x1b[2J\x07\x7f", 0, 200},
    {"AReasonOfFourThousandBytes", "HTTP/1.1 200 " + std::string(4000, 'r'), 0, 200},
    {"BlanksOfAWholeBuffer", std::string(2048, ' ') + "HTTP/1.1 200 OK", 3, 0},
    {"AContinue", "HTTP/1.1 100 Continue", 5, 100},
};

std::vector<ReplyScenario> StatusLineTable() {
  std::vector<ReplyScenario> table;
  for (const StatusLineRow& row : kStatusLines) {
    table.push_back({row.name, row.line + "\r\n\r\n", Head, {0, row.response, row.status, ""}});
  }
  return table;
}

const ReplyScenario kHeadTable[] = {
    // Line ends.
    {"NothingAtAll", "", Head, {0, 3, 0, ""}},
    {"BareLineFeeds", "HTTP/1.1 200 OK\nContent-Type: a\n\n", Head, {0, 0, 200, "type=a|"}},
    {"BareCarriageReturnsCostAByteEach",
     "HTTP/1.1 200 OK\rContent-Type: a\r\r",
     Head,
     {0, 0, 200, ""}},
    {"LineFeedsBeforeCarriageReturns",
     "HTTP/1.1 200 OK\n\rContent-Type: a\n\r\n\r",
     Rest,
     {0, 0, 200, "ontent-Type: a\n\r\n\r"}},
    {"AStatusLineCutBehindItsCarriageReturn", "HTTP/1.1 200 OK\r", Head, {0, 3, 0, ""}},
    {"AHeaderLineCutBehindItsCarriageReturn",
     kOk + "Content-Type: a\r"s,
     Head,
     {0, 3, 200, ""},
     {kReadFailed}},
    {"AHeaderLineCutInItsMiddle", kOk + "Content-Type: a"s, Head, {0, 0, 200, "type=a|"}},
    {"NoEmptyLine", kOk + "Content-Type: a\r\n"s, Head, {0, 0, 200, "type=a|"}},
    {"CarriageReturnsWithoutEnd",
     kOk + std::string(5000, '\r') + "body",
     Rest,
     {0, 0, 200, std::string(4998, '\r') + "body"}},

    // Names.
    {"NoColon", kOk + "Content-Type text\r\n\r\n"s, Head, {0, 0, 200, "type=text|"}},
    {"AnEqualsSignForTheColon",
     kOk + "Content-Type=text\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=text|"}},
    {"AColonAlone", kOk + ":\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"TwoThousandColons", kOk + std::string(2000, ':') + "\r\n\r\n", Head, {0, 1, 200, ""}},
    {"EveryDelimiterAndNoName", kOk + " :;= \r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"AColonInFrontOfTheName",
     kOk + ": Content-Length: 5\r\n\r\n"s,
     Head,
     {0, 0, 200, "length=5|"}},
    {"AnUnknownNameAlone", kOk + "Server\r\n\r\n"s, Head, {0, 0, 200, ""}},
    {"AKnownNameAlone", kOk + "Content-Type\r\nContent-Length: 1\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"ATypeWithoutAValue",
     kOk + "Content-Length: 1\r\nContent-Type:\r\n\r\n"s,
     Head,
     {0, 1, 200, "length=1|"}},
    {"ALengthWithoutAValue", kOk + "Content-Length:\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"ARangeWithoutAValue", kOk + "Content-Range:\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"ACookieWithoutAValue", kOk + "Set-Cookie:\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"AChallengeWithoutAValue", kOk + "WWW-Authenticate:\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"AnEncodingWithoutAValue", kOk + "Transfer-Encoding:\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"ABlankForAValue", kOk + "Content-Type: \r\n\r\n"s, Head, {0, 0, 200, "type=|"}},
    {"NamesInMixedCase",
     kOk + "cOnTeNt-TyPe: a\r\nTRANSFER-ENCODING: b\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=a|encoding=b|"}},
    {"ALongerNameWithAKnownPrefix",
     kOk + "Content-Lengthiness: 9\r\n\r\n"s,
     Head,
     {0, 0, 200, "length=9|"}},

    // Folded lines are lines of their own.
    {"AFoldedValue",
     kOk + "Content-Type: a;\r\n charset=b\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=a;|"}},
    {"AKnownNameInAFold",
     kOk + "X: y\r\n Content-Length: 7\r\n\r\n"s,
     Head,
     {0, 0, 200, "length=7|"}},
    {"AFoldOfABlank", kOk + "X: y\r\n \r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"AFoldOfATab", kOk + "X: y\r\n\t\r\n\r\n"s, Head, {0, 0, 200, ""}},

    // Repetitions.
    {"TwoOfEachKeptOnce",
     kOk + "Content-Type: a\r\nContent-Type: b\r\nContent-Length: 1\r\nContent-Length: 2\r\n"
           "Content-Range: c\r\nContent-Range: d\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=a|length=1|range=c|"}},
    {"TwoOfEachReplaced",
     kOk + "Set-Cookie: a;\r\nSet-Cookie: b;\r\nWWW-Authenticate: c\r\nWWW-Authenticate: d\r\n"
           "Transfer-Encoding: e\r\nTransfer-Encoding: f\r\n\r\n"s,
     Head,
     {0, 0, 200, "cookie=b;|challenge= d|encoding=f|"}},

    // Bytes that are no text.
    {"AZeroByteInAValue", kOk + "Content-Type: a\0b\r\n\r\n"s, Head, {0, 0, 200, "type=a|"}},
    {"AZeroByteInAName", kOk + "Content\0-Type: a\r\n\r\n"s, Head, {0, 0, 200, ""}},
    {"AZeroByteForALine", kOk + "\0\r\nContent-Type: a\r\n\r\n"s, Head, {0, 1, 200, ""}},
    {"ControlBytesInAValue",
     kOk + "Content-Type: \x01\x1b[2J\x7f\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=\x01\x1b[2J\x7f|"}},
    {"HighBytesInAValue",
     kOk + "Content-Type: \xff\xfe\x80\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=\xff\xfe\x80|"}},
    {"PrintfDirectivesInAValue",
     kOk + "Content-Type: %s%n%s\r\n\r\n"s,
     Head,
     {0, 0, 200, "type=%s%n%s|"}},

    // Many lines and long ones: 30 lines are read, of at most 2,047 bytes.
    {"ThirtyLinesLeaveTheEmptyOne", kOk + Lines(30) + "\r\nbody", Rest, {0, 0, 200, "\r\nbody"}},
    {"AThousandLinesLeaveTheOthers",
     kOk + Lines(1000) + "\r\nbody",
     Rest,
     {0, 0, 200, Lines(970) + "\r\nbody"}},
    {"ALineThatFits",
     kOk + "X: "s + std::string(2044, 'v') + "\r\nContent-Type: a\r\n\r\n",
     Head,
     {0, 0, 200, "type=a|"}},
    {"ALineOfTheBuffersLengthEndsTheHead",
     kOk + "X: "s + std::string(2045, 'v') + "\r\nContent-Type: a\r\n\r\n",
     Rest,
     {0, 0, 200, "Content-Type: a\r\n\r\n"}},
    {"ALongValueIsCut",
     kOk + "Content-Type: "s + std::string(3000, 'v') + "\r\n\r\n",
     Head,
     {0, 0, 200, "type=" + std::string(2033, 'v') + "|"}},
    {"ALineIsHiddenBehindALongOne",
     kOk + "X: "s + std::string(2045, 'v') + "Content-Length: 3\r\n\r\n",
     Head,
     {0, 0, 200, "length=3|"}},
};

// Heads without an end come over plain connections alone: the bytes behind them are counted, and
// the client may not keep any.
Outcome GetAndCount(int port) {
  ClientProbe client(port);
  const int result = client.SendRequestByGet();
  char piece[8192];
  size_t total = 0;
  for (int n; (n = client.ReadData(piece, sizeof(piece))) > 0;) total += static_cast<size_t>(n);
  return OutcomeOf(client, result, std::to_string(total));
}

Outcome FormPost(int port) {
  ClientProbe client(port);
  const int result = client.SendRequestBySocketPost("a=1");
  return OutcomeOf(client, result);
}

Outcome Soap(int port) {
  ClientProbe client(port);
  std::string reply = "untouched";
  const int result = client.SendReqBySocketPost("<a/>", reply);
  return OutcomeOf(client, result, reply);
}

Outcome SoapWithLogin(int port) {
  ClientProbe client(port);
  std::string reply = "untouched";
  const int result = client.SendAuthReqBySocketPost("<a/>", reply);
  return OutcomeOf(client, result, reply);
}

Outcome CurlGet(int port) {
  ClientProbe client(port);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 20);
  return OutcomeOf(client, result, client.m_strCurlText);
}

Outcome CurlGetToFile(int port) {
  ClientProbe client(port);
  const UniqueFile file(tmpfile());
  client.SetCurlRespFile(file.get());
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 20);
  return OutcomeOf(client, result, ftell(file.get()) < (1 << 20) ? "a short file" : "a long file");
}

Outcome CurlPost(int port) {
  ClientProbe client(port);
  const int result = client.SendRequestByPost("?");
  return OutcomeOf(client, result);
}

Outcome XmlGet(int port) {
  ClientProbe client(port);
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

std::string FailedBy(const std::string& function, int code) {
  return function + ": Failed to make http connection, return value=" + std::to_string(code) + "\n";
}

const std::string kLongLine = std::string("HTTP/1.1 200 OK\r\nX: ");
constexpr size_t kThirtyPieces = 30 * 2048;

const Scenario kEndlessTable[] = {
    {"ALineOf100Mebibytes",
     {Endless(kLongLine, "v")},
     GetAndCount,
     {0, 0, 200, std::to_string(3 + kHundred - kThirtyPieces)}},
    {"AStatusLineOf100Mebibytes",
     {Endless("HTTP/1.1 200 ", "v")},
     GetAndCount,
     {0, 0, 200, std::to_string(13 + kHundred - 31 * 2048)}},
    {"BlanksOf100Mebibytes", {Endless("", " ")}, GetAndCount, {0, 3, 0, "0"}},
    {"ZeroBytesOf100Mebibytes", {Endless(kOk, "\0"s)}, GetAndCount, {0, 1, 200, "0"}},
    {"LineFeedsOf100Mebibytes",
     {Endless(kOk, "\n")},
     GetAndCount,
     {0, 0, 200, std::to_string(kHundred - 1)}},
    {"TenMillionLines", {TenMillionLines()}, GetAndCount, {0, 0, 200, "59999820"}},
    {"AContinueForEver",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     GetAndCount,
     {0, 5, 100, "104857475"}},
    {"ALineOf100MebibytesForAForm", {Endless(kLongLine, "v")}, FormPost, {0, 0, 200, ""}},
    {"ALineOf100MebibytesForSoap", {Endless(kLongLine, "v")}, Soap, {3, 0, 200, "untouched"}},
    {"TenMillionLinesForSoap", {TenMillionLines()}, Soap, {3, 0, 200, "untouched"}},
    {"AContinueForEverForSoap",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     Soap,
     {3, 5, 100, "untouched"}},
    {"AContinueForEverForSoapWithALogin",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     SoapWithLogin,
     {3, 5, 100, "untouched"}},
};

// libcurl ends a line of over 100 KiB (code 27) and a head of over 300 KiB (code 56).
const Scenario kEndlessCurlTable[] = {
    {"ALineOf100MebibytesForCurl",
     {Endless(kLongLine, "v")},
     CurlGet,
     {3, 3, 0, ""},
     {FailedBy("SendRequestByCurl", 27)}},
    {"TenMillionLinesForCurl",
     {TenMillionLines()},
     CurlGet,
     {3, 3, 0, ""},
     {FailedBy("SendRequestByCurl", 56)}},
    {"TenMillionLinesForAFile",
     {TenMillionLines()},
     CurlGetToFile,
     {3, 3, 0, "a short file"},
     {FailedBy("SendRequestByCurl", 56)}},
    {"TenMillionLinesForCurlPost",
     {TenMillionLines()},
     CurlPost,
     {3, 3, 0, ""},
     {FailedBy("SendRequestByPost", 56)}},
    {"TenMillionLinesForXml",
     {TenMillionLines()},
     XmlGet,
     {3, 3, 0, ""},
     {FailedBy("SendReqByXMLGet", 56)}},
    {"AContinueForEverForCurl",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     CurlGet,
     {3, 3, 0, ""},
     {FailedBy("SendRequestByCurl", 56)}},
    {"AContinueForEverForCurlPost",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     CurlPost,
     {3, 3, 0, ""},
     {FailedBy("SendRequestByPost", 56)}},
    {"AContinueForEverForXml",
     {Endless("", "HTTP/1.1 100 Continue\r\n\r\n")},
     XmlGet,
     {3, 3, 0, ""},
     {FailedBy("SendReqByXMLGet", 56)}},
};

}  // namespace

class StatusLines : public ::testing::TestWithParam<ReplyScenario> {};

TEST_P(StatusLines, EndAsTheTableSays) {
  PlayReply(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Hostile, StatusLines, ::testing::ValuesIn(StatusLineTable()), ReplyName);

class Heads : public ::testing::TestWithParam<ReplyScenario> {};

TEST_P(Heads, EndAsTheTableSays) {
  PlayReply(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Hostile, Heads, ::testing::ValuesIn(kHeadTable), ReplyName);

class EndlessHeads : public ::testing::TestWithParam<Scenario> {};

TEST_P(EndlessHeads, EndAsTheTableSaysInConstantMemory) {
  const PeakMemory memory;
  PlayScenario(GetParam());
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
