// Requests through libcurl, and its initialisation.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/twcurl.h"
#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";

// The outcome of a request whose peer answers with `response`.
int ResultOfResponse(const std::string& response, TW_HTTP_METHOD method = HTTP_METHOD_GET) {
  ScriptedPeer peer({Exchange(response)});
  ExposedClient client(peer.Port());
  const int result = client.SendRequestByCurl(method, true, 10);
  EXPECT_EQ(client.m_result, result);
  EXPECT_EQ(client.m_connState, result == HTTP_RET_OK ? 1 : 0);
  return result;
}

std::string Response(const std::string& status) {
  return "HTTP/1.1 " + status + "\r\nContent-Length: 0\r\n\r\n";
}

}  // namespace

TEST(SendRequestByCurl, AGetWithAnEmptyHostHasTheUrlOfSchemeAndPathAlone) {
  for (const bool https : {false, true}) {
    ExposedClient client(80);
    client.m_strHost = "";
    client.m_strPath = "x/y";
    client.m_bHttps = https;
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, https ? "https://x/y" : "http://x/y");
  }
}

TEST(SendRequestByCurl, APostSendsThePathAsItsBodyToTheHostAlone) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port(), {"a=1"});
  Faults faults;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 10), HTTP_RET_OK);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://127.0.0.1");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_PORT).number, peer.Port());
  EXPECT_THAT(peer.Received(0),
              AllOf(StartsWith("POST / HTTP/1.1\r\n"), HasSubstr("\r\nContent-Length: 3\r\n"),
                    EndsWith("\r\n\r\na=1")));
}

TEST(SendRequestByCurl, A302OrA404IsAnIoErrorAndA200OrA299IsOk) {
  EXPECT_EQ(ResultOfResponse(Response("302 Found\r\nLocation: /elsewhere")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfResponse(Response("404 Not Found")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfResponse(Response("200 OK")), HTTP_RET_OK);
  EXPECT_EQ(ResultOfResponse(Response("299 Fine")), HTTP_RET_OK);
}

TEST(SendRequestByCurl, LibcurlCode60IsACertificateErrorAndAnyOtherAnIoError) {
  for (const int code : {60, 1, 6, 7, 28, 35, 51, 52, 56, 59, 61, 77}) {
    ExposedClient client(80);
    Faults faults;
    faults.FailNth(Call::kCurlEasyPerform, 1, 0, code);
    const int expected = code == 60 ? HTTP_RET_CERT_ERROR : HTTP_RET_IO_ERROR;
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), expected) << code;
    EXPECT_EQ(client.m_result, expected);
    EXPECT_EQ(client.m_connState, 0);
    ExpectHandleReleased(faults);
  }
}

TEST(SendRequestByCurl, TheResponseFileGetsHeadersAndBodyWithoutStatusAndTransferEncoding) {
  ScriptedPeer peer(
      {Exchange("HTTP/1.1 200 OK\r\nServer: s\r\nTransfer-Encoding: chunked\r\n"
                "Content-Type: text/plain\r\n\r\n3\r\nabc\r\n2\r\nde\r\n0\r\n\r\n")});
  FileInMemory file;
  ExposedClient client(peer.Port());
  client.SetCurlRespFile(file.Stream());
  client.m_strCurlText = "old";
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(file.Content(), "Server: s\r\nContent-Type: text/plain\r\n\r\nabcde");
  EXPECT_EQ(client.m_strCurlText, "");
}

TEST(TWCurlInit, AFailedInitialisationIsLoggedAndTriedAgainByTheNextCall) {
  if (!InFreshProcess()) return;
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlGlobalInit, 1);
  EXPECT_EQ(TWCurlInit(), nullptr);
  EXPECT_EQ(faults.Count(Call::kCurlEasyInit), 0);
  for (int i = 0; i < 2; ++i) {
    CURL* curl = TWCurlInit();
    EXPECT_NE(curl, nullptr);
    curl_easy_cleanup(curl);
  }
  EXPECT_EQ(faults.Count(Call::kCurlGlobalInit), 2);
  EXPECT_THAT(log.Lines(), ElementsAre(IsLog("http", "error", "twcurl", "CurlGlobalInit",
                                             "Failed to global init curl with res [2].\n")));
}

TEST(SendRequestByCurl, AFailedInitialisationLeavesTheResultAndAFailedHandleToo) {
  ExposedClient client(80);
  client.m_result = HTTP_RET_REDIRECT;
  client.m_strCurlText = "old";
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyInit, 1);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(client.m_strCurlText, "");
  EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 0);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByCurl", "Failed to initial libcurl.\n")));
}

TEST(SendRequestByCurl, AFailedTransferIsLoggedAtDebug) {
  ExposedClient client(80);
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyPerform, 1, 0, 60);
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByCurl",
                                    "Failed to make http connection, return value=60\n")));
}

TEST(SendRequestByCurl, AnotherStatusIsLoggedAtDebug) {
  LogCapture log;
  ResultOfResponse(Response("404 Not Found"));
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByCurl",
                                    "Failed to make http connection, response=404\n")));
}

