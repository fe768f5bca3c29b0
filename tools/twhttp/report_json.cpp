#include "tools/twhttp/report.h"
#include "tools/twhttp/secrets.h"
#include "tools/twhttp/timings.h"

namespace {

Json::Value HeadersJson(const Options& options, const HeaderLines& headers) {
  Json::Value list(Json::arrayValue);
  for (const auto& [name, value] : headers) {
    Json::Value header(Json::objectValue);
    header["name"] = name;
    header["value"] = MaskValue(options, name, value);
    list.append(header);
  }
  return list;
}

Json::Value ExchangeJson(const Session& session, const Exchange& exchange) {
  const Options& options = session.options;
  Json::Value value(Json::objectValue);
  const std::string head = exchange.sent.substr(0, exchange.sent.find("\r\n\r\n"));
  value["number"] = exchange.number;
  value["connection"] = exchange.connection;
  value["request_line"] = head.substr(0, head.find("\r\n"));
  value["request_headers"] = HeadersJson(options, SplitHeaderLines(head));
  value["bytes_sent"] = static_cast<Json::UInt64>(exchange.sent_bytes);
  value["status"] = exchange.response.Status();
  value["response_headers"] = HeadersJson(options, exchange.response.Headers());
  value["head_bytes"] = static_cast<Json::UInt64>(exchange.response.HeadBytes());
  value["body_bytes"] = static_cast<Json::UInt64>(exchange.response.BodyBytes());
  Json::Value& notes = value["notes"] = Json::Value(Json::arrayValue);
  for (const HeadFinding& finding : FindingsOf(session.trace, exchange)) {
    notes.append(finding.text + ": " + finding.rule);
  }
  return value;
}

Json::Value FailureJson(const Session& session) {
  const Failure& failure = session.failure;
  Json::Value value(Json::objectValue);
  value["class"] = FactsOf(failure.id).name;
  value["meaning"] = FactsOf(failure.id).meaning;
  value["phase"] = failure.phase;
  value["peer"] = failure.peer;
  value["seen"] = failure.detail;
  value["system"] = MaskText(session.options, failure.system);
  value["limit"] = failure.limit;
  Json::Value& causes = value["causes"] = Json::Value(Json::arrayValue);
  for (const std::string& cause : failure.causes) causes.append(cause);
  value["next"] = failure.next;
  return value;
}

Json::Value TimingsJson(const Session& session) {
  Json::Value list(Json::arrayValue);
  for (const Timing& timing : TimingsOf(session.trace, session.options)) {
    Json::Value entry(Json::objectValue);
    entry["phase"] = timing.phase;
    if (timing.exchange > 0) entry["exchange"] = timing.exchange;
    entry["took"] = timing.took;
    entry["at"] = timing.at;
    entry["limit"] = timing.limit;
    list.append(entry);
  }
  return list;
}

}  // namespace

Json::Value ReportJson(const Session& session) {
  const Options& options = session.options;
  const Exchange* const last = session.trace.LastExchange();
  Json::Value report(Json::objectValue);
  report["operation"] = options.operation->name;
  report["call"] = options.operation->call;
  report["target"] = options.target.Url(options.show_secrets);
  report["class"] = FactsOf(session.failure.id).name;
  report["exit"] = FactsOf(session.failure.id).exit_code;
  report["result"] = session.outcome.result;
  report["status"] = last != nullptr ? last->response.Status() : 0;
  report["elapsed"] = session.trace.finished;
  report["body_bytes"] = static_cast<Json::UInt64>(session.outcome.body_bytes);
  Json::Value& exchanges = report["exchanges"] = Json::Value(Json::arrayValue);
  for (const Exchange& exchange : session.trace.Exchanges()) {
    exchanges.append(ExchangeJson(session, exchange));
  }
  report["timings"] = TimingsJson(session);
  if (session.failure.id != FailureClass::kNone) report["failure"] = FailureJson(session);
  return report;
}
