// The SOAP POST whose response is an XML document.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/tree.h>

#include "tests/http/http_test_util.h"
#include "tests/http/soap_test_util.h"

namespace {

using ::testing::IsEmpty;

// A document that is freed at the end.
struct OwnedDoc {
  ~OwnedDoc() { xmlFreeDoc(doc); }
  std::string Text() const {
    xmlChar* content = xmlNodeGetContent(xmlDocGetRootElement(doc));
    const std::string text = reinterpret_cast<const char*>(content);
    xmlFree(content);
    return text;
  }
  xmlDoc* doc = nullptr;
};

// The text of the document that a response's body returns; "(null)" for no document.
std::string XmlTextOf(const std::string& body) {
  ScriptedPeer peer({Exchange(Soap(body))});
  ExposedClient client(peer.Port());
  OwnedDoc response;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", response.doc), HTTP_RET_OK);
  return response.doc != nullptr ? response.Text() : "(null)";
}

}  // namespace

TEST(SendReqByXMLSocketPost, ABodyThatIsNoXmlIsANullDocumentAndOk) {
  ScriptedPeer peer({Exchange(Soap("<a>no end"))});
  ExposedClient client(peer.Port());
  OwnedDoc earlier;
  earlier.doc = xmlNewDoc(BAD_CAST "1.0");
  xmlDoc* doc = earlier.doc;  // overwritten, not freed
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", doc), HTTP_RET_OK);
  EXPECT_EQ(doc, nullptr);
}

TEST(SendReqByXMLSocketPost, TextOfTwoLinesIsJoinedWithNothingBetween) {
  EXPECT_EQ(XmlTextOf("<a>one\r\ntwo</a>"), "onetwo");
}

// The XML response.

TEST(SendReqByXMLSocketPost, CarriageReturnsAndLineFeedsAreRemovedEverywhere) {
  EXPECT_EQ(XmlTextOf("\n\r<?xml version=\"1.0\"?>\r\n<a\n>\rone\n\ntwo \r\n three</a>\n"),
            "onetwo  three");
}

TEST(SendReqByXMLSocketPost, AFaultWithStatus500IsADocument) {
  ScriptedPeer peer({Exchange(Soap("<fault>f</fault>", "500 Oops"))});
  ExposedClient client(peer.Port());
  OwnedDoc response;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", response.doc), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_BAD_RESPONSE);
  ASSERT_NE(response.doc, nullptr);
  EXPECT_EQ(response.Text(), "f");
  EXPECT_EQ(peer.Received(0), RequestText("", "x"));
}

TEST(SendReqByXMLSocketPost, AFailureLeavesTheDocument) {
  const ClosedPort port;
  ExposedClient client(port.Port());
  OwnedDoc earlier;
  earlier.doc = xmlNewDoc(BAD_CAST "1.0");
  xmlDoc* doc = earlier.doc;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", doc), HTTP_RET_IO_ERROR);
  EXPECT_EQ(doc, earlier.doc);
  EXPECT_EQ(client.SendReqByXMLSocketPost("", doc), HTTP_RET_IO_ERROR);
  EXPECT_EQ(doc, earlier.doc);
}

TEST(SendReqByXMLSocketPost, A401IsNotAnswered) {
  ScriptedPeer peer({Exchange(Unauthorized(kDigest, "<no/>"))});
  ExposedClient client(peer.Port(), WithCredentials());
  OwnedDoc response;
  EXPECT_EQ(client.SendReqByXMLSocketPost("x", response.doc), HTTP_RET_OK);
  EXPECT_EQ(client.m_result, HTTP_RET_UNAUTHORIZED);
  EXPECT_NE(response.doc, nullptr);
  peer.Finish();
  EXPECT_EQ(peer.Connections(), 1u);
}

TEST(SendReqByXMLSocketPost, ABodyOfCrAndLfAloneIsNoDocument) {
  EXPECT_EQ(XmlTextOf("\r\n\r\n"), "(null)");
}

TEST(SendReqByXMLSocketPost, SixteenMebibytesOfShortLinesAreJoined) {
  const std::string line(48, 'x');
  std::string lines;
  while (lines.size() < 4 * kMebibyte) lines += line + "\r\n";
  const std::string body =
      "<r><a>" + lines + "</a><a>" + lines + "</a><a>" + lines + "</a><a>" + lines + "</a></r>";
  const std::string text = XmlTextOf(body);
  EXPECT_EQ(text.size(), 4 * (lines.size() / 50) * 48);
  EXPECT_EQ(text.find_first_not_of('x'), std::string::npos);
}

TEST(SendReqByXMLSocketPost, ItLogsNothingOfItsOwn) {
  LogCapture log;
  log.SetLevel(kHttpCategory, 6);
  XmlTextOf("no document");
  EXPECT_THAT(log.Lines("http"), IsEmpty());
}
