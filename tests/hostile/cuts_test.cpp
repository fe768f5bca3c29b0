// The socket's exchanges, cut after every byte of their responses. What a client makes of the rest
// is worked out by tests/model/response.h.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/value.h>
#include <libxml/tree.h>

#include "tests/hostile/cut_runs.h"

using namespace std::string_literals;

namespace {

// What the clients do.

Outcome GetAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

Outcome LoginAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

Outcome PostAndReadBody(ExposedClient& client) {
  EXPECT_EQ(client.SendRequestBySocketPost("a=1&b=2"), HTTP_RET_OK);
  std::string body;
  const int result = client.ReadBody(body);
  return OutcomeOf(client, result, body);
}

Outcome Soap(ExposedClient& client) {
  std::string response = "untouched";
  const int result = client.SendReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

Outcome SoapWithLogin(ExposedClient& client) {
  std::string response = "untouched";
  const int result = client.SendAuthReqBySocketPost("<a/>", response);
  return OutcomeOf(client, result, response);
}

Outcome XmlSoap(ExposedClient& client) {
  xmlDoc untouched;
  xmlDoc* doc = &untouched;
  const int result = client.SendReqByXMLSocketPost("<a/>", doc);
  if (doc == &untouched) return OutcomeOf(client, result, "untouched");
  const bool parsed = doc != nullptr;
  xmlFreeDoc(doc);
  return OutcomeOf(client, result, parsed ? "a document" : "none");
}

Outcome Upload(ExposedClient& client) {
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.WriteData("data, to the end.", 17), 17);
  const std::string response = client.GetResp();
  return OutcomeOf(client, 0, response);
}

Outcome JsonGet(ExposedClient& client) {
  Json::Value value = "untouched";
  const int result = SendHttpGet("127.0.0.1", client.m_port, "a.cgi", value, 5, true);
  // A part of a document may leave a part of its values.
  return OneCall(result, result == 0 ? value["id"].asString() : "none");
}

Outcome OneCallPost(ExposedClient& client) {
  return {SendHttpPost("127.0.0.1", client.m_port, "a.cgi", "a=1", "s=1", 5), 0, 0, ""};
}

// What must come of it.

std::vector<std::string> ReadBodyLog(bool read) {
  return read ? std::vector<std::string>{}
              : std::vector<std::string>{"ReadBody: Read data error\n"};
}

// The head and the body of the last response, with the log of the heads before it.
Expected HeadAndBody(const Cut& response, bool buffered, std::vector<std::string> log) {
  CutReader reader(response, buffered);
  const ModelHead head = ReadModelHead(reader, &log);
  std::string body;
  const bool read = ReadModelBody(reader, head, &body);
  for (const std::string& line : ReadBodyLog(read)) log.push_back(line);
  return {{read ? HTTP_RET_OK : HTTP_RET_IO_ERROR, head.response, head.status, body}, log};
}

Expected GetRule(const std::vector<Cut>& responses, bool buffered) {
  return HeadAndBody(responses[0], buffered, {});
}

// A challenge that names a scheme is answered, and the next response is the last.
bool AsksForLogin(const ModelHead& head) {
  return head.response == HTTP_RET_UNAUTHORIZED &&
         (head.challenge.find("Digest") != std::string::npos ||
          head.challenge.find("Basic") != std::string::npos);
}

Expected LoginRule(const std::vector<Cut>& responses, bool buffered) {
  CutReader reader(responses[0], buffered);
  std::vector<std::string> log;
  if (!AsksForLogin(ReadModelHead(reader, &log))) return GetRule(responses, buffered);
  Expected expected = HeadAndBody(responses[1], buffered, log);
  expected.connections = 2;
  return expected;
}

// One SOAP response; `text` stays when there is nothing to read.
int ReadSoap(const Cut& response, bool buffered, ModelHead* head, Expected* expected) {
  CutReader reader(response, buffered);
  *head = ReadModelHead(reader, &expected->log);
  expected->outcome.response = head->response;
  expected->outcome.status = head->status;
  const size_t length = head->complete ? strtoul(head->length.c_str(), nullptr, 10) : 0;
  if (length == 0) return HTTP_RET_IO_ERROR;
  std::string text;
  if (reader.Read(length, &text) > 0) {
    expected->outcome.text = text;
    return HTTP_RET_OK;
  }
  expected->log.push_back("SendReqBySocketPost: Read data faild.\n");
  return HTTP_RET_IO_ERROR;
}

Expected SoapRule(const std::vector<Cut>& responses, bool buffered) {
  Expected expected = {{HTTP_RET_OK, HTTP_RET_OK, 0, "untouched"}, {}};
  ModelHead head;
  expected.outcome.result = ReadSoap(responses[0], buffered, &head, &expected);
  return expected;
}

Expected SoapLoginRule(const std::vector<Cut>& responses, bool buffered) {
  Expected expected = {{HTTP_RET_OK, HTTP_RET_OK, 0, "untouched"}, {}};
  ModelHead head;
  int result = ReadSoap(responses[0], buffered, &head, &expected);
  if (AsksForLogin(head)) {
    result = ReadSoap(responses[1], buffered, &head, &expected);
    expected.connections = 2;
  }
  expected.outcome.result = result != HTTP_RET_OK ? result : head.response;
  return expected;
}

// Half a document is none.
Expected XmlSoapRule(const std::vector<Cut>& responses, bool buffered) {
  Expected expected = SoapRule(responses, buffered);
  if (expected.outcome.result != HTTP_RET_OK) return expected;
  expected.outcome.text = expected.outcome.text == kXml ? "a document" : "none";
  return expected;
}

Expected UploadRule(const std::vector<Cut>& responses, bool buffered) {
  const std::string error = "{\"error\":true}";
  Expected expected;
  CutReader reader(responses[0], buffered);
  const ModelHead head = ReadModelHead(reader, &expected.log);
  std::string body;
  const bool success = head.response == HTTP_RET_OK;
  const bool read = success && ReadModelBody(reader, head, &body);
  if (!read) {
    expected.log.push_back(success ? "GetResp: Read data error\n" : "GetResp: Http Resp error\n");
  }
  expected.outcome = Sent(head.response, head.status, read ? body : error);
  return expected;
}

Expected JsonRule(const std::vector<Cut>& responses, bool /*buffered*/) {
  Expected expected = {OneCall(-1, "none"), {}};
  CutReader reader(responses[0], true);
  const ModelHead head = ReadModelHead(reader, &expected.log);
  std::string body;
  if (head.response != HTTP_RET_OK) {
    expected.log.push_back("SendHttpGet: Failed to check response[N]: N\n");
  } else if (!ReadModelBody(reader, head, &body)) {
    expected.log.push_back("SendHttpGet: Failed to read data: N\n");
  } else if (body.empty()) {
    expected.log.push_back("SendHttpGet: Read Buffer Error\n");
  } else if (body != kJson) {
    expected.log.push_back("SendHttpGet: Failed to parse json [" + body + "].\n");
    expected.outcome.result = -2;
  } else {
    expected.outcome = OneCall(0, "7");
  }
  return expected;
}

// The response's outcome is ignored.
Expected OneCallPostRule(const std::vector<Cut>& responses, bool /*buffered*/) {
  Expected expected = {OneCall(0, ""), {}};
  CutReader reader(responses[0], true);
  ReadModelHead(reader, &expected.log);
  return expected;
}

const ExchangeCase kSocketExchanges[] = {
    {"GetToTheEnd", {kToTheEnd}, GetAndReadBody, GetRule},
    {"GetOfALength", {kOfALength}, GetAndReadBody, GetRule},
    {"GetOfChunks", {kChunked}, GetAndReadBody, GetRule},
    {"GetOfAnError", {kNotFound}, GetAndReadBody, GetRule},
    {"DigestLogin", {kDigest, kOfALength}, LoginAndReadBody, LoginRule},
    {"BasicLogin", {kBasic, kChunked}, LoginAndReadBody, LoginRule},
    {"RefusedLogin", {kDigest, kDigest}, LoginAndReadBody, LoginRule},
    {"Form", {kChunked}, PostAndReadBody, GetRule},
    {"Soap", {OkOfLength(kXml)}, Soap, SoapRule},
    {"SoapDigestLogin", {kDigest, OkOfLength(kXml)}, SoapWithLogin, SoapLoginRule},
    {"SoapBasicLogin", {kBasic, OkOfLength(kXml)}, SoapWithLogin, SoapLoginRule},
    {"XmlSoap", {OkOfLength(kXml)}, XmlSoap, XmlSoapRule},
    {"Upload", {kChunked}, Upload, UploadRule, "data, to the end."},
};

const ExchangeCase kPlainExchanges[] = {
    {"Json", {Ok("", kJson)}, JsonGet, JsonRule},
    {"OneCallPost", {kNotFound}, OneCallPost, OneCallPostRule},
};

// Each exchange with each end. Over TLS a direct read returns what a direct plain one does, so that
// two exchanges will do.
std::vector<CutCase> SocketCuts() {
  std::vector<CutCase> cases;
  for (const ExchangeCase& exchange : kSocketExchanges) {
    const bool in_all_ways = exchange.name == "GetOfChunks" || exchange.name == "SoapDigestLogin";
    for (const auto& [name, end] : kEnds) {
      cases.push_back({exchange.name + name, exchange, end, true});
      if (IsTls(end) && !in_all_ways) continue;
      cases.push_back({exchange.name + name + "Direct", exchange, end, false});
    }
  }
  return cases;
}

}  // namespace

class Cuts : public ::testing::TestWithParam<CutCase> {};

TEST_P(Cuts, AtEveryByteGiveWhatTheRulesSay) {
  RunCuts(GetParam().exchange, GetParam().end, GetParam().buffered);
}

INSTANTIATE_TEST_SUITE_P(Socket, Cuts, ::testing::ValuesIn(SocketCuts()), CutName);
INSTANTIATE_TEST_SUITE_P(OneCall, Cuts, ::testing::ValuesIn(CasesOf(kPlainExchanges, true, false)),
                         CutName);
