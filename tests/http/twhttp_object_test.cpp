// The client object: construction, settings, accessors, the forwards to its socket.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <netinet/in.h>

#include <cstdlib>
#include <type_traits>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/net/sslsocket.h"
#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

using namespace tarnwick;

namespace {

using ::testing::IsEmpty;

constexpr char kPlainResponse[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";

// The shape that other programs are compiled against.
static_assert(std::has_virtual_destructor_v<TWHttpClient>);
static_assert(sizeof(HTTP_MAP_KEY) == sizeof(int) && sizeof(HTTP_VERSION) == sizeof(int));
static_assert(HTTP_CONTENT_TYPE == 0 && HTTP_CONTENT_LENGTH == 1 && HTTP_CONTENT_RANGE == 2);
static_assert(HTTP_METHOD_GET == 0 && HTTP_METHOD_POST == 1);
static_assert(HTTP_RET_OK == 0 && HTTP_RET_NOT_READY == 1 && HTTP_RET_BAD_KEY == 2);
static_assert(HTTP_RET_IO_ERROR == 3 && HTTP_RET_UNAUTHORIZED == 4 && HTTP_RET_BAD_RESPONSE == 5);
static_assert(HTTP_RET_NO_CONTENT == 6 && HTTP_RET_REDIRECT == 7 && HTTP_RET_URI_TOO_LONG == 8);
static_assert(HTTP_RET_CERT_ERROR == 9);
static_assert(int{HTTP_VERSION_NONE} == int{CURL_HTTP_VERSION_NONE});
static_assert(int{HTTP_VERSION_1_0} == int{CURL_HTTP_VERSION_1_0});
static_assert(int{HTTP_VERSION_1_1} == int{CURL_HTTP_VERSION_1_1});
static_assert(std::is_same_v<decltype(ExposedClient::m_pRespBuf), char*>);
static_assert(std::is_same_v<decltype(ExposedClient::m_respLen), unsigned int>);
static_assert(std::is_same_v<decltype(ExposedClient::m_connState), int>);
static_assert(std::is_same_v<decltype(ExposedClient::m_result), int>);
static_assert(std::is_same_v<decltype(ExposedClient::m_statusCode), int>);
static_assert(std::is_same_v<decltype(ExposedClient::m_port), int>);
static_assert(std::is_same_v<decltype(ExposedClient::m_httpVersion), HTTP_VERSION>);

void ExpectNewClient(const ExposedClient& client) {
  EXPECT_THAT(client.m_mapContent, IsEmpty());
  EXPECT_EQ(client.m_connState, 0);
  EXPECT_EQ(client.m_result, HTTP_RET_NOT_READY);
  EXPECT_EQ(client.m_statusCode, 0);
  EXPECT_EQ(client.m_strCookie, "");
  EXPECT_EQ(client.m_strAuthenticate, "");
  EXPECT_EQ(client.m_strAuthorization, "");
  EXPECT_EQ(client.m_strTransferEncoding, "");
  EXPECT_EQ(client.m_strCurlText, "");
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  EXPECT_EQ(client.m_respLen, 0u);
  EXPECT_EQ(client.m_pCurlRespFile, nullptr);
}

// True when one of the process's sockets has this local address, given in network byte order.
bool HasSocketBoundTo(in_addr_t wanted) {
  for (const auto& [fd, target] : OpenDescriptors()) {
    sockaddr_in address = {};
    socklen_t size = sizeof(address);
    if (target.rfind("socket:", 0) != 0) continue;
    // A peer of the same process has the address on its other end, not on its own.
    getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size);
    if (address.sin_family == AF_INET && address.sin_addr.s_addr == wanted) return true;
  }
  return false;
}

template <typename T>
const char* Address(const T& field) {
  return reinterpret_cast<const char*>(&field);
}

}  // namespace

TEST(TWHttpClientObject, APathOfTwoLeadingSlashesIsStoredWithoutBoth) {
  const ExposedClient client(80, {"//cgi/a//b/"});
  EXPECT_EQ(client.m_strPath, "cgi/a//b/");
}

TEST(TWHttpClientObject, APathOfSlashesOnlyBecomesEmpty) {
  const ExposedClient client(80, {"///"});
  EXPECT_EQ(client.m_strPath, "");
}

