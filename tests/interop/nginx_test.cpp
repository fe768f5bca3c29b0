// nginx: files of every size, TLS 1.2 and 1.3, a proxied program, PUT and DELETE.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include "tests/interop/servers.h"

namespace {

using ::testing::HasSubstr;

constexpr char kNginx[] = "nginx";

// One of nginx's ports, and how the client reads from it.
struct Access {
  const char* port;
  const char* transport;
  Mode mode;
};

constexpr Access kAccesses[] = {
    {"PORT", "plain", {false, true}},        {"PORT", "plain", {false, false}},
    {"TLS12_PORT", "TLS 1.2", {true, true}}, {"TLS12_PORT", "TLS 1.2", {true, false}},
    {"TLS13_PORT", "TLS 1.3", {true, true}}, {"TLS13_PORT", "TLS 1.3", {true, false}}};

std::string NameOfAccess(const ::testing::TestParamInfo<Access>& test) {
  const std::string version = std::string(test.param.port).substr(0, 5);
  return (test.param.mode.tls ? version : "Plain") +
         (test.param.mode.buffered ? "Buffered" : "Direct");
}

class NginxTest : public ::testing::TestWithParam<Access> {
 protected:
  std::unique_ptr<ExposedClient> Client(const std::string& path,
                                        HTTP_VERSION version = HTTP_VERSION_NONE) {
    ClientSettings settings = LoginTo(GetParam().mode, path);
    settings.version = version;
    return std::make_unique<ExposedClient>(Nginx().Port(GetParam().port), settings);
  }

  void WorkedHere(const std::string& operation, const std::string& login,
                  const std::string& result = "passed") {
    AddRow({operation, kNginx, login, GetParam().transport,
            GetParam().mode.buffered ? "buffered" : "direct", result});
  }

  std::string Get(const std::string& path) {
    auto client = Client(path);
    EXPECT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
    EXPECT_EQ(StatusOf(client.get()), 200);
    return BodyOf(client.get());
  }
};

INSTANTIATE_TEST_SUITE_P(, NginxTest, ::testing::ValuesIn(kAccesses), NameOfAccess);

TEST_P(NginxTest, SendsFilesOfAllSizes) {
  WorkedHere("SendRequestByGet (0 B, 1 B, 64 MiB)", "none");
  EXPECT_EQ(Get("empty"), "");
  EXPECT_EQ(Get("byte"), "x");
  const std::string large = Get("large");
  EXPECT_EQ(large.size(), kLargeFile);
  EXPECT_TRUE(large == ReadFile(Nginx().File("www/large")));
}

TEST_P(NginxTest, SpeaksTheWantedProtocol) {
  WorkedHere("SendRequestByGet", "none");
  const std::string transport = GetParam().transport;
  const std::string protocol = GetParam().mode.tls ? "TLSv" + transport.substr(4) : "";
  EXPECT_EQ(Get("protocol"), protocol);
}

TEST_P(NginxTest, HandsAChunkedResponseThrough) {
  WorkedHere("ReadBody (chunked, proxied)", "none");
  auto client = Client("upstream/stream.cgi", HTTP_VERSION_1_1);
  ASSERT_EQ(client->SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client->GetTransferEncoding(), "chunked");
  EXPECT_EQ(BodyOf(client.get()).size(), 20 * 9 + 100u * 210);
}

TEST_P(NginxTest, LogsInByBasic) {
  WorkedHere("SendRequest (GET)", "Basic, when asked");
  auto client = Client("basic/byte");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_EQ(BodyOf(client.get()), "x");
}

TEST_P(NginxTest, PostsAFormThroughTheProxy) {
  WorkedHere("SendRequestBySocketPost (proxied)", "none");
  auto client = Client("upstream/text.cgi");
  ASSERT_EQ(client->SendRequestBySocketPost("pan=3"), HTTP_RET_OK);
  EXPECT_THAT(BodyOf(client.get()), HasSubstr("body pan=3\n"));
}

TEST_P(NginxTest, PostsAnEnvelopeThroughTheProxy) {
  WorkedHere("SendReqBySocketPost (proxied)", "none");
  auto client = Client("upstream/xml.cgi");
  std::string response;
  ASSERT_EQ(client->SendReqBySocketPost("<envelope/>", response), HTTP_RET_OK);
  EXPECT_THAT(response, HasSubstr("<envelope/>"));
}

TEST_P(NginxTest, RefusesTheHeadOfAnUpload) {
  WorkedHere("OpenRawDataUpload", "none",
             "not possible: the server refuses a header name with a blank before its colon (400)");
  auto client = Client("store/clip");
  ASSERT_EQ(client->OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client->GetResp(), "{\"error\":true}");
  EXPECT_EQ(StatusOf(client.get()), 400);
}

TEST_P(NginxTest, SendsToLibcurl) {
  if (!GetParam().mode.buffered) return;  // libcurl reads by itself
  AddRow({"SendRequestByCurl (GET)", kNginx, "none", GetParam().transport, "libcurl", "passed"});
  auto client = Client("byte");
  ASSERT_EQ(client->SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_OK);
  EXPECT_EQ(client->GetCurlText(), "x");
}

// ---- without TLS

TEST(NginxStore, TakesAPutAndADelete) {
  WorkedByCurl("SendReqByXMLPut with GetResponseXML", kNginx, "none", false);
  WorkedByCurl("SendReqByXMLDelete", kNginx, "none", false);
  ExposedClient client(Nginx().Port(), LoginTo(kModes[0], "store/presets/7.xml"));
  const std::string file = Nginx().File("www/store/presets/7.xml");
  const xmlChar* text = reinterpret_cast<const xmlChar*>("<preset id=\"7\"/>");
  xmlDoc* doc = xmlReadDoc(text, nullptr, nullptr, 0);
  EXPECT_EQ(client.SendReqByXMLPut(doc), HTTP_RET_OK);
  EXPECT_EQ(ReadFile(file), "<?xml version=\"1.0\"?>\n<preset id=\"7\"/>\n");
  EXPECT_EQ(client.SendReqByXMLDelete(), HTTP_RET_OK);
  EXPECT_FALSE(FileExists(file));
  xmlDoc* response = nullptr;
  EXPECT_FALSE(client.GetResponseXML(response)) << "201 and 204 have no body";
  xmlFreeDoc(doc);
}

TEST(NginxStore, ReportsThatThereIsNothingToDelete) {
  ExposedClient client(Nginx().Port(), LoginTo(kModes[0], "store/nothing.xml"));
  EXPECT_EQ(client.SendReqByXMLDelete(), HTTP_RET_IO_ERROR);
}

TEST(NginxOneCall, GetsJson) {
  AddRow({"SendHttpGet", kNginx, "none", "plain", "buffered", "passed"});
  Json::Value response;
  ASSERT_EQ(SendHttpGet("127.0.0.1", Nginx().Port(), "success.json", response, 10, false), 0);
  EXPECT_EQ(response["server"].asString(), "nginx");
}

}  // namespace
