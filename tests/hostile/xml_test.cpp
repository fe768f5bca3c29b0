// Servers whose XML is meant to open files, to reach other hosts, to fill memory or to break the
// parser: in SOAP responses, of which CR and LF are removed first, and in responses to XML requests.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/hostile/xml_canaries.h"

namespace {

void SayNothing(void*, const char*, ...) {}

enum class Parsed { kByBoth, kByNone, kByRestAlone, kBySoapAlone };

// Copies share the bytes: a table of tests is copied many times.
class SharedText {
 public:
  SharedText(std::string text) : text_(std::make_shared<const std::string>(std::move(text))) {}
  SharedText(const char* text) : SharedText(std::string(text)) {}
  const std::string& Text() const { return *text_; }

 private:
  std::shared_ptr<const std::string> text_;
};

struct XmlCase {
  std::string name;
  SharedText document;
  Parsed parsed;
  SharedText text = "";     // of the root, entities unresolved; of the ways that parse it
  size_t memory = 1 << 20;  // that libxml2 may hold beside ten times the document
};

std::ostream& operator<<(std::ostream& out, const XmlCase& test) {
  return out << test.name;
}

std::string Nested(int levels, const std::string& inside = "") {
  return Repeated(levels, "<a>") + inside + Repeated(levels, "</a>");
}

std::string WithDtd(const std::string& subset, const std::string& root) {
  return "<?xml version=\"1.0\"?><!DOCTYPE a [" + subset + "]>" + root;
}

// Entities of which each stands for ten of the one before.
std::string Laughs(int levels) {
  std::string subset = "<!ENTITY l0 'lol'>";
  for (int i = 1; i <= levels; ++i) {
    subset += "<!ENTITY l" + std::to_string(i) + " '" +
              Repeated(10, "&l" + std::to_string(i - 1) + ";") + "'>";
  }
  return subset;
}

std::string ParameterLaughs(int levels, const std::string& laugh) {
  std::string subset = "<!ENTITY % p0 '" + laugh + "'>";
  for (int i = 1; i <= levels; ++i) {
    subset += "<!ENTITY % p" + std::to_string(i) + " '" +
              Repeated(10, "&#37;p" + std::to_string(i - 1) + ";") + "'>";
  }
  return subset + "%p" + std::to_string(levels) + ";";
}

std::string Chain(int levels) {
  std::string subset = "<!ENTITY c0 'x'>";
  for (int i = 1; i <= levels; ++i) {
    subset += "<!ENTITY c" + std::to_string(i) + " '<b>&c" + std::to_string(i - 1) + ";</b>'>";
  }
  return subset;
}

const std::string kBig(100000, 'q');

std::vector<XmlCase> EntityTable() {
  return {
      {"BillionLaughs", WithDtd(Laughs(9), "<a>&l9;</a>"), Parsed::kByNone},
      {"LaughsOf30Levels", WithDtd(Laughs(30), "<a>&l30;</a>"), Parsed::kByNone},
      {"BillionLaughsInAnAttribute", WithDtd(Laughs(9), "<a x='&l9;'/>"), Parsed::kByNone},
      {"BillionLaughsInADefault", WithDtd(Laughs(9) + "<!ATTLIST a x CDATA '&l9;'>", "<a/>"),
       Parsed::kByNone},
      {"LaughsOfParameters", WithDtd(ParameterLaughs(9, "lol"), "<a/>"), Parsed::kByNone},
      {"LaughsOfEmptyParameters", WithDtd(ParameterLaughs(9, ""), "<a/>"), Parsed::kByNone},
      {"LaughsOfParametersOfBlanks", WithDtd(ParameterLaughs(5, " "), "<a/>"), Parsed::kByNone},
      {"LaughsOfParametersOfComments", WithDtd(ParameterLaughs(6, "<!---->"), "<a/>"),
       Parsed::kByNone},
      {"LaughsOfParametersOfElements", WithDtd(ParameterLaughs(6, "<!ELEMENT b ANY>"), "<a/>"),
       Parsed::kByNone},
      {"LaughsOfParametersInAnEntity",
       WithDtd(ParameterLaughs(0, "") + "<!ENTITY % q '&#37;p0;'><!ENTITY e '%q;'>", "<a>&e;</a>"),
       Parsed::kByNone},
      {"BillionLaughsInAParameter",
       WithDtd(Laughs(9) + "<!ENTITY % e \"<!ATTLIST a x CDATA '&#38;l9;'>  \">%e; %e;", "<a/>"),
       Parsed::kByNone},
      {"TenThousandEmptyParameters", WithDtd("<!ENTITY % e ''>" + Repeated(10000, "%e;"), "<a/>"),
       Parsed::kByBoth},
      {"QuadraticBlowUp",
       WithDtd("<!ENTITY q '" + kBig + "'>", "<a>" + Repeated(1000, "&q;") + "</a>"),
       Parsed::kByBoth},
      {"QuadraticBlowUpInAnAttribute",
       WithDtd("<!ENTITY q '" + kBig + "'>", "<a x='" + Repeated(1000, "&q;") + "'/>"),
       Parsed::kByBoth},
      {"QuadraticBlowUpInAttributes",
       WithDtd("<!ENTITY q '" + kBig + "'>", "<a>" + Repeated(1000, "<b x='&q;'/>") + "</a>"),
       Parsed::kByBoth},
      {"AChainOf10Entities", WithDtd(Chain(10), "<a>&c10;</a>"), Parsed::kByBoth},
      {"AChainOf30Entities", WithDtd(Chain(30), "<a>&c30;</a>"), Parsed::kByNone},
      {"AChainOf10000Entities", WithDtd(Chain(10000), "<a>&c10000;</a>"), Parsed::kByNone, "",
       4 << 20},
      {"AnEntityOfItself", WithDtd("<!ENTITY e '&e;'>", "<a>&e;</a>"), Parsed::kByNone},
      {"EntitiesOfEachOther", WithDtd("<!ENTITY e '&f;'><!ENTITY f '&e;'>", "<a>&e;</a>"),
       Parsed::kByNone},
      {"AParameterOfItself", WithDtd("<!ENTITY % e '%e;'>%e;", "<a/>"), Parsed::kByNone},
      {"AnUnknownEntity", "<a>&nobody;</a>", Parsed::kByNone},
      {"AnEntityWithoutItsSemicolon", "<a>&lt</a>", Parsed::kByNone},
      {"AnEntityOfHalfAnElement", WithDtd("<!ENTITY e '<b>'>", "<a>&e;</b></a>"), Parsed::kByNone},
      {"CharacterZero", "<a>&#0;</a>", Parsed::kByNone},
      {"CharacterBeyondAll", "<a>&#x110000;</a>", Parsed::kByNone},
      {"CharacterOfADigitStorm", "<a>&#" + std::string(100000, '9') + ";</a>", Parsed::kByNone},
      {"ATenThousandCharacterReferences", "<a>" + Repeated(10000, "&#65;") + "</a>",
       Parsed::kByBoth, std::string(10000, 'A')},
      {"PredefinedEntities", "<a>&lt;&amp;&gt;&quot;&apos;</a>", Parsed::kByBoth, "<&>\"'"},
  };
}

// No file is opened for any of these, and no connection made.
std::vector<XmlCase> ExternalTable() {
  return {
      {"EntityOfAFile", WithDtd("<!ENTITY e SYSTEM 'FILE'>", "<a>&e;</a>"), Parsed::kByBoth},
      {"EntityOfAPath", WithDtd("<!ENTITY e SYSTEM 'PATH'>", "<a>&e;</a>"), Parsed::kByBoth},
      {"EntityOfAUrl", WithDtd("<!ENTITY e SYSTEM 'URL'>", "<a>&e;</a>"), Parsed::kByBoth},
      {"EntityOfAPublicName", WithDtd("<!ENTITY e PUBLIC 'p' 'URL'>", "<a>&e;</a>"),
       Parsed::kByBoth},
      {"EntityOfAFileInAnAttribute", WithDtd("<!ENTITY e SYSTEM 'FILE'>", "<a x='&e;'/>"),
       Parsed::kByNone},
      {"EntityOfAUrlInAnEntity", WithDtd("<!ENTITY e SYSTEM 'URL'><!ENTITY f '&e;'>", "<a>&f;</a>"),
       Parsed::kByBoth},
      {"EntityOfAnUnparsedFile",
       WithDtd("<!NOTATION n SYSTEM 'URL'><!ENTITY e SYSTEM 'FILE' NDATA n>"
               "<!ATTLIST a x ENTITY #IMPLIED>",
               "<a x='e'/>"),
       Parsed::kByBoth},
      {"DtdOfAFile", "<!DOCTYPE a SYSTEM 'FILE'><a/>", Parsed::kByBoth},
      {"DtdOfAUrl", "<!DOCTYPE a SYSTEM 'URL'><a/>", Parsed::kByBoth},
      {"DtdOfAPublicName", "<!DOCTYPE a PUBLIC '-//X//DTD Y//EN' 'URL'><a/>", Parsed::kByBoth},
      {"DtdOfAUrlThatStandsAlone",
       "<?xml version='1.0' standalone='no'?><!DOCTYPE a SYSTEM 'URL'><a>&canary;</a>",
       Parsed::kByBoth},
      {"ParameterOfAFile", WithDtd("<!ENTITY % e SYSTEM 'FILE'>%e;", "<a/>"), Parsed::kByBoth},
      {"ParameterOfAUrl", WithDtd("<!ENTITY % e SYSTEM 'URL'>%e;", "<a/>"), Parsed::kByBoth},
      {"ParameterThatCarriesAFileAway",
       WithDtd("<!ENTITY % f SYSTEM 'FILE'><!ENTITY % e \"<!ENTITY &#37; s SYSTEM 'URL?%f;'>\">"
               "%e;%s;",
               "<a/>"),
       Parsed::kByNone},
      {"XIncludeOfAFile",
       "<a xmlns:xi='http://www.w3.org/2001/XInclude'><xi:include href='FILE' parse='text'/></a>",
       Parsed::kByBoth},
      {"XIncludeOfAUrl",
       "<a xmlns:xi='http://www.w3.org/2001/XInclude'><xi:include href='URL'/></a>",
       Parsed::kByBoth},
      {"SchemaLocation",
       "<a xmlns:xsi='http://www.w3.org/2001/XMLSchema-instance' "
       "xsi:noNamespaceSchemaLocation='URL'/>",
       Parsed::kByBoth},
      {"StyleSheet", "<?xml-stylesheet type='text/xsl' href='URL'?><a/>", Parsed::kByBoth},
      {"Catalogue", "<?oasis-xml-catalog catalog='FILE'?><!DOCTYPE a SYSTEM 'x.dtd'><a/>",
       Parsed::kByBoth},
      {"BaseOfAUrl", "<a xml:base='URL'><b href='x'/></a>", Parsed::kByBoth},
      {"NamespaceOfAUrl", "<a xmlns='URL'/>", Parsed::kByBoth},
  };
}

std::vector<XmlCase> SizeTable() {
  constexpr size_t kMegabyte = 1 << 20;
  const std::string long_text(9 * kMegabyte, 't');
  std::string attributes;
  for (int i = 0; i < 5000; ++i) attributes += " a" + std::to_string(i) + "='v'";
  return {
      {"250Levels", Nested(250, "x"), Parsed::kByBoth, "x"},
      {"300Levels", Nested(300), Parsed::kByNone},
      {"100000Levels", Nested(100000), Parsed::kByNone},
      {"100000OpenElements", Repeated(100000, "<a>"), Parsed::kByNone},
      {"100000ClosedElements", Repeated(100000, "</a>"), Parsed::kByNone},
      {"100000OpenParentheses", WithDtd("<!ELEMENT a " + Repeated(100000, "("), "<a/>"),
       Parsed::kByNone},
      {"100000Brothers", "<r>" + Repeated(100000, "<a/>") + "</r>", Parsed::kByBoth, "",
       32 * kMegabyte},
      {"100000CommentsBeforeTheRoot", Repeated(100000, "<!---->") + "<a/>", Parsed::kByBoth, "",
       32 * kMegabyte},
      {"AnAttributeOf64KB", "<a x='" + std::string(65536, 'v') + "'/>", Parsed::kByBoth},
      {"AnAttributeOf9MB", "<a x='" + long_text + "'/>", Parsed::kByBoth},
      {"AnAttributeOf11MB", "<a x='" + std::string(11 * kMegabyte, 'v') + "'/>", Parsed::kByNone},
      {"5000Attributes", "<a" + attributes + "/>", Parsed::kByBoth, "", 4 * kMegabyte},
      {"AnAttributeTwice", "<a x='1' x='2'/>", Parsed::kByNone},
      {"ANameOf40000Bytes", "<" + std::string(40000, 'n') + "/>", Parsed::kByBoth},
      {"ANameOf60000Bytes", "<" + std::string(60000, 'n') + "/>", Parsed::kByNone},
      {"ATextOf9MB", "<a>" + long_text + "</a>", Parsed::kByBoth, long_text},
      {"ATextOf11MB", "<a>" + std::string(11 * kMegabyte, 't') + "</a>", Parsed::kByBoth},
      {"ACommentOf11MB", "<!--" + std::string(11 * kMegabyte, 'c') + "--><a/>", Parsed::kByNone},
      {"ACdataOf11MB", "<a><![CDATA[" + std::string(11 * kMegabyte, 'd') + "]]></a>",
       Parsed::kByNone},
      {"AnInstructionOf11MB", "<?i " + std::string(11 * kMegabyte, 'i') + "?><a/>",
       Parsed::kByNone},
      {"A1MBOfLineEnds", "<a>" + Repeated(1 << 19, "\r\n") + "</a>", Parsed::kByBoth, ""},
      // Each element gets a copy of the name: what the server announces, the daemon pays for.
      {"500DefaultNamespacesOf40KB",
       WithDtd("<!ATTLIST a xmlns CDATA 'u:" + std::string(40000, 'n') + "'>",
               "<r>" + Repeated(500, "<a/>") + "</r>"),
       Parsed::kByBoth, "", 500 * 41000},
  };
}

std::vector<XmlCase> ShapeTable() {
  const std::string zero(1, '\0');
  const std::string sound = "<?xml version=\"1.0\" encoding=\"UTF-8\"?><a b=\"c\"><d>e</d></a>";
  return {
      {"Sound", sound, Parsed::kByBoth, "e"},
      {"TextOverLines", "<a>b\r\nc\nd</a>", Parsed::kByBoth},
      {"ATagOverLines", "<a\nb='c'/>", Parsed::kByRestAlone},
      {"NoXml", "Hello", Parsed::kByNone},
      {"Html", "<html><body><br></body></html>", Parsed::kByNone},
      {"Json", "{\"a\":1}", Parsed::kByNone},
      {"Blanks", "      ", Parsed::kByNone},
      {"OneByte", "<", Parsed::kByNone},
      {"OnlyADeclaration", "<?xml version=\"1.0\"?>", Parsed::kByNone},
      {"OnlyADtd", "<!DOCTYPE a>", Parsed::kByNone},
      {"TwoRoots", "<a/><b/>", Parsed::kByNone},
      {"TextAfterTheRoot", "<a/>b", Parsed::kByNone},
      {"TextBeforeTheRoot", "b<a/>", Parsed::kByNone},
      {"BlanksBeforeTheDeclaration", " " + sound, Parsed::kByNone},
      {"ALineEndBeforeTheDeclaration", "\r\n" + sound, Parsed::kBySoapAlone, "e"},
      {"TwoDeclarations", "<?xml version=\"1.0\"?>" + sound, Parsed::kByNone},
      {"ElementsThatCross", "<a><b></a></b>", Parsed::kByNone},
      {"NoQuotes", "<a b=c/>", Parsed::kByNone},
      {"ATagInATag", "<a<b>>", Parsed::kByNone},
      {"CdataThatDoesNotEnd", "<a><![CDATA[</a>", Parsed::kByNone},
      {"ACommentInAComment", "<a><!-- <!-- --> --></a>", Parsed::kByNone},
      {"AnUnknownPrefix", "<x:a/>", Parsed::kByBoth},
      {"AnEmptyNamespacePrefix", "<a xmlns:x=''/>", Parsed::kByBoth},
      {"ThePrefixXmlns", "<a xmlns:xmlns='u'/>", Parsed::kByBoth},
      {"ThePrefixXmlOfAnother", "<a xmlns:xml='u'/>", Parsed::kByBoth},
      {"TwoPrefixesOfOneAttribute", "<a xmlns:x='u' xmlns:y='u' x:b='1' y:b='2'/>",
       Parsed::kByBoth},
      {"ColonsAlone", "<:/>", Parsed::kByBoth},
      {"ManyColons", "<a:b:c:d/>", Parsed::kByBoth},
      {"AZeroByteInTheText", "<a>b" + zero + "c</a>", Parsed::kByNone},
      {"AZeroByteAfterTheRoot", "<a/>" + zero, Parsed::kByBoth},
      {"AZeroByteAlone", zero, Parsed::kByNone},
      {"ControlBytes", "<a>\x01\x1b</a>", Parsed::kByNone},
      {"BytesOfNoEncoding", "<a>\xff\xfe\xfd</a>", Parsed::kByNone},
      {"OverlongUtf8", "<a>\xc0\xaf</a>", Parsed::kByNone},
      {"SurrogatesInUtf8", "<a>\xed\xa0\x80</a>", Parsed::kByNone},
      {"CutUtf8", "<a>\xe2\x82", Parsed::kByNone},
      {"AByteOrderMark", "\xef\xbb\xbf" + sound, Parsed::kByBoth, "e"},
      {"Latin1", "<?xml version='1.0' encoding='ISO-8859-1'?><a>\xe4</a>", Parsed::kByBoth,
       "\xc3\xa4"},
      {"Utf8CalledUtf16", "<?xml version='1.0' encoding='UTF-16'?><a>b</a>", Parsed::kByNone},
      {"AnUnknownEncoding", "<?xml version='1.0' encoding='QUEN-8'?><a>b</a>", Parsed::kByNone},
      {"AnEncodingOf64KB",
       "<?xml version='1.0' encoding='" + std::string(65536, 'e') + "'?><a>b</a>", Parsed::kByNone},
      {"Utf16", std::string("\xff\xfe<\0a\0/\0>\0", 10), Parsed::kByRestAlone},
      {"Utf16Cut", std::string("\xff\xfe<\0a\0/\0>", 9), Parsed::kByNone},
      {"Version2", "<?xml version='2.0'?><a/>", Parsed::kByNone},
      {"AVersionOf64KB", "<?xml version='" + std::string(65536, '1') + "'?><a/>", Parsed::kByNone},
  };
}

// The content of the root as it stands in the document, without what entities stand for.
std::string RootText(const xmlDoc* doc) {
  std::string text;
  const xmlNode* root = xmlDocGetRootElement(doc);
  for (const xmlNode* node = root; node != nullptr;) {
    if (node->type == XML_TEXT_NODE) text += reinterpret_cast<const char*>(node->content);
    const bool descend = node->type == XML_ELEMENT_NODE && node->children != nullptr;
    if (descend) {
      node = node->children;
      continue;
    }
    while (node != root && node->next == nullptr) node = node->parent;
    node = node == root ? nullptr : node->next;
  }
  return text;
}

class Xml : public ::testing::TestWithParam<XmlCase> {
 protected:
  static void SetUpTestSuite() {
    static const bool counted =
        xmlMemSetup(CountedFree, CountedMalloc, CountedRealloc, CountedStrdup) == 0;
    EXPECT_TRUE(counted);
    xmlInitParser();
    xmlFreeDoc(xmlParseMemory("<a/>", 4));  // what libxml2 makes once is no document's
  }

