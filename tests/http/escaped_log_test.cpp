// The log lines that show a peer's text, inside and outside a TWRequestScope.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>

#include <functional>
#include <thread>

#include "tarnwick/http/json_response.h"
#include "tarnwick/net/twrequestscope.h"
#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

using namespace tarnwick;

namespace {

using ::testing::Contains;
using ::testing::HasSubstr;
using ::testing::Not;

// Every kind of byte that is escaped, between two that are not.
constexpr char kRaw[] = "<\x01\t\x1b[2J\r\n\x7f\\n\xff\xc2\x9b\xe2\x80\xaej\xc3\xa4>";
constexpr char kEscaped[] =
    "<\\x01\\x09\\x1B[2J\\x0D\\x0A\\x7F\\\\n\\xFF\\xC2\\x9B\\xE2\\x80\\xAEj\xc3\xa4>";
constexpr char kForged[] =
    "x\nNov 22 04:40:00 [1][camera][alarm] camerad:57:Watch(): motion detection switched off\n";

std::string Ok(const std::string& body) {
  return "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
}

// What `act` logs under the name of `function`, outside a scope and then inside one.
struct Lines {
  std::string outside;
  std::string inside;
};

std::string MessageOf(const std::string& function, const std::function<void()>& act) {
  const LogCapture log;
  act();
  std::string messages;
  for (const LogLine& line : log.Lines()) {
    if (line.function == function) messages += line.message;
  }
  return messages;
}

Lines Both(const std::string& function, const std::function<void()>& act) {
  Lines lines;
  lines.outside = MessageOf(function, act);
  TWRequestScope scope;
  scope.SetEscapedLog(true);
  lines.inside = MessageOf(function, act);
  return lines;
}

void Get(const std::string& body) {
  ScriptedPeer peer({Exchange(Ok(body))});
  Json::Value result;
  EXPECT_EQ(SendHttpGet("127.0.0.1", peer.Port(), "api", result, 5, false), -2);
}

// The parser's own words about a text.
std::string ReasonFor(const std::string& text) {
  Json::Value value;
  Json::Reader reader;
  EXPECT_FALSE(reader.parse(text, value, true));
  return reader.getFormattedErrorMessages();
}

}  // namespace

TEST(EscapedLog, TheBodyAndTheParsersReason) {
  Json::Value value;
  const Lines lines = Both("JsonParse", [&] { EXPECT_EQ(JsonParse(kRaw, value), -1); });
  const std::string reason = ReasonFor(kRaw);
  EXPECT_EQ(lines.outside,
            std::string("Failed to parse json: [") + kRaw + "] with error [" + reason + "]\n");
  EXPECT_EQ(reason, "* Line 1, Column 1\n  Syntax error: value, object or array expected.\n");
  EXPECT_EQ(lines.inside, std::string("Failed to parse json: [") + kEscaped +
                              "] with error [* Line 1, Column 1\\x0A  Syntax error: value, object "
                              "or array expected.\\x0A]\n");
}

TEST(EscapedLog, TheBodyOfSendHttpGet) {
  const Lines lines = Both("SendHttpGet", [] { Get(kRaw); });
  EXPECT_EQ(lines.outside, std::string("Failed to parse json [") + kRaw + "].\n");
  EXPECT_EQ(lines.inside, std::string("Failed to parse json [") + kEscaped + "].\n");
}

TEST(EscapedLog, TheBodyOfSendHttpsGet) {
  const Lines lines = Both("SendHttpsGet", [] {
    TlsScriptedPeer peer({Exchange(Ok(kRaw))});
    const TrustedAuthority trusted(peer.CaFile());
    Json::Value result;
    EXPECT_EQ(SendHttpsGet("127.0.0.1", peer.Port(), "api", result, 10), -3);
  });
  EXPECT_EQ(lines.outside, std::string("Failed to parse json. Result is [") + kRaw + "]\n");
  EXPECT_EQ(lines.inside, std::string("Failed to parse json. Result is [") + kEscaped + "]\n");
}

// What a caller gets is not escaped.
TEST(EscapedLog, TheBodyOfReadBodyAndGetResp) {
  std::string body;
  const Lines lines = Both("ReadBody", [&] {
    EXPECT_EQ(ClientAfter(Ok(kRaw))->ReadBody(body), HTTP_RET_OK);
    EXPECT_EQ(body, kRaw);
  });
  EXPECT_EQ(lines.outside, std::string("strRet = ") + kRaw + "\n");
  EXPECT_EQ(lines.inside, std::string("strRet = ") + kEscaped + "\n");
}

TEST(EscapedLog, EachHeaderLine) {
  const Lines lines = Both("CheckContentType", [] {
    ClientAfter("HTTP/1.1 200 OK\r\nServer: a\x1b]0;owned\x07 \\ \xff\r\nX: y\r\n\r\n");
  });
  EXPECT_EQ(lines.outside, "Server: a\x1b]0;owned\x07 \\ \xff\nX: y\n");
  EXPECT_EQ(lines.inside, "Server: a\\x1B]0;owned\\x07 \\\\ \\xFF\nX: y\n");
}

TEST(EscapedLog, ADeviceForgesALineOutsideAScopeAlone) {
  const auto forged = ::testing::Field(&LogLine::level, "alarm");
  const LogCapture log;
  Get(kForged);
  EXPECT_THAT(log.Lines(), Contains(forged).Times(2));
  const size_t before = log.Text().size();
  TWRequestScope scope;
  scope.SetEscapedLog(true);
  Get(kForged);
  const std::string inside = log.Text().substr(before);
  EXPECT_THAT(inside, HasSubstr("[x\\x0ANov 22 04:40:00 [1][camera][alarm] camerad:57:Watch(): "
                                "motion detection switched off\\x0A]"));
  EXPECT_THAT(ParseLog(inside), Not(Contains(forged)));
}

TEST(EscapedLog, TwoThreadsDoAsTheirOwnScopesSay) {
  const LogCapture log;
  const auto parse = [](bool escaped) {
    TWRequestScope scope;
    scope.SetEscapedLog(escaped);
    Json::Value value;
    for (int i = 0; i < 50; ++i) JsonParse(escaped ? "e\x1b" : "r\x1b", value);
  };
  std::thread escaped(parse, true);
  std::thread raw(parse, false);
  escaped.join();
  raw.join();
  const std::string text = log.Text();
  const auto count = [&](const std::string& piece) {
    int found = 0;
    for (size_t at = text.find(piece); at != std::string::npos; at = text.find(piece, at + 1)) {
      ++found;
    }
    return found;
  };
  EXPECT_EQ(count("[e\\x1B]"), 50);
  EXPECT_EQ(count("[r\x1b]"), 50);
}
