// Requests through libcurl, and its initialisation.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "tarnwick/http/curl_callbacks.h"
#include "tarnwick/http/twcurl.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";
constexpr char kFormHeader[] = "Content-Type: application/x-www-form-urlencoded; charset=utf-8";
constexpr char kOutOfMemory[] = "CURL Error(27): Out of memory\n";
constexpr auto kPut = static_cast<TW_HTTP_METHOD>(2);

class FileInMemory {
 public:
  ~FileInMemory() { fclose(file_); }
  FILE* Stream() { return file_; }
  std::string Content() {
    fflush(file_);
    char buf[4096];
    const ssize_t n = pread(fileno(file_), buf, sizeof(buf), 0);
    return std::string(buf, n > 0 ? static_cast<size_t>(n) : 0);
  }

 private:
  FILE* file_ = tmpfile();
};

std::vector<CURLoption> OptionsOf(const Faults& faults) {
  std::vector<CURLoption> options;
  for (const CurlOption& given : faults.CurlOptions()) options.push_back(given.option);
  return options;
}

// The outcome of a request whose peer answers with `reply`.
int ResultOfReply(const std::string& reply, TW_HTTP_METHOD method = HTTP_METHOD_GET) {
  ScriptedPeer peer({Exchange(reply)});
  ClientProbe client(peer.Port());
  const int result = client.SendRequestByCurl(method, true, 10);
  EXPECT_EQ(client.m_result, result);
  EXPECT_EQ(client.m_connState, result == HTTP_RET_OK ? 1 : 0);
  return result;
}

std::string Reply(const std::string& status) {
  return "HTTP/1.1 " + status + "\r\nContent-Length: 0\r\n\r\n";
}

void ExpectAllReleased(const Faults& faults) {
  EXPECT_EQ(faults.Count(Call::kCurlEasyInit), 1);
  EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
}

}  // namespace

TEST(SendRequestByCurl, AGetWithAnEmptyHostHasTheUrlOfSchemeAndPathAlone) {
  for (const bool https : {false, true}) {
    ClientProbe client(80);
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
  ClientProbe client(peer.Port(), {"a=1"});
  Faults faults;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 10), HTTP_RET_OK);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://127.0.0.1");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_PORT).number, peer.Port());
  EXPECT_THAT(peer.Received(0),
              AllOf(StartsWith("POST / HTTP/1.1\r\n"), HasSubstr("\r\nContent-Length: 3\r\n"),
                    EndsWith("\r\n\r\na=1")));
}

TEST(SendRequestByCurl, A302OrA404IsAnIoErrorAndA200OrA299IsOk) {
  EXPECT_EQ(ResultOfReply(Reply("302 Found\r\nLocation: /elsewhere")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfReply(Reply("404 Not Found")), HTTP_RET_IO_ERROR);
  EXPECT_EQ(ResultOfReply(Reply("200 OK")), HTTP_RET_OK);
  EXPECT_EQ(ResultOfReply(Reply("299 Fine")), HTTP_RET_OK);
}

TEST(SendRequestByCurl, LibcurlCode60IsACertificateErrorAndAnyOtherAnIoError) {
  for (const int code : {60, 1, 6, 7, 28, 35, 51, 52, 56, 59, 61, 77}) {
    ClientProbe client(80);
    Faults faults;
    faults.FailNth(Call::kCurlEasyPerform, 1, 0, code);
    const int expected = code == 60 ? HTTP_RET_CERT_ERROR : HTTP_RET_IO_ERROR;
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), expected) << code;
    EXPECT_EQ(client.m_result, expected);
    EXPECT_EQ(client.m_connState, 0);
    ExpectAllReleased(faults);
  }
}

