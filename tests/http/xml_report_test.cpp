// What libxml2's error handlers are told of a broken document: what xmlParseMemory tells them. And
// without a handler nothing reaches standard error.
#include <gtest/gtest.h>
#include <libxml/globals.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <libxml/xmlerror.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/http/xml_response.h"
#include "tests/http/xml_test_util.h"
#include "tests/support/standard_error.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

using Reports = std::vector<std::string>;
using Parser = std::function<xmlDoc*(const char*, int)>;

// With errors of each kind that a document can bring about, and with none.
std::vector<std::string> Documents() {
  const auto with = [](const std::string& subset) { return "<!DOCTYPE a [" + subset + "]>"; };
  return {
      "<a/>",
      "",
      "no xml",
      "<a>",
      "<a><b></a>",
      "<a b=c/>",
      "<a b='1' b='2'/>",
      "<a/><b/>",
      "<a>\n\n  &nobody;</a>",
      "<a>&#0;</a>",
      "<a>\xff\xfe</a>",
      "<a>b\0c</a>"s,
      "<a>" + std::string(200, 'x') + "<b>" + std::string(200, 'y') + "</a>",
      "<x:a/>",
      "<a xmlns:x='u' xmlns:y='u' x:b='1' y:b='2'/>",
      "<a xmlns:x=''/>",
      "<a xmlns='relative'/>",
      "<a xmlns:xml='u'/>",
      "<a xml:space='odd'/>",
      "<a xml:lang='not a language'/>",
      "<?xml version='2.0'?><a/>",
      "<?xml version='1.0' encoding='QUEN-8'?><a/>",
      "<?xml version='1.0' encoding='UTF-16'?><a/>",
      "<?xml version='1.0' encoding='EUC-JP'?><a>\x8f\xff</a>",
      "<?XML-a?><a/>",
      with("<!ELEMENT a ANY><!ELEMENT a ANY>") + "<a/>",
      with("<!ELEMENT a (") + "<a/>",
      with("<!ATTLIST a b ID 'x'>") + "<a/>",
      with("<!ENTITY e '<b>'>") + "<a>&e;</b></a>",
      with("<!ENTITY e '&e;'>") + "<a>&e;</a>",
      with("<!ENTITY % p '<!ELEMENT a ANY> <!ELEMENT a ANY> oops'>\n%p;") + "<a/>",
      with("<!ENTITY % p '%q;'>%p;%nobody;") + "<a/>",
      with("<!ENTITY % p SYSTEM 'x'>%p;%nobody;") + "<a>&none;</a>",
      with("<!ENTITY e 'x'><!ENTITY e 'y'>") + "<a>&e;",
  };
}

xmlDoc* ByLibxml2(const char* text, int size) {
  return xmlParseMemory(text, size);
}

// Parses the document. Results: it as text.
std::string Parse(const Parser& parse, const std::string& text) {
  xmlDoc* const doc = parse(text.data(), static_cast<int>(text.size()));
  const std::string dumped = TextOf(doc);
  xmlFreeDoc(doc);
  return dumped;
}

// The kinds of handler: each parses with such a handler, and returns what it was told.

__attribute__((format(printf, 2, 3))) void Note(void* reports, const char* format, ...) {
  char text[4096];
  va_list arguments;
  va_start(arguments, format);
  vsnprintf(text, sizeof(text), format, arguments);
  va_end(arguments);
  static_cast<Reports*>(reports)->emplace_back(text);
}

std::string Word(const char* text) {
  return text == nullptr ? "-" : text;
}

void NoteStructured(void* reports, xmlError* error) {
  std::string text;
  for (const int number : {error->domain, error->code, static_cast<int>(error->level), error->line,
                           error->int1, error->int2, static_cast<int>(error->ctxt != nullptr),
                           static_cast<int>(error->node != nullptr)}) {
    text += std::to_string(number) + " ";
  }
  for (const char* word : {error->message, error->file, error->str1, error->str2, error->str3}) {
    text += Word(word) + "|";
  }
  static_cast<Reports*>(reports)->push_back(text);
}

Reports OfAFunction(const Parser& parse, const std::string& text) {
  Reports reports;
  xmlSetGenericErrorFunc(&reports, Note);
  reports.push_back(Parse(parse, text));
  EXPECT_EQ(xmlGenericError, Note);
  EXPECT_EQ(xmlGenericErrorContext, &reports);
  xmlSetGenericErrorFunc(nullptr, nullptr);
  return reports;
}

Reports OfAStructuredFunction(const Parser& parse, const std::string& text) {
  Reports reports;
  xmlSetStructuredErrorFunc(&reports, NoteStructured);
  reports.push_back(Parse(parse, text));
  EXPECT_EQ(xmlStructuredError, NoteStructured);
  EXPECT_EQ(xmlStructuredErrorContext, &reports);
  xmlSetStructuredErrorFunc(nullptr, nullptr);
  return reports;
}

// Both: libxml2 then tells the structured one alone.
Reports OfBothFunctions(const Parser& parse, const std::string& text) {
  Reports unused;
  xmlSetGenericErrorFunc(&unused, Note);
  Reports reports = OfAStructuredFunction(parse, text);
  xmlSetGenericErrorFunc(nullptr, nullptr);
  reports.insert(reports.end(), unused.begin(), unused.end());
  return reports;
}

// A stream of the daemon's with libxml2's own function.
Reports OfAStream(const Parser& parse, const std::string& text) {
  char* told = nullptr;
  size_t size = 0;
  FILE* const stream = open_memstream(&told, &size);
  xmlSetGenericErrorFunc(stream, nullptr);
  const std::string parsed = Parse(parse, text);
  xmlSetGenericErrorFunc(nullptr, nullptr);
  fclose(stream);
  const Reports reports = {std::string(told, size), parsed};
  free(told);
  return reports;
}

