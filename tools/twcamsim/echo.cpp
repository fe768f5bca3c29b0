#include "tools/twcamsim/echo.h"

#include <fmt/format.h>
#include <json/value.h>

#include "tools/common/json_output.h"
#include "tools/twcamsim/xml_text.h"

namespace {

// The document in a request's body, without its declaration and the blanks after it.
std::string Inner(std::string document) {
  if (document.compare(0, 5, "<?xml") == 0) {
    const size_t end = document.find("?>");
    if (end != std::string::npos) document.erase(0, document.find_first_not_of("\r\n\t ", end + 2));
  }
  document.erase(document.find_last_not_of("\r\n\t ") + 1);
  return document;
}

}  // namespace

Response EchoAsText(const Exchange& exchange) {
  const Request& request = exchange.request;
  return MakeResponse(
      200, "text/plain",
      fmt::format("{} HTTP/{}.{}\nquery {}\ntype {}\ncookie {}\nuser {}\nbody {}\n", request.method,
                  request.version / 10, request.version % 10, request.query,
                  request.Get("Content-Type"), request.Get("Cookie"), exchange.user, request.body));
}

Response EchoAsJson(const Exchange& exchange) {
  Json::Value value(Json::objectValue);
  value["success"] = true;
  value["method"] = exchange.request.method;
  value["query"] = exchange.request.query;
  value["user"] = exchange.user;
  value["cookie"] = exchange.request.Get("Cookie");
  value["body"] = exchange.request.body;
  return MakeResponse(200, "application/json", CompactJson(value));
}

Response EchoAsXml(const Exchange& exchange) {
  const Request& request = exchange.request;
  return MakeResponse(
      request.query == "fault" ? 500 : 200, "application/xml",
      fmt::format("<?xml version=\"1.0\"?>\n<reply method=\"{}\" user=\"{}\">\n"
                  "<joined>one\r\ntwo</joined>{}</reply>\n",
                  EscapeXml(request.method), EscapeXml(exchange.user), Inner(request.body)));
}
