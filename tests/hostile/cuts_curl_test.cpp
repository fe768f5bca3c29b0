// libcurl's exchanges, cut after every byte of their responses.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include "tarnwick/platform/unique.h"
#include "tests/hostile/cut_runs.h"

using namespace tarnwick;

namespace {

Outcome CurlGet(ExposedClient& client) {
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, false, 5);
  return OutcomeOf(client, result, client.m_strCurlText);
}

Outcome CurlPost(ExposedClient& client) {
  const int result = client.SendRequestByCurl(HTTP_METHOD_POST, false, 5);
  return OutcomeOf(client, result, client.m_strCurlText);
}

Outcome CurlToFile(ExposedClient& client) {
  const UniqueFile file(tmpfile());
  client.SetCurlRespFile(file.get());
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, false, 5);
  std::string content(static_cast<size_t>(ftell(file.get())), '\0');
  rewind(file.get());
  EXPECT_EQ(fread(content.data(), 1, content.size(), file.get()), content.size());
  return OutcomeOf(client, result, content);
}

Outcome LoginByCurl(ExposedClient& client) {
  return OutcomeOf(client, client.SendRequestByPost("?"));
}

Outcome HttpsJson(ExposedClient& client) {
  Json::Value value = "untouched";
  const int result = SendHttpsGet("127.0.0.1", client.m_port, "a.cgi", value, 5);
  return OneCall(result, result == 0 && value.isObject() ? value["id"].asString() : "none");
}

// The outcome of an XML request, with what was collected for a document.
template <typename Request>
Outcome XmlRequest(ExposedClient& client, Request request) {
  xmlDoc* doc = xmlParseMemory("<a/>", 4);
  const int result = request(doc);
  xmlFreeDoc(doc);
  const std::string text = client.m_pRespBuf == nullptr
                               ? std::string()
                               : std::string(client.m_pRespBuf, client.m_respLen);
  return OutcomeOf(client, result, text);
}

Outcome XmlGet(ExposedClient& client) {
  return XmlRequest(client, [&](xmlDoc*) { return client.SendReqByXMLGet(5); });
}

Outcome XmlPost(ExposedClient& client) {
  return XmlRequest(client, [&](xmlDoc* doc) { return client.SendReqByXMLPost(doc); });
}

Outcome XmlPut(ExposedClient& client) {
  return XmlRequest(client, [&](xmlDoc* doc) { return client.SendReqByXMLPut(doc); });
}

Outcome XmlDelete(ExposedClient& client) {
  return XmlRequest(client, [&](xmlDoc*) { return client.SendReqByXMLDelete(); });
}

// How far libcurl comes with a cut response.
struct CurlProgress {
  bool succeeds = false;
  std::string lines;  // complete header lines, without the status line
  std::string body;   // decoded
};

// libcurl takes a close within the head, after the status line, for the end of the response, until it
// has read the line that tells where the body ends. From there on the body must be whole. A reset
// is a failure unless the response was known to be whole.
CurlProgress FollowCurl(const std::string& whole, const Cut& cut) {
  const size_t status_end = whole.find("\r\n") + 2;
  const size_t head_end = whole.find("\r\n\r\n") + 4;
  const bool chunked = whole.find("Transfer-Encoding") != std::string::npos;
  const size_t framing = std::min(whole.find("Content-Length"), whole.find("Transfer-Encoding"));
  const size_t framed = framing == std::string::npos ? framing : whole.find("\r\n", framing) + 2;
  const size_t length = cut.bytes.size();
  CurlProgress progress;
  progress.succeeds = length == whole.size() && framed != std::string::npos;
  // The line feed after the last chunk is not missed.
  if (!cut.reset && chunked && length + 1 == whole.size()) progress.succeeds = true;
  if (!cut.reset && length >= status_end && length < framed) progress.succeeds = true;
  const size_t lines_end = length < head_end ? cut.bytes.rfind('\n') + 1 : head_end;
  if (lines_end > status_end) progress.lines = whole.substr(status_end, lines_end - status_end);
  if (length <= head_end) return progress;
  CutReader reader({cut.bytes.substr(head_end)}, true);
  if (chunked) ReadModelChunks(reader, &progress.body);
  if (!chunked) progress.body = cut.bytes.substr(head_end);
  return progress;
}

std::string FailedIn(const std::string& function) {
  return function + ": Failed to make http connection, return value=N\n";
}

using Rule = std::function<Expected(const std::vector<Cut>&, bool)>;

