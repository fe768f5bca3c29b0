#include "tests/torture/http_operations.h"

#include <json/reader.h>
#include <libxml/parser.h>

#include <algorithm>
#include <cstring>
#include <sstream>

#include "tests/torture/peer_process.h"

namespace {

std::string TextOf(xmlDoc* doc) {
  xmlChar* text = nullptr;
  int length = 0;
  if (doc != nullptr) xmlDocDumpMemory(doc, &text, &length);
  std::string copy(reinterpret_cast<const char*>(text), static_cast<size_t>(length));
  xmlFree(text);
  return copy;
}

std::string WithoutLineEnds(std::string text) {
  text.erase(std::remove(text.begin(), text.end(), '\n'), text.end());
  return text;
}

}  // namespace

Document::Document(const char* text) : doc_(xmlParseMemory(text, static_cast<int>(strlen(text)))) {}

bool Document::IsBody() const {
  return doc_ != nullptr && WithoutLineEnds(TextOf(doc_)) == WithoutLineEnds(kXmlBody);
}

bool IsJsonBody(const Json::Value& value) {
  static const Json::Value body = [] {
    Json::Value parsed;
    Json::CharReaderBuilder builder;
    std::string errors;
    std::istringstream text(kJsonBody);
    Json::parseFromStream(builder, text, &parsed, &errors);
    return parsed;
  }();
  return value == body;
}
