#include <algorithm>
#include <cstdio>

#include "tarnwick/http/digest.h"
#include "tools/common/terminal.h"
#include "tools/common/units.h"
#include "tools/twhttp/report.h"
#include "tools/twhttp/rules.h"
#include "tools/twhttp/secrets.h"
#include "tools/twhttp/timings.h"

namespace {

std::string Field(const char* name, const std::string& value) {
  char label[24];
  snprintf(label, sizeof(label), "  %-9s", name);
  return value.empty() ? "" : label + value + "\n";
}

std::string CausesText(const std::vector<std::string>& causes) {
  std::string text;
  int number = 0;
  for (const std::string& cause : causes) {
    text += "  " + std::string(number == 0 ? "causes   " : "         ");
    text += std::to_string(++number) + ". " + EscapeControls(cause) + "\n";
  }
  return text;
}

// One line of a head, with the rule that made it when it was sent.
std::string LineText(const char* mark, const std::string& line, const std::string& rule,
                     bool colour) {
  constexpr size_t kLongest = 500;
  constexpr size_t kRuleColumn = 46;
  std::string shown = EscapeControls(line.substr(0, kLongest));
  if (line.size() > kLongest) shown += "... (" + std::to_string(line.size()) + " bytes)";
  std::string text = mark + shown;
  if (rule.empty()) return text + "\n";
  text.append(text.size() < kRuleColumn ? kRuleColumn - text.size() : 1, ' ');
  return text + InColour(Colour::kGrey, "| " + rule, colour) + "\n";
}

std::string HeadOf(const std::string& message) {
  const size_t end = std::min(message.find("\r\n\r\n"), message.find("\n\n"));
  return message.substr(0, end);
}

std::string HeadText(const char* mark, const std::string& head, const Operation* rules,
                     bool colour) {
  std::string text;
  for (size_t begin = 0; begin < head.size();) {
    const size_t end = std::min(head.find('\n', begin), head.size());
    std::string line = head.substr(begin, end - begin);
    while (!line.empty() && line.back() == '\r') line.pop_back();
    const size_t colon = line.find(':');
    std::string name = begin == 0 || colon == std::string::npos ? "" : line.substr(0, colon);
    while (!name.empty() && name.back() == ' ') name.pop_back();
    const bool ruled = rules != nullptr && (begin == 0 || !name.empty());
    if (!line.empty()) text += LineText(mark, line, ruled ? RuleOf(*rules, name) : "", colour);
    begin = end + 1;
  }
  return text;
}

std::string ChallengeText(const Exchange& exchange) {
  const std::string challenge = exchange.response.Value("WWW-Authenticate");
  if (challenge.empty()) return "";
  std::string text =
      "  challenge " + EscapeControls(challenge.substr(0, challenge.find(' '))) + "\n";
  for (const auto& [name, value] : tarnwick::ParseChallenge(challenge)) {
    char line[32];
    snprintf(line, sizeof(line), "    %-10s ", name.c_str());
    if (!value.empty()) text += line + EscapeControls(value) + "\n";
  }
  return text;
}

// The scheme that followed a challenge, and why it was that.
std::string CredentialsText(const Exchange& asked, const Exchange* next,
                            const Operation& operation) {
  if (asked.response.Status() != 401) return "";
  if (next == nullptr || !SentCredentials(*next)) {
    if (SentCredentials(asked)) return "  login     refused, and not tried again\n";
    return std::string("  login     none: ") +
           (operation.Uses(kCredentials) ? "the challenge names neither Digest nor Basic\n"
                                         : "the operation sends no credentials\n");
  }
  const bool digest = next->sent.find("Authorization: Digest") != std::string::npos;
  return digest ? "  login     Digest, because the challenge names it, and it goes before Basic\n"
                : "  login     Basic, because the challenge names it and no Digest\n";
}

std::string ConnectionText(const Connection& connection, bool by_curl) {
  std::string text = "  connection " + std::to_string(connection.number) + " to " +
                     EscapeControls(connection.address);
  if (!connection.tls_facts.empty()) text += ", " + connection.tls_facts;
  text += "\n";
  if (!connection.certificate.empty()) {
    text += "  certificate " + EscapeControls(connection.certificate) +
            (by_curl ? "\n" : ", which the library does not verify here\n");
  }
  return text;
}

std::vector<std::string> NotesOf(const Session& session, const Exchange& exchange) {
  std::vector<std::string> notes;
  for (const HeadFinding& finding : FindingsOf(session.trace, exchange)) {
    notes.push_back(EscapeControls(finding.text) + ": " + finding.rule);
  }
  if (exchange.response.Surplus() > 0) {
    notes.push_back(std::to_string(exchange.response.Surplus()) +
                    " bytes came after the announced end of the body");
  }
  const Connection* const connection = session.trace.Find(exchange.connection);
  const bool closed = exchange.end == End::kClosed && !session.trace.curl.used;
  if (closed && connection != nullptr && connection->tls && !connection->close_notice) {
    notes.push_back("the peer closed without TLS's close notice: the library takes it for the end");
  }
  return notes;
}

std::string ExchangeText(const Session& session, const Exchange& exchange, const Exchange* next,
                         bool colour) {
  const Options& options = session.options;
  std::string text =
      InColour(Colour::kBold, "== exchange " + std::to_string(exchange.number), colour) + "\n";
  if (const Connection* const connection = session.trace.Find(exchange.connection)) {
    text += ConnectionText(*connection, session.trace.curl.used);
  }
  const std::string sent = HeadOf(exchange.sent);
  text += HeadText("> ", MaskHead(options, sent), options.operation, colour);
  text += "  " + std::to_string(exchange.sent_bytes) + " bytes sent\n";
  text += HeadText("< ", MaskHead(options, HeadOf(exchange.response.Head())), nullptr, colour);
  text += "  " + std::to_string(exchange.response.HeadBytes()) + " bytes of head and " +
          std::to_string(exchange.response.BodyBytes()) + " of body came\n";
  for (const std::string& note : NotesOf(session, exchange)) text += "  note      " + note + "\n";
  return text + ChallengeText(exchange) + CredentialsText(exchange, next, *options.operation);
}

}  // namespace