  void SetUp() override {
    document_ = canaries_.Named(GetParam().document.Text());
    before_ = held;
    most_held = before_;
  }

  void TearDown() override {
    EXPECT_FALSE(canaries_.FileWasOpened());
    EXPECT_FALSE(canaries_.PortWasConnected());
    const size_t limit = GetParam().memory + 10 * document_.size();
    EXPECT_LT(static_cast<size_t>(most_held - before_), limit);
    EXPECT_LE(held - before_, 65536) << "what libxml2 keeps for its next document";
  }

  std::string Response() const {
    return "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(document_.size()) + "\r\n\r\n" +
           document_;
  }

  // Takes the document, and compares it.
  static void Take(xmlDoc* doc, bool expected) {
    EXPECT_EQ(doc != nullptr, expected);
    const std::string& text = GetParam().text.Text();
    if (!text.empty() && doc != nullptr) {
      EXPECT_EQ(RootText(doc), text);
    }
    xmlFreeDoc(doc);
  }

  const Canaries canaries_;
  std::string document_;
  long before_ = 0;
};

std::string NameOf(const ::testing::TestParamInfo<XmlCase>& test) {
  return test.param.name;
}

}  // namespace

TEST_P(Xml, OfASoapResponseIsParsedOrNotAsTheTableSays) {
  ScriptedPeer peer({Exchange(Response())});
  RunOnSmallStack(kSmallStack, [&] {
    xmlSetGenericErrorFunc(nullptr, SayNothing);
    xmlDoc* doc = nullptr;
    ExposedClient client(peer.Port());
    EXPECT_EQ(client.SendReqByXMLSocketPost("<q/>", doc), HTTP_RET_OK);
    EXPECT_EQ(client.m_result, HTTP_RET_OK);
    Take(doc, GetParam().parsed == Parsed::kByBoth || GetParam().parsed == Parsed::kBySoapAlone);
  });
}

