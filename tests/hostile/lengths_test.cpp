// Content-Length lines that are none, and how each reader of a body ends with them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <libxml/tree.h>

#include "tests/hostile/hostile_util.h"

using namespace std::string_literals;

namespace {

constexpr char kReadFailed[] = "SendReqBySocketPost: Read data faild.\n";

// The body of a response, of which a SOAP request reads as much as the response announces and anything
// else all of it, and libcurl what it makes of the length.
struct LengthRow {
  const char* name;
  std::string lines;  // of the head
  std::string body;
  std::string kept;  // what GetHttpContent returns
  std::string soap;  // the response; kFails when there is none
  CURLcode curl_code;
  std::string curl;
};

constexpr char kFails[] = "(fails)";
constexpr char kNone[] = "(none)";

std::string Length(const std::string& value) {
  return "Content-Length: " + value + "\r\n";
}

std::string Lines(size_t count) {
  std::string lines;
  for (size_t i = 0; i < count; ++i) lines += "X: y\r\n";
  return lines;
}

const LengthRow kLengths[] = {
    {"TheRightOne", Length("4"), "<a/>", "4", "<a/>", CURLE_OK, "<a/>"},
    {"NoLength", "", "<a/>", kNone, kFails, CURLE_OK, "<a/>"},

    // What is no number.
    {"AText", Length("four"), "<a/>", "four", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"ABlank", "Content-Length: \r\n", "<a/>", "", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"ASignAlone", Length("-"), "<a/>", "-", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"AHexadecimalNumber", Length("0x4"), "<a/>", "0x4", kFails, CURLE_OK, ""},
    {"ControlBytes", Length("\x01\x02"), "<a/>", "\x01\x02", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"AZeroByte", Length("\0"s + "4"), "<a/>", "", kFails, CURLE_WEIRD_SERVER_REPLY, ""},

    // Numbers with something around them.
    {"APlusSign", Length("+4"), "<a/>", "+4", "<a/>", CURLE_OK, "<a/>"},
    {"BlanksAround", Length("   4   "), "<a/>", "4", "<a/>", CURLE_OK, "<a/>"},
    {"ATabInFront", Length("\t4"), "<a/>", "\t4", "<a/>", CURLE_OK, "<a/>"},
    {"ZerosInFront", Length("0004"), "<a/>", "0004", "<a/>", CURLE_OK, "<a/>"},
    {"AThousandZerosInFront", Length(std::string(1000, '0') + "4"), "<a/>",
     std::string(1000, '0') + "4", "<a/>", CURLE_OK, "<a/>"},
    {"LettersAfter", Length("4 bytes"), "<a/>", "4 bytes", "<a/>", CURLE_OK, "<a/>"},
    {"AFraction", Length("4.9"), "<a/>", "4.9", "<a/>", CURLE_OK, "<a/>"},
    {"AList", Length("4, 4"), "<a/>", "4, 4", "<a/>", CURLE_OK, "<a/>"},
    {"NoColon", "Content-Length 4\r\n", "<a/>", "4", "<a/>", CURLE_WEIRD_SERVER_REPLY, ""},
    {"ALongerName", "Content-Lengths: 4\r\n", "<a/>", "4", "<a/>", CURLE_OK, "<a/>"},

    // Numbers out of range.
    {"Zero", Length("0"), "<a/>", "0", kFails, CURLE_OK, ""},
    {"MinusZero", Length("-0"), "<a/>", "-0", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"Negative", Length("-4"), "<a/>", "-4", kFails, CURLE_WEIRD_SERVER_REPLY, ""},
    {"NegativeBeyond64Bits", Length("-9223372036854775812"), "<a/>", "-9223372036854775812", kFails,
     CURLE_WEIRD_SERVER_REPLY, ""},
    {"AlmostAllOf31Bits", Length("2147483646"), "<a/>", "2147483646", "<a/>", CURLE_PARTIAL_FILE,
     "<a/>"},
    {"AllOf31Bits", Length("2147483647"), "<a/>", "2147483647", kFails, CURLE_PARTIAL_FILE, "<a/>"},
    {"Beyond31Bits", Length("2147483652"), "<a/>", "2147483652", kFails, CURLE_PARTIAL_FILE,
     "<a/>"},
    {"Beyond32Bits", Length("4294967300"), "<a/>", "4294967300", kFails, CURLE_PARTIAL_FILE,
     "<a/>"},
    {"AllOf63Bits", Length("9223372036854775807"), "<a/>", "9223372036854775807", kFails,
     CURLE_PARTIAL_FILE, "<a/>"},
    {"Beyond64Bits", Length("18446744073709551620"), "<a/>", "18446744073709551620", kFails,
     CURLE_OK, "<a/>"},
    {"AThousandDigits", Length(std::string(1000, '4')), "<a/>", std::string(1000, '4'), kFails,
     CURLE_OK, "<a/>"},

    // Several lines: the first counts.
    {"TwiceTheSame", Length("4") + Length("4"), "<a/>", "4", "<a/>", CURLE_OK, "<a/>"},
    {"ASmallerOneFirst", Length("2") + Length("4"), "<a/>", "2", "<a", CURLE_OK, "<a/>"},
    {"ALargerOneFirst", Length("4") + Length("2"), "<a/>", "4", "<a/>", CURLE_OK, "<a"},
    {"ATextFirst", Length("four") + Length("4"), "<a/>", "four", kFails, CURLE_WEIRD_SERVER_REPLY,
     ""},
    {"AsTheLastLineThatIsRead", Lines(28) + Length("4"), "<a/>", "4", "<a/>", CURLE_OK, "<a/>"},

    // Lengths that lie.
    {"LargerThanTheBody", Length("100"), "<a/>", "100", "<a/>", CURLE_PARTIAL_FILE, "<a/>"},
    {"SmallerThanTheBody", Length("2"), "<a/>", "2", "<a", CURLE_OK, "<a"},
    {"AByteMoreThanTheBody", Length("5"), "<a/>", "5", "<a/>", CURLE_PARTIAL_FILE, "<a/>"},
    {"ABodyWithAZeroByte", Length("4"), "<a\0b"s, "4", "<a", CURLE_OK, "<a\0b"s},
};

Outcome GetAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, Content(client, HTTP_CONTENT_LENGTH) + ": " + body);
}

