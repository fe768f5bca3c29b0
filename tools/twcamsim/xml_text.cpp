#include "tools/twcamsim/xml_text.h"

#include <libxml/parser.h>
#include <libxml/tree.h>

#include <memory>

namespace {

struct FreeXml {
  void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
  void operator()(xmlChar* text) const { xmlFree(text); }
};

const xmlNode* FirstElement(const xmlNode* parent) {
  const xmlNode* child = parent->children;
  while (child && child->type != XML_ELEMENT_NODE) child = child->next;
  return child;
}

std::string Name(const xmlNode* node) {
  return reinterpret_cast<const char*>(node->name);
}

const xmlNode* FindBody(const xmlNode* envelope) {
  for (const xmlNode* child = envelope->children; child; child = child->next) {
    if (child->type == XML_ELEMENT_NODE && Name(child) == "Body") return child;
  }
  return nullptr;
}

}  // namespace

std::string EscapeXml(const std::string& text) {
  std::string escaped;
  for (const char letter : text) {
    switch (letter) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '"':
        escaped += "&quot;";
        break;
      default:
        escaped += letter;
    }
  }
  return escaped;
}

XmlRequest ParseXmlRequest(const std::string& bytes) {
  XmlRequest request;
  const std::unique_ptr<xmlDoc, FreeXml> document(
      xmlReadMemory(bytes.data(), static_cast<int>(bytes.size()), "request.xml", nullptr,
                    XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING));
  const xmlNode* root = document ? xmlDocGetRootElement(document.get()) : nullptr;
  if (!root) return request;
  request.well_formed = true;
  request.root = Name(root);
  const xmlNode* body = FindBody(root);
  const xmlNode* command = body ? FirstElement(body) : nullptr;
  if (!command) return request;
  request.command = Name(command);
  const std::unique_ptr<xmlChar, FreeXml> text(xmlNodeGetContent(command));
  if (text) request.text = reinterpret_cast<const char*>(text.get());
  return request;
}