Rule CurlRule(const std::string& function, const std::string& whole, bool to_file = false) {
  return [=](const std::vector<Cut>& responses, bool) {
    const CurlProgress progress = FollowCurl(whole, responses[0]);
    const int result = progress.succeeds ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
    Expected expected = {{result, result, 0, progress.body}, {}};
    if (to_file) {
      std::string lines = progress.lines;
      const size_t coding = lines.find("Transfer-Encoding");
      if (coding != std::string::npos) lines.erase(coding, lines.find('\n', coding) + 1 - coding);
      expected.outcome.text = lines + progress.body;
    }
    if (!progress.succeeds) expected.log = {FailedIn(function)};
    return expected;
  };
}

// An empty text is taken for a success.
Expected HttpsJsonRule(const std::vector<Cut>& responses, bool /*buffered*/) {
  const CurlProgress progress = FollowCurl(Ok("", kJson), responses[0]);
  if (!progress.succeeds) return {OneCall(-1, "none"), {FailedIn("SendRequestByCurl")}};
  if (progress.body.empty()) return {OneCall(0, "none"), {}};
  if (progress.body == kJson) return {OneCall(0, "7"), {}};
  return {OneCall(-3, "none"),
          {"SendHttpsGet: Failed to parse json. Result is [" + progress.body + "]\n"}};
}

// What libcurl makes of half a refusal is its own matter: the first response comes whole.
Expected CurlLoginRule(const std::vector<Cut>& responses, bool /*buffered*/) {
  const CurlProgress progress = FollowCurl(kOfALength, responses[1]);
  const int result = progress.succeeds ? HTTP_RET_OK : HTTP_RET_IO_ERROR;
  Expected expected = {{result, result, 0, ""}, {}, 2};
  if (!progress.succeeds) expected.log = {FailedIn("SendRequestByPost")};
  return expected;
}

constexpr char kByCurl[] = "SendRequestByCurl";

const ExchangeCase kCurlExchanges[] = {
    {"CurlGet", {kOfALength}, CurlGet, CurlRule(kByCurl, kOfALength)},
    {"CurlGetToTheEnd", {kToTheEnd}, CurlGet, CurlRule(kByCurl, kToTheEnd)},
    {"CurlGetOfChunks", {kChunked}, CurlGet, CurlRule(kByCurl, kChunked)},
    {"CurlToFile", {kOfALength}, CurlToFile, CurlRule(kByCurl, kOfALength, true)},
    {"CurlToFileOfChunks", {kChunked}, CurlToFile, CurlRule(kByCurl, kChunked, true)},
    {"CurlPost", {kOfALength}, CurlPost, CurlRule(kByCurl, kOfALength)},
};

const ExchangeCase kPlainCurlExchanges[] = {
    {"CurlLogin", {kClosedDigest, kOfALength}, LoginByCurl, CurlLoginRule, "", 1},
    {"XmlGet", {OkOfLength(kXml)}, XmlGet, CurlRule("SendReqByXMLGet", OkOfLength(kXml))},
    {"XmlPost", {OkOfLength(kXml)}, XmlPost, CurlRule("SendReqByXMLPost", OkOfLength(kXml))},
    {"XmlPut", {OkOfLength(kXml)}, XmlPut, CurlRule("SendReqByXMLPut", OkOfLength(kXml))},
    {"XmlDelete", {OkOfLength(kXml)}, XmlDelete, CurlRule("SendReqByXMLDelete", OkOfLength(kXml))},
};

const ExchangeCase kHttpsExchanges[] = {
    {"HttpsJson", {Ok("", kJson)}, HttpsJson, HttpsJsonRule},
};

}  // namespace

class CurlCuts : public ::testing::TestWithParam<CutCase> {};

TEST_P(CurlCuts, AtEveryByteGiveWhatTheRulesSay) {
  RunCuts(GetParam().exchange, GetParam().end, GetParam().buffered);
}

INSTANTIATE_TEST_SUITE_P(PlainAndTls, CurlCuts,
                         ::testing::ValuesIn(CasesOf(kCurlExchanges, true, true)), CutName);
INSTANTIATE_TEST_SUITE_P(Plain, CurlCuts,
                         ::testing::ValuesIn(CasesOf(kPlainCurlExchanges, true, false)), CutName);
INSTANTIATE_TEST_SUITE_P(Tls, CurlCuts, ::testing::ValuesIn(CasesOf(kHttpsExchanges, false, true)),
                         CutName);