TEST(SendRequestByCurl, TheResponseFileGetsHeadersAndBodyWithoutStatusAndTransferEncoding) {
  ScriptedPeer peer(
      {Exchange("HTTP/1.1 200 OK\r\nServer: s\r\nTransfer-Encoding: chunked\r\n"
                "Content-Type: text/plain\r\n\r\n3\r\nabc\r\n2\r\nde\r\n0\r\n\r\n")});
  FileInMemory file;
  ClientProbe client(peer.Port());
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

TEST(TWCurlInit, WithoutARecordItsFailureIsLoggedAllTheSame) {
  if (!InFreshProcess()) return;
  unlink(kMainLog);
  Faults faults;
  faults.FailNth(Call::kCurlGlobalInit, 1, 0, 27);
  EXPECT_EQ(TWCurlInit(), nullptr);
  EXPECT_THAT(ParseLog(ReadFile(kMainLog)),
              ElementsAre(IsLog("http", "error", "twcurl", "CurlGlobalInit",
                                "Failed to global init curl with res [27].\n")));
}

TEST(TWCurlInit, AMissingHandleIsNullAndNotLogged) {
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kCurlEasyInit, 1);
  EXPECT_EQ(TWCurlInit(), nullptr);
  EXPECT_THAT(log.Lines(), IsEmpty());
}

TEST(TWCurlInit, ManyThreadsMayCallItFirst) {
  if (!InFreshProcess()) return;
  std::vector<std::thread> threads;
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back([] {
      CURL* curl = TWCurlInit();
      EXPECT_NE(curl, nullptr);
      curl_easy_cleanup(curl);
    });
  }
  for (std::thread& thread : threads) thread.join();
}

TEST(SendRequestByCurl, AFailedInitialisationLeavesTheResultAndAFailedHandleToo) {
  ClientProbe client(80);
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

TEST(SendRequestByCurl, AGetSetsItsOptionsInOrder) {
  ClientSettings settings;
  settings.path = "/x?y=1";
  settings.user = "u";
  settings.password = "p";
  settings.host = "cam";
  ClientProbe client(8080, settings);
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 17);
  EXPECT_THAT(OptionsOf(faults),
              ElementsAre(CURLOPT_WRITEFUNCTION, CURLOPT_WRITEDATA, CURLOPT_TIMEOUT,
                          CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_HTTPGET, CURLOPT_PORT,
                          CURLOPT_URL, CURLOPT_USERAGENT, CURLOPT_HTTPHEADER));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEFUNCTION).pointer,
            reinterpret_cast<const void*>(&CurlStringWrite));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEDATA).pointer, &client.m_strCurlText);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_TIMEOUT).number, 17);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_USERNAME).text, "u");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_PASSWORD).text, "p");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_HTTPGET).number, 1);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_PORT).number, 8080);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://cam/x?y=1");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_USERAGENT).text, "Quenrith Tarnwick");
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list,
              ElementsAre(kFormHeader, "Connection: close"));
}

TEST(SendRequestByCurl, APostWithoutVerificationIntoAFileSetsItsOptionsInOrder) {
  ClientProbe client(8080, {"a=1&b=2"});
  FileInMemory file;
  client.SetCurlRespFile(file.Stream());
  client.SetCookie("s=1");
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_POST, false, 1);
  EXPECT_THAT(OptionsOf(faults),
              ElementsAre(CURLOPT_SSL_VERIFYPEER, CURLOPT_SSL_VERIFYHOST, CURLOPT_HEADERFUNCTION,
                          CURLOPT_HEADERDATA, CURLOPT_WRITEFUNCTION, CURLOPT_WRITEDATA,
                          CURLOPT_TIMEOUT, CURLOPT_USERNAME, CURLOPT_PASSWORD, CURLOPT_POSTFIELDS,
                          CURLOPT_PORT, CURLOPT_URL, CURLOPT_USERAGENT, CURLOPT_HTTPHEADER));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_SSL_VERIFYPEER).number, 0);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_SSL_VERIFYHOST).number, 0);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_HEADERFUNCTION).pointer,
            reinterpret_cast<const void*>(&CurlHeaderToFile));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_HEADERDATA).pointer, file.Stream());
  EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEFUNCTION).pointer,
            reinterpret_cast<const void*>(&CurlFileWrite));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEDATA).pointer, file.Stream());
  EXPECT_EQ(faults.OptionGiven(CURLOPT_POSTFIELDS).pointer, client.m_strPath.c_str());
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://127.0.0.1");
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list,
              ElementsAre(kFormHeader, "Connection: close", "Content-Length: 7", "Cookie: s=1"));
}

