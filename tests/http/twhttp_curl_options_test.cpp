// The options of requests through libcurl, and what follows when one is refused.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarnwick/http/curl_callbacks.h"
#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

using namespace tarnwick;

namespace {

using ::testing::ElementsAre;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";
constexpr char kOutOfMemory[] = "CURL Error(27): Out of memory\n";
constexpr auto kPut = static_cast<TW_HTTP_METHOD>(2);

}  // namespace

TEST(SendRequestByCurl, AGetSetsItsOptionsInOrder) {
  ClientSettings settings;
  settings.path = "/x?y=1";
  settings.user = "u";
  settings.password = "p";
  settings.host = "cam";
  ExposedClient client(8080, settings);
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
  ExposedClient client(8080, {"a=1&b=2"});
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
  ExposedClient client(80, {"a=1"});
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(kPut, true, 1);
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTPGET));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_POSTFIELDS).text, "a=1");
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list,
              ElementsAre(kFormHeader, "Connection: close"));
}

TEST(SendRequestByCurl, APostToAnEmptyHostHasTheUrlOfTheSchemeAlone) {
  ExposedClient client(80, {"a=1"});
  client.m_strHost = "";
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_POST, true, 1);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://");
}

TEST(SendRequestByCurl, NoVersionAndNoAuthenticationSchemeIsSet) {
  ExposedClient client(80, {"a", HTTP_VERSION_1_0});
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTP_VERSION));
  EXPECT_FALSE(faults.HasOption(CURLOPT_HTTPAUTH));
  EXPECT_FALSE(faults.HasOption(CURLOPT_SSL_VERIFYPEER));
}

TEST(SendRequestByCurl, EachRefusedOptionEndsTheRequestAsAnIoError) {
  const CURLoption options[] = {CURLOPT_TIMEOUT,   CURLOPT_USERNAME,  CURLOPT_PASSWORD,
                                CURLOPT_HTTPGET,   CURLOPT_PORT,      CURLOPT_URL,
                                CURLOPT_USERAGENT, CURLOPT_HTTPHEADER};
  for (const CURLoption option : options) {
    SCOPED_TRACE(option);
    ExposedClient client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
    ExpectHandleReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("error", "SendRequestByCurl", kOutOfMemory)));
  }
}

TEST(SendRequestByCurl, EachRefusedFileOptionAndPostFieldsToo) {
  const CURLoption options[] = {CURLOPT_HEADERFUNCTION, CURLOPT_HEADERDATA, CURLOPT_WRITEFUNCTION,
                                CURLOPT_WRITEDATA, CURLOPT_POSTFIELDS};
  for (const CURLoption option : options) {
    SCOPED_TRACE(option);
    ExposedClient client(80);
    FileInMemory file;
    client.SetCurlRespFile(file.Stream());
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_UNKNOWN_OPTION);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectHandleReleased(faults);
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
    ExposedClient client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectHandleReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SetCurlSSLOpt", message),
                                         IsHttpLog("error", "SetCurlSSLOpt", kOutOfMemory)));
  }
}

TEST(SetCurlCallbackOpt, ARefusalIsLoggedAtErrorBeforeTheErrorLine) {
  const std::pair<CURLoption, const char*> table[] = {
      {CURLOPT_WRITEFUNCTION, "Failed set CURLOPT_WRITEFUNCTION\n"},
      {CURLOPT_WRITEDATA, "Failed to CURLOPT_WRITEDATA\n"}};
  for (const auto& [option, message] : table) {
    ExposedClient client(80);
    LogCapture log;
    Faults faults;
    faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(OptionsOf(faults).back(), option);
    ExpectHandleReleased(faults);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("error", "SetCurlCallbackOpt", message),
                                         IsHttpLog("error", "SetCurlCallbackOpt", kOutOfMemory)));
  }
}

TEST(SendRequestByCurl, EachHeaderWithoutMemoryEndsTheRequest) {
  const int failures = ForEachFailingCall(Call::kCurlSlistAppend, [](Faults& faults) {
    ExposedClient client(80, {"a=1"});
    client.SetCookie("s=1");
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 1), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_EQ(faults.Count(Call::kCurlSlistFreeAll), 1);
    ExpectHandleReleased(faults);
  });
  EXPECT_EQ(failures, 4);
}

TEST(SendRequestByCurl, TheHandleIsReleasedBeforeTheHeaderList) {
  ExposedClient client(80);
  std::string order;
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1)
      .Before(Call::kCurlEasyCleanup, [&](int) { order += "handle "; })
      .Before(Call::kCurlSlistFreeAll, [&](int) { order += "list "; });
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_EQ(order, "handle list ");
}

TEST(SendRequestByCurl, BelowDebugOnlyRefusedOptionsAreLogged) {
  LogCapture log(1);
  ExposedClient client(80);
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendRequestByCurl(HTTP_METHOD_GET, true, 1);
  EXPECT_THAT(log.Lines(), ::testing::IsEmpty());
  faults.FailCurlOption(CURLOPT_SSL_VERIFYPEER, CURLE_OUT_OF_MEMORY);
  client.SendRequestByCurl(HTTP_METHOD_GET, false, 1);
  EXPECT_THAT(log.Messages(), ElementsAre(kOutOfMemory));
}

TEST(SendRequestByCurl, EachFailingCallOfLibcurlIsAnIoErrorAndReleasesTheHandle) {
  const DescriptorGuard guard;
  RepeatingPeer server(Exchange(kOk));
  for (const Call call : {Call::kCurlEasySetopt, Call::kCurlEasyPerform, Call::kCurlEasyGetinfo}) {
    for (const TW_HTTP_METHOD method : {HTTP_METHOD_GET, HTTP_METHOD_POST}) {
      ForEachFailingCall(call, [&](Faults& faults) {
        ExposedClient client(server.Port());
        const int result = client.SendRequestByCurl(method, false, 10);
        EXPECT_EQ(result, faults.Struck() ? HTTP_RET_IO_ERROR : HTTP_RET_OK);
        EXPECT_EQ(client.m_result, result);
        ExpectHandleReleased(faults);
      });
    }
  }
}
