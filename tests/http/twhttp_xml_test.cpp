// XML requests through libcurl: their options, and what reaches the server.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/tree.h>
#include <sys/resource.h>

#include <csignal>
#include <map>

#include "tarnwick/http/curl_callbacks.h"
#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/http/xml_senders.h"
#include "tests/support/faults.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

// What a sender says when an option is refused with code 27.
std::string RefusalOf(const Sender& sender, CURLoption option) {
  const std::string code = "return value=27\n";
  const bool of_delete = sender.name == std::string("SendReqByXMLDelete");
  const std::map<CURLoption, std::string> messages = {
      {CURLOPT_TIMEOUT, "Failed to set timeout, "},
      {CURLOPT_USERNAME, "Failed to set Usr=u, "},
      {CURLOPT_PASSWORD, "Failed to set Pwd=secret, "},
      {CURLOPT_URL, "Failed to set url=http://h:80/x/y?z, "},
      {CURLOPT_HTTPAUTH, "Failed to set auth, "},
      {CURLOPT_HTTPHEADER, "Failed to set custom request, "},
      {CURLOPT_POSTFIELDS, "Failed to set POST field, "},
      {CURLOPT_READFUNCTION, "Failed to set READFUNCTION, "},
      {CURLOPT_WRITEFUNCTION, "Failed to set WRITEFUNCTION, "},
      {CURLOPT_UPLOAD, "Failed to set upload=1, "},
      {kPutOption, "Failed to set put=1, "},
      {CURLOPT_READDATA, "Failed to set file, "},
      {CURLOPT_INFILESIZE_LARGE, "Failed to set file size, "},
      {CURLOPT_CUSTOMREQUEST, "Failed to setopt, "},
      {CURLOPT_WRITEDATA, of_delete ? "Failed to set WRITEDATA, " : "Failed to set file, "}};
  return messages.at(option) + code;
}

// What a peer that answers with `response` receives.
std::string RequestOf(const Sender& sender, const std::string& response = Response("<ok/>")) {
  ScriptedPeer peer({Exchange(response)});
  ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
  EXPECT_EQ(Send(sender, client), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_OK);
  EXPECT_EQ(client.m_connState, 1);
  return peer.Received(0);
}

// The fields of a POST whose document has this text.
std::string PostFieldsOf(const std::string& text) {
  ExposedClient client(80, WithCredentials());
  OwnedDoc document(text);
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendReqByXMLPost(document.doc);
  return faults.OptionGiven(CURLOPT_POSTFIELDS).text;
}

}  // namespace

TEST(XmlSenders, WithAnEmptyHostTheUrlIsTheSchemeAlone) {
  for (const Sender& sender : Senders()) {
    ExposedClient client(80, WithCredentials(""));
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    Send(sender, client);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://") << sender.name;
  }
}

TEST(SendReqByXMLPost, WithANullDocumentNoHandleIsMadeAndTheResultStays) {
  ExposedClient client(80);
  client.m_result = HTTP_RET_REDIRECT;
  xmlDoc* none = nullptr;
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendReqByXMLPost(none), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_REDIRECT);
  EXPECT_EQ(faults.Count(Call::kCurlEasyInit), 0);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendReqByXMLPost", "Empty xml document\n")));
}

TEST(SendReqByXMLPut, WithANullDocumentEveryOptionIsSetBeforeTheErrorIsStored) {
  ExposedClient client(80);
  client.m_result = HTTP_RET_REDIRECT;
  xmlDoc* none = nullptr;
  LogCapture log;
  Faults faults;
  EXPECT_EQ(client.SendReqByXMLPut(none), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
  EXPECT_THAT(OptionsOf(faults), ElementsAreArray(kPut.options.data(), 8));
  EXPECT_EQ(faults.OptionGiven(kPutOption).number, 1);
  EXPECT_EQ(faults.Count(Call::kTmpfile), 0);
  EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
  EXPECT_EQ(faults.Count(Call::kCurlSlistFreeAll), 1);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "SendReqByXMLPut", "Empty XML document\n")));
}

