// Services whose JSON is broken, huge, nested without end, or of other kinds than callers expect.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "tarnwick/http/json_response.h"
#include "tests/hostile/hostile_util.h"

using namespace tarnwick;

namespace {

using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr int kTrue = 0;      // "success" is true
constexpr int kNoJson = -1;   // the text cannot be parsed
constexpr int kNotTrue = -2;  // "success" is missing, or something else
constexpr size_t kMegabyte = 1 << 20;

// What is too deep for the smallest stack fits the larger one that the sanitizers need.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr int kTrueOnALargeStack = kTrue;
#else
constexpr int kTrueOnALargeStack = kNoJson;
#endif

// Copies share the bytes: a table of tests is copied many times.
struct JsonCase {
  JsonCase(std::string called, std::string text, int gives)
      : name(std::move(called)),
        response(std::make_shared<const std::string>(std::move(text))),
        result(gives) {}

  std::string name;
  std::shared_ptr<const std::string> response;
  int result;  // of JsonParse
};

std::ostream& operator<<(std::ostream& out, const JsonCase& test) {
  return out << test.name;
}

// A response that succeeds, with `value` beside it.
std::string Beside(const std::string& value) {
  return "{\"success\":true,\"x\":" + value + "}";
}

std::string SuccessIs(const std::string& value) {
  return "{\"success\":" + value + "}";
}

std::vector<JsonCase> DepthTable() {
  return {
      {"16Levels", Beside(Repeated(15, "[") + Repeated(15, "]")), kTrue},
      {"60Levels", Beside(Repeated(59, "[") + Repeated(59, "]")), kTrue},
      {"200Levels", Beside(Repeated(199, "[") + Repeated(199, "]")), kTrueOnALargeStack},
      {"1100Levels", Beside(Repeated(1099, "[") + Repeated(1099, "]")), kNoJson},
      {"100000Arrays", Repeated(100000, "[") + Repeated(100000, "]"), kNoJson},
      {"100000Objects", Repeated(100000, "{\"a\":") + "1" + Repeated(100000, "}"), kNoJson},
      {"100000OpenArrays", Repeated(100000, "["), kNoJson},
      {"100000OpenObjects", Repeated(100000, "{\"a\":"), kNoJson},
      {"100000ArraysInObjects", Repeated(50000, "{\"a\":["), kNoJson},
      {"100000ClosedArrays", Repeated(100000, "]"), kNoJson},
      {"100000ClosedBeforeTheOpen", Repeated(100000, "]") + Repeated(100000, "["), kNoJson},
      {"100000InAString", Beside("\"" + Repeated(100000, "[") + "\""), kTrue},
      {"100000AfterAnEscapedQuote", Beside("\"\\\"" + Repeated(100000, "[") + "\""), kTrue},
      {"100000AfterTwoBackslashes", "[\"\\\\\"," + Repeated(100000, "["), kNoJson},
      {"100000InAComment", "/*" + Repeated(100000, "[") + "*/" + SuccessIs("true"), kTrue},
      {"100000InALineComment", "//" + Repeated(100000, "[") + "\n" + SuccessIs("true"), kTrue},
      {"100000AfterALineComment", "//\r" + Repeated(100000, "["), kNoJson},
      {"100000AfterASlash", "/" + Repeated(100000, "["), kNoJson},
      {"100000AfterAnOpenString", "\"" + Repeated(100000, "["), kNoJson},
      {"100000AfterAZeroByte", std::string(1, '\0') + Repeated(100000, "["), kNoJson},
      {"100000AfterTheRoot", SuccessIs("true") + Repeated(100000, "["), kNoJson},
      {"100000Commas", "[" + Repeated(100000, ",") + "]", kNoJson},
      {"100000Colons", "{" + Repeated(100000, ":") + "}", kNoJson},
      {"100000Comments", Repeated(100000, "/**/") + SuccessIs("true"), kTrue},
  };
}

std::vector<JsonCase> ShapeTable() {
  const std::string sound = SuccessIs("true");
  const std::string zero(1, '\0');
  return {
      {"Sound", sound, kTrue},
      {"OneBlank", " ", kNoJson},
      {"OnlyBlanks", std::string(65536, ' '), kNoJson},
      {"OnlyLineEnds", Repeated(1000, "\r\n"), kNoJson},
      {"BlanksAround", " \t\r\n" + sound + " \t\r\n", kTrue},
      {"OtherBlanksAround", "\v\f" + sound, kNoJson},
      {"OnlyACommentAndNoEnd", "/*", kNoJson},
      {"OnlyASlash", "/", kNoJson},
      {"CommentsAround", "/* a */ // b\n" + sound + "/* c */", kTrue},
      {"ACommentInside", "{/* a */\"success\"/* b */:/* c */true/* d */}", kNoJson},
      {"ACommentWithoutItsEnd", sound + "/* a", kTrue},
      {"OpenObject", "{", kNoJson},
      {"OpenArray", "[", kNoJson},
      {"OpenString", "\"success", kNoJson},
      {"OpenMember", "{\"success\"", kNoJson},
      {"OpenValue", "{\"success\":", kNoJson},
      {"CutTrue", "{\"success\":tru", kNoJson},
      {"CutObject", "{\"success\":true", kNoJson},
      {"CutAfterAComma", "{\"success\":true,", kNoJson},
      {"ACommaAfterTheLast", "{\"success\":true,}", kNoJson},
      {"ACommaBeforeTheFirst", "{,\"success\":true}", kNoJson},
      {"TwoColons", "{\"success\"::true}", kNoJson},
      {"NoColon", "{\"success\" true}", kNoJson},
      {"ANameWithoutQuotes", "{success:true}", kNoJson},
      {"ANameInSingleQuotes", "{'success':true}", kNoJson},
      {"ANumberAsName", "{1:true}", kNoJson},
      {"AnEmptyName", "{\"\":true}", kNotTrue},
      {"ANullAsName", "{null:true}", kNoJson},
      {"ClosedByTheOther", "{\"success\":true]", kNoJson},
      {"TwoRoots", sound + sound, kTrue},
      {"TrailingGarbage", sound + "garbage", kTrue},
      {"TrailingBrackets", sound + "}}}]]]", kTrue},
      {"LeadingGarbage", "x" + sound, kNoJson},
      {"LeadingParenthesis", "(" + sound + ")", kNoJson},
      {"ACallOfAFunction", "callback(" + sound + ");", kNoJson},
      {"AProtectionPrefix", ")]}',\n" + sound, kNoJson},
      {"Html", "<html><body>" + sound + "</body></html>", kNoJson},
      {"Xml", "<success>true</success>", kNoJson},
      {"AByteOrderMark", "\xef\xbb\xbf" + sound, kNoJson},
      {"AByteOrderMarkAlone", "\xef\xbb\xbf", kNoJson},
      {"Utf16", std::string("{\0\"\0a\0\"\0:\0001\0}\0", 14), kNoJson},
      {"AZeroByteBefore", zero + sound, kNoJson},
      {"AZeroByteAfter", sound + zero, kTrue},
      {"AZeroByteInside", "{\"success\"" + zero + ":true}", kNoJson},
      {"AZeroByteInAString", Beside("\"a" + zero + "b\""), kTrue},
      {"AZeroByteInTheName", "{\"success" + zero + "\":true}", kNotTrue},
      {"AnEscapedZeroInTheName", "{\"success\\u0000\":true}", kNotTrue},
      {"AnEscapedName", "{\"s\\u0075ccess\":true}", kTrue},
      {"AZeroByteAlone", zero, kNoJson},
  };
}

std::vector<JsonCase> StringTable() {
  return {
      {"Of10MB", Beside("\"" + std::string(10 * kMegabyte, 's') + "\""), kTrue},
      {"Of10MBOpen", Beside("\"" + std::string(10 * kMegabyte, 's')), kNoJson},
      {"Of1MBOfEscapes", Beside("\"" + Repeated(1 << 19, "\\n") + "\""), kTrue},
      {"AMemberNameOf1MB", "{\"" + std::string(kMegabyte, 'n') + "\":1,\"success\":true}", kTrue},
      {"WrongUtf8", Beside("\"\xff\xfe\xc0\xaf\""), kTrue},
      {"CutUtf8", Beside("\"\xe2\x82\""), kTrue},
      {"WrongUtf8InTheName", "{\"\xff\":1,\"success\":true}", kTrue},
      {"WrongUtf8OutsideAString", "{\xff:1}", kNoJson},
      {"ControlBytes", Beside("\"\x01\t\r\n\x1b\x7f\""), kTrue},
      {"AnUnknownEscape", Beside("\"\\x41\""), kNoJson},
      {"AnEscapeAtTheEnd", Beside("\"\\\""), kNoJson},
      {"ABackslashAlone", "\"\\", kNoJson},
      {"ACutUnicodeEscape", Beside("\"\\u12\""), kNoJson},
      {"AUnicodeEscapeOfNoHex", Beside("\"\\u12zz\""), kNoJson},
      {"AHighSurrogateAlone", Beside("\"\\ud800\""), kNoJson},
      {"TwoHighSurrogates", Beside("\"\\ud800\\ud800\""), kTrue},
      {"ALowSurrogateAlone", Beside("\"\\udc00\""), kTrue},
      {"APairOfSurrogates", Beside("\"\\ud83d\\ude00\""), kTrue},
      {"SingleQuotes", Beside("'a'"), kNoJson},
      {"AString", "\"success\"", kNotTrue},
  };
}

std::vector<JsonCase> NumberTable() {
  return {
      {"AMillionDigits", Beside(std::string(kMegabyte, '9')), kNoJson},
      {"AMillionDigitsAfterThePoint", Beside("0." + std::string(kMegabyte, '9')), kTrue},
      {"AMillionZeros", Beside(std::string(kMegabyte, '0')), kTrue},
      {"AHugeExponent", Beside("1e999999999"), kNoJson},
      {"AHugeNegativeExponent", Beside("1e-999999999"), kTrue},
      {"AnExponentOfAMillionDigits", Beside("1e" + std::string(kMegabyte, '9')), kNoJson},
      {"BeyondUnsigned64Bits", Beside("18446744073709551616"), kTrue},
      {"BeyondSigned64Bits", Beside("-9223372036854775809"), kTrue},
      {"ALoneMinus", Beside("-"), kTrue},
      {"ALonePlus", Beside("+1"), kNoJson},
      {"ALonePoint", Beside("."), kNoJson},
      {"APointAtTheEnd", Beside("1."), kTrue},
      {"TwoPoints", Beside("1.2.3"), kNoJson},
      {"ALeadingZero", Beside("007"), kTrue},
      {"Hexadecimal", Beside("0x10"), kNoJson},
      {"NotANumber", Beside("NaN"), kNoJson},
      {"Infinity", Beside("Infinity"), kNoJson},
      {"MinusInfinity", Beside("-Infinity"), kNoJson},
  };
}

std::vector<JsonCase> SuccessTable() {
  return {
      {"True", SuccessIs("true"), kTrue},
      {"False", SuccessIs("false"), kNotTrue},
      {"InCapitals", SuccessIs("TRUE"), kNoJson},
      {"OfAnotherCase", "{\"Success\":true}", kNotTrue},
      {"Null", SuccessIs("null"), kNotTrue},
      {"AString", SuccessIs("\"true\""), kNotTrue},
      {"AnEmptyString", SuccessIs("\"\""), kNotTrue},
      {"AnArray", SuccessIs("[true]"), kNotTrue},
      {"AnEmptyArray", SuccessIs("[]"), kNotTrue},
      {"AnObject", SuccessIs("{\"success\":true}"), kNotTrue},
      {"Zero", SuccessIs("0"), kNotTrue},
      {"MinusZero", SuccessIs("-0"), kNotTrue},
      {"MinusZeroPointZero", SuccessIs("-0.0"), kNotTrue},
      {"One", SuccessIs("1"), kTrue},
      {"MinusOne", SuccessIs("-1"), kTrue},
      {"ASmallFraction", SuccessIs("1e-300"), kTrue},
      {"TooSmallAFraction", SuccessIs("1e-999"), kNotTrue},
      {"BeyondAllNumbers", SuccessIs("1e999"), kNoJson},
      {"TheLargestNumber", SuccessIs("18446744073709551615"), kTrue},
      {"Twice", "{\"success\":false,\"success\":true}", kTrue},
      {"TwiceTheOtherWay", "{\"success\":true,\"success\":false}", kNotTrue},
      {"AHundredThousandTimes", "{" + Repeated(100000, "\"success\":true,") + "\"success\":false}",
       kNotTrue},
      {"Inside", "{\"data\":{\"success\":true}}", kNotTrue},
      {"AfterAHundredThousandMembers", "{" + Repeated(100000, "\"m\":[],") + "\"success\":true}",
       kTrue},
      {"InAnArray", "[{\"success\":true}]", kNotTrue},
      {"ARootThatIsTrue", "true", kNotTrue},
      {"ARootThatIsOne", "1", kNotTrue},
      {"ARootThatIsNull", "null", kNotTrue},
      {"AnEmptyRoot", "{}", kNotTrue},
      {"AnEmptyArrayAsRoot", "[]", kNotTrue},
  };
}

// The line that tells of a text that cannot be parsed; it has neither category nor level.
MATCHER_P(TellsOf, text, "") {
  return arg.category.empty() && arg.level.empty() && arg.function == "JsonParse" &&
         ::testing::Value(arg.message,
                          StartsWith("Failed to parse json: [" + text + "] with error [")) &&
         ::testing::Value(arg.message, EndsWith("]\n"));
}

class JsonResponses : public ::testing::TestWithParam<JsonCase> {
 protected:
  const std::string& Response() const { return *GetParam().response; }

