// The stack that the library's operations need. A thread's stack holds the thread's own block, with
// the thread-local storage of all libraries, and what the operation uses; both are measured.
//
// On amd64, unoptimised, with every log line written:
//
//   a thread that does nothing                     6 KiB
//   requests over the client's socket, plain    22-26 KiB
//   the same over TLS                             24 KiB
//   requests through libcurl, plain and TLS     14-22 KiB
//   XML, whatever is in it                       7-28 KiB
//   JSON of up to 16 levels                        13 KiB
//   JSON, each further level                      0.4 KiB, and refused where the stack ends
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/parser.h>

#include <cstdlib>
#include <cstring>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tarnwick/http/json_response.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/utils/utils.h"
#include "tests/hostile/hostile_util.h"
#include "tests/support/stack_use.h"

using namespace tarnwick;

namespace {

// Sanitizers multiply what a function needs.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr size_t kScale = 16;
#else
constexpr size_t kScale = 1;
#endif

struct StackCase {
  std::string name;
  size_t least;  // KiB that are known to be enough
  std::vector<Script> peer;
  std::function<void(int port)> operation;
  bool tls = false;
};

std::ostream& operator<<(std::ostream& out, const StackCase& test) {
  return out << test.name;
}

const char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 16\r\n\r\n{\"success\":true}";
const char kXml[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\n<a/>";
const char kRefusal[] =
    "HTTP/1.1 401 No\r\nWWW-Authenticate: Digest realm=\"r\", nonce=\"n\", qop=\"auth\"\r\n"
    "Content-Length: 0\r\n\r\n";

ClientSettings Https() {
  ClientSettings settings;
  settings.https = true;
  return settings;
}

std::string Nested(const std::string& open, const std::string& close, int levels) {
  std::string text;
  for (int i = 0; i < levels; ++i) text += open;
  for (int i = 0; i < levels; ++i) text += close;
  return text;
}

void ParseXml(const std::string& text) {
  ClientProbe client;
  client.m_pRespBuf = strdup(text.c_str());
  client.m_respLen = static_cast<unsigned int>(text.size());
  xmlDoc* doc = nullptr;
  client.GetResponseXML(doc);
  xmlFreeDoc(doc);
}

// An entity that stands for the next one, and so on.
std::string NestedEntities(int levels) {
  std::string text = "<!DOCTYPE a [<!ENTITY e0 'x'>";
  for (int i = 1; i <= levels; ++i) {
    text += "<!ENTITY e" + std::to_string(i) + " '<b>&e" + std::to_string(i - 1) + ";</b>'>";
  }
  return text + "]><a>&e" + std::to_string(levels) + ";</a>";
}

template <typename Socket>
void ReadALine(int port) {
  const auto socket = std::make_unique<Socket>("127.0.0.1", port, 5, true);
  char line[64];
  socket->Connect();
  socket->ReadToLineEnd(line, sizeof(line));
}

const StackCase kStacks[] = {
    {"Nothing", 8, {}, [](int) {}},
    {"TWPrintf",
     16,
     {},
     [](int) { TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_WARN, "camera %d: %f\n", 3, 0.5); }},
    {"LoadDbgLogSettings", 16, {}, [](int) { TWDbgLogCfg().LoadDbgLogSettings(); }},
    {"SaveDbgLogSettings", 16, {}, [](int) { TWDbgLogCfg().SaveDbgLogSettings(); }},
    {"UrlEncode", 8, {}, [](int) { UrlEncode("a b", "/"); }},
    {"Base64Encode", 8, {}, [](int) { free(Base64Encode("abc")); }},
    {"FormatUtcTimeStamp", 12, {}, [](int) { FormatUtcTimeStamp(0); }},
    {"ConnectAndReadALine", 16, {SendThenClose("hello\n")}, ReadALine<TWSocket>},
    {"ConnectAndReadALineOverTls", 32, {SendThenClose("hello\n")}, ReadALine<SSLSocket>, true},
    {"SendRequestByGet",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port).SendRequestByGet(); }},
    {"SendRequestWithDigest",
     32,
     {Exchange(kRefusal), Exchange(kOk)},
     [](int port) { ClientProbe(port).SendRequest(HTTP_METHOD_GET, ""); }},
    {"GetResp",
     32,
     {SendThenClose(kOk)},
     [](int port) {
       ClientProbe client(port);
       client.m_pSocket->Connect();
       client.GetResp();
     }},
    {"SendRequestBySocketPost",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port).SendRequestBySocketPost("a=1"); }},
    {"SendAuthReqBySocketPost",
     32,
     {Exchange(kRefusal), Exchange(kOk)},
     [](int port) {
       std::string response;
       ClientProbe(port).SendAuthReqBySocketPost("<a/>", response);
     }},
    {"SendReqByXMLSocketPost",
     32,
     {Exchange(kXml)},
     [](int port) {
       xmlDoc* doc = nullptr;
       ClientProbe(port).SendReqByXMLSocketPost("<a/>", doc);
       xmlFreeDoc(doc);
     }},
    {"OpenRawDataUpload",
     32,
     {{DiscardUntilEnd()}},
     [](int port) { ClientProbe(port).OpenRawDataUpload(); }},
    {"SendHttpGet",
     32,
     {Exchange(kOk)},
     [](int port) {
       Json::Value value;
       SendHttpGet("127.0.0.1", port, "a.cgi", value, 5, true);
     }},
    {"SendHttpPost",
     32,
     {Exchange(kOk)},
     [](int port) { SendHttpPost("127.0.0.1", port, "a.cgi", "a=1", "b=2", 5); }},
    {"SendRequestByGetToAHostName",
     32,
     {Exchange(kOk)},
     [](int port) {
       ClientSettings settings;
       settings.host = "localhost";
       ClientProbe(port, settings).SendRequestByGet();
     }},
    {"SendRequestByGetOverTls",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port, Https()).SendRequestByGet(); },
     true},
    {"SendRequestByCurl",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port).SendRequestByCurl(HTTP_METHOD_GET, true, 5); }},
    {"SendRequestByCurlOverTls",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port, Https()).SendRequestByCurl(HTTP_METHOD_GET, false, 5); },
     true},
    {"SendHttpsGet",
     32,
     {{ExpectRefusedHandshake()}},
     [](int port) {
       Json::Value value;
       SendHttpsGet("127.0.0.1", port, "a.cgi", value, 5);
     },
     true},
    {"SendRequestByPost",
     32,
     {Exchange(kOk)},
     [](int port) { ClientProbe(port).SendRequestByPost("?"); }},
    {"SendReqByXMLGet",
     32,
     {Exchange(kXml)},
     [](int port) { ClientProbe(port).SendReqByXMLGet(5); }},
    {"SendReqByXMLPost",
     32,
     {Exchange(kXml)},
     [](int port) {
       xmlDoc* doc = xmlParseMemory("<a/>", 4);
       ClientProbe(port).SendReqByXMLPost(doc);
       xmlFreeDoc(doc);
     }},
    {"SendReqByXMLPut",
     32,
     {Exchange(kXml)},
     [](int port) {
       xmlDoc* doc = xmlParseMemory("<a/>", 4);
       ClientProbe(port).SendReqByXMLPut(doc);
       xmlFreeDoc(doc);
     }},
    {"SendReqByXMLDelete",
     32,
     {Exchange(kXml)},
     [](int port) { ClientProbe(port).SendReqByXMLDelete(); }},
    {"GetResponseXML", 16, {}, [](int) { ParseXml("<a/>"); }},
    {"GetResponseXMLOf250Levels", 16, {}, [](int) { ParseXml(Nested("<a>", "</a>", 250)); }},
    {"GetResponseXMLOf100000Levels", 32, {}, [](int) { ParseXml(Nested("<a>", "</a>", 100000)); }},
    {"GetResponseXMLOf100000OpenParentheses",
     32,
     {},
     [](int) { ParseXml("<!DOCTYPE a [<!ELEMENT a " + Nested("(", ")", 100000) + ">]><a/>"); }},
    {"GetResponseXMLOf40EntitiesInEachOther", 32, {}, [](int) { ParseXml(NestedEntities(40)); }},
    {"GetResponseXMLOf1000EntitiesInEachOther",
     32,
     {},
     [](int) { ParseXml(NestedEntities(1000)); }},
    {"JsonParse",
     16,
     {},
     [](int) {
       Json::Value value;
       JsonParse("{\"success\":true}", value);
     }},
    {"JsonParseOf16Levels",
     16,
     {},
     [](int) {
       Json::Value value;
       JsonParse(Nested("[", "]", 16), value);
     }},
    {"JsonParseOf1000Levels",
     400,
     {},
     [](int) {
       Json::Value value;
       JsonParse(Nested("[", "]", 1000), value);
     }},
};

class Stacks : public ::testing::TestWithParam<StackCase> {};

}  // namespace

TEST_P(Stacks, AreEnoughAsTheTableSays) {
  const StackCase& test = GetParam();
  const LogCapture log(7);
  std::unique_ptr<ScriptedPeer> peer;
  if (test.tls) {
    peer = std::make_unique<TlsScriptedPeer>(test.peer);
  } else if (!test.peer.empty()) {
    peer = std::make_unique<ScriptedPeer>(test.peer);
  }
  const size_t used = StackUsedBy([&] { test.operation(peer ? peer->Port() : 0); });
  RecordProperty("bytes", std::to_string(used));
  EXPECT_LE(used, kScale * test.least * 1024);
}

INSTANTIATE_TEST_SUITE_P(Hostile, Stacks, ::testing::ValuesIn(kStacks),
                         [](const auto& test) { return test.param.name; });