TEST(TWHttpClientObject, AKeyOfNoFieldIsABadKeyAndKeyZeroIsNotReadyBeforeAnyRequest) {
  const ExposedClient client(80);
  std::string out = "kept";
  EXPECT_EQ(client.GetHttpContent(static_cast<HTTP_MAP_KEY>(99), out), HTTP_RET_BAD_KEY);
  EXPECT_EQ(client.GetHttpContent(HTTP_CONTENT_TYPE, out), HTTP_RET_NOT_READY);
  EXPECT_EQ(out, "kept");
}

TEST(TWHttpClientObject, AHeaderThatTheResponseDidNotHaveIsNoContentAndLeavesOutUntouched) {
  const auto client = ClientAfter(kPlainResponse);
  std::string out = "kept";
  EXPECT_EQ(client->GetHttpContent(HTTP_CONTENT_RANGE, out), HTTP_RET_NO_CONTENT);
  EXPECT_EQ(out, "kept");
  EXPECT_EQ(client->GetHttpContent(HTTP_CONTENT_LENGTH, out), HTTP_RET_OK);
  EXPECT_EQ(out, "4");
}

TEST(TWHttpClientObject, CheckResponseOfANewObjectIsNotReadyWithStatusZero) {
  TWHttpClient client;
  int status = -7;
  EXPECT_EQ(client.CheckResponse(status), HTTP_RET_NOT_READY);
  EXPECT_EQ(status, 0);
}

TEST(TWHttpClientObject, WithHttpsTheSocketIsTlsAndTheSourceAddressIsBoundBeneathIt) {
  TlsScriptedPeer peer({Exchange(kPlainResponse)});
  ClientSettings settings;
  settings.https = true;
  ExposedClient client(peer.Port(), settings);
  EXPECT_NE(dynamic_cast<SSLSocket*>(client.m_pSocket), nullptr);
  client.SetSocketRemoteAddr(htonl(0x7f000005));
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  EXPECT_TRUE(HasSocketBoundTo(htonl(0x7f000005)));
}

TEST(TWHttpClientObject, WithoutHttpsTheSocketIsPlain) {
  const ExposedClient client(80);
  ASSERT_NE(client.m_pSocket, nullptr);
  EXPECT_EQ(dynamic_cast<SSLSocket*>(client.m_pSocket), nullptr);
}

TEST(TWHttpClientObject, TheDefaultConstructorMakesNoSocketAndEmptyFields) {
  const ExposedClient client;
  ExpectNewClient(client);
  EXPECT_EQ(client.m_pSocket, nullptr);
  EXPECT_FALSE(client.m_bHttps || client.m_bEncodeQuery || client.m_bBasicAuth);
  EXPECT_EQ(client.m_port, 0);
  EXPECT_EQ(client.m_strHost + client.m_strPath + client.m_strUser + client.m_strPassword, "");
  EXPECT_EQ(client.m_strEncodeKeep, "");
  EXPECT_EQ(client.m_httpVersion, HTTP_VERSION_NONE);
}

TEST(TWHttpClientObject, TheLongConstructorStoresEachSettingInItsField) {
  const ExposedClient client(
      8080, {"/p?q=1", HTTP_VERSION_1_1, "u", "w", true, true, "/:", 3, true, true, "cam"});
  ExpectNewClient(client);
  EXPECT_EQ(client.m_strHost, "cam");
  EXPECT_EQ(client.m_port, 8080);
  EXPECT_EQ(client.m_strPath, "p?q=1");
  EXPECT_EQ(client.m_strUser, "u");
  EXPECT_EQ(client.m_strPassword, "w");
  EXPECT_EQ(client.m_strEncodeKeep, "/:");
  EXPECT_TRUE(client.m_bHttps && client.m_bEncodeQuery && client.m_bBasicAuth);
  EXPECT_EQ(client.m_httpVersion, HTTP_VERSION_1_1);
}