TEST_P(Xml, OfAResponseToAnXmlGetIsParsedOrNotAsTheTableSays) {
  const LogCapture log(5);
  const bool parsed =
      GetParam().parsed == Parsed::kByBoth || GetParam().parsed == Parsed::kByRestAlone;
  ScriptedPeer peer({Exchange(Response())});
  RunOnSmallStack(kSmallStack, [&] {
    xmlSetGenericErrorFunc(nullptr, SayNothing);
    xmlDoc* doc = nullptr;
    ExposedClient client(peer.Port());
    EXPECT_EQ(client.SendReqByXMLGet(20), HTTP_RET_OK);
    EXPECT_EQ(client.GetResponseXML(doc), parsed);
    EXPECT_EQ(client.m_pRespBuf, nullptr);
    Take(doc, parsed);
  });
  const std::vector<std::string> failed = {"GetResponseXML: Failed to parse response to XML\n"};
  EXPECT_EQ(HttpLog(log), parsed ? std::vector<std::string>() : failed);
}

INSTANTIATE_TEST_SUITE_P(WithEntities, Xml, ::testing::ValuesIn(EntityTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(ThatPointsElsewhere, Xml, ::testing::ValuesIn(ExternalTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddSizes, Xml, ::testing::ValuesIn(SizeTable()), NameOf);
INSTANTIATE_TEST_SUITE_P(OfOddShapes, Xml, ::testing::ValuesIn(ShapeTable()), NameOf);

// The canaries do sing for a parser that follows what a document points to.
TEST(XmlCanaries, SingForAParserThatFollows) {
  const Canaries canaries;
  const int follow = XML_PARSE_NOENT | XML_PARSE_DTDLOAD | XML_PARSE_NOERROR | XML_PARSE_NOWARNING;
  const std::string file = canaries.Named("<!DOCTYPE a [<!ENTITY e SYSTEM 'FILE'>]><a>&e;</a>");
  xmlFreeDoc(xmlReadMemory(file.data(), static_cast<int>(file.size()), nullptr, nullptr, follow));
  EXPECT_TRUE(canaries.FileWasOpened());
  const std::string url = canaries.Named("<!DOCTYPE a SYSTEM 'URL'><a/>");
  std::thread reader([&] {
    xmlFreeDoc(xmlReadMemory(url.data(), static_cast<int>(url.size()), nullptr, nullptr, follow));
  });
  EXPECT_TRUE(canaries.RefuseConnection());
  reader.join();
}
