// The parse of a device's XML, with each allocation of the parser failing in turn.
#include "tarnwick/http/xml_response.h"

#include <gtest/gtest.h>
#include <libxml/parser.h>
#include <libxml/tree.h>
#include <libxml/xmlerror.h>
#include <libxml/xmlmemory.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "tests/http/xml_test_util.h"
#include "tests/support/standard_error.h"

using namespace tarnwick;

namespace {

constexpr char kText[] = "<r><a n=\"one\">text</a><!-- c --><b><c>more</c></b></r>";

int g_allocations = 0;
int g_failing = 0;

bool Fails() {
  return ++g_allocations == g_failing;
}

void* FailingMalloc(size_t size) {
  return Fails() ? nullptr : malloc(size);
}

void* FailingRealloc(void* block, size_t size) {
  return Fails() ? nullptr : realloc(block, size);
}

char* FailingStrdup(const char* text) {
  return Fails() ? nullptr : strdup(text);
}

void Ignore(void* /*unused*/, const char* /*format*/, ...) {}

// libxml2's allocations are counted while one exists, and the n-th fails.
class FailingParser {
 public:
  explicit FailingParser(int failing, xmlGenericErrorFunc handler = Ignore) {
    xmlInitParser();
    g_allocations = 0;
    g_failing = failing;
    xmlSetGenericErrorFunc(nullptr, handler);
    xmlMemSetup(free, FailingMalloc, FailingRealloc, FailingStrdup);
  }
  ~FailingParser() {
    xmlMemSetup(free, malloc, realloc, strdup);
    xmlSetGenericErrorFunc(nullptr, nullptr);
  }
  FailingParser(const FailingParser&) = delete;
  FailingParser& operator=(const FailingParser&) = delete;

  bool Failed() const { return g_allocations >= g_failing; }
};

xmlDoc* Parse() {
  return ParseXml(kText, static_cast<int>(strlen(kText)));
}

}  // namespace

TEST(ParseXml, ReturnsTheDocument) {
  xmlDoc* const doc = Parse();
  ASSERT_NE(doc, nullptr);
  EXPECT_EQ(TextOf(doc), "<?xml version=\"1.0\"?>\n" + std::string(kText) + "\n");
  xmlFreeDoc(doc);
}

TEST(ParseXml, WhicheverAllocationFailsTheDocumentIsWholeOrNone) {
  xmlDoc* whole = Parse();
  const std::string expected = TextOf(whole);
  xmlFreeDoc(whole);
  constexpr int kMost = 1000;
  bool failed = true;
  for (int n = 1; failed && n < kMost; ++n) {
    xmlDoc* doc;
    {
      const FailingParser parser(n);
      doc = Parse();
      failed = parser.Failed();
    }
    EXPECT_TRUE(doc != nullptr || failed) << n;
    if (doc != nullptr) {
      EXPECT_EQ(TextOf(doc), expected) << "allocation " << n << " fails";
    }
    xmlFreeDoc(doc);
  }
  EXPECT_FALSE(failed);
}

TEST(ParseXml, WhicheverAllocationFailsNothingReachesStandardErrorWithoutAHandler) {
  CapturedStandardError captured;
  bool failed = true;
  for (int n = 1; failed; ++n) {
    const FailingParser parser(n, nullptr);
    xmlFreeDoc(Parse());
    failed = parser.Failed();
  }
  EXPECT_EQ(captured.End(), "");
}

TEST(ParseXml, AnEarlierFailureOfTheThreadIsIgnored) {
  {
    const FailingParser parser(1);
    EXPECT_EQ(Parse(), nullptr);
  }
  xmlDoc* const doc = Parse();
  EXPECT_NE(doc, nullptr);
  xmlFreeDoc(doc);
}