TEST(SendRequestByCurl, AStatusThatCannotBeReadIsLoggedAsZero) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port());
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyGetinfo, 1);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 0);
  EXPECT_EQ(client.m_strCurlText, "body");
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendRequestByCurl",
                                                 "Failed to make http connection, response=0\n")));
}

TEST(SendRequestByCurl, TheBoundariesOfSuccessAre200And299) {
  for (const char* status : {"200 x", "201 x", "204 x", "299 x"}) {
    EXPECT_EQ(ResultOfResponse(Response(status)), HTTP_RET_OK) << status;
  }
  for (const char* status : {"199 x", "300 x", "301 x", "401 x", "414 x", "500 x"}) {
    EXPECT_EQ(ResultOfResponse(Response(status)), HTTP_RET_IO_ERROR) << status;
  }
}

TEST(SendRequestByCurl, ANon2xxResponseLeavesTheStateAndKeepsTheBody) {
  ScriptedPeer peer({Exchange("HTTP/1.1 404 No\r\nContent-Length: 4\r\n\r\ngone")});
  ExposedClient client(peer.Port());
  client.m_connState = 2;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.GetCurlText(), "gone");
}

TEST(SendRequestByCurl, ACutBodyIsKeptThoughTheTransferFailed) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nhalf")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_strCurlText, "half");
}

TEST(SendRequestByCurl, TheRequestCarriesCredentialsAgentHeadersAndCookie) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientSettings settings;
  settings.path = "x?y=1";
  settings.user = "u";
  settings.password = "p";
  ExposedClient client(peer.Port(), settings);
  client.SetCookie("s=1");
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
  EXPECT_THAT(
      peer.Received(0),
      AllOf(StartsWith("GET /x?y=1 HTTP/1.1\r\n"), HasSubstr("\r\nAuthorization: Basic dTpw\r\n"),
            HasSubstr("\r\nUser-Agent: Quenrith Tarnwick\r\n"),
            HasSubstr("\r\n" + std::string(kFormHeader) + "\r\n"),
            HasSubstr("\r\nConnection: close\r\n"), HasSubstr("\r\nCookie: s=1\r\n")));
}

TEST(SendRequestByCurl, NothingSurvivesFromOneRequestToTheNext) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nSet-Cookie: c=1\r\n\r\nfirst"),
                     Exchange("HTTP/1.1 200 OK\r\nContent-Length: 6\r\n\r\nsecond")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "second");
  EXPECT_THAT(peer.Received(1), Not(HasSubstr("Cookie")));
  EXPECT_EQ(client.m_strCookie, "");
}

TEST(SendRequestByCurl, ANullFileSwitchesBackToMemory) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port());
  client.SetCurlRespFile(stdout);
  client.SetCurlRespFile(nullptr);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
}

TEST(SendRequestByCurl, TheFileIsWrittenFromItsPositionAndStaysOpen) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
  FileInMemory file;
  fputs("before|", file.Stream());
  ExposedClient client(peer.Port());
  client.SetCurlRespFile(file.Stream());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  fputs("|after", file.Stream());
  const std::string one = "Content-Length: 4\r\n\r\nbody";
  EXPECT_EQ(file.Content(), "before|" + one + one + "|after");
}

TEST(SendRequestByCurl, AFileThatTakesNothingFailsTheTransfer) {
  ScriptedPeer peer({{ExpectRequest(), Send(kOk), DiscardUntilEnd()}});
  FILE* file = fopen("/dev/null", "re");
  ExposedClient client(peer.Port());
  client.SetCurlRespFile(file);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  fclose(file);
}

TEST(SendRequestByCurl, AFileOnAFullDiskIsAnIoErrorThoughStdioTookTheBytes) {
  ScriptedPeer peer({Exchange(kOk)});
  FILE* file = fopen("/dev/full", "we");
  ExposedClient client(peer.Port());
  client.SetCurlRespFile(file);
  LogCapture log;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Messages(), Contains(StartsWith("CURL Error(23): ")));
  fclose(file);
}

TEST(SendRequestByCurl, ItsTimeoutLimitsTheWholeTransfer) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nhalf"),
                      DiscardUntilEnd()}});
  ExposedClient client(peer.Port());
  LogCapture log;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to make http connection, return value=28\n"));
}

TEST(SendRequestByCurl, ARefusedConnectionIsAnIoErrorWithoutADescriptorLeft) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 5);  // libcurl's own lasting descriptors
  const DescriptorGuard guard;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_IO_ERROR);
}

TEST(SendRequestByCurl, ItNeverTouchesTheSocket) {
  ScriptedPeer peer({Exchange(kOk)});
  ExposedClient client(peer.Port());
  Faults faults;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(faults.Count(Call::kConnect), 0);
  EXPECT_EQ(faults.Count(Call::kSocket), 1);  // libcurl's, which connects it
  EXPECT_FALSE(client.m_pSocket->IsConnected());
  EXPECT_EQ(client.m_statusCode, 0);
}
