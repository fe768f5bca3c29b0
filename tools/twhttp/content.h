// What the parsers of responses say beside their results.
#ifndef TARNWICK_TOOLS_TWHTTP_CONTENT_H_
#define TARNWICK_TOOLS_TWHTTP_CONTENT_H_

#include <json/value.h>
#include <libxml/tree.h>

#include <memory>
#include <string>

struct DocumentDeleter {
  void operator()(xmlDoc* document) const { xmlFreeDoc(document); }
};
using Document = std::unique_ptr<xmlDoc, DocumentDeleter>;

// Keeps what libxml2 finds from now on, which it would else print.
void ListenToXml();

// The first finding since, which explains the others.
std::string FirstXmlError();

// What the parser told the library's log about a response that is no JSON; an empty text for one
// that is. REQUIRES: within Observe.
std::string JsonError();

// Why a response in JSON is no success.
std::string SuccessError(const Json::Value& response);

#endif  // TARNWICK_TOOLS_TWHTTP_CONTENT_H_
