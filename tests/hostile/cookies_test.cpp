// Servers that set broken, huge or dangerous cookies: what the next request carries.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tarnwick/utils/utils.h"
#include "tests/hostile/hostile_util.h"

namespace {

using ::testing::IsEmpty;

constexpr size_t kLongest = 64 << 10;
constexpr size_t kLineLimit = 2047;  // of a header line that the client reads, and of a GET
constexpr char kName[] = "Set-Cookie:";
constexpr char kOldCookie[] = "old=1;";

struct CookieCase {
  std::string name;
  std::string lines;           // the header lines of the response
  std::string cookie;          // that the next request carries; empty: none
  int response = HTTP_RET_OK;  // what CheckResponse returns for the response
  std::string status = "HTTP/1.1 200 OK\r\n";
};

std::ostream& operator<<(std::ostream& out, const CookieCase& test) {
  return out << test.name;
}

std::string Cookie(const std::string& value) {
  return "Set-Cookie: " + value + "\r\n";
}

// All bytes but those that end a line or a text.
std::string Controls() {
  std::string controls;
  for (char c = 1; c < ' '; ++c) {
    if (c != '\r' && c != '\n') controls += c;
  }
  return controls + "\x7f\x80\xff";
}

std::string WithZero(const std::string& before, const std::string& after) {
  return before + std::string(1, '\0') + after;
}

// The longest cookie that a header line can hold.
std::string LongestCookie() {
  return std::string(kLineLimit - sizeof(kName), 'c') + ";";
}

std::vector<CookieCase> ShapeTable() {
  return {
      {"Sound", Cookie("a=1; Path=/"), "a=1;"},
      {"None", "X: y\r\n", ""},
      {"WithoutASemicolon", Cookie("a=1"), ""},
      {"NothingAfterTheColon", "Set-Cookie:\r\n", "", HTTP_RET_NOT_READY},
      {"NothingAfterTheColonOfTheSecond", Cookie("a=1;") + "Set-Cookie:\r\n", "a=1;",
       HTTP_RET_NOT_READY},
      {"OneBlank", Cookie(""), ""},
      {"OnlyASemicolon", Cookie(";"), ";"},
      {"OnlySemicolons", Cookie(";;;;;;"), ";"},
      {"OnlyAttributes", Cookie("; Path=/; HttpOnly"), ";"},
      {"AnAttributeInPlaceOfTheCookie", Cookie("Path=/; HttpOnly"), "Path=/;"},
      {"NoName", Cookie("=v; Path=/"), "=v;"},
      {"NoValue", Cookie("a; Path=/"), "a;"},
      {"OnlyAnEqualsSign", Cookie("=;"), "=;"},
      {"ASemicolonInQuotes", Cookie("a=\"b;c\"; Path=/"), "a=\"b;"},
      {"UnterminatedQuotes", Cookie("a=\"b; Path=/"), "a=\"b;"},
      {"BlanksAround", Cookie("     a=1     ; Path=/"), "a=1     ;"},
      {"TabsAround", Cookie("\ta=1\t;\t"), "\ta=1\t;"},
      {"SeveralInOneLine", Cookie("a=1, b=2; c=3"), "a=1, b=2;"},
      {"NameInMixedCase", "sEt-cOOKIE: a=1;\r\n", "a=1;"},
      {"ALongerName", "Set-Cookie2: a=1;\r\n", "a=1;"},
      {"ABlankBeforeTheColon", "Set-Cookie : a=1;\r\n", ": a=1;"},
      {"AnEqualsSignInPlaceOfTheColon", "Set-Cookie=a=1;\r\n", "a=1;"},
      {"ASemicolonInPlaceOfTheColon", "Set-Cookie;a=1;\r\n", "a=1;"},
      {"DelimitersBeforeTheName", ":= ;Set-Cookie: a=1;\r\n", "a=1;"},
      {"ATabBeforeTheName", "\tSet-Cookie: a=1;\r\n", ""},
      {"AFoldedLine", "Set-Cookie: a=1\r\n  ;\r\n", "", HTTP_RET_NOT_READY},
      {"ACookieForTheServer", "Cookie: a=1;\r\n", ""},
  };
}

std::vector<CookieCase> NumberTable() {
  return {
      {"TheLastOfTwo", Cookie("a=1;") + Cookie("b=2;"), "b=2;"},
      {"TheLastOfTwoIsBroken", Cookie("a=1;") + Cookie("b=2"), ""},
      {"TheLastOf29", Repeated(28, Cookie("a=1;")) + Cookie("b=2;"), "b=2;"},
      {"The30thOf100", Repeated(29, Cookie("a=1;")) + Cookie("b=2;") + Repeated(70, Cookie("c=3;")),
       "b=2;"},
      {"The31stIsNotRead", Repeated(30, "X: y\r\n") + Cookie("a=1;"), ""},
      {"TenThousand", Repeated(10000, Cookie("a=1;")), "a=1;"},
      {"LongestThatALineHolds", "Set-Cookie:" + LongestCookie() + "\r\n", LongestCookie()},
      {"OneByteLonger", "Set-Cookie:c" + LongestCookie() + "\r\n", ""},
      {"64KBWithoutASemicolon", Cookie(std::string(kLongest, 'c')), ""},
      {"64KBBeforeTheSemicolon", Cookie(std::string(kLongest, 'c') + ";"), ""},
      {"64KBAfterTheSemicolon", Cookie("a=1;" + std::string(kLongest, 'c')), "a=1;"},
      {"64KBOfSemicolons", Cookie(std::string(kLongest, ';')), ";", HTTP_RET_NOT_READY},
      {"64KBOfBlanks", Cookie(std::string(kLongest, ' ') + "a=1;"), "", HTTP_RET_NOT_READY},
      {"TheRestOfALongLineIsALineOfItsOwn",
       "X: " + std::string(kLineLimit + 1 - 3, 'x') + Cookie("b=2;"), "b=2;"},
  };
}

std::vector<CookieCase> ByteTable() {
  return {
      {"ControlBytes", Cookie(Controls() + ";"), Controls() + ";"},
      {"ControlBytesAfterTheSemicolon", Cookie("a=1;" + Controls()), "a=1;"},
      {"ACarriageReturnBeforeTheSemicolon", Cookie("a=1\rX; b=2;"), ""},
      {"ACarriageReturnAndAName", Cookie("a=1;\rXY: 1"), "a=1;"},
      {"ALineFeedBeforeTheSemicolon", Cookie("a=1\nX: 1;"), ""},
      {"ALineFeedAndAnotherCookie", Cookie("a=1;\nSet-Cookie: b=2;"), "b=2;"},
      {"ALineEndAndAHeader", Cookie("a=1;\r\nAuthorization: Basic eA=="), "a=1;"},
      {"AnEmptyLineAndARequest", Cookie("a=1;\r\n\r\nGET /evil HTTP/1.0\r\n\r\n"), "a=1;"},
      {"AZeroByteBeforeTheSemicolon", Cookie(WithZero("a=1", ";")), ""},
      {"AZeroByteAfterTheSemicolon", Cookie(WithZero("a=1;", "b=2;")), "a=1;"},
      {"AZeroByteInTheName", WithZero("Set-Coo", "kie: a=1;\r\n"), ""},
      {"AZeroByteInPlaceOfTheValue", WithZero("Set-Cookie:", "a=1;\r\n"), "", HTTP_RET_NOT_READY},
      {"PercentSigns", Cookie("a=%s%n%0d%0a;"), "a=%s%n%0d%0a;"},
      {"Backslashes", Cookie("a=\\r\\n\\;"), "a=\\r\\n\\;"},
      {"BytesOfUtf8", Cookie("\xc3\xa4=\xe2\x82\xac;"), "\xc3\xa4=\xe2\x82\xac;"},
  };
}

// A response that is refused sets its cookie all the same, unless its head is not read.
std::vector<CookieCase> StatusTable() {
  const auto with = [](const char* name, const char* status, const char* cookie, int response) {
    return CookieCase{name, Cookie("a=1;"), cookie, response, status};
  };
  return {
      with("A404", "HTTP/1.1 404 No\r\n", "a=1;", HTTP_RET_BAD_RESPONSE),
      with("A302", "HTTP/1.1 302 Found\r\n", "a=1;", HTTP_RET_REDIRECT),
      with("A401", "HTTP/1.1 401 No\r\n", "a=1;", HTTP_RET_UNAUTHORIZED),
      with("A100", "HTTP/1.1 100 Continue\r\n", "a=1;", HTTP_RET_BAD_RESPONSE),
      with("NoStatus", "HTTP/1.1\r\n", kOldCookie, HTTP_RET_IO_ERROR),
      with("AnotherProtocol", "ICY 200 OK\r\n", kOldCookie, HTTP_RET_BAD_RESPONSE),
      with("NoStatusLine", "", kOldCookie, HTTP_RET_BAD_RESPONSE),
  };
}

// The second requests.

std::string CookieLine(const CookieCase& test) {
  return test.cookie.empty() ? "" : "Cookie: " + test.cookie + "\r\n";
}

struct NextRequest {
  const char* name;
  void (*send)(ExposedClient&);
  std::string (*expected)(const CookieCase& test, int port);
};

const NextRequest kGet = {
    "Get", [](ExposedClient& client) { EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK); },
    [](const CookieCase& test, int) {
      const std::string request =
          "GET /a.cgi HTTP/1.0\r\nUser-Agent: Quenrith Tarnwick\r\n" + CookieLine(test) + "\r\n";
      return request.substr(0, kLineLimit);
    }};

