// Faults of what the response says.
#include <fmt/format.h>

#include "tools/twcamsim/faults.h"

namespace {

constexpr char kGroup[] = "body";

FaultType Make(const char* name, const char* meaning, void (*hook)(Response*, const FaultContext&),
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.response = hook;
  return {name, kGroup, std::move(rules), meaning, hooks};
}

void SetBody(Response* response, const std::string& type, const std::string& body) {
  response->Set("Content-Type", type);
  response->body = body;
  response->more = nullptr;
}

void SetJson(Response* response, const std::string& body) {
  SetBody(response, "application/json", body);
}

void SetXml(Response* response, const std::string& body) {
  SetBody(response, "application/xml", body);
}

// Each entity holds the one before it ten times over.
void XmlBomb(Response* response, const FaultContext& context) {
  std::string text = "<?xml version=\"1.0\"?>\n<!DOCTYPE bomb [\n<!ENTITY e0 \"boom\">\n";
  for (int64_t i = 1; i <= context.Number(0); ++i) {
    text += fmt::format("<!ENTITY e{} \"", i);
    for (int j = 0; j < 10; ++j) text += fmt::format("&e{};", i - 1);
    text += "\">\n";
  }
  SetXml(response, text + fmt::format("]>\n<bomb>&e{};</bomb>\n", context.Number(0)));
}

void XmlDeep(Response* response, const FaultContext& context) {
  std::string open, close;
  for (int64_t i = 0; i < context.Number(0); ++i) {
    open += "<a>";
    close += "</a>";
  }
  SetXml(response, "<?xml version=\"1.0\"?>\n" + open + close + "\n");
}

void JsonBomb(Response* response, const FaultContext& context) {
  const size_t depth = static_cast<size_t>(context.Number(0));
  SetJson(response,
          "{\"success\":true,\"deep\":" + std::string(depth, '[') + std::string(depth, ']') + "}");
}

void ZeroBytes(Response* response, const FaultContext&) {
  response->body.insert(response->body.size() / 2, std::string("\0\0\0", 3));
}

void WrongCharset(Response* response, const FaultContext&) {
  SetJson(response, "{\"success\":true,\"camera\":\"Nordt\xf6r\"}");
  response->Set("Content-Type", "application/json; charset=utf-8");
}

// Claims a coding that the body does not have.
void FalseGzip(Response* response, const FaultContext&) {
  response->Set("Content-Encoding", "gzip");
}

void BigBody(Response* response, const FaultContext& context) {
  const size_t size = static_cast<size_t>(context.Number(0));
  SetJson(response, "{\"success\":true,\"filler\":\"" + std::string(size, 'x') + "\"}");
}

void ExtraBytes(Steps* steps, const FaultContext&) {
  steps->push_back({Action::kSend, Part::kBody, "HTTP/1.1 200 OK\r\nX-Extra: 1\r\n\r\n", {}});
}

std::vector<FaultType> XmlFaults() {
  return {
      Make("xml-bomb", "XML whose entities multiply, so many levels by ten", XmlBomb,
           {{"LEVELS", "9", 1, 20}}),
      Make("xml-deep", "XML with so many elements one in another", XmlDeep,
           {{"DEPTH", "100000", 1, 1000000}}),
      Make("xml-broken", "XML that is not well-formed",
           [](Response* response, const FaultContext&) {
             SetXml(response, "<?xml version=\"1.0\"?>\n<reply><preset>7</reply>\n");
           }),
      Make("html-page", "a page for people, in place of the response",
           [](Response* response, const FaultContext&) {
             SetBody(response, "text/html",
                     "<!doctype html><html><head><title>Camera</title><body><p>Please log in<br>");
           }),
  };
}

std::vector<FaultType> JsonFaults() {
  return {
      Make("json-bomb", "JSON with so many arrays one in another", JsonBomb,
           {{"DEPTH", "100000", 1, 4000000}}),
      Make("json-broken", "JSON that ends in the middle",
           [](Response* response, const FaultContext&) {
             SetJson(response, "{\"success\":true,\"camera\":\"nor");
           }),
      Make("success-false", "JSON with \"success\":false",
           [](Response* response, const FaultContext&) {
             SetJson(response, "{\"success\":false,\"error\":{\"code\":105}}");
           }),
      Make("success-missing", "JSON without \"success\"",
           [](Response* response, const FaultContext&) {
             SetJson(response, "{\"camera\":\"north gate\"}");
           }),
      Make("success-text", "JSON with \"success\":\"yes\"",
           [](Response* response, const FaultContext&) {
             SetJson(response, "{\"success\":\"yes\"}");
           }),
      Make("json-array", "JSON that is an array",
           [](Response* response, const FaultContext&) { SetJson(response, "[true]"); }),
      Make("wrong-charset", "JSON in another character set than it says", WrongCharset),
  };
}

std::vector<FaultType> ByteFaults() {
  return {
      Make("empty-body", "a response without a body",
           [](Response* response, const FaultContext&) {
             response->body.clear();
             response->more = nullptr;
           }),
      Make("zero-bytes", "zero bytes in the middle of the body", ZeroBytes),
      Make("byte-order-mark", "a byte order mark in front of the body",
           [](Response* response, const FaultContext&) {
             response->body.insert(0, "\xef\xbb\xbf");
           }),
      Make("wrong-type", "the response with that Content-Type",
           [](Response* response, const FaultContext& context) {
             response->Set("Content-Type", context.Text(0));
           },
           {{"TYPE", "text/html"}}),
      Make("false-gzip", "Content-Encoding says gzip, and the body is none", FalseGzip),
      Make("big-body", "JSON with a text of so many bytes", BigBody,
           {{"BYTES", "10485760", 1, 1 << 30}}),
  };
}

}  // namespace

std::vector<FaultType> BodyFaults() {
  std::vector<FaultType> types = XmlFaults();
  for (const auto part : {JsonFaults, ByteFaults}) {
    for (FaultType& type : part()) types.push_back(std::move(type));
  }
  FaultHooks extra;
  extra.steps = ExtraBytes;
  types.push_back({"extra-bytes", kGroup, {}, "more bytes after the body than announced", extra});
  return types;
}
