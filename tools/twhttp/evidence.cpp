#include "tools/twhttp/evidence.h"

#include "tools/common/text.h"

const Exchange& LastOf(const Evidence& evidence) {
  static const Exchange none = {};
  const Exchange* const last = evidence.trace.LastExchange();
  return last != nullptr ? *last : none;
}

std::vector<HeadFinding> FindingsOf(const Trace& trace, const Exchange& exchange) {
  return trace.curl.used ? std::vector<HeadFinding>() : InspectHead(exchange.response);
}

bool SentCredentials(const Exchange& exchange) {
  const size_t end = exchange.sent.find("\r\n\r\n");
  for (const auto& header : SplitHeaderLines(exchange.sent.substr(0, end))) {
    if (EqualsIgnoringCase(header.first, "Authorization")) return true;
  }
  return false;
}

bool Contains(const std::string& text, const char* word) {
  return text.find(word) != std::string::npos;
}
