#include "tools/twhttp/content.h"

#include <libxml/parser.h>
#include <libxml/xmlerror.h>

#include "tools/common/json_output.h"
#include "tools/twhttp/hooks.h"
#include "tools/twhttp/run.h"

namespace {

std::string g_first_xml_error;

}  // namespace

void ListenToXml() {
  g_first_xml_error.clear();
  xmlSetStructuredErrorFunc(nullptr, [](void* /*context*/, auto* error) {
    if (!g_first_xml_error.empty() || error->message == nullptr) return;
    g_first_xml_error = "line " + std::to_string(error->line) + ": " + error->message;
    while (g_first_xml_error.back() == '\n') g_first_xml_error.pop_back();
  });
}

std::string FirstXmlError() {
  return g_first_xml_error;
}

bool IsXml(const std::string& text) {
  ListenToXml();
  const Document document(
      xmlReadMemory(text.data(), static_cast<int>(text.size()), nullptr, nullptr, XML_PARSE_NONET));
  return document != nullptr;
}

// What the parser told the log about a response that is no JSON; an empty text for one that is.
std::string JsonError() {
  constexpr char kFailed[] = "JsonParse(): Failed to parse json: ";
  constexpr char kWith[] = "] with error [";
  for (const std::string& line : CurrentHooks()->trace->log) {
    if (line.find(kFailed) == std::string::npos) continue;
    const size_t begin = line.rfind(kWith);
    if (begin == std::string::npos) return "it cannot be parsed";
    std::string error = line.substr(begin + sizeof(kWith) - 1);
    while (!error.empty() && (error.back() == ']' || error.back() == '\n')) error.pop_back();
    for (char& c : error) c = c == '\n' ? ' ' : c;
    return error;
  }
  return "";
}

std::string SuccessError(const Json::Value& response) {
  if (!response.isObject()) return "the response is no object";
  if (!response.isMember("success")) return "the member \"success\" is missing";
  return "\"success\" is " + CompactJson(response["success"]);
}
