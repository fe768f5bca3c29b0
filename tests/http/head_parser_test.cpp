// The pure functions that take a response's head apart.
#include "tarnwick/http/head_parser.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace tarnwick;

using namespace std::string_literals;

namespace {

struct StatusCase {
  std::string line;
  StatusLine result;
  int status;  // 0: untouched or zero
};

void ExpectStatus(const StatusCase& expected) {
  SCOPED_TRACE(expected.line);
  int status = 0;
  EXPECT_EQ(ParseStatusLine(expected.line, &status), expected.result);
  EXPECT_EQ(status, expected.status);
}

// The value of a line whose field has that name.
std::string ValueOf(const std::string& line, std::string_view name) {
  const HeaderLine parsed = ParseHeaderLine(line);
  EXPECT_TRUE(parsed.hasName) << line;
  EXPECT_EQ(parsed.field != nullptr ? parsed.field->name : "none", name) << line;
  return std::string(parsed.value);
}

}  // namespace

TEST(ParseStatusLine, TheSecondWordIsTheStatusAndTheReasonIsIgnored) {
  for (const StatusCase& expected :
       std::vector<StatusCase>{{"HTTP/1.1 200 OK", StatusLine::kParsed, 200},
                               {"HTTP/1.0 404 Not Found", StatusLine::kParsed, 404},
                               {"HTTP/1.1 204", StatusLine::kParsed, 204},
                               {"HTTP/1.1 401 200", StatusLine::kParsed, 401},
                               {"  HTTP/1.1   302   x", StatusLine::kParsed, 302},
                               {"HTTP/1.1 200OK", StatusLine::kParsed, 200},
                               {"HTTP/1.1 0200", StatusLine::kParsed, 200},
                               {"HTTP/1.1 +200", StatusLine::kParsed, 200},
                               {"HTTP/1.1 \t200", StatusLine::kParsed, 200}}) {
    ExpectStatus(expected);
  }
}

TEST(ParseStatusLine, AStatusThatIsNoNumberIsZero) {
  ExpectStatus({"HTTP/1.1 OK", StatusLine::kParsed, 0});
  ExpectStatus({"HTTP/1.1 x200", StatusLine::kParsed, 0});
  ExpectStatus({"HTTP/1.1 -", StatusLine::kParsed, 0});
}

TEST(ParseStatusLine, TheVersionIsComparedOverEightCharactersWithItsCase) {
  ExpectStatus({"HTTP/1.10 200", StatusLine::kParsed, 200});
  ExpectStatus({"HTTP/1.1x 200", StatusLine::kParsed, 200});
  for (const char* line : {"HTTP/2 200", "HTTP/2.0 200", "http/1.1 200", "HTTP/1.2 200",
                           "HTTP/1. 200", "HTTP 200", "ICY 200 OK", "x", "HTTP/1"}) {
    ExpectStatus({line, StatusLine::kNotHttp, 0});
  }
}

TEST(ParseStatusLine, AMissingWordIsIncomplete) {
  for (const char* line : {"", " ", "    ", "HTTP/1.1", "HTTP/1.0 ", " HTTP/1.1   "}) {
    ExpectStatus({line, StatusLine::kIncomplete, 0});
  }
}

TEST(ParseStatusLine, AStatusBeyondAnIntNeverBecomesASmallOne) {
  for (const char* line :
       {"HTTP/1.1 99999999999", "HTTP/1.1 4294967496", "HTTP/1.1 -4294967096",
        "HTTP/1.1 99999999999999999999999999", "HTTP/1.1 18446744073709551816"}) {
    int status = 0;
    EXPECT_EQ(ParseStatusLine(line, &status), StatusLine::kParsed) << line;
    EXPECT_TRUE(status < 100 || status > 999) << line << " gave " << status;
  }
}

