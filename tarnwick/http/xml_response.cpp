#include "tarnwick/http/xml_response.h"

#include <libxml/globals.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>
#include <libxml/xmlerror.h>

#include <cstdio>
#include <cstring>
#include <memory>

#include "tarnwick/platform/cancel.h"

namespace tarnwick {

namespace {

struct XmlParserDeleter {
  void operator()(xmlParserCtxt* parser) const { xmlFreeParserCtxt(parser); }
};

// Whether an error of this thread would be written to standard error: the handlers are libxml2's
// own ones. Its function makes stderr the context when it first writes; only setting it tells which
// function that is. With another stream as its context it is the program's choice.
bool ErrorsGoToStderr() {
  void* const context = xmlGenericErrorContext;
  if (xmlStructuredError != nullptr || (context != nullptr && context != stderr)) return false;
  const xmlGenericErrorFunc handler = xmlGenericError;
  xmlSetGenericErrorFunc(context, nullptr);
  const bool own = handler == xmlGenericError;
  xmlSetGenericErrorFunc(context, handler);
  return own;
}

void Ignore(void* /*unused*/, xmlError* /*unused*/) {}

// Where errors would be written to standard error, they are ignored for as long as it lives.
class QuietErrors {
 public:
  QuietErrors() : m_quiet(ErrorsGoToStderr()), m_context(xmlStructuredErrorContext) {
    if (m_quiet) xmlSetStructuredErrorFunc(nullptr, Ignore);
  }
  ~QuietErrors() {
    if (m_quiet) xmlSetStructuredErrorFunc(m_context, nullptr);
  }
  QuietErrors(const QuietErrors&) = delete;
  QuietErrors& operator=(const QuietErrors&) = delete;

 private:
  bool m_quiet;
  void* m_context;
};

// The domains whose errors a parser has.
const char* NameOfDomain(int domain) {
  switch (domain) {
    case XML_FROM_PARSER:
      return "parser ";
    case XML_FROM_NAMESPACE:
      return "namespace ";
    case XML_FROM_DTD:
    case XML_FROM_VALID:
      return "validity ";
    case XML_FROM_IO:
      return "I/O ";
    default:
      return "";
  }
}

void ReportPlace(const xmlParserInput* input, const xmlError& error, const char* end) {
  if (input == nullptr) return;
  void* const context = xmlGenericErrorContext;
  if (input->filename != nullptr) {
    xmlGenericError(context, "%s:%d: %s", input->filename, input->line, end);
  } else if (error.line != 0 && error.domain == XML_FROM_PARSER) {
    xmlGenericError(context, "Entity: line %d: %s", input->line, end);
  }
}

void ReportMessage(const xmlError& error) {
  void* const context = xmlGenericErrorContext;
  const char* const text = error.message != nullptr ? error.message : "out of memory error";
  const size_t length = strlen(text);
  const bool ended = length > 0 && text[length - 1] == '\n';
  xmlGenericError(context, "%s", NameOfDomain(error.domain));
  xmlGenericError(context, "%s : ", error.level == XML_ERR_WARNING ? "warning" : "error");
  xmlGenericError(context, "%s%s", text, ended ? "" : "\n");
}

// Tells the generic handler what libxml2 2.9.14 would, in as many calls (pinned by
// XmlReport.ToAFunctionIsLibxml2sOwn). Its own function for that is not to be had once a parser has
// a handler, and xmlParserError has other words.
void Report(const xmlParserCtxt& parser, const xmlError& error) {
  xmlParserInput* input = parser.input;
  xmlParserInput* entity = nullptr;
  if (input != nullptr && input->filename == nullptr && parser.inputNr > 1) {
    entity = input;
    input = parser.inputTab[parser.inputNr - 2];
  }
  ReportPlace(input, error, "");
  ReportMessage(error);
  xmlParserPrintFileContext(input);
  if (entity == nullptr) return;
  ReportPlace(entity, error, "\n");
  xmlParserPrintFileContext(entity);
}

// After these errors the parser goes on for ever when it is inside a parameter entity: it takes no
// further byte, and waits for the entity's end. A document of 500 bytes is enough for that.
bool IsEndlessLoop(const xmlParserCtxt& parser, int code) {
  return parser.inputNr > 1 && (code == XML_ERR_ENTITY_LOOP || code == XML_ERR_NO_MEMORY);
}

// Hands an error on as the parser itself does, and ends a parse that would not end.
void HandleError(void* context, xmlError* error) {
  xmlParserCtxt* const parser = static_cast<xmlParserCtxt*>(context);
  if (xmlStructuredError != nullptr) {
    xmlStructuredError(xmlStructuredErrorContext, error);
  } else {
    Report(*parser, *error);
  }
  if (!IsEndlessLoop(*parser, error->code)) return;
  const int code = parser->errNo;
  xmlStopParser(parser);
  parser->errNo = code;
}

}  // namespace

// The parser hands out what it has when there is no memory for a text or an attribute, and callers
// would take half a document for a whole one.
xmlDoc* ParseXml(const char* text, int size) {
  const NoCancel no_cancel;
  const QuietErrors quiet;
  xmlResetLastError();
  const std::unique_ptr<xmlParserCtxt, XmlParserDeleter> parser(
      xmlCreateMemoryParserCtxt(text, size));
  if (!parser) return nullptr;
  parser->sax->serror = HandleError;
  xmlParseDocument(parser.get());
  const xmlError* const error = xmlGetLastError();
  const bool out_of_memory = error != nullptr && error->code == XML_ERR_NO_MEMORY;
  if (parser->wellFormed != 0 && !out_of_memory) return parser->myDoc;
  xmlFreeDoc(parser->myDoc);
  return nullptr;
}

}  // namespace tarnwick
