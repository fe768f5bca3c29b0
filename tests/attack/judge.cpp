#include "tests/attack/judge.h"

#include <algorithm>
#include <cctype>
#include <cstdio>

#include "tests/attack/request_check.h"

namespace {

std::string TimeProblem(double took, double allowed) {
  if (took <= allowed) return "";
  char text[80];
  snprintf(text, sizeof(text), "took %.2f s, at most %.2f s are allowed", took, allowed);
  return text;
}

// What one pause of the server's may cost the call.
double CostOfPause(const HostileExchange& exchange, unsigned pause_ms) {
  const double pause = pause_ms / 1000.0;
  const OperationSettings& target = exchange.target;
  const AttackedOperation& operation = *exchange.operation;
  if (operation.limit == Limit::kTransfer) return std::min<double>(pause, target.timeout);
  // A handshake over the socket has no limit.
  if (operation.limit == Limit::kNone || exchange.tls.fault == HandshakeFault::kStall) return pause;
  const int waits = target.buffered ? operation.waits_buffered : operation.waits_direct;
  return std::min<double>(pause, waits * target.timeout * (target.https ? 2 : 1));
}

bool IsSuccess(int status) {
  return status >= 200 && status <= 299;
}

// The response that the operation must have understood; null when it need not have.
const Response* UnderstoodResponse(const HostileExchange& exchange, const PeerRecord& record) {
  if (!record.whole || exchange.stalls || record.spoke_http2) return nullptr;
  if (exchange.tls.fault != HandshakeFault::kNone) return nullptr;
  const Delivery& last = exchange.deliveries[static_cast<size_t>(record.last_delivery)];
  return last.response.clean_head ? &last.response : nullptr;
}

std::string StatusProblem(const HostileExchange& exchange, const Response& response,
                          const OperationResult& outcome) {
  const std::string sent = "status " + std::to_string(response.status) + " was sent";
  switch (exchange.operation->shows) {
    case Shows::kNothing:
      return "";
    case Shows::kStatus:
      if (outcome.status == response.status) return "";
      return sent + ", " + std::to_string(outcome.status) + " is reported";
    case Shows::kSuccess:
      if ((outcome.result == HTTP_RET_OK) == IsSuccess(response.status)) return "";
      break;
    case Shows::kJson:
      if ((outcome.result != -1) == IsSuccess(response.status)) return "";
  }
  return sent + ", result " + std::to_string(outcome.result);
}

std::string ResultProblem(const HostileExchange& exchange, const OperationResult& outcome) {
  const std::vector<int>& failures = exchange.operation->failures;
  const bool failed = outcome.result != HTTP_RET_OK;
  if (failed && std::find(failures.begin(), failures.end(), outcome.result) == failures.end()) {
    return "undocumented result " + std::to_string(outcome.result);
  }
  const bool known = outcome.response >= HTTP_RET_OK && outcome.response <= HTTP_RET_CERT_ERROR &&
                     outcome.response != HTTP_RET_BAD_KEY &&
                     outcome.response != HTTP_RET_NO_CONTENT;
  return known ? "" : "undocumented outcome " + std::to_string(outcome.response);
}

// At the most `most`, of however many connections.
std::string RequestsProblem(const HostileExchange& exchange, const PeerRecord& record) {
  if (record.spoke_http2) return "";
  int requests = 0;
  for (const std::string& bytes : record.connections) {
    const std::string problem = RequestProblem(bytes, *exchange.operation, &requests);
    if (!problem.empty()) return problem;
  }
  if (requests <= exchange.operation->most_requests) return "";
  return std::to_string(requests) + " requests";
}

// The length of the valid UTF-8 character at `at`, and its code point; 0 for bytes that are none.
size_t CharacterAt(const std::string& text, size_t at, unsigned* code) {
  const auto byte = [&](size_t i) { return static_cast<unsigned char>(text[i]); };
  const unsigned first = byte(at);
  const size_t length = first < 0x80   ? 1
                        : first < 0xc2 ? 0
                        : first < 0xe0 ? 2
                        : first < 0xf0 ? 3
                                       : 4;
  if (length == 0 || first > 0xf4 || at + length > text.size()) return 0;
  *code = length == 1 ? first : first & (0xff >> (length + 1));
  for (size_t i = 1; i < length; ++i) {
    if ((byte(at + i) & 0xc0) != 0x80) return 0;
    *code = *code << 6 | (byte(at + i) & 0x3f);
  }
  static constexpr unsigned kLeast[] = {0, 0, 0x80, 0x800, 0x10000};
  const bool surrogate = *code >= 0xd800 && *code <= 0xdfff;
  return *code < kLeast[length] || *code > 0x10ffff || surrogate ? 0 : length;
}

// As tarnwick/net/twrequestscope.h lists them.
bool IsUnsafe(unsigned code) {
  return code < 0x20 || (code >= 0x7f && code <= 0x9f) || code == 0x61c || code == 0x200e ||
         code == 0x200f || (code >= 0x2028 && code <= 0x202e) || (code >= 0x2066 && code <= 0x2069);
}

// "Nov 22 04:40:00 [": how every line begins.
bool BeginsAsALine(const std::string& line) {
  static constexpr char kShape[] = "Aaa NN NN:NN:NN [";
  if (line.size() < sizeof(kShape)) return false;
  for (size_t i = 0; kShape[i] != '\0'; ++i) {
    const auto c = static_cast<unsigned char>(line[i]);
    const bool good = kShape[i] == 'N'   ? isdigit(c) != 0 || c == ' '
                      : kShape[i] == 'A' ? isupper(c) != 0
                      : kShape[i] == 'a' ? islower(c) != 0
                                         : c == static_cast<unsigned char>(kShape[i]);
    if (!good) return false;
  }
  return true;
}

}  // namespace