TEST(ParseStatusLine, EveryCutOfALineHasTheResultOfItsWords) {
  const std::string line = "HTTP/1.1 401 No";
  const int statuses[] = {4, 40, 401, 401, 401, 401};
  for (size_t n = 0; n <= line.size(); ++n) {
    const StatusLine result = n == 0   ? StatusLine::kIncomplete
                              : n < 8  ? StatusLine::kNotHttp
                              : n < 10 ? StatusLine::kIncomplete
                                       : StatusLine::kParsed;
    ExpectStatus({line.substr(0, n), result, n < 10 ? 0 : statuses[n - 10]});
  }
}

TEST(ParseHeaderLine, TheKeptNamesAreKnownInAnyCase) {
  for (const KeptField& field : kKeptFields) {
    std::string name(field.name);
    EXPECT_EQ(ValueOf(name + ": v w", field.name), " v w");
    EXPECT_EQ(ValueOf(name + "-2: v", field.name), " v");
    for (char& c : name) c = static_cast<char>(c ^ (isalpha(c) ? 0x20 : 0));
    EXPECT_EQ(ValueOf(name + ":v", field.name), "v");
  }
}

TEST(ParseHeaderLine, OtherNamesAndCutNamesAreOther) {
  for (const char* line : {"Date: x", "Content: x", "Content-Typ: x", "X-Content-Type: x", "Server",
                           "Set-Cooki", "\tContent-Type: x", "a"}) {
    const HeaderLine parsed = ParseHeaderLine(line);
    EXPECT_TRUE(parsed.hasName) << line;
    EXPECT_EQ(parsed.field, nullptr) << line;
  }
}

TEST(ParseHeaderLine, ALineOfDelimitersHasNoName) {
  for (const char* line : {"", " ", ":", ";", "=", ": =;:", "   "}) {
    EXPECT_FALSE(ParseHeaderLine(line).hasName) << line;
  }
}

TEST(ParseHeaderLine, ASpaceColonSemicolonOrEqualsSignEndsTheName) {
  for (const char delimiter : {' ', ':', ';', '='}) {
    const std::string line = "Content-Type"s + delimiter + "a=b;c";
    EXPECT_EQ(ValueOf(line, "Content-Type"), "a=b;c");
  }
}

TEST(ParseHeaderLine, LeadingDelimitersAreSkipped) {
  EXPECT_EQ(ValueOf(" :;= Content-Type: x", "Content-Type"), " x");
}

TEST(ParseHeaderLine, OnlyOneDelimiterIsTakenAfterTheName) {
  EXPECT_EQ(ValueOf("Content-Type : x", "Content-Type"), ": x");
  EXPECT_EQ(ValueOf("Content-Type:: x ", "Content-Type"), ": x ");
}

TEST(ParseHeaderLine, ANameAloneHasAnEmptyValue) {
  EXPECT_EQ(ValueOf("Content-Length", "Content-Length"), "");
  EXPECT_EQ(ValueOf("Content-Length:", "Content-Length"), "");
  EXPECT_EQ(ValueOf("Content-Length: ", "Content-Length"), " ");
}

TEST(ParseHeaderLine, AnyBytesAreTaken) {
  for (int byte = 0; byte < 256; ++byte) {
    const std::string text(3, static_cast<char>(byte));
    ParseHeaderLine(text);
    EXPECT_EQ(ValueOf("Content-Type:" + text, "Content-Type"), text);
  }
}

TEST(ParseCookie, TheFirstSemicolonEndsTheCookieAndStays) {
  EXPECT_EQ(ParseCookie(" id=42; Path=/; Secure"), "id=42;");
  EXPECT_EQ(ParseCookie("id=42;"), "id=42;");
  EXPECT_EQ(ParseCookie("  ; x"), ";");
}

TEST(ParseCookie, SpacesAreTrimmedAndTabsAreNot) {
  EXPECT_EQ(ParseCookie("  a b ;"), "a b ;");
  EXPECT_EQ(ParseCookie("\ta;"), "\ta;");
}

TEST(ParseCookie, WithoutASemicolonThereIsNoCookie) {
  EXPECT_EQ(ParseCookie(" id=42"), "");
  EXPECT_EQ(ParseCookie(""), "");
}
