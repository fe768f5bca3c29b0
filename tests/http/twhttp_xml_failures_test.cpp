// XML requests through libcurl: their outcomes and failures.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/http/http_test_util.h"
#include "tests/http/xml_senders.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

}  // namespace

// The outcome.

TEST(XmlSenders, AStatusFrom200To299IsOkAndAnyOtherALineAndAnIoError) {
  for (const Sender& sender : Senders()) {
    for (const int status : {200, 299, 300, 302, 401, 404, 500}) {
      ScriptedPeer peer({Exchange(Response("<b/>", std::to_string(status) + " x"))});
      ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
      LogCapture log;
      const bool good = status <= 299;
      EXPECT_EQ(Send(sender, client), good ? HTTP_RET_OK : HTTP_RET_IO_ERROR) << status;
      EXPECT_EQ(client.m_result, good ? HTTP_RET_OK : HTTP_RET_IO_ERROR);
      EXPECT_EQ(client.m_connState, good ? 1 : 0);
      EXPECT_EQ(Collected(client), "<b/>");
      if (good) {
        EXPECT_THAT(log.Lines(), IsEmpty());
        continue;
      }
      EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", sender.name,
                                                     "Failed to make http connection, response=" +
                                                         std::to_string(status) + "\n")));
    }
  }
}

TEST(XmlSenders, AFailedTransferIsLoggedAndAnIoErrorWhateverTheCode) {
  for (const Sender& sender : Senders()) {
    for (const int code : {7, 28, 60}) {
      const DescriptorGuard guard;
      ExposedClient client(80, WithCredentials());
      client.m_connState = 2;
      LogCapture log;
      Faults faults;
      faults.FailNth(Call::kCurlEasyPerform, 1, 0, code);
      EXPECT_EQ(Send(sender, client), HTTP_RET_IO_ERROR);
      EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
      EXPECT_EQ(client.m_connState, 2);
      EXPECT_EQ(faults.Count(Call::kCurlEasyGetinfo), 0);
      EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
      EXPECT_THAT(log.Lines(),
                  ElementsAre(IsHttpLog("debug", sender.name,
                                        "Failed to make http connection, return value=" +
                                            std::to_string(code) + "\n")));
    }
  }
}

TEST(XmlSenders, AStatusThatCannotBeReadIsLoggedAsZero) {
  for (const Sender& sender : Senders()) {
    ScriptedPeer peer({Exchange(Response("<b/>"))});
    ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
    LogCapture log;
    Faults faults;
    faults.FailNth(Call::kCurlEasyGetinfo, 1);
    EXPECT_EQ(Send(sender, client), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", sender.name,
                                                   "Failed to make http connection, "
                                                   "response=0\n")));
  }
}

TEST(XmlSenders, WithoutAHandleTheResultStaysAndALineIsLogged) {
  for (const Sender& sender : Senders()) {
    ExposedClient client(80, WithCredentials());
    client.m_result = HTTP_RET_REDIRECT;
    LogCapture log;
    Faults faults;
    faults.FailNth(Call::kCurlEasyInit, 1);
    EXPECT_EQ(Send(sender, client), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
    EXPECT_THAT(faults.CurlOptions(), IsEmpty());
    EXPECT_THAT(log.Lines(),
                ElementsAre(IsHttpLog("debug", sender.name, "Failed to initial libcurl.\n")));
  }
}

TEST(XmlSenders, WithoutMemoryForTheHeadersTheRequestEndsWithALine) {
  for (const Sender* sender : {&kPost, &kPut}) {
    for (const int nth : {1, 2}) {
      ExposedClient client(80, WithCredentials());
      LogCapture log;
      Faults faults;
      faults.FailNth(Call::kCurlSlistAppend, nth);
      EXPECT_EQ(Send(*sender, client), HTTP_RET_IO_ERROR) << sender->name;
      EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
      EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
      EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
      EXPECT_THAT(log.Lines(),
                  ElementsAre(IsHttpLog("debug", sender->name,
                                        "Failed to set custom request, return value=27\n")));
    }
  }
}

TEST(SendReqByXMLPut, WithoutATemporaryFileALineIsLogged) {
  ExposedClient client(80, WithCredentials());
  LogCapture log;
  Faults faults;
  faults.FailNth(Call::kTmpfile, 1);
  EXPECT_EQ(Send(kPut, client), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendReqByXMLPut", "Failed to fopen temp file\n")));
}

TEST(SendReqByXMLPut, ADocumentThatCannotBeWrittenIsLoggedAndTheFileClosed) {
  const DescriptorGuard guard;
  ExposedClient client(80, WithCredentials());
  FILE* full = fopen("/dev/full", "w+e");
  LogCapture log;
  Faults faults;
  faults.Return(Call::kTmpfile, 1, 1, reinterpret_cast<long>(full));
  EXPECT_EQ(Send(kPut, client), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendReqByXMLPut",
                                                 "Failed to write xml document to temp file\n")));
}

TEST(SendReqByXMLPut, TheFileIsClosedAndGoneAfterwards) {
  const DescriptorGuard guard;
  ScriptedPeer peer({Exchange(Response("<ok/>"))});
  ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
  {
    Faults faults;
    EXPECT_EQ(Send(kPut, client), HTTP_RET_OK);
    EXPECT_EQ(faults.Count(Call::kTmpfile), 1);
    EXPECT_EQ(faults.Count(Call::kFclose), 1);
  }
  peer.Finish();
}

TEST(XmlSenders, WithoutMemoryForTheDocumentsTextNothingElseIsSent) {
  for (const Sender* sender : {&kPost, &kPut}) {
    ExposedClient client(80, WithCredentials());
    OwnedDoc document("<r><a>1</a></r>");
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    int result = 0;
    {
      const NoMemoryForXml none;
      result = sender->send(client, document.doc);
    }
    EXPECT_EQ(result, HTTP_RET_IO_ERROR);
    if (faults.HasOption(CURLOPT_POSTFIELDS)) {
      EXPECT_EQ(faults.OptionGiven(CURLOPT_POSTFIELDS).text, "");
    }
  }
}

TEST(XmlSenders, BelowDebugNothingIsLogged) {
  LogCapture log(4);
  for (const Sender& sender : Senders()) {
    ExposedClient client(80, WithCredentials());
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    EXPECT_EQ(Send(sender, client), HTTP_RET_IO_ERROR);
  }
  EXPECT_THAT(log.Lines(), IsEmpty());
}