const NextRequest kFormPost = {
    "FormPost",
    [](ExposedClient& client) { EXPECT_EQ(client.SendRequestBySocketPost("a=1"), HTTP_RET_OK); },
    [](const CookieCase& test, int) {
      return "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\n" + CookieLine(test) +
             "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n"
             "Content-Length: 3\r\nConnection: close;\r\n\r\na=1";
    }};

const NextRequest kUpload = {
    "Upload", [](ExposedClient& client) { EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK); },
    [](const CookieCase& test, int port) {
      return "POST /a.cgi HTTP/1.1\r\nHost: 127.0.0.1:" + IntToString(port) + "\r\n" +
             CookieLine(test) +
             "Content-Type: multipart/form-data; "
             "boundary=-----------QUENMULTIPART_BOUNDARY-----------\r\n"
             "Content-Length: 137438953472\r\nCache-Control :no-cache\r\n"
             "Connection: keep-alive\r\n\r\n";
    }};

const NextRequest kCurlGet = {
    "CurlGet",
    [](ExposedClient& client) {
      EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_OK);
    },
    [](const CookieCase& test, int port) {
      return "GET /a.cgi HTTP/1.1\r\nHost: 127.0.0.1:" + IntToString(port) +
             "\r\nAuthorization: Basic Og==\r\nUser-Agent: Quenrith Tarnwick\r\nAccept: */*\r\n"
             "Content-Type: application/x-www-form-urlencoded; charset=utf-8\r\n"
             "Connection: close\r\n" +
             CookieLine(test) + "\r\n";
    }};