void ExpectTheSame(Reports (*reports_of)(const Parser& parse, const std::string& text)) {
  size_t told = 0;
  for (const std::string& text : Documents()) {
    const Reports expected = reports_of(ByLibxml2, text);
    EXPECT_EQ(reports_of(ParseXml, text), expected) << text;
    if (expected.size() > 1 && !expected[0].empty()) ++told;
  }
  EXPECT_GE(told, 25u);  // else nothing was compared
}

void InAThread(const std::function<void()>& body) {
  std::thread(body).join();
}

// What reaches standard error when nobody has set a handler.
std::string ToldToStandardError(const Parser& parse) {
  CapturedStandardError captured;
  for (const std::string& text : Documents()) Parse(parse, text);
  return captured.End();
}

}  // namespace

TEST(XmlReport, ToAFunctionIsLibxml2sOwn) {
  ExpectTheSame(OfAFunction);
  InAThread([] { ExpectTheSame(OfAFunction); });
}

TEST(XmlReport, ToAStructuredFunctionIsLibxml2sOwn) {
  ExpectTheSame(OfAStructuredFunction);
  InAThread([] { ExpectTheSame(OfAStructuredFunction); });
}

TEST(XmlReport, ToBothFunctionsIsLibxml2sOwn) {
  ExpectTheSame(OfBothFunctions);
}

TEST(XmlReport, ToAStreamIsLibxml2sOwn) {
  ExpectTheSame(OfAStream);
  InAThread([] { ExpectTheSame(OfAStream); });
}

TEST(XmlReport, OfEachKindReadsAsLibxml2WritesIt) {
  const auto first = [](const std::string& text) {
    std::string told;
    for (const std::string& piece : OfAFunction(ParseXml, text)) told += piece;
    return told.substr(0, told.find('\n') + 1);
  };
  EXPECT_EQ(first("<a>\n<b></a>"),
            "Entity: line 2: parser error : Opening and ending tag mismatch: b line 2 and a\n");
  EXPECT_EQ(first("<x:a/>"), "namespace error : Namespace prefix x on a is not defined\n");
  EXPECT_EQ(first("<a xmlns='relative'/>"),
            "namespace warning : xmlns: URI relative is not absolute\n");
  EXPECT_EQ(first("<!DOCTYPE a [<!ELEMENT a ANY><!ELEMENT a ANY>]><a/>"),
            "validity error : Redefinition of element a\n");
}

// A daemon may have libxml2 put entities in their places.
TEST(XmlReport, OfAnEntityThatCannotBeLoadedReadsAsLibxml2WritesIt) {
  const std::string text = "<!DOCTYPE a [<!ENTITY e SYSTEM '/nowhere'>]><a>&e;</a>";
  const int before = xmlSubstituteEntitiesDefault(1);
  std::string told;
  for (const std::string& piece : OfAFunction(ParseXml, text)) told += piece;
  xmlSubstituteEntitiesDefault(before);
  EXPECT_EQ(told.substr(0, told.find('\n') + 1),
            "I/O warning : failed to load external entity \"/nowhere\"\n");
}

TEST(XmlReport, OfAnEndlessEntityIsMadeAndTheParseEnds) {
  std::string subset = "<!ENTITY % p0 ' '>";
  for (int i = 1; i <= 5; ++i) {
    subset += "<!ENTITY % p" + std::to_string(i) + " '";
    for (int n = 0; n < 10; ++n) subset += "&#37;p" + std::to_string(i - 1) + ";";
    subset += "'>";
  }
  const std::string text = "<!DOCTYPE a [" + subset + "%p5;]><a/>";
  EXPECT_EQ(OfAFunction(ParseXml, text).at(2) + OfAFunction(ParseXml, text).at(3),
            "error : Detected an entity reference loop\n");
  EXPECT_EQ(OfAStructuredFunction(ParseXml, text).at(0).substr(0, 5), "1 89 ");
  EXPECT_EQ(ToldToStandardError([&](const char*, int) {
              return ParseXml(text.data(), static_cast<int>(text.size()));
            }),
            "");
}

TEST(XmlReport, WithoutAHandlerNothingReachesStandardError) {
  EXPECT_EQ(ToldToStandardError(ParseXml), "");
  InAThread([] { EXPECT_EQ(ToldToStandardError(ParseXml), ""); });
}

TEST(XmlReport, WithoutAHandlerStandardErrorStaysLibxml2sForTheDaemonsOwnDocuments) {
  for (int round = 0; round < 2; ++round) {  // the first report makes it the context
    EXPECT_NE(ToldToStandardError(ByLibxml2), "");
    EXPECT_EQ(ToldToStandardError(ParseXml), "");
  }
  EXPECT_EQ(xmlStructuredError, nullptr);
}

TEST(XmlReport, WithoutAHandlerTheContextOfOneThatWasTakenBackStays) {
  int context = 0;
  xmlSetStructuredErrorFunc(&context, nullptr);
  EXPECT_EQ(ToldToStandardError(ParseXml), "");
  EXPECT_EQ(xmlStructuredErrorContext, &context);
  xmlSetStructuredErrorFunc(nullptr, nullptr);
}

TEST(XmlReport, AHandlerOfNewThreadsIsTheirOwn) {
  xmlInitParser();  // sets the handlers of new threads
  Reports reports;
  xmlThrDefSetGenericErrorFunc(&reports, Note);
  InAThread([] { Parse(ParseXml, "<a>"); });
  xmlThrDefSetGenericErrorFunc(nullptr, nullptr);
  ASSERT_GT(reports.size(), 1u);
  EXPECT_EQ(reports[1], "parser ");
}
