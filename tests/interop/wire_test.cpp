// The requests of docs/wire.md, byte by byte.
#include <gtest/gtest.h>
#include <json/value.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <functional>
#include <map>
#include <regex>
#include <set>

#include "tests/http/http_test_util.h"

namespace {

constexpr char kResponse[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\n<a/>";
// The peer closes after it, and says so: libcurl would else send the credentials over this connection.
constexpr char kLoginHead[] =
    "HTTP/1.1 401 Unauthorized\r\nContent-Length: 0\r\nConnection: close\r\nWWW-Authenticate: ";
constexpr char kDigestQop[] =
    "Digest realm=\"camera\", nonce=\"5f3d9c\", qop=\"auth\", opaque=\"q1\"";
constexpr char kDigest[] = "Digest realm=\"camera\", nonce=\"5f3d9c\", algorithm=MD5";

struct WireCase {
  const char* name;  // of the block in the document
  ClientSettings settings;
  const char* challenge;  // what the first request is answered with; null: with success
  std::function<void(ExposedClient*)> send;
};

void Get(ExposedClient* client) {
  client->SendRequest(HTTP_METHOD_GET, "");
}

void GetWithCookie(ExposedClient* client) {
  client->SetCookie("session=42");
  client->SendRequestByGet();
}

void FormPost(ExposedClient* client) {
  client->SendRequestBySocketPost("pan=3&tilt=-4");
}

void SoapPost(ExposedClient* client) {
  std::string response;
  client->SendAuthReqBySocketPost("<envelope/>", response);
}

void XmlSocketPost(ExposedClient* client) {
  xmlDoc* doc = nullptr;
  client->SendReqByXMLSocketPost("<envelope/>", doc);
  xmlFreeDoc(doc);
}

void CurlGet(ExposedClient* client) {
  client->SetCookie("session=42");
  client->SendRequestByCurl(HTTP_METHOD_GET, true, 10);
}

void CurlPost(ExposedClient* client) {
  client->SendRequestByCurl(HTTP_METHOD_POST, true, 10);
}

void LoginPost(ExposedClient* client) {
  client->SendRequest(HTTP_METHOD_POST, "?");
}

void WithDocument(const std::function<void(xmlDoc*&)>& send) {
  const xmlChar* text = reinterpret_cast<const xmlChar*>("<preset><pan>3</pan></preset>");
  xmlDoc* doc = xmlReadDoc(text, nullptr, nullptr, 0);
  send(doc);
  xmlFreeDoc(doc);
}

void XmlGet(ExposedClient* client) {
  client->SendReqByXMLGet(10);
}
void XmlDelete(ExposedClient* client) {
  client->SendReqByXMLDelete();
}
void XmlPost(ExposedClient* client) {
  WithDocument([client](xmlDoc*& doc) { client->SendReqByXMLPost(doc); });
}
void XmlPut(ExposedClient* client) {
  WithDocument([client](xmlDoc*& doc) { client->SendReqByXMLPut(doc); });
}

void Upload(ExposedClient* client) {
  client->SetCookie("session=42");
  client->OpenRawDataUpload();
}

void OneCallGet(ExposedClient* client) {
  Json::Value response;
  SendHttpGet(client->m_strHost, client->m_port, client->m_strPath, response, 5, true);
}

void OneCallPost(ExposedClient* client) {
  SendHttpPost(client->m_strHost, client->m_port, client->m_strPath, "pan=3", "session=42", 5);
}

ClientSettings Settings(const std::string& path, HTTP_VERSION version = HTTP_VERSION_NONE) {
  ClientSettings settings;
  settings.path = path;
  settings.version = version;
  settings.user = "operator";
  settings.password = "gate-7";
  return settings;
}

ClientSettings BasicAtOnce() {
  ClientSettings settings = Settings("info.cgi");
  settings.basic_auth = true;
  return settings;
}

const std::vector<WireCase>& Cases() {
  static const std::vector<WireCase> cases = {
      {"get", Settings("info.cgi?full=1"), nullptr, Get},
      {"get-1.1", Settings("info.cgi", HTTP_VERSION_1_1), nullptr, GetWithCookie},
      {"get-basic", BasicAtOnce(), nullptr, Get},
      {"get-digest", Settings("info.cgi"), kDigest, Get},
      {"get-digest-qop", Settings("info.cgi"), kDigestQop, Get},
      {"form-post", Settings("set.cgi"), nullptr, FormPost},
      {"form-post-1.0", Settings("set.cgi", HTTP_VERSION_1_0), nullptr, FormPost},
      {"soap-post", Settings("soap/ptz"), nullptr, XmlSocketPost},
      {"soap-post-basic", Settings("soap/ptz"), "Basic realm=\"camera\"", SoapPost},
      {"upload", Settings("clip"), nullptr, Upload},
      {"curl-get", Settings("info.cgi?full=1"), nullptr, CurlGet},
      {"curl-post", Settings("pan=3&tilt=-4"), nullptr, CurlPost},
      {"login-post", Settings("set.cgi?pan=3"), "Basic realm=\"camera\"", LoginPost},
      {"xml-get", Settings("presets/7"), nullptr, XmlGet},
      {"xml-post", Settings("presets"), nullptr, XmlPost},
      {"xml-put", Settings("presets/7"), nullptr, XmlPut},
      {"xml-delete", Settings("presets/7"), nullptr, XmlDelete},
      {"one-call-get", Settings("info.cgi?name=north gate"), nullptr, OneCallGet},
      {"one-call-post", Settings("set.cgi"), nullptr, OneCallPost},
  };
  return cases;
}

// The blocks of the document: fenced, "text NAME" after the opening fence.
const std::map<std::string, std::string>& Blocks() {
  static const std::map<std::string, std::string> blocks = [] {
    const std::string text = ReadFile(TARNWICK_DOCS_FOLDER "/wire.md");
    const std::regex fence("```text ([^\n]+)\n([^`]*)```\n");
    std::map<std::string, std::string> found;
    for (std::sregex_iterator it(text.begin(), text.end(), fence), end; it != end; ++it) {
      found[(*it)[1]] = (*it)[2];
    }
    return found;
  }();
  return blocks;
}

// Bytes as the document shows them: CR and LF in letters, each at the end of its line, and names
// for what differs from run to run.
std::string Shown(const std::string& bytes, int port) {
  std::string text;
  for (const char c : bytes) text += c == '\r' ? "\\r" : c == '\n' ? "\\n\n" : std::string(1, c);
  if (text.empty() || text.back() != '\n') text += '\n';
  text = std::regex_replace(text, std::regex(":" + std::to_string(port)), ":PORT");
  if (text.find("cnonce=") == std::string::npos) return text;
  text = std::regex_replace(text, std::regex("cnonce=\"[0-9a-f]{32}\""), "cnonce=\"CNONCE\"");
  return std::regex_replace(text, std::regex("response=\"[0-9a-f]{32}\""), "response=\"RESPONSE\"");
}

Script UploadScript() {
  return {ExpectUntil("\r\n\r\n"), ExpectEof()};
}

std::vector<Script> ScriptsFor(const WireCase& c) {
  if (std::string(c.name) == "upload") return {UploadScript()};
  if (c.challenge == nullptr) return {Exchange(kResponse)};
  return {Exchange(kLoginHead + std::string(c.challenge) + "\r\n\r\n"), Exchange(kResponse)};
}

class Wire : public ::testing::TestWithParam<WireCase> {};

INSTANTIATE_TEST_SUITE_P(, Wire, ::testing::ValuesIn(Cases()), [](const auto& test) {
  return std::regex_replace(std::string(test.param.name), std::regex("[-.]"), "_");
});

TEST_P(Wire, CarriesTheDocumentedBytes) {
  const std::vector<Script> scripts = ScriptsFor(GetParam());
  ScriptedPeer peer(scripts);
  {
    ExposedClient client(peer.Port(), GetParam().settings);
    GetParam().send(&client);
  }
  const std::string shown = Shown(peer.Received(scripts.size() - 1), peer.Port());
  const auto block = Blocks().find(GetParam().name);
  ASSERT_NE(block, Blocks().end()) << "```text " << GetParam().name << "\n" << shown << "```";
  EXPECT_EQ(block->second, shown);
}

TEST(WireDocument, HasNoBlockThatIsNotCompared) {
  std::set<std::string> names;
  for (const WireCase& c : Cases()) names.insert(c.name);
  for (const auto& block : Blocks()) EXPECT_EQ(names.count(block.first), 1u) << block.first;
}

}  // namespace