Outcome Soap(ExposedClient& client) {
  std::string response = kFails;
  const int result = client.SendReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

// The text tells whether there is a document.
Outcome XmlSoap(ExposedClient& client) {
  xmlDoc untouched;
  xmlDoc* doc = &untouched;
  const int result = client.SendReqByXMLSocketPost("<a/>", doc);
  if (doc == &untouched) return OutcomeOf(client, result, kFails);
  const bool parsed = doc != nullptr;
  xmlFreeDoc(doc);
  return OutcomeOf(client, result, parsed ? "a document" : "no document");
}

Outcome CurlGet(int port) {
  ExposedClient client(port);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 10);
  return OutcomeOf(client, result, client.m_strCurlText);
}

std::string Response(const std::string& lines, const std::string& body) {
  return "HTTP/1.1 200 OK\r\n" + lines + "\r\n" + body;
}

std::vector<ResponseScenario> BodyTable() {
  std::vector<ResponseScenario> table;
  for (const LengthRow& row : kLengths) {
    table.push_back({row.name, Response(row.lines, row.body), GetAndReadBody,
                     Success(row.kept + ": " + row.body)});
  }
  return table;
}

std::vector<ResponseScenario> SoapTable() {
  std::vector<ResponseScenario> table;
  for (const LengthRow& row : kLengths) {
    const int result = row.soap == kFails ? HTTP_RET_IO_ERROR : HTTP_RET_OK;
    table.push_back({row.name,
                     Response(row.lines, row.body),
                     Soap,
                     {result, HTTP_RET_OK, 200, row.soap},
                     {},
                     true});
  }
  return table;
}

std::vector<Scenario> CurlTable() {
  std::vector<Scenario> table;
  for (const LengthRow& row : kLengths) {
    const int result = row.curl_code == CURLE_OK ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
    std::vector<std::string> log;
    if (row.curl_code != CURLE_OK) {
      log.push_back("SendRequestByCurl: Failed to make http connection, return value=" +
                    std::to_string(row.curl_code) + "\n");
    }
    const Script script = {ExpectRequest(), SendWhileRead(Response(row.lines, row.body)), Close()};
    table.push_back({row.name, {script}, CurlGet, {result, result, 0, row.curl}, log});
  }
  return table;
}