const char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n";

// The response sets the cookie; `next`, by the same client, is compared byte by byte.
void ExpectNextRequest(const CookieCase& test, const NextRequest& next) {
  const LogCapture log(5);
  const size_t length = next.expected(test, 10000).size();  // every port here has five digits
  ScriptedPeer peer(
      {Exchange(test.status + test.lines + "\r\n"), {ExpectBytes(length), Send(kOk), Close()}});
  RunOnSmallStack(kSmallStack, [&] {
    ExposedClient client(peer.Port());
    client.SetCookie(kOldCookie);
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, test.response);
    std::string cookie;
    EXPECT_EQ(client.GetCookie(cookie), HTTP_RET_OK);
    EXPECT_EQ(cookie, test.cookie);
    next.send(client);
  });
  EXPECT_EQ(peer.Received(1), next.expected(test, peer.Port()));
  EXPECT_THAT(HttpLog(log), IsEmpty());
}

class Cookies : public ::testing::TestWithParam<CookieCase> {};

std::string NameOf(const ::testing::TestParamInfo<CookieCase>& info) {
  return info.param.name;
}

}  // namespace

TEST_P(Cookies, ReachTheNextGetAsTheTableSays) {
  ExpectNextRequest(GetParam(), kGet);
}

TEST_P(Cookies, ReachTheNextFormPostAsTheTableSays) {
  ExpectNextRequest(GetParam(), kFormPost);
}

TEST_P(Cookies, ReachTheNextUploadAsTheTableSays) {
  ExpectNextRequest(GetParam(), kUpload);
}

TEST_P(Cookies, ReachTheNextGetOfLibcurlAsTheTableSays) {
  ExpectNextRequest(GetParam(), kCurlGet);
}

INSTANTIATE_TEST_SUITE_P(OfOddShapes, Cookies, ::testing::ValuesIn(ShapeTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddNumbers, Cookies, ::testing::ValuesIn(NumberTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddBytes, Cookies, ::testing::ValuesIn(ByteTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddReplies, Cookies, ::testing::ValuesIn(StatusTable()), NameOf);
