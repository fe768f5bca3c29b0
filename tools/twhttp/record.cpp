#include "tools/twhttp/record.h"

#include <cmath>

#include "tools/twhttp/record_masks.h"

namespace {

int64_t Milliseconds(double from, double to) {
  return from < 0 || to < from ? 0 : std::llround((to - from) * 1000);
}

const char* EndOf(const Exchange& exchange) {
  switch (exchange.end) {
    case End::kClosed:
      return "close";
    case End::kReset:
      return "reset";
    case End::kKept:
      return exchange.empty_waits > 0 ? "silent" : "kept";
    default:
      return "silent";
  }
}

RecordedExchange BeginRecord(const Session& session, const Connection* connection, int number) {
  RecordedExchange record;
  record.number = number;
  record.connection = connection != nullptr ? connection->number : 0;
  record.tls = session.options.target.https;
  record.host = session.options.target.host;
  record.port = session.options.target.port;
  return record;
}

// Method and target stand in the request's first line.
void AddRequestLine(RecordedExchange* record) {
  const std::string line = record->request.substr(0, record->request.find("\r\n"));
  const size_t blank = line.find(' ');
  if (blank == std::string::npos) return;
  record->method = line.substr(0, blank);
  record->target = line.substr(blank + 1, line.rfind(' ') - blank - 1);
}

RecordedExchange RecordOf(const Session& session, const Exchange& exchange, int number) {
  RecordedExchange record = BeginRecord(session, session.trace.Find(exchange.connection), number);
  record.request = MaskRequest(session.options, exchange.sent);
  record.response = MaskResponse(session.options, exchange.received);
  AddRequestLine(&record);
  double before = exchange.send_end;
  for (const Piece& piece : exchange.pieces) {
    record.pieces.push_back({Milliseconds(before, piece.at), piece.bytes});
    before = piece.at;
  }
  record.end = EndOf(exchange);
  record.end_delay_ms = Milliseconds(before, exchange.ended);
  return record;
}

// A connection over which nothing was said.
RecordedExchange FailedRecord(const Session& session, const Connection& connection, int number) {
  RecordedExchange record = BeginRecord(session, &connection, number);
  const bool refused = session.failure.id == FailureClass::kRefused;
  record.end = connection.connect.Done() ? "tls" : refused ? "refused" : "unreachable";
  record.end_delay_ms = Milliseconds(connection.connect.begin, connection.connect.end);
  return record;
}

}  // namespace

std::vector<RecordedExchange> RecordingOf(const Session& session) {
  std::vector<RecordedExchange> records;
  for (const Connection& connection : session.trace.Connections()) {
    const size_t before = records.size();
    for (const Exchange& exchange : session.trace.Exchanges()) {
      if (exchange.connection != connection.number) continue;
      records.push_back(RecordOf(session, exchange, static_cast<int>(records.size()) + 1));
    }
    if (records.size() > before) continue;
    records.push_back(FailedRecord(session, connection, static_cast<int>(records.size()) + 1));
  }
  return records;
}