TEST(SendRequestByCurl, AnotherMethodPostsWithoutAContentLengthOfItsOwn) {
  ClientProbe client(80, {"a=1"});
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(kPut, true, 1);
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTPGET));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_POSTFIELDS).text, "a=1");
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list,
              ElementsAre(kFormHeader, "Connection: close"));
}

TEST(SendRequestByCurl, APostToAnEmptyHostHasTheUrlOfTheSchemeAlone) {
  ClientProbe client(80, {"a=1"});
  client.m_strHost = "";
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_POST, true, 1);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://");
}

TEST(SendRequestByCurl, NoVersionAndNoLoginSchemeIsSet) {
  ClientProbe client(80, {"a", HTTP_VERSION_1_0});
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTP_VERSION));
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTPAUTH));
  EXPECT_FALSE(faults.HasOption(CURLOPT_SSL_VERIFYPEER));
}

// An option that libcurl refuses ends the request.

TEST(SendRequestByCurl, EachRefusedOptionEndsTheRequestAsAnIoError) {
  const CURLoption options[] = {CURLOPT_TIMEOUT,   CURLOPT_USERNAME,  CURLOPT_PASSWORD,
                                CURLOPT_HTTPGET,   CURLOPT_PORT,      CURLOPT_URL,
                                CURLOPT_USERAGENT, CURLOPT_HTTPHEADER};
  for (const CURLoption option : options) {
    SCOPED_TRACE(option);
    ClientProbe client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
    ExpectAllReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("error", "SendRequestByCurl", kOutOfMemory)));
  }
}

TEST(SendRequestByCurl, EachRefusedFileOptionAndPostFieldsToo) {
  const CURLoption options[] = {CURLOPT_HEADERFUNCTION, CURLOPT_HEADERDATA, CURLOPT_WRITEFUNCTION,
                                CURLOPT_WRITEDATA, CURLOPT_POSTFIELDS};
  for (const CURLoption option : options) {
    SCOPED_TRACE(option);
    ClientProbe client(80);
    FileInMemory file;
    client.SetCurlRespFile(file.Stream());
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_UNKNOWN_OPTION);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectAllReleased(faults);
    const std::string text = curl_easy_strerror(CURLE_UNKNOWN_OPTION);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("error", "SendRequestByCurl",
                                                   "CURL Error(48): " + text + "\n")));
  }
}

TEST(SetCurlSSLOpt, ARefusalIsLoggedAtDebugBeforeTheErrorLine) {
  const std::pair<CURLoption, const char*> table[] = {
      {CURLOPT_SSL_VERIFYPEER, "Failed to set CURLOPT_SSL_VERIFYPEER\n"},
      {CURLOPT_SSL_VERIFYHOST, "Failed to set CURLOPT_SSL_VERIFYHOST\n"}};
  for (const auto& [option, message] : table) {
    ClientProbe client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectAllReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SetCurlSSLOpt", message),
                                         IsHttpLog("error", "SetCurlSSLOpt", kOutOfMemory)));
  }
}

TEST(SetCurlCallbackOpt, ARefusalIsLoggedAtErrorBeforeTheErrorLine) {
  const std::pair<CURLoption, const char*> table[] = {
      {CURLOPT_WRITEFUNCTION, "Failed set CURLOPT_WRITEFUNCTION\n"},
      {CURLOPT_WRITEDATA, "Failed to CURLOPT_WRITEDATA\n"}};
  for (const auto& [option, message] : table) {
    ClientProbe client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectAllReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("error", "SetCurlCallbackOpt", message),
                                         IsHttpLog("error", "SetCurlCallbackOpt", kOutOfMemory)));
  }
}