std::string NotesText(const Session& session) {
  const Exchange* const last = session.trace.LastExchange();
  std::string text;
  if (last == nullptr) return text;
  for (const std::string& note : NotesOf(session, *last)) text += "twhttp: note: " + note + "\n";
  return text;
}

std::string FailureText(const Session& session, bool colour) {
  const Failure& failure = session.failure;
  const ClassFacts& facts = FactsOf(failure.id);
  std::string text =
      "twhttp: " + InColour(Colour::kRed, facts.name, colour) + ": " + facts.meaning + "\n";
  if (failure.id == FailureClass::kInterrupted) return text;
  text += Field("phase", failure.phase);
  text += Field("peer", EscapeControls(failure.peer));
  text += Field("seen", EscapeControls(failure.detail));
  text += Field("system", EscapeControls(MaskText(session.options, failure.system)));
  const std::string limit = failure.limit.empty() ? "" : " (limit: " + failure.limit + ")";
  text += Field("elapsed", FormatSeconds(failure.elapsed, 3) + limit);
  text += CausesText(failure.causes);
  return text + Field("next", EscapeControls(failure.next, Backslash::kKept));
}

std::string ExchangesText(const Session& session, bool colour) {
  std::string text;
  const std::vector<Exchange>& exchanges = session.trace.Exchanges();
  for (size_t i = 0; i < exchanges.size(); ++i) {
    const Exchange* const next = i + 1 < exchanges.size() ? &exchanges[i + 1] : nullptr;
    text += ExchangeText(session, exchanges[i], next, colour);
  }
  if (!session.trace.log.empty()) text += InColour(Colour::kBold, "== library log", colour) + "\n";
  for (const std::string& line : session.trace.log) {
    text += "  " + EscapeControls(MaskText(session.options, line)) + "\n";
  }
  return text;
}

std::string TimingsText(const Session& session, bool colour) {
  char line[160];
  snprintf(line, sizeof(line), "%-9s%-11s %11s %11s   %s", "exchange", "phase", "took", "done at",
           "limit");
  std::string text = InColour(Colour::kBold, line, colour) + "\n";
  for (const Timing& timing : TimingsOf(session.trace, session.options)) {
    const std::string exchange = timing.exchange > 0 ? std::to_string(timing.exchange) : "";
    snprintf(line, sizeof(line), "%-9s%-11s %11s %11s   ", exchange.c_str(), timing.phase.c_str(),
             FormatSeconds(timing.took, 3).c_str(), FormatSeconds(timing.at, 3).c_str());
    text += line + timing.limit + "\n";
  }
  return text;
}