TEST(SendReqByXMLPost, OfADocumentOf10000BytesTheFirst8191AreSent) {
  const std::string text = DocumentOf(10000);
  ScriptedPeer peer({Exchange(Response("<ok/>"))});
  ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
  OwnedDoc document(text);
  EXPECT_EQ(client.SendReqByXMLPost(document.doc), HTTP_RET_OK);
  const std::string request = peer.Received(0);
  EXPECT_THAT(request, HasSubstr("\r\nContent-Length: 8191\r\n"));
  EXPECT_EQ(request.substr(request.find("\r\n\r\n") + 4), text.substr(0, 8191));
}

TEST(XmlSenders, A204WithoutABodyIsSuccessAndNothingToParse) {
  for (const Sender& sender : Senders()) {
    ScriptedPeer peer({Exchange("HTTP/1.1 204 No Content\r\n\r\n")});
    ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
    EXPECT_EQ(Send(sender, client), HTTP_RET_OK) << sender.name;
    xmlDoc* doc = nullptr;
    EXPECT_FALSE(client.GetResponseXML(doc));
  }
}

// The options.

TEST(XmlSenders, TheOptionsAreSetInOrder) {
  for (const Sender& sender : Senders()) {
    ExposedClient client(80, WithCredentials());
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    Send(sender, client);
    EXPECT_THAT(OptionsOf(faults), ElementsAreArray(sender.options)) << sender.name;
  }
}

TEST(XmlSenders, CredentialsUrlAndCollectionAreTheSameForAll) {
  for (const Sender& sender : Senders()) {
    ClientSettings settings = WithCredentials();
    settings.https = true;  // is ignored here
    settings.version = HTTP_VERSION_1_0;
    ExposedClient client(443, settings);
    Faults faults;
    faults.FailFrom(Call::kCurlEasyPerform, 1);
    Send(sender, client);
    EXPECT_EQ(faults.OptionGiven(CURLOPT_URL).text, "http://h:443/x/y?z");
    EXPECT_EQ(faults.OptionGiven(CURLOPT_USERNAME).text, "u");
    EXPECT_EQ(faults.OptionGiven(CURLOPT_PASSWORD).text, "secret");
    EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEFUNCTION).pointer,
              reinterpret_cast<const void*>(&CurlBufferWrite));
    EXPECT_EQ(faults.OptionGiven(CURLOPT_WRITEDATA).pointer, &client.m_pRespBuf);
    EXPECT_FALSE(faults.HasOption(CURLOPT_HTTP_VERSION));
  }
}

TEST(SendReqByXMLGet, TheTimeoutAndBothSchemesAreSet) {
  ExposedClient client(80, WithCredentials());
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendReqByXMLGet(7);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_TIMEOUT).number, 7);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_HTTPAUTH).number, 3);
}

TEST(SendReqByXMLPost, TheDocumentIsHandedOnIndentedWithTwoHeaders) {
  ExposedClient client(80, WithCredentials());
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  Send(kPost, client);
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list, ElementsAre("Accept: */*", kType));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_POSTFIELDS).text,
            "<?xml version=\"1.0\"?>\n<r>\n  <a>1</a>\n</r>\n");
}

TEST(SendReqByXMLPost, DocumentsAroundTheLimitAreSentWholeOrCutAt8191) {
  for (const size_t size : {8190, 8191, 8192, 8193}) {
    const std::string text = DocumentOf(size);
    EXPECT_EQ(PostFieldsOf(text), text.substr(0, 8191)) << size;
  }
}

