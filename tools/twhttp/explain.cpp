// A failure in words.
#include <algorithm>
#include <cstdio>

#include "tools/common/shell.h"
#include "tools/common/units.h"
#include "tools/twhttp/causes.h"

namespace {

using Id = FailureClass;

std::string Seconds(double seconds) {
  return FormatSeconds(seconds, seconds < 10 ? 2 : 1);
}

std::string Count(uint64_t count, const char* what) {
  return std::to_string(count) + " " + what + (count == 1 ? "" : "s");
}

void Replace(std::string* text, const std::string& from, const std::string& to) {
  for (size_t at = 0; (at = text->find(from, at)) != std::string::npos; at += to.size()) {
    text->replace(at, from.size(), to);
  }
}

// A URL is quoted whether it must be or not: a person may add a query to it.
std::string QuotedUrl(const Options& options) {
  const std::string url = options.target.Url(options.show_secrets);
  const std::string word = QuoteForShell(url);
  return word == url ? "'" + url + "'" : word;
}

std::string FillIn(const char* command, const Options& options) {
  std::string text = command;
  Replace(&text, "{operation}", options.operation->name);
  Replace(&text, "{host}", QuoteForShell(options.target.host));
  Replace(&text, "{port}", std::to_string(options.target.port));
  Replace(&text, "{url}", QuotedUrl(options));
  return text;
}

// Where on the way it failed, whatever the class.
std::string PhaseOf(const Evidence& evidence, Id id) {
  const Connection* const connection = evidence.trace.LastConnection();
  const Exchange* const last = evidence.trace.LastExchange();
  if (id == Id::kXml || id == Id::kJson || id == Id::kNotSuccess) return "content";
  if (id == Id::kLoginRefused || id == Id::kLoginWanted || id == Id::kStatus) return "status";
  if (connection == nullptr) return "start";
  if (connection->look_up.failed || id == Id::kLookUp) return "look-up";
  if (!connection->connect.Done()) return "connect";
  const bool tls = connection->tls || evidence.options.target.https;
  if (tls && (connection->handshake.failed || connection->handshake.end < 0)) return "TLS";
  if (last == nullptr || last->connection != connection->number || last->send.failed) {
    return "request";
  }
  return last->response.HeadComplete() ? "body" : "head";
}

std::string LimitOf(const Evidence& evidence, const std::string& phase) {
  if (phase == "content" || phase == "status") return "";
  const Options& options = evidence.options;
  if (options.operation->by_curl) {
    if (!options.operation->Uses(kTimeout)) return "none";
    return options.timeout > 0 ? Seconds(options.timeout) + " for the whole transfer" : "none";
  }
  if (phase == "look-up" || phase == "TLS" || phase == "request") return "none in the library";
  if (options.timeout < 0) return "none";
  return phase == "connect" ? Seconds(options.timeout) : WaitLimit(options);
}

std::string PeerOf(const Evidence& evidence) {
  const Connection* const connection = evidence.trace.LastConnection();
  std::string peer = evidence.options.target.HostAndPort();
  if (connection != nullptr && !connection->address.empty() && connection->address != peer) {
    peer += " (" + connection->address + ")";
  }
  return peer;
}

std::string SystemText(const Evidence& evidence) {
  if (!evidence.outcome.content_error.empty()) return evidence.outcome.content_error;
  if (evidence.stop == Stop::kGaveUp) return "";  // it would only tell how the tool did it
  const Trace& trace = evidence.trace;
  if (trace.curl.used && trace.curl.code != 0) return "libcurl: " + trace.curl.text;
  if (trace.curl.used) return "";
  const Connection* const connection = trace.LastConnection();
  const Exchange* const last = trace.LastExchange();
  if (connection == nullptr) return "";
  for (const Step* step : {&connection->look_up, &connection->connect, &connection->handshake}) {
    if (step->failed) return step->text;
  }
  if (last == nullptr || last->connection != connection->number) return "";
  return last->send.failed ? last->send.text : last->error_text;
}

std::string Silence(const Exchange& exchange) {
  return Count(exchange.received_bytes, "byte") + " came, then nothing for " +
         Seconds(exchange.waited) + " in " +
         Count(static_cast<uint64_t>(exchange.empty_waits), "wait");
}

std::string StatusLine(const Exchange& exchange) {
  const std::string& head = exchange.response.Head();
  return head.substr(0, head.find_first_of("\r\n"));
}

std::string HeadDetail(const Trace& trace, const Exchange& exchange) {
  const std::vector<HeadFinding> found = FindingsOf(trace, exchange);
  for (const HeadFinding& finding : found) {
    if (finding.breaks) return finding.text;
  }
  if (!exchange.response.HeadComplete()) {
    return "the head ended after " + Count(exchange.received_bytes, "byte") +
           ", before its empty line";
  }
  return found.empty() ? "the library refused it" : found.front().text;
}

// What was seen, by what the last exchange knows.
std::string ExchangeDetail(const Trace& trace, const Exchange& last, Id id) {
  switch (id) {
    case Id::kReadTimeout:
      return last.empty_waits > 0 ? Silence(last)
                                  : Count(last.received_bytes, "byte") + " came in time";
    case Id::kKeptOpen:
      return "the body was complete " + Seconds(last.waited) + " before the library gave up";
    case Id::kMalformedHead:
      return HeadDetail(trace, last);
    case Id::kCutBody:
      return last.response.Missing();
    case Id::kReset:
    case Id::kNoReply:
    case Id::kWriteFailed:
      return Count(last.sent_bytes, "byte") + " were sent and " +
             Count(last.received_bytes, "byte") + " came before that";
    case Id::kNoLength:
    case Id::kLoginRefused:
    case Id::kLoginWanted:
    case Id::kStatus:
      return StatusLine(last);
    default:
      return "";
  }
}

std::string DetailOf(const Evidence& evidence, Id id) {
  if (evidence.stop == Stop::kGaveUp) {
    return "nothing happened for " + Seconds(GiveUpLimit(evidence.options)) + " (--give-up)";
  }
  const Exchange* const last = evidence.trace.LastExchange();
  return last != nullptr ? ExchangeDetail(evidence.trace, *last, id) : "";
}

}  // namespace