// Heads that end the reading, and bodies that end before they begin.
const ResponseScenario kOthers[] = {
    {"NoValueForABody",
     Response("Content-Length:\r\n", "<a/>"),
     GetAndReadBody,
     {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 200, "(none): "},
     {"ReadBody: Read data error\n"}},
    {"NoValueForSoap",
     Response("Content-Length:\r\n", "<a/>"),
     Soap,
     {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 200, kFails}},
    {"AFoldedValueForSoap",
     Response("Content-Length:\r\n 4\r\n", "<a/>"),
     Soap,
     {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 200, kFails}},
    {"BeyondTheLastLineForSoap", Response(Lines(30) + Length("4"), "<a/>"), Soap,
     BodyFailed(kFails)},
    {"BeyondTheLastLineForABody", Response(Lines(30) + Length("4"), "<a/>"), GetAndReadBody,
     Success("(none): Content-Length: 4\r\n\r\n<a/>")},
    {"NoBodyForSoap", Response(Length("4"), ""), Soap, BodyFailed(kFails), {kReadFailed}},
    {"NoBodyOf2GibibytesForSoap",
     Response(Length("2147483646"), ""),
     Soap,
     BodyFailed(kFails),
     {kReadFailed}},
    {"ABodyOfAZeroByteForSoap", Response(Length("1"), "\0"s), Soap, Success("")},
    {"AnErrorsBodyForSoap",
     "HTTP/1.1 500 No\r\nContent-Length: 4\r\n\r\n<a/>",
     Soap,
     Sent(HTTP_RET_BAD_RESPONSE, 500, "<a/>"),
     {},
     true},
    {"TheRightOneForXml", Response(Length("4"), "<a/>"), XmlSoap, Success("a document"), {}, true},
    {"SmallerThanTheBodyForXml",
     Response(Length("3"), "<a/>"),
     XmlSoap,
     Success("no document"),
     {},
     true},
    {"NegativeForXml", Response(Length("-4"), "<a/>"), XmlSoap, BodyFailed(kFails)},
};

Outcome JsonGet(int port) {
  Json::Value value = "untouched";
  const int result = SendHttpGet("127.0.0.1", port, "a.cgi", value, 5, true);
  return OneCall(result, value.toStyledString());
}

Script Respond(const std::string& response) {
  return {ExpectRequest(), SendWhileRead(response), Close()};
}

const char kJson[] = "{\"success\":true}";
const char kJsonShown[] = "{\n\t\"success\" : true\n}\n";

const Scenario kJsonTable[] = {
    {"SmallerThanTheBodyForJson",
     {Respond(Response(Length("2"), kJson))},
     JsonGet,
     OneCall(0, kJsonShown)},
    {"LargerThanTheBodyForJson",
     {Respond(Response(Length("2000"), kJson))},
     JsonGet,
     OneCall(0, kJsonShown)},
    {"NegativeForJson", {Respond(Response(Length("-1"), kJson))}, JsonGet, OneCall(0, kJsonShown)},
    {"NoValueForJson",
     {Respond(Response("Content-Length:\r\n", kJson))},
     JsonGet,
     OneCall(-1, "\"untouched\"\n"),
     {"SendHttpGet: Failed to check response[200]: 1\n"}},
    {"NoBodyForJson",
     {Respond(Response(Length("16"), ""))},
     JsonGet,
     OneCall(-1, "\"untouched\"\n"),
     {"SendHttpGet: Read Buffer Error\n"}},
};

// A SOAP response of more than a mebibyte is read as it comes, and whole.
Outcome SoapOfAnySize(int port) {
  ExposedClient client(port);
  return Soap(client);
}

const std::string kLarge(3 << 20, 'x');

const Scenario kLargeTable[] = {
    {"ALargeBodyForSoap",
     {Respond(Response(Length(std::to_string(kLarge.size())), kLarge))},
     SoapOfAnySize,
     Success(kLarge)},
    {"HalfOfALargeBodyForSoap",
     {Respond(Response(Length(std::to_string(2 * kLarge.size())), kLarge))},
     SoapOfAnySize,
     Success(kLarge)},
    {"MuchMoreThanALargeBodyForSoap",
     {Respond(Response(Length("2147483646"), kLarge))},
     SoapOfAnySize,
     Success(kLarge)},
};

}  // namespace

class Lengths : public ::testing::TestWithParam<ResponseScenario> {};

TEST_P(Lengths, EndAsTheTableSays) {
  RunInEachWay(GetParam());
}

INSTANTIATE_TEST_SUITE_P(ReadBody, Lengths, ::testing::ValuesIn(BodyTable()), ResponseName);
INSTANTIATE_TEST_SUITE_P(Soap, Lengths, ::testing::ValuesIn(SoapTable()), ResponseName);
INSTANTIATE_TEST_SUITE_P(Others, Lengths, ::testing::ValuesIn(kOthers), ResponseName);

class LengthReaders : public ::testing::TestWithParam<Scenario> {};

TEST_P(LengthReaders, EndAsTheTableSays) {
  RunScenario(GetParam());
}

INSTANTIATE_TEST_SUITE_P(Curl, LengthReaders, ::testing::ValuesIn(CurlTable()), ScenarioName);
INSTANTIATE_TEST_SUITE_P(Json, LengthReaders, ::testing::ValuesIn(kJsonTable), ScenarioName);
INSTANTIATE_TEST_SUITE_P(Large, LengthReaders, ::testing::ValuesIn(kLargeTable), ScenarioName);