  // As the log shows it: a zero byte ends it.
  std::string Shown() const { return Response().c_str(); }
};

std::string NameOf(const ::testing::TestParamInfo<JsonCase>& test) {
  return test.param.name;
}

std::string Served(const std::string& body) {
  return "HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n" + body;
}

}  // namespace

TEST_P(JsonResponses, AreParsedAsTheTableSays) {
  const LogCapture log(3);
  int result = 1;
  RunOnSmallStack(kSmallStack, [&] {
    Json::Value value;
    EXPECT_NO_THROW(result = JsonParse(Response(), value));
  });
  EXPECT_EQ(result, GetParam().result);
  if (GetParam().result == kNoJson) {
    EXPECT_THAT(log.Lines(), ElementsAre(TellsOf(Shown())));
  } else {
    EXPECT_THAT(log.Lines(), IsEmpty());
  }
}

TEST_P(JsonResponses, EndTheOneCallGetAsTheTableSays) {
  const LogCapture log(3);
  ScriptedPeer peer({Exchange(Served(Response()))});
  int result = 1;
  RunOnSmallStack(kSmallStack, [&] {
    Json::Value value;
    result = SendHttpGet("127.0.0.1", peer.Port(), "a.cgi", value, 10, true);
  });
  EXPECT_EQ(result, GetParam().result == kTrue ? 0 : -2);
  const std::string failed = "SendHttpGet: Failed to parse json [" + Shown() + "].\n";
  EXPECT_EQ(HttpLog(log), GetParam().result == kTrue ? std::vector<std::string>()
                                                     : std::vector<std::string>{failed});
}

INSTANTIATE_TEST_SUITE_P(OfManyLevels, JsonResponses, ::testing::ValuesIn(DepthTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddShapes, JsonResponses, ::testing::ValuesIn(ShapeTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(WithOddStrings, JsonResponses, ::testing::ValuesIn(StringTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(WithOddNumbers, JsonResponses, ::testing::ValuesIn(NumberTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(WithSuccess, JsonResponses, ::testing::ValuesIn(SuccessTable()), NameOf);

// A thread with a usual stack takes as many levels as the parser does.
TEST(JsonLevels, OfAThousandAreTakenOnAUsualStack) {
  int thousand = 1;
  int more = 1;
  RunOnSmallStack(8 * kMegabyte, [&] {
    Json::Value value;
    thousand = JsonParse(Beside(Repeated(998, "[") + Repeated(998, "]")), value);
    more = JsonParse(Beside(Repeated(1100, "[") + Repeated(1100, "]")), value);
  });
  EXPECT_EQ(thousand, kTrue);
  EXPECT_EQ(more, kNoJson);
}