TEST(SendRequestByCurl, EachHeaderWithoutMemoryEndsTheRequest) {
  const int failures = ForEachFailingCall(Call::kCurlSlistAppend, [](Faults& faults) {
    ClientProbe client(80, {"a=1"});
    client.SetCookie("s=1");
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(faults.Count(Call::kCurlSlistFreeAll), 1);
    ExpectAllReleased(faults);
  });
  EXPECT_EQ(failures, 4);
}

TEST(SendRequestByCurl, TheHandleIsReleasedBeforeTheHeaderList) {
  ClientProbe client(80);
  std::string order;
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1)
      .Before(Call::kCurlEasyCleanup, [&](int) { order += "handle "; })
      .Before(Call::kCurlSlistFreeAll, [&](int) { order += "list "; });
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_EQ(order, "handle list ");
}

TEST(SendRequestByCurl, AFailedTransferIsLoggedAtDebug) {
  ClientProbe client(80);
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
  ResultOfReply(Reply("404 Not Found"));
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendRequestByCurl",
                                    "Failed to make http connection, response=404\n")));
}

TEST(SendRequestByCurl, AStatusThatCannotBeReadIsLoggedAsZero) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientProbe client(peer.Port());
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

TEST(SendRequestByCurl, BelowDebugOnlyRefusedOptionsAreLogged) {
  LogCapture log(1);
  ResultOfReply(Reply("404 Not Found"));
  EXPECT_THAT(log.Lines(), IsEmpty());
  ClientProbe client(80);
  Faults faults;
  faults.FailCurlOption(CURLOPT_SSL_VERIFYPEER, CURLE_OUT_OF_MEMORY);
  client.SendRequestByCurl(HTTP_METHOD_GET, false, 1);
  EXPECT_THAT(log.Messages(), ElementsAre(kOutOfMemory));
}

TEST(SendRequestByCurl, TheBoundariesOfSuccessAre200And299) {
  for (const char* status : {"200 x", "201 x", "204 x", "299 x"}) {
    EXPECT_EQ(ResultOfReply(Reply(status)), HTTP_RET_OK) << status;
  }
  for (const char* status : {"199 x", "300 x", "301 x", "401 x", "414 x", "500 x"}) {
    EXPECT_EQ(ResultOfReply(Reply(status)), HTTP_RET_IO_ERROR) << status;
  }
}

TEST(SendRequestByCurl, ANon2xxReplyLeavesTheStateAndKeepsTheBody) {
  ScriptedPeer peer({Exchange("HTTP/1.1 404 No\r\nContent-Length: 4\r\n\r\ngone")});
  ClientProbe client(peer.Port());
  client.m_connState = 2;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_connState, 2);
  EXPECT_EQ(client.GetCurlText(), "gone");
}

TEST(SendRequestByCurl, ACutBodyIsKeptThoughTheTransferFailed) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nhalf")});
  ClientProbe client(peer.Port());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_strCurlText, "half");
}

TEST(SendRequestByCurl, TheRequestCarriesLoginAgentHeadersAndCookie) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientSettings settings;
  settings.path = "x?y=1";
  settings.user = "u";
  settings.password = "p";
  ClientProbe client(peer.Port(), settings);
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
  ClientProbe client(peer.Port());
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "second");
  EXPECT_THAT(peer.Received(1), Not(HasSubstr("Cookie")));
  EXPECT_EQ(client.m_strCookie, "");
}

TEST(SendRequestByCurl, ANullFileSwitchesBackToMemory) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientProbe client(peer.Port());
  client.SetCurlRespFile(stdout);
  client.SetCurlRespFile(nullptr);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
}

TEST(SendRequestByCurl, TheFileIsWrittenFromItsPositionAndStaysOpen) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
  FileInMemory file;
  fputs("before|", file.Stream());
  ClientProbe client(peer.Port());
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
  ClientProbe client(peer.Port());
  client.SetCurlRespFile(file);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_IO_ERROR);
  fclose(file);
}

TEST(SendRequestByCurl, ItsTimeoutLimitsTheWholeTransfer) {
  ScriptedPeer peer({{ExpectRequest(), Send("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nhalf"),
                      DiscardUntilEnd()}});
  ClientProbe client(peer.Port());
  LogCapture log;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to make http connection, return value=28\n"));
}

