// Parsing a device's XML.
#ifndef TARNWICK_HTTP_XML_REPLY_H_
#define TARNWICK_HTTP_XML_REPLY_H_

#include <libxml/globals.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>
#include <libxml/xmlerror.h>

#include <memory>

struct XmlParserDeleter {
  void operator()(xmlParserCtxt* parser) const { xmlFreeParserCtxt(parser); }
};

// Behind these errors the parser goes on for ever when it is inside a parameter entity: it takes no
// further byte, and waits for the entity's end. A reply of 500 bytes is enough for that.
inline bool NeverEnds(const xmlParserCtxt& parser, int code) {
  return parser.inputNr > 1 && (code == XML_ERR_ENTITY_LOOP || code == XML_ERR_NO_MEMORY);
}

// Hands an error on as the parser itself does, and ends a parse that would not end.
inline void HandleXmlError(void* context, xmlError* error) {
  xmlParserCtxt* const parser = static_cast<xmlParserCtxt*>(context);
  if (xmlStructuredError != nullptr) {
    xmlStructuredError(xmlStructuredErrorContext, error);
  } else if (error->level == XML_ERR_WARNING) {
    xmlParserWarning(parser, "%s", error->message);
  } else {
    xmlParserError(parser, "%s", error->message);
  }
  if (!NeverEnds(*parser, error->code)) return;
  const int code = parser->errNo;
  xmlStopParser(parser);
  parser->errNo = code;
}

// The document in `text`; null when it is not well-formed, and when memory ran out. The parser
// itself hands out what it has when there is no memory for a text or an attribute, and callers would
// take half a document for a whole one.
inline xmlDoc* ParseXml(const char* text, int size) {
  xmlResetLastError();
  const std::unique_ptr<xmlParserCtxt, XmlParserDeleter> parser(
      xmlCreateMemoryParserCtxt(text, size));
  if (!parser) return nullptr;
  parser->sax->serror = HandleXmlError;
  xmlParseDocument(parser.get());
  const xmlError* const error = xmlGetLastError();
  const bool out_of_memory = error != nullptr && error->code == XML_ERR_NO_MEMORY;
  if (parser->wellFormed != 0 && !out_of_memory) return parser->myDoc;
  xmlFreeDoc(parser->myDoc);
  return nullptr;
}

#endif  // TARNWICK_HTTP_XML_REPLY_H_
