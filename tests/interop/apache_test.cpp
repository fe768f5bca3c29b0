// Apache httpd: credentials, and responses of every shape, over the client's socket.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/tree.h>

#include "tests/interop/servers.h"

namespace {

using ::testing::HasSubstr;
using ::testing::StartsWith;

constexpr char kApache[] = "Apache httpd";
constexpr char kSoap[] = "<envelope><move pan=\"3\"/></envelope>";

class ApacheTest : public ::testing::TestWithParam<Mode> {
 protected:
  std::unique_ptr<ExposedClient> Client(const std::string& path) {
    return NewClient(Apache(), LoginTo(GetParam(), path));
  }

  std::unique_ptr<ExposedClient> ModernClient(const std::string& path) {
    ClientSettings settings = LoginTo(GetParam(), path);
    settings.version = HTTP_VERSION_1_1;
    return NewClient(Apache(), settings);
  }
};

INSTANTIATE_TEST_SUITE_P(, ApacheTest, ::testing::ValuesIn(kModes),
                         [](const auto& test) { return NameOf(test.param); });

// ---- GET

TEST_P(ApacheTest, GetsAPageOfAProgram) {
  Worked("SendRequestByGet", kApache, "none", GetParam());
  auto client = Client("cgi/text.cgi?zoom=3");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_EQ(BodyOf(client.get()), "GET HTTP/1.0\nquery zoom=3\ntype \ncookie \nuser \nbody \n");
}

TEST_P(ApacheTest, DecodesTheChunksOfAnEndlessProgram) {
  Worked("ReadBody (chunked)", kApache, "none", GetParam());
  auto client = ModernClient("cgi/stream.cgi");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client->GetTransferEncoding(), "chunked");
  const std::string body = BodyOf(client.get());
  EXPECT_THAT(body, StartsWith("line 01 ....."));
  EXPECT_EQ(body.size(), 20 * 9 + 100u * 210);
}

TEST_P(ApacheTest, ReadsABodyThatOnlyTheCloseEnds) {
  Worked("ReadBody (until the close)", kApache, "none", GetParam());
  auto client = Client("cgi/stream.cgi");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(Content(*client, HTTP_CONTENT_LENGTH), "(none)");
  EXPECT_EQ(client->GetTransferEncoding(), "");
  EXPECT_EQ(BodyOf(client.get()).size(), 20 * 9 + 100u * 210);
}

TEST_P(ApacheTest, LeavesTheHeadersAfterTheThirtiethInFrontOfTheBody) {
  Worked("SendRequestByGet (100 headers)", kApache, "none", GetParam());
  auto client = Client("cgi/headers.cgi");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  const std::string body = BodyOf(client.get());
  EXPECT_THAT(body, StartsWith("X-Filler-"));
  EXPECT_THAT(body, HasSubstr("X-Filler-99: 99\r\n"));
  EXPECT_THAT(body, HasSubstr("\r\n\r\nfinished"));
}

TEST_P(ApacheTest, SendsTheLastCookieBack) {
  Worked("SendRequestByGet (cookies)", kApache, "none", GetParam());
  auto client = Client("cgi/cookies.cgi");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  std::string cookie;
  client->GetCookie(cookie);
  EXPECT_EQ(cookie, "session=42;");
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(BodyOf(client.get()), "cookie session=42;");
}

TEST_P(ApacheTest, ReportsARedirectAndDoesNotFollow) {
  Worked("SendRequestByGet (302)", kApache, "none", GetParam());
  auto client = Client("moved");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  int status = 0;
  EXPECT_EQ(client->CheckResponse(status), HTTP_RET_REDIRECT);
  EXPECT_EQ(status, 302);
}

TEST_P(ApacheTest, ReportsThatAPathIsTooLong) {
  Worked("SendRequestByGet (414)", kApache, "none", GetParam());
  auto client = Client("cgi/text.cgi?" + std::string(1500, 'x'));
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  int status = 0;
  EXPECT_EQ(client->CheckResponse(status), HTTP_RET_URI_TOO_LONG);
  EXPECT_EQ(status, 414);
}

// ---- credentials

TEST_P(ApacheTest, LogsInByDigestWithQop) {
  Worked("SendRequest (GET)", kApache, "Digest, qop auth", GetParam());
  auto client = Client("digest/text.cgi?zoom=3");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_THAT(BodyOf(client.get()), HasSubstr("user operator\n"));
}

TEST_P(ApacheTest, LogsInByDigestWithoutQop) {
  Worked("SendRequest (GET)", kApache, "Digest, no qop", GetParam());
  auto client = Client("cgi/oldlogin.cgi?zoom=3");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_EQ(BodyOf(client.get()), "welcome\n");
}

TEST_P(ApacheTest, LogsInByBasicWhenAsked) {
  Worked("SendRequest (GET)", kApache, "Basic, when asked", GetParam());
  auto client = Client("basic/text.cgi");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_THAT(BodyOf(client.get()), HasSubstr("user operator\n"));
}

TEST_P(ApacheTest, LogsInByBasicAtOnce) {
  Worked("SendRequest (GET)", kApache, "Basic, at once", GetParam());
  ClientSettings settings = LoginTo(GetParam(), "basic/text.cgi");
  settings.basic_auth = true;
  auto client = NewClient(Apache(), settings);
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(client->m_strAuthenticate, "") << "the server had to ask";
  EXPECT_THAT(BodyOf(client.get()), HasSubstr("user operator\n"));
}

