// The little XML that a simulated device needs.
#ifndef TARNWICK_TOOLS_TWCAMSIM_XML_TEXT_H_
#define TARNWICK_TOOLS_TWCAMSIM_XML_TEXT_H_

#include <string>

// `text` with the characters that XML reserves written as entities.
std::string EscapeXml(const std::string& text);

// What a request's document asks for.
struct XmlRequest {
  bool well_formed = false;
  std::string root;     // the local name of its outermost element
  std::string command;  // of the first element in a SOAP body; empty when there is none
  std::string text;     // the text in that element
};

// Entities are not resolved, and nothing is fetched.
XmlRequest ParseXmlRequest(const std::string& bytes);

#endif  // TARNWICK_TOOLS_TWCAMSIM_XML_TEXT_H_
