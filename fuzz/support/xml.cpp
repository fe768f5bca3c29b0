#include "fuzz/support/xml.h"

#include <libxml/xmlIO.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <utility>

namespace {

[[noreturn]] void Report(const char* place) {
  std::fprintf(stderr, "a document made the parser look for \"%s\"\n",
               place != nullptr ? place : "");
  std::abort();
}

xmlParserInput* LoadEntity(const char* url, const char*, xmlParserCtxt*) {
  Report(url);
}

int OpenInput(const char* file) {
  Report(file);
}

void* NeverOpened(const char*) {
  return nullptr;
}
int NeverRead(void*, char*, int) {
  return -1;
}
int NeverClosed(void*) {
  return -1;
}

std::string reports;

__attribute__((format(printf, 2, 3))) void Collect(void*, const char* format, ...) {
  char text[4096];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(text, sizeof(text), format, arguments);
  va_end(arguments);
  reports += text;
}

}  // namespace

void WatchXml() {
  xmlInitParser();
  xmlSetExternalEntityLoader(LoadEntity);
  xmlCleanupInputCallbacks();
  xmlRegisterInputCallbacks(OpenInput, NeverOpened, NeverRead, NeverClosed);
  xmlSetGenericErrorFunc(nullptr, Collect);
}

std::string TakeXmlReports() {
  return std::exchange(reports, "");
}

std::string XmlText(xmlDoc* doc) {
  if (doc == nullptr) return "(none)";
  xmlChar* text = nullptr;
  int length = 0;
  xmlDocDumpMemory(doc, &text, &length);
  std::string copy(reinterpret_cast<char*>(text), static_cast<size_t>(length));
  xmlFree(text);
  return copy;
}

std::string XmlTextOf(const std::string& text) {
  xmlDoc* doc = xmlParseMemory(text.data(), static_cast<int>(text.size()));
  std::string dumped = XmlText(doc);
  xmlFreeDoc(doc);
  return dumped;
}