TEST_P(ApacheTest, GivesUpWhenTheCredentialsAreRefusedAgain) {
  Worked("SendRequest (GET), refused", kApache, "wrong password", GetParam());
  for (const char* path : {"basic/text.cgi", "digest/text.cgi", "cgi/oldlogin.cgi"}) {
    ClientSettings settings = LoginTo(GetParam(), path);
    settings.password = "gate-8";
    auto client = NewClient(Apache(), settings);
    ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
    int status = 0;
    EXPECT_EQ(client->CheckResponse(status), HTTP_RET_UNAUTHORIZED) << path;
    EXPECT_EQ(status, 401) << path;
  }
}

// ---- POST

TEST_P(ApacheTest, PostsAForm) {
  Worked("SendRequestBySocketPost", kApache, "none", GetParam());
  auto client = Client("cgi/text.cgi?x=1");
  client->SetCookie("session=42");
  ASSERT_EQ(client->SendRequestBySocketPost("pan=3&tilt=-4"), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_EQ(BodyOf(client.get()),
            "POST HTTP/1.1\nquery x=1\ntype application/x-www-form-urlencoded; charset=utf-8\n"
            "cookie session=42\nuser \nbody pan=3&tilt=-4\n");
}

TEST_P(ApacheTest, PostsAnEnvelope) {
  Worked("SendReqBySocketPost", kApache, "none", GetParam());
  auto client = Client("cgi/xml.cgi");
  std::string response;
  ASSERT_EQ(client->SendReqBySocketPost(kSoap, response), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_THAT(response, HasSubstr(kSoap));
}

TEST_P(ApacheTest, ReadsTheEnvelopeOfAFault) {
  Worked("SendReqBySocketPost (500)", kApache, "none", GetParam());
  auto client = Client("cgi/xml.cgi?fault");
  std::string response;
  ASSERT_EQ(client->SendReqBySocketPost(kSoap, response), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 500);
  EXPECT_THAT(response, HasSubstr(kSoap));
}

TEST_P(ApacheTest, CannotReadAnEnvelopeWithoutALength) {
  AddRow({"SendReqBySocketPost (chunked response)", kApache, "none",
          GetParam().tls ? "TLS" : "plain", GetParam().buffered ? "buffered" : "direct",
          "not possible: the response must announce its Content-Length"});
  auto client = Client("cgi/stream.cgi");
  std::string response = "old";
  EXPECT_EQ(client->SendReqBySocketPost(kSoap, response), HTTP_RET_IO_ERROR);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_EQ(response, "old");
}

TEST_P(ApacheTest, LogsInToPostAnEnvelope) {
  const std::pair<const char*, const char*> cases[] = {
      {"digest", "Digest, qop auth"}, {"basic", "Basic"}, {"cgi", "none"}};
  for (const auto& [directory, login] : cases) {
    Worked("SendAuthReqBySocketPost", kApache, login, GetParam());
    auto client = Client(directory + std::string("/xml.cgi"));
    std::string response;
    EXPECT_EQ(client->SendAuthReqBySocketPost(kSoap, response), HTTP_RET_OK) << directory;
    EXPECT_THAT(response, HasSubstr(kSoap)) << directory;
  }
}

TEST_P(ApacheTest, ReportsThatTheCredentialsForAnEnvelopeAreRefused) {
  Worked("SendAuthReqBySocketPost, refused", kApache, "wrong password", GetParam());
  ClientSettings settings = LoginTo(GetParam(), "digest/xml.cgi");
  settings.password = "gate-8";
  auto client = NewClient(Apache(), settings);
  std::string response;
  EXPECT_EQ(client->SendAuthReqBySocketPost(kSoap, response), HTTP_RET_UNAUTHORIZED);
}

TEST_P(ApacheTest, ParsesTheEnvelopeWithItsLinesJoined) {
  Worked("SendReqByXMLSocketPost", kApache, "none", GetParam());
  auto client = Client("cgi/xml.cgi");
  xmlDoc* doc = nullptr;
  ASSERT_EQ(client->SendReqByXMLSocketPost(kSoap, doc), HTTP_RET_OK);
  ASSERT_NE(doc, nullptr);
  xmlNode* joined = xmlFirstElementChild(xmlDocGetRootElement(doc));
  xmlChar* text = xmlNodeGetContent(joined);
  EXPECT_STREQ(reinterpret_cast<const char*>(text), "onetwo");
  xmlFree(text);
  xmlFreeDoc(doc);
}

// ---- a whole response, its head included

TEST_P(ApacheTest, RespondsToASecondRequestOnTheSameConnection) {
  if (GetParam().tls) return;  // the port that keeps connections is a plain one
  Worked("GetResp", kApache, "none", GetParam());
  ClientSettings settings = LoginTo(GetParam(), "cgi/cookies.cgi");
  settings.version = HTTP_VERSION_1_1;
  ExposedClient client(Apache().Port("KEEP_PORT"), settings);
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  char body[64];
  ASSERT_EQ(client.ReadData(body, 7), 7);  // "cookie ", all that was announced
  const std::string request =
      "GET /cgi/stream.cgi HTTP/1.1\r\nHost: 127.0.0.1\r\nConnection: close\r\n\r\n";
  ASSERT_EQ(client.WriteData(request.data(), static_cast<int>(request.size())),
            static_cast<int>(request.size()));
  EXPECT_EQ(client.GetResp().size(), 20 * 9 + 100u * 210);
}

}  // namespace
