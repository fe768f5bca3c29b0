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
#include "tarnwick/utils/utils.h"
#include "tests/hostile/hostile_util.h"
#include "tests/operations/operations.h"
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

// A line for the body that the operations of the table send.
const Script kLine = {ExpectUntil("<a/>"), Send("hello\n"), Close()};

std::string Nested(const std::string& open, const std::string& close, int levels) {
  std::string text;
  for (int i = 0; i < levels; ++i) text += open;
  for (int i = 0; i < levels; ++i) text += close;
  return text;
}

void ParseXml(const std::string& text) {
  ExposedClient client;
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

std::vector<std::string> g_operations;  // that cases run

// Runs an operation of the table.
std::function<void(int port)> Run(const char* name, OperationSettings settings = {}) {
  g_operations.emplace_back(name);
  settings.body = "<a/>";
  settings.verify = !settings.https;
  settings.read_body = false;  // GetResp has a row of its own
  return [name, settings](int port) mutable {
    settings.port = port;
    OperationNamed(name).run(settings);
  };
}

std::function<void(int port)> OverTls(const char* name) {
  OperationSettings settings;
  settings.https = true;
  return Run(name, settings);
}

std::function<void(int port)> ToAName(const char* name) {
  OperationSettings settings;
  settings.host = "localhost";
  return Run(name, settings);
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
    {"ConnectAndReadALine", 16, {kLine}, Run("socket_exchange")},
    {"ConnectAndReadALineOverTls", 32, {kLine}, OverTls("socket_exchange"), true},
    {"SendRequestByGet", 32, {Exchange(kOk)}, Run("get_body")},
    {"SendRequestWithDigest", 32, {Exchange(kRefusal), Exchange(kOk)}, Run("login_get")},
    {"GetResp",
     32,
     {SendThenClose(kOk)},
     [](int port) {
       ExposedClient client(port);
       client.m_pSocket->Connect();
       client.GetResp();
     }},
    {"SendRequestBySocketPost", 32, {Exchange(kOk)}, Run("form_post")},
    {"SendReqBySocketPost", 32, {Exchange(kOk)}, Run("soap")},
    {"SendAuthReqBySocketPost", 32, {Exchange(kRefusal), Exchange(kOk)}, Run("soap_login")},
    {"SendReqByXMLSocketPost", 32, {Exchange(kXml)}, Run("soap_xml")},
    {"OpenRawDataUpload",
     32,
     {{DiscardUntilEnd()}},
     [](int port) { ExposedClient(port).OpenRawDataUpload(); }},
    {"SendHttpGet", 32, {Exchange(kOk)}, Run("json_get")},
    {"SendHttpPost", 32, {Exchange(kOk)}, Run("json_post")},
    {"SendRequestByGetToAHostName", 32, {Exchange(kOk)}, ToAName("get_body")},
    {"SendRequestByGetOverTls", 32, {Exchange(kOk)}, OverTls("get_body"), true},
    {"SendRequestByCurl", 32, {Exchange(kOk)}, Run("curl_get")},
    {"SendRequestByCurlIntoAFile", 32, {Exchange(kOk)}, Run("curl_get_file")},
    {"SendRequestByCurlOverTls", 32, {Exchange(kOk)}, OverTls("curl_get"), true},
    {"SendHttpsGet", 32, {{ExpectRefusedHandshake()}}, OverTls("json_get_tls"), true},
    {"SendRequestByPost", 32, {Exchange(kOk)}, Run("curl_form")},
    {"SendReqByXMLGet", 32, {Exchange(kXml)}, Run("xml_get")},
    {"SendReqByXMLPost", 32, {Exchange(kXml)}, Run("xml_post")},
    {"SendReqByXMLPut", 32, {Exchange(kXml)}, Run("xml_put")},
    {"SendReqByXMLDelete", 32, {Exchange(kXml)}, Run("xml_delete")},
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

// Those that are left out call what the others call; an upload is OpenRawDataUpload and GetResp.
TEST(StackCases, AreThereForEachOperation) {
  EXPECT_EQ(
      Unmatched(g_operations,
                {"get_data", "get_lines", "get_twice", "get_head_again", "second_request", "upload",
                 "curl_post", "curl_post_file", "curl_login_form", "curl_handle", "connect",
                 "reconnect", "keep_alive", "probe", "socket_data", "socket_lines", "socket_raw"}),
      "");
}

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