TEST(TWHttpClientObject, InitStoresTheSameSettingsAsTheLongConstructor) {
  ExposedClient client;
  client.Init("//p", "cam", 81, "u", "w", 3, true, false, true, HTTP_VERSION_1_0, "k", false);
  ExpectNewClient(client);
  EXPECT_NE(client.m_pSocket, nullptr);
  EXPECT_EQ(client.m_strHost, "cam");
  EXPECT_EQ(client.m_port, 81);
  EXPECT_EQ(client.m_strPath, "p");
  EXPECT_EQ(client.m_strUser, "u");
  EXPECT_EQ(client.m_strPassword, "w");
  EXPECT_EQ(client.m_strEncodeKeep, "k");
  EXPECT_FALSE(client.m_bHttps || client.m_bEncodeQuery);
  EXPECT_TRUE(client.m_bBasicAuth);
  EXPECT_EQ(client.m_httpVersion, HTTP_VERSION_1_0);
}

TEST(TWHttpClientObject, InitResetsOutcomeCookieAndCurlOutputWithoutFreeing) {
  ExposedClient client;
  char* lost = static_cast<char*>(malloc(8));
  client.m_pRespBuf = lost;
  client.m_respLen = 7;
  client.m_result = HTTP_RET_OK;
  client.m_statusCode = 200;
  client.m_connState = 2;
  client.SetCookie("s=1");
  client.SetCurlRespFile(stdout);
  client.Init("p", "h", 1, "", "", 1, true, false, false, HTTP_VERSION_NONE, "", false);
  ExpectNewClient(client);
  free(lost);  // were it freed already, this would be the second time
}

TEST(TWHttpClientObject, ASecondInitDoesNotReleaseTheFirstSocket) {
  ExposedClient client(80);
  TWSocket* first = client.m_pSocket;
  client.Init("p", "h", 1, "", "", 1, true, false, false, HTTP_VERSION_NONE, "", false);
  EXPECT_NE(client.m_pSocket, first);
  EXPECT_FALSE(first->IsConnected());
  delete first;
}

TEST(TWHttpClientObject, TheSocketGetsHostPortTimeoutAndReadAhead) {
  const BlackHolePort port;
  LogCapture log;
  ClientSettings settings;
  settings.timeout = 0;
  ExposedClient client(port.Port(), settings);
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Messages(), ::testing::Contains("Socket connect timeout (0)\n"));
}

TEST(TWHttpClientObject, SetPathStripsLeadingSlashes) {
  ExposedClient client(80);
  client.SetPath("//x/y");
  EXPECT_EQ(client.m_strPath, "x/y");
  client.SetPath("/");
  EXPECT_EQ(client.m_strPath, "");
}

TEST(TWHttpClientObject, CookieAndTransferEncodingAreReadBack) {
  ExposedClient client(80);
  EXPECT_EQ(client.SetCookie("s=1"), 0);
  std::string cookie;
  EXPECT_EQ(client.GetCookie(cookie), 0);
  EXPECT_EQ(cookie, "s=1");
  client.m_strTransferEncoding = "chunked";
  EXPECT_EQ(client.GetTransferEncoding(), "chunked");
}

TEST(TWHttpClientObject, CheckResponseReturnsTheLastResultAndStatus) {
  ExposedClient client(80);
  client.m_result = HTTP_RET_REDIRECT;
  client.m_statusCode = 302;
  int status = 0;
  EXPECT_EQ(client.CheckResponse(status), HTTP_RET_REDIRECT);
  EXPECT_EQ(status, 302);
}

TEST(TWHttpClientObject, ANegativeKeyIsABadKey) {
  const auto client = ClientAfter(kPlainResponse);
  std::string out = "kept";
  EXPECT_EQ(client->GetHttpContent(static_cast<HTTP_MAP_KEY>(-1), out), HTTP_RET_BAD_KEY);
  EXPECT_EQ(client->GetHttpContent(static_cast<HTTP_MAP_KEY>(INT_MIN), out), HTTP_RET_BAD_KEY);
  EXPECT_EQ(out, "kept");
}

TEST(TWHttpClientObject, TheKeyIsTestedBeforeTheState) {
  ExposedClient client(80);
  client.m_connState = 1;
  client.m_mapContent[HTTP_CONTENT_TYPE] = "x";
  std::string out;
  EXPECT_EQ(client.GetHttpContent(static_cast<HTTP_MAP_KEY>(99), out), HTTP_RET_BAD_KEY);
  EXPECT_EQ(client.GetHttpContent(HTTP_CONTENT_TYPE, out), HTTP_RET_NOT_READY);
  client.m_connState = 2;
  EXPECT_EQ(client.GetHttpContent(HTTP_CONTENT_TYPE, out), HTTP_RET_OK);
  EXPECT_EQ(out, "x");
}