TEST(SendRequestByCurl, ARefusedConnectionIsAnIoErrorWithoutADescriptorLeft) {
  const ClosedPort port;
  ClientProbe client(port.Port());
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 5);  // libcurl's own lasting descriptors
  const DescriptorGuard guard;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_IO_ERROR);
}

TEST(SendRequestByCurl, ItNeverTouchesTheSocket) {
  ScriptedPeer peer({Exchange(kOk)});
  ClientProbe client(peer.Port());
  Faults faults;
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(faults.Count(Call::kSocket) + faults.Count(Call::kConnect), 0);
  EXPECT_FALSE(client.m_pSocket->IsConnected());
  EXPECT_EQ(client.m_statusCode, 0);
}

TEST(SendRequestByCurl, EachFailingCallOfLibcurlIsAnIoErrorAndReleasesTheHandle) {
  ReplyServer server(kOk);
  for (const Call call : {Call::kCurlEasySetopt, Call::kCurlEasyPerform, Call::kCurlEasyGetinfo}) {
    for (const TW_HTTP_METHOD method : {HTTP_METHOD_GET, HTTP_METHOD_POST}) {
      const DescriptorGuard guard;
      ForEachFailingCall(call, [&](Faults& faults) {
        ClientProbe client(server.Port());
        const int result = client.SendRequestByCurl(method, false, 10);
        EXPECT_EQ(result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
        EXPECT_EQ(client.m_result, result);
        ExpectAllReleased(faults);
      });
    }
  }
}

// TLS.

TEST(SendRequestByCurlTls, ATrustedAuthorityIsVerified) {
  TlsScriptedPeer peer({Exchange(kOk)});
  const TrustedAuthority trusted(peer.CaFile());
  ClientSettings settings;
  settings.https = true;
  ClientProbe client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
  EXPECT_THAT(peer.Received(0), StartsWith("GET /a.cgi HTTP/1.1\r\n"));
}

TEST(SendRequestByCurlTls, AnUnknownAuthorityIsACertificateError) {
  TlsScriptedPeer peer({{ExpectRefusedHandshake()}});
  const SelfSignedCertificate other;
  const TrustedAuthority trusted(other.File());
  ClientSettings settings;
  settings.https = true;
  ClientProbe client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_CERT_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_CERT_ERROR);
}

TEST(SendRequestByCurlTls, AnExpiredCertificateOrAnotherHostsIsACertificateError) {
  TlsOptions options[2];
  options[0].expired = true;
  options[1].wrong_host = true;
  for (const TlsOptions& tls : options) {
    TlsScriptedPeer peer({{ExpectRefusedHandshake()}}, tls);
    const TrustedAuthority trusted(peer.CaFile());
    ClientSettings settings;
    settings.https = true;
    ClientProbe client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_CERT_ERROR);
  }
}

TEST(SendRequestByCurlTls, WithoutVerificationAnyCertificateIsTaken) {
  TlsOptions tls;
  tls.expired = tls.wrong_host = true;
  TlsScriptedPeer peer({Exchange(kOk)}, tls);
  ClientSettings settings;
  settings.https = true;
  ClientProbe client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_OK);
  EXPECT_EQ(client.m_strCurlText, "body");
}

TEST(SendRequestByCurlTls, APeerThatSpeaksNoTlsIsAnIoError) {
  ScriptedPeer peer({{ExpectBytes(1), Send("HTTP/1.1 400 No\r\n\r\n"), DiscardUntilEnd()}});
  ClientSettings settings;
  settings.https = true;
  ClientProbe client(peer.Port(), settings);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 10), HTTP_RET_IO_ERROR);
}

TEST(HttpThreads, SeparateClientsMayWorkAtTheSameTime) {
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
      ClientProbe client(peer.Port());
      EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_OK);
      EXPECT_EQ(ReadBody(client), "body");
      EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 10), HTTP_RET_OK);
      EXPECT_EQ(client.m_strCurlText, "body");
    });
  }
  for (std::thread& thread : threads) thread.join();
}
