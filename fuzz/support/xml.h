// libxml2 for the fuzz targets: a spy in the place of everything that opens files and connections,
// and documents as text.
#ifndef TARNWICK_FUZZ_SUPPORT_XML_H_
#define TARNWICK_FUZZ_SUPPORT_XML_H_

#include <libxml/parser.h>

#include <string>

// From now on a document that makes libxml2 look for anything outside itself aborts the program,
// and its complaints about documents are not printed, but collected.
void WatchXml();

// The complaints since the last call.
std::string TakeXmlReports();

// The document as text; "(none)" for null.
std::string XmlText(xmlDoc* doc);

// What libxml2 makes of the text.
std::string XmlTextOf(const std::string& text);

#endif  // TARNWICK_FUZZ_SUPPORT_XML_H_