TEST(TWHttpClientObject, ReadDataAndWriteDataAreRefusedUntilTheHeadIsRead) {
  ScriptedPeer peer({{ExpectExactly("ping"), Send("pong"), Close()}});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.m_pSocket->Connect(), 0);
  char buf[8] = "";
  for (const int state : {0, 1}) {
    client.m_connState = state;
    EXPECT_EQ(client.ReadData(buf, 4), -1);
    EXPECT_EQ(client.WriteData("ping", 4), -1);
  }
  client.m_connState = 2;
  EXPECT_EQ(client.WriteData("ping", 4), 4);
  EXPECT_EQ(client.ReadData(buf, 4), 4);
  EXPECT_STREQ(buf, "pong");
}

TEST(TWHttpClientObject, LineReadingPushBackAndTheReadinessProbeNeedNoState) {
  ScriptedPeer peer({SendThenClose("line\r\nrest")});
  ExposedClient client(peer.Port());
  ASSERT_EQ(client.m_pSocket->Connect(), 0);
  EXPECT_TRUE(client.HasDataToRead(5));
  char buf[16] = "";
  EXPECT_EQ(client.ReadToLineEnd(buf, sizeof(buf)), 4);
  EXPECT_STREQ(buf, "line");
  char back[] = "back";
  EXPECT_EQ(client.RestoreData(back, 4), 0);
  EXPECT_EQ(client.ReadToLineEnd(buf, sizeof(buf)), 8);
  EXPECT_STREQ(buf, "backrest");
}

TEST(TWHttpClientObject, TheDestructorFreesTheBufferAndClosesTheConnectionButNoFile) {
  const DescriptorGuard guard;
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\n\r\n"), ExpectEof()}});
  FILE* file = tmpfile();
  {
    ExposedClient client(peer.Port());
    client.SetCurlRespFile(file);
    client.m_pRespBuf = static_cast<char*>(malloc(4));
    client.SendRequestByGet();
  }
  peer.Finish();
  EXPECT_EQ(fputs("open", file), 1);
  EXPECT_EQ(fclose(file), 0);
}

TEST(TWHttpClientObject, TheFieldsStandInTheOrderThatOtherProgramsCountOn) {
  const ExposedClient c;
  const std::vector<const char*> places = {Address(c.m_pSocket),
                                           Address(c.m_mapContent),
                                           Address(c.m_connState),
                                           Address(c.m_bHttps),
                                           Address(c.m_bEncodeQuery),
                                           Address(c.m_result),
                                           Address(c.m_bBasicAuth),
                                           Address(c.m_statusCode),
                                           Address(c.m_port),
                                           Address(c.m_strHost),
                                           Address(c.m_strPath),
                                           Address(c.m_strUser),
                                           Address(c.m_strPassword),
                                           Address(c.m_strCookie),
                                           Address(c.m_strAuthenticate),
                                           Address(c.m_strAuthorization),
                                           Address(c.m_strTransferEncoding),
                                           Address(c.m_strEncodeKeep),
                                           Address(c.m_strCurlText),
                                           Address(c.m_pRespBuf),
                                           Address(c.m_respLen),
                                           Address(c.m_httpVersion),
                                           Address(c.m_pCurlRespFile)};
  for (size_t i = 1; i < places.size(); ++i) EXPECT_LT(places[i - 1], places[i]) << i;
  EXPECT_EQ(places.front() - reinterpret_cast<const char*>(&c), long{sizeof(void*)});
}

TEST(TWHttpClientObject, BufferAndLengthAreOneRecordForTheCurlCallbacks) {
  ExposedClient client;
  auto* record = reinterpret_cast<CurlMemBuffer*>(&client.m_pRespBuf);
  EXPECT_EQ(Address(client.m_respLen) - Address(client.m_pRespBuf),
            Address(record->size) - Address(record->data));
  EXPECT_EQ(Address(record->data), Address(client.m_pRespBuf));
  char text[] = "abc";
  EXPECT_EQ(CurlBufferWrite(text, 1, 3, &client.m_pRespBuf), 3u);
  EXPECT_STREQ(client.m_pRespBuf, "abc");
  EXPECT_EQ(client.m_respLen, 3u);
}