bool IsUnderstood(const HostileExchange& exchange, const PeerRecord& record) {
  return UnderstoodResponse(exchange, record) != nullptr;
}

double LongestAllowed(const HostileExchange& exchange, const Played& played, double margin) {
  const PeerRecord& record = played.record;
  double seconds = margin + record.sending + record.without_processor + played.without_processor;
  for (const unsigned pause : record.stalls_ms) seconds += CostOfPause(exchange, pause);
  return seconds;
}

std::string EscapedLogProblem(const std::string& log) {
  for (size_t at = 0; at < log.size();) {
    const size_t found = log.find('\n', at);
    const std::string line = log.substr(at, found - at);
    if (found == std::string::npos) return "a line without an end in the log";
    at = found + 1;
    // A message that ends with two line feeds has an empty line after it.
    if (line.empty()) continue;
    if (!BeginsAsALine(line)) return "a forged line in the log: " + line.substr(0, 100);
    for (size_t i = 0; i < line.size();) {
      unsigned code = 0;
      const size_t length = CharacterAt(line, i, &code);
      if (length == 0 || IsUnsafe(code)) {
        return "byte " + std::to_string(static_cast<unsigned char>(line[i])) + " in the log";
      }
      i += length;
    }
  }
  return "";
}

std::vector<std::string> Judge(const HostileExchange& exchange, const Played& played,
                               double margin) {
  std::vector<std::string> findings;
  const auto note = [&](const std::string& finding) {
    if (!finding.empty()) findings.push_back(finding);
  };
  note(played.outcome.mistake);
  note(ResultProblem(exchange, played.outcome));
  note(RequestsProblem(exchange, played.record));
  note(TimeProblem(played.seconds, LongestAllowed(exchange, played, margin)));
  if (const Response* response = UnderstoodResponse(exchange, played.record)) {
    note(StatusProblem(exchange, *response, played.outcome));
    // A body after another response is decoded by that one's transfer encoding.
    const bool body = exchange.operation->decoded && played.outcome.has_text &&
                      response->clean_body && played.record.deliveries == 1;
    if (body && played.outcome.text != response->content) note("another body than was sent");
  }
  if (exchange.escaped) note(EscapedLogProblem(played.log));
  return findings;
}