TEST(SendReqByXMLPut, TheFileHoldsTheDocumentAndItsSizeIsHandedOn) {
  ExposedClient client(80, WithCredentials());
  std::string content;
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1).Before(Call::kCurlEasyPerform, [&](int) {
    const auto* file = faults.OptionGiven(CURLOPT_READDATA).pointer;
    char buf[256];
    const size_t n = CurlFileRead(buf, 1, sizeof(buf), const_cast<void*>(file));
    content.assign(buf, n);
  });
  Send(kPut, client);
  EXPECT_EQ(content, "<?xml version=\"1.0\"?>\n<r><a>1</a></r>\n");
  EXPECT_EQ(faults.OptionGiven(CURLOPT_INFILESIZE_LARGE).number, long(content.size()));
  EXPECT_EQ(faults.OptionGiven(CURLOPT_UPLOAD).number, 1);
  EXPECT_EQ(faults.OptionGiven(kPutOption).number, 1);
  EXPECT_EQ(faults.OptionGiven(CURLOPT_READFUNCTION).pointer,
            reinterpret_cast<const void*>(&CurlFileRead));
  EXPECT_THAT(faults.OptionGiven(CURLOPT_HTTPHEADER).list,
              ElementsAre("Accept: */*", kType, "Expect:"));
}

TEST(SendReqByXMLDelete, TheMethodIsHandedOn) {
  ExposedClient client(80, WithCredentials());
  Faults faults;
  faults.FailFrom(Call::kCurlEasyPerform, 1);
  client.SendReqByXMLDelete();
  EXPECT_EQ(faults.OptionGiven(CURLOPT_CUSTOMREQUEST).text, "DELETE");
}

TEST(XmlSenders, EachRefusedOptionHasItsLineAndEndsTheRequest) {
  for (const Sender& sender : Senders()) {
    for (const CURLoption option : sender.options) {
      const DescriptorGuard guard;
      ExposedClient client(80, WithCredentials());
      LogCapture log;
      Faults faults;
      faults.FailCurlOption(option, CURLE_OUT_OF_MEMORY);
      EXPECT_EQ(Send(sender, client), HTTP_RET_IO_ERROR);
      EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
      EXPECT_EQ(client.m_connState, 0);
      EXPECT_EQ(faults.CurlOptions().back().option, option);
      EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
      EXPECT_EQ(faults.Count(Call::kCurlEasyCleanup), 1);
      EXPECT_TRUE(faults.Count(Call::kCurlSlistFreeAll) == 1 ||
                  !faults.HasOption(CURLOPT_HTTPHEADER));
      EXPECT_THAT(log.Lines(),
                  ElementsAre(IsHttpLog("debug", sender.name, RefusalOf(sender, option))));
    }
  }
}

// The requests on the wire.

TEST(SendReqByXMLGet, TheFirstRequestHasNoCredentials) {
  EXPECT_THAT(RequestOf(kGet), AllOf(StartsWith("GET /x/y?z HTTP/1.1\r\nHost: 127.0.0.1:"),
                                     EndsWith("\r\nAccept: */*\r\n\r\n"),
                                     Not(HasSubstr("Authorization")), Not(HasSubstr("Tarnwick"))));
}

TEST(SendReqByXMLPost, TheRequestCarriesTheCredentialsTheTypeAndTheDocument) {
  EXPECT_THAT(RequestOf(kPost),
              AllOf(StartsWith("POST /x/y?z HTTP/1.1\r\nHost: 127.0.0.1:"),
                    HasSubstr("\r\nAuthorization: Basic dTpzZWNyZXQ=\r\n"),
                    HasSubstr("\r\nAccept: */*\r\n"), HasSubstr("\r\n" + std::string(kType)),
                    EndsWith("\r\n\r\n<?xml version=\"1.0\"?>\n<r>\n  <a>1</a>\n</r>\n")));
}

TEST(SendReqByXMLPut, TheRequestCarriesTheDocumentUnindentedAndWaitsForNothing) {
  EXPECT_THAT(RequestOf(kPut),
              AllOf(StartsWith("PUT /x/y?z HTTP/1.1\r\nHost: 127.0.0.1:"),
                    HasSubstr("\r\nAuthorization: Basic dTpzZWNyZXQ=\r\n"),
                    HasSubstr("\r\nContent-Length: 38\r\n"), HasSubstr("\r\n" + std::string(kType)),
                    Not(HasSubstr("Expect")),
                    EndsWith("\r\n\r\n<?xml version=\"1.0\"?>\n<r><a>1</a></r>\n")));
}