double GiveUpLimit(const Options& options) {
  constexpr double kUsual = 30;
  constexpr double kMargin = 10;
  if (options.give_up >= 0) return options.give_up;
  return std::max(kUsual, options.timeout + kMargin);  // a limit of the library goes first
}

std::string WaitLimit(const Options& options) {
  if (options.timeout < 0) return "none";
  // What TWSocket does with a small buffered read that gets nothing.
  return Seconds(options.timeout) + " a wait" +
         (options.buffered || !options.operation->Uses(kBuffered) ? ", 7 waits at most" : "");
}

Failure Explain(const Evidence& evidence) {
  Failure failure;
  failure.id = Classify(evidence);
  if (failure.id == Id::kNone) return failure;
  const ClassFacts& facts = FactsOf(failure.id);
  failure.phase = PhaseOf(evidence, failure.id);
  failure.peer = PeerOf(evidence);
  failure.detail = DetailOf(evidence, failure.id);
  failure.system = SystemText(evidence);
  failure.elapsed = evidence.trace.finished;
  failure.limit = LimitOf(evidence, failure.phase);
  failure.causes = SpecialCauses(evidence, failure.id);
  for (const char* cause : facts.causes) {
    if (cause != nullptr) failure.causes.emplace_back(cause);
  }
  for (const std::string& cause : FurtherCauses(evidence, failure.id)) {
    failure.causes.push_back(cause);
  }
  failure.next = FillIn(NextCommand(evidence, failure.id), evidence.options);
  return failure;
}
