// What the tests of XML share.
#ifndef TARNWICK_TESTS_HTTP_XML_TEST_UTIL_H_
#define TARNWICK_TESTS_HTTP_XML_TEST_UTIL_H_

#include <libxml/tree.h>

#include <string>

// The document as text; "(none)" for null.
inline std::string TextOf(xmlDoc* doc) {
  if (doc == nullptr) return "(none)";
  xmlChar* text = nullptr;
  int length = 0;
  xmlDocDumpMemory(doc, &text, &length);
  const std::string copy(reinterpret_cast<const char*>(text), static_cast<size_t>(length));
  xmlFree(text);
  return copy;
}

#endif  // TARNWICK_TESTS_HTTP_XML_TEST_UTIL_H_