TEST(SendReqByXMLDelete, TheRequestHasNoBody) {
  EXPECT_THAT(RequestOf(kDelete), AllOf(StartsWith("DELETE /x/y?z HTTP/1.1\r\nHost: 127.0.0.1:"),
                                        HasSubstr("\r\nAuthorization: Basic dTpzZWNyZXQ=\r\n"),
                                        Not(HasSubstr("Content-")), EndsWith("\r\n\r\n")));
}

TEST(SendReqByXMLPut, ADocumentOfSeveralMebibytesIsSentWhole) {
  ScriptedPeer peer({Exchange(Response("<ok/>"))});
  ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
  const std::string text = DocumentOf(3 << 20);
  OwnedDoc document(text);
  EXPECT_EQ(client.SendReqByXMLPut(document.doc), HTTP_RET_OK);
  const std::string request = peer.Received(0);
  EXPECT_TRUE(request.substr(request.find("\r\n\r\n") + 4) == text);
}

TEST(SendReqByXMLPut, ADocumentThatTheDiskDoesNotTakeIsNotSent) {
  ScriptedPeer peer({});  // a connection would fail the test
  const ChildResult child = RunInChild([&] {
    const rlimit nothing = {0, 0};
    setrlimit(RLIMIT_FSIZE, &nothing);
    signal(SIGXFSZ, SIG_IGN);
    ExposedClient client(peer.Port());
    OwnedDoc document("<r/>");
    return client.SendReqByXMLPut(document.doc);
  });
  EXPECT_EQ(child.code, HTTP_RET_IO_ERROR);
}

TEST(SendReqByXMLGet, AChallengeOfDigestOrBasicIsAnswered) {
  const std::pair<const char*, const char*> table[] = {
      {"Digest realm=\"r\", nonce=\"n\", qop=\"auth\"", "\r\nAuthorization: Digest username=\"u\""},
      {"Basic realm=\"r\"", "\r\nAuthorization: Basic dTpzZWNyZXQ=\r\n"}};
  for (const auto& [challenge, authorization] : table) {
    ScriptedPeer peer({Exchange("HTTP/1.1 401 No\r\nConnection: close\r\nWWW-Authenticate: "s +
                                challenge + "\r\nContent-Length: 0\r\n\r\n"),
                       Exchange(Response("<ok/>"))});
    ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
    EXPECT_EQ(client.SendReqByXMLGet(7), HTTP_RET_OK);
    EXPECT_THAT(peer.Received(1), HasSubstr(authorization));
    EXPECT_EQ(Collected(client), "<ok/>");
  }
}

TEST(SendReqByXMLGet, TheTimeoutEndsATransferThatStalls) {
  ScriptedPeer peer({{ExpectRequest(), StallUntilFinish()}});
  ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
  LogCapture log;
  EXPECT_EQ(client.SendReqByXMLGet(1), HTTP_RET_IO_ERROR);
  EXPECT_THAT(log.Messages(), ElementsAre("Failed to make http connection, return value=28\n"));
}

TEST(XmlSenders, TheDocumentIsOnlyRead) {
  for (const Sender* sender : {&kPost, &kPut}) {
    ScriptedPeer peer({Exchange(Response("<ok/>"))});
    ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
    OwnedDoc document("<r><a>1</a></r>");
    xmlDoc* doc = document.doc;
    EXPECT_EQ(sender->send(client, doc), HTTP_RET_OK);
    EXPECT_EQ(doc, document.doc);
    xmlChar* text = nullptr;
    int length = 0;
    xmlDocDumpMemory(doc, &text, &length);
    EXPECT_STREQ(reinterpret_cast<char*>(text), "<?xml version=\"1.0\"?>\n<r><a>1</a></r>\n");
    xmlFree(text);
  }
}
