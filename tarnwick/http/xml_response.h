// Parsing a device's XML.
#ifndef TARNWICK_HTTP_XML_RESPONSE_H_
#define TARNWICK_HTTP_XML_RESPONSE_H_

#include <libxml/tree.h>

namespace tarnwick {

// The document in `text`, as xmlParseMemory parses it; null when it is not well-formed. What
// differs: it is null too when memory ran out on the way, it ends in a parameter entity in which
// libxml2 would go on for ever, and errors are not written to standard error. Handlers that the
// program has set for the thread are told of errors in libxml2's own words.
xmlDoc* ParseXml(const char* text, int size);

}  // namespace tarnwick

#endif  // TARNWICK_HTTP_XML_RESPONSE_H_
