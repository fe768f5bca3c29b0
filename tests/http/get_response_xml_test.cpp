// The documents that the XML requests collect.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/tree.h>

#include <cstdlib>

#include "tests/http/http_test_util.h"
#include "tests/http/xml_senders.h"
#include "tests/support/faults.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// Sends GETs that collect these bodies.
void Collect(ExposedClient& client, const std::vector<std::string>& bodies) {
  for (const std::string& body : bodies) {
    ScriptedPeer peer({Exchange(Response(body))});
    client.m_port = peer.Port();
    EXPECT_EQ(client.SendReqByXMLGet(7), HTTP_RET_OK);
  }
}

}  // namespace

TEST(GetResponseXML, TwoGetsInARowLeaveBothBodiesWhichTogetherAreNoDocument) {
  ExposedClient client(80);
  Collect(client, {"<a/>", "<b/>"});
  EXPECT_EQ(Collected(client), "<a/><b/>");
  xmlDoc* doc = nullptr;
  LogCapture log;
  EXPECT_FALSE(client.GetResponseXML(doc));
  EXPECT_EQ(doc, nullptr);
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  EXPECT_EQ(client.m_respLen, 0u);
  EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "GetResponseXML",
                                                 "Failed to parse response to XML\n")));
}

TEST(GetResponseXML, ASecondCallFindsNothingAndLeavesTheDocument) {
  ExposedClient client(80);
  Collect(client, {"<a>text</a>"});
  OwnedDoc response;
  LogCapture log;
  EXPECT_TRUE(client.GetResponseXML(response.doc));
  ASSERT_NE(response.doc, nullptr);
  EXPECT_STREQ(reinterpret_cast<const char*>(xmlDocGetRootElement(response.doc)->name), "a");
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  EXPECT_EQ(client.m_respLen, 0u);
  EXPECT_THAT(log.Lines(), IsEmpty());
  xmlDoc* const first = response.doc;
  EXPECT_FALSE(client.GetResponseXML(response.doc));
  EXPECT_EQ(response.doc, first);
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "GetResponseXML", "Empty xml response\n")));
}

// The collected answers.

TEST(GetResponseXML, EachSendersResponseIsCollected) {
  for (const Sender& sender : Senders()) {
    ScriptedPeer peer({Exchange(Response("<of>" + std::string(sender.name) + "</of>"))});
    ExposedClient client(peer.Port(), WithCredentials("127.0.0.1"));
    EXPECT_EQ(Send(sender, client), HTTP_RET_OK);
    OwnedDoc response;
    EXPECT_TRUE(client.GetResponseXML(response.doc));
    xmlChar* content = xmlNodeGetContent(xmlDocGetRootElement(response.doc));
    EXPECT_STREQ(reinterpret_cast<char*>(content), sender.name);
    xmlFree(content);
  }
}

TEST(GetResponseXML, AResponseOfManyPiecesIsCollectedWhole) {
  ExposedClient client(80);
  const std::string body = DocumentOf(300000);
  Collect(client, {body});
  EXPECT_TRUE(Collected(client) == body);
  OwnedDoc response;
  EXPECT_TRUE(client.GetResponseXML(response.doc));
}

TEST(GetResponseXML, ABodyThatIsNoXmlIsANullDocumentAndIsEmptied) {
  ExposedClient client(80);
  Collect(client, {"no xml"});
  OwnedDoc earlier("<e/>");
  xmlDoc* doc = earlier.doc;
  EXPECT_FALSE(client.GetResponseXML(doc));
  EXPECT_EQ(doc, nullptr);
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  Collect(client, {"<next/>"});
  EXPECT_EQ(Collected(client), "<next/>");
}

TEST(GetResponseXML, AResponseThatNobodyFetchesIsFreedWithTheClient) {
  ExposedClient client(80);
  Collect(client, {"<a/>"});
  EXPECT_EQ(Collected(client), "<a/>");
}

TEST(GetResponseXML, WithoutMemoryForTheDocumentItIsNone) {
  ExposedClient client(80);
  Collect(client, {"<a/>"});
  xmlDoc* doc = nullptr;
  {
    const NoMemoryForXml none;
    EXPECT_FALSE(client.GetResponseXML(doc));
  }
  EXPECT_EQ(doc, nullptr);
  EXPECT_EQ(client.m_pRespBuf, nullptr);
}

TEST(GetResponseXML, AfterAnAllocationFailedThereIsNothingToParse) {
  ExposedClient client(80);
  {
    Faults faults;
    faults.FailFrom(Call::kMalloc, 1).FailFrom(Call::kRealloc, 1);
    Collect(client, {"<a/>"});  // libcurl is not told
  }
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  xmlDoc* doc = nullptr;
  LogCapture log;
  EXPECT_FALSE(client.GetResponseXML(doc));
  EXPECT_THAT(log.Lines(),
              ElementsAre(IsHttpLog("debug", "GetResponseXML", "Empty xml response\n")));
}

TEST(GetResponseXML, AfterALostResponseTheNextParseSeesNoUnsetByte) {
  ExposedClient client(80);
  Collect(client, {"<a/>"});
  const std::unique_ptr<char, decltype(&free)> lost(client.m_pRespBuf, &free);
  {
    Faults faults;
    faults.FailFrom(Call::kMalloc, 1).FailFrom(Call::kRealloc, 1);
    Collect(client, {"<b/>"});
  }
  EXPECT_EQ(client.m_pRespBuf, nullptr);
  Collect(client, {"<c/>"});
  EXPECT_EQ(Collected(client), "\0\0\0\0<c/>"s);
  xmlDoc* doc = nullptr;
  EXPECT_FALSE(client.GetResponseXML(doc));
  EXPECT_EQ(doc, nullptr);
  EXPECT_EQ(client.m_respLen, 0u);
}
