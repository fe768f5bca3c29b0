// Apache httpd: the operations that go through libcurl, and the one-call functions.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <cstdio>

#include "tests/interop/certificates.h"
#include "tests/interop/servers.h"

namespace {

using ::testing::HasSubstr;
using ::testing::Not;

constexpr char kApache[] = "Apache httpd";
constexpr Mode kPlain = {false, true};
constexpr Mode kTls = {true, true};

class ApacheCurl : public ::testing::TestWithParam<bool> {
 protected:
  std::unique_ptr<ExposedClient> Client(const std::string& path) {
    return NewClient(Apache(), LoginTo(GetParam() ? kTls : kPlain, path));
  }

 private:
  TrustedAuthority trusted_{Certificates().CaFile()};
};

INSTANTIATE_TEST_SUITE_P(, ApacheCurl, ::testing::Bool(),
                         [](const auto& test) { return test.param ? "Tls" : "Plain"; });

TEST_P(ApacheCurl, GetsAPageProtectedByBasic) {
  WorkedByCurl("SendRequestByCurl (GET)", kApache, "Basic", GetParam());
  auto client = Client("basic/text.cgi?zoom=3");
  ASSERT_EQ(client->SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_THAT(client->GetCurlText(), HasSubstr("query zoom=3\n"));
  EXPECT_THAT(client->GetCurlText(), HasSubstr("user operator\n"));
}

TEST_P(ApacheCurl, DoesNotLogInByDigest) {
  AddRow({"SendRequestByCurl (GET)", kApache, "Digest, qop auth", GetParam() ? "TLS" : "plain",
          "libcurl", "not possible: this operation logs in by Basic alone, so the 401 stays"});
  auto client = Client("digest/text.cgi");
  EXPECT_EQ(client->SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_THAT(client->GetCurlText(), HasSubstr("401 Unauthorized"));
}

TEST_P(ApacheCurl, PostsAFormToTheRoot) {
  WorkedByCurl("SendRequestByCurl (POST)", kApache, "none", GetParam());
  auto client = Client("pan=3&tilt=-4");
  client->SetCookie("session=42");
  ASSERT_EQ(client->SendRequestByCurl(HTTP_METHOD_POST, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client->GetCurlText(),
            "{\"success\":true,\"method\":\"POST\",\"query\":\"\",\"user\":\"\","
            "\"cookie\":\"session=42\",\"body\":\"pan=3&tilt=-4\"}");
}

TEST_P(ApacheCurl, WritesAChunkedResponseToAFile) {
  WorkedByCurl("SendRequestByCurl (file)", kApache, "none", GetParam());
  auto client = Client("cgi/stream.cgi");
  const TempDir directory;
  FILE* file = fopen(directory.File("response").c_str(), "we");
  ASSERT_NE(file, nullptr);
  client->SetCurlRespFile(file);
  EXPECT_EQ(client->SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  fclose(file);
  const std::string response = ReadFile(directory.File("response"));
  EXPECT_THAT(response, HasSubstr("Content-Type: text/plain\r\n"));
  EXPECT_THAT(response, Not(HasSubstr("Transfer-Encoding")));
  ASSERT_NE(response.find("\r\n\r\nline 01"), std::string::npos);
  EXPECT_EQ(response.size() - response.find("line 01"), 20 * 9 + 100u * 210);
}

// ---- a POST with credentials

struct LoginCase {
  const char* directory;
  const char* login;
};

constexpr LoginCase kLogins[] = {
    {"cgi", "none"}, {"basic", "Basic"}, {"digest", "Digest, qop auth"}};

TEST(ApacheCurlPost, LogsInAsTheServerAsks) {
  for (const LoginCase& c : kLogins) {
    for (const char* operation : {"SendRequestByPost", "SendRequest (POST)"}) {
      WorkedByCurl(operation, kApache, c.login, false);
      auto client =
          NewClient(Apache(), LoginTo(kPlain, c.directory + std::string("/json.cgi?pan=3")));
      const int result = operation == std::string("SendRequestByPost")
                             ? client->SendRequestByPost("?")
                             : client->SendRequest(HTTP_METHOD_POST, "?");
      EXPECT_EQ(result, HTTP_RET_OK) << operation << " " << c.login;
    }
  }
}

TEST(ApacheCurlPost, FailsWithAWrongPassword) {
  WorkedByCurl("SendRequestByPost, refused", kApache, "wrong password", false);
  ClientSettings settings = LoginTo(kPlain, "digest/json.cgi?pan=3");
  settings.password = "gate-8";
  EXPECT_EQ(NewClient(Apache(), settings)->SendRequestByPost("?"), HTTP_RET_IO_ERROR);
}

// ---- XML

// The attribute of the response's root; "(no response)" without a document.
std::string Attribute(TWHttpClient* client, const char* name) {
  xmlDoc* doc = nullptr;
  if (!client->GetResponseXML(doc)) return "(no response)";
  const xmlChar* key = reinterpret_cast<const xmlChar*>(name);
  xmlChar* value = xmlGetProp(xmlDocGetRootElement(doc), key);
  const std::string text = value != nullptr ? reinterpret_cast<const char*>(value) : "(none)";
  xmlFree(value);
  xmlFreeDoc(doc);
  return text;
}

int SendXml(TWHttpClient* client, const std::string& operation, xmlDoc* doc) {
  if (operation == "SendReqByXMLGet") return client->SendReqByXMLGet(10);
  if (operation == "SendReqByXMLPost") return client->SendReqByXMLPost(doc);
  if (operation == "SendReqByXMLPut") return client->SendReqByXMLPut(doc);
  return client->SendReqByXMLDelete();
}

struct XmlCase {
  const char* operation;
  const char* method;
};

constexpr XmlCase kXmlCases[] = {{"SendReqByXMLGet", "GET"},
                                 {"SendReqByXMLPost", "POST"},
                                 {"SendReqByXMLPut", "PUT"},
                                 {"SendReqByXMLDelete", "DELETE"}};

class ApacheXml : public ::testing::TestWithParam<XmlCase> {
 protected:
  ~ApacheXml() override { xmlFreeDoc(doc_); }

  xmlDoc* doc_ =
      xmlReadDoc(reinterpret_cast<const xmlChar*>("<preset id=\"7\"/>"), nullptr, nullptr, 0);
};

INSTANTIATE_TEST_SUITE_P(, ApacheXml, ::testing::ValuesIn(kXmlCases),
                         [](const auto& test) { return test.param.method; });

TEST_P(ApacheXml, IsAnswered) {
  for (const char* directory : {"cgi", "basic"}) {
    const bool basic = std::string(directory) == "basic";
    WorkedByCurl(GetParam().operation + std::string(" with GetResponseXML"), kApache,
                 basic ? "Basic" : "none", false);
    auto client = NewClient(Apache(), LoginTo(kPlain, std::string(directory) + "/xml.cgi"));
    ASSERT_EQ(SendXml(client.get(), GetParam().operation, doc_), HTTP_RET_OK) << directory;
    EXPECT_EQ(Attribute(client.get(), "method"), GetParam().method) << directory;
  }
}

TEST_P(ApacheXml, LogsInByDigestWithAGetAlone) {
  const bool get = GetParam().method == std::string("GET");
  const char* reason = "not possible: this operation logs in by Basic alone, so the 401 stays";
  AddRow({GetParam().operation + std::string(" with GetResponseXML"), kApache, "Digest, qop auth",
          "plain", "libcurl", get ? "passed" : reason});
  auto client = NewClient(Apache(), LoginTo(kPlain, "digest/xml.cgi"));
  const int result = SendXml(client.get(), GetParam().operation, doc_);
  EXPECT_EQ(result, get ? HTTP_RET_OK : HTTP_RET_IO_ERROR);
  if (!get) return;
  EXPECT_EQ(Attribute(client.get(), "user"), "operator");
}

// ---- one call

TEST(ApacheOneCall, GetsJson) {
  AddRow({"SendHttpGet", kApache, "none", "plain", "buffered", "passed"});
  Json::Value response;
  ASSERT_EQ(
      SendHttpGet("127.0.0.1", Apache().Port(), "cgi/json.cgi?name=a b&x=1/2", response, 10, true),
      0);
  EXPECT_EQ(response["query"].asString(), "name=a%20b&x=1%2F2");
}

TEST(ApacheOneCall, PostsAForm) {
  AddRow({"SendHttpPost", kApache, "none", "plain", "buffered", "passed"});
  EXPECT_EQ(SendHttpPost("127.0.0.1", Apache().Port(), "cgi/json.cgi", "pan=3", "session=42", 10),
            0);
}

TEST(ApacheOneCall, GetsJsonOverTls) {
  WorkedByCurl("SendHttpsGet", kApache, "none", true);
  const TrustedAuthority trusted(Certificates().CaFile());
  Json::Value response;
  ASSERT_EQ(
      SendHttpsGet("127.0.0.1", Apache().Port("TLS_PORT"), "cgi/json.cgi?zoom=3", response, 10), 0);
  EXPECT_EQ(response["query"].asString(), "zoom=3");
}

}  // namespace
