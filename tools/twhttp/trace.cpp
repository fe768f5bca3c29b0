#include "tools/twhttp/trace.h"

#include <algorithm>

namespace {

void Keep(std::string* kept, std::string_view bytes, bool all) {
  const size_t room = Trace::kKeptBytes - std::min(kept->size(), Trace::kKeptBytes);
  kept->append(all ? bytes : bytes.substr(0, room));
}

}  // namespace

Connection& Trace::Open(bool tls) {
  Connection connection;
  connection.number = static_cast<int>(connections_.size()) + 1;
  connection.tls = tls;
  connections_.push_back(connection);
  return connections_.back();
}

Connection* Trace::Find(int connection) {
  const bool known = connection > 0 && static_cast<size_t>(connection) <= connections_.size();
  return known ? &connections_[static_cast<size_t>(connection) - 1] : nullptr;
}

const Connection* Trace::Find(int connection) const {
  return const_cast<Trace*>(this)->Find(connection);
}

Exchange* Trace::Current(int connection) {
  const bool found = !exchanges_.empty() && exchanges_.back().connection == connection;
  return found ? &exchanges_.back() : nullptr;
}

// What is sent after a response's first byte begins the next exchange. The first byte of an interim
// response (1xx) is ignored.
void Trace::Sent(int connection, double begin, double end, std::string_view bytes) {
  Exchange* exchange = Current(connection);
  if (exchange == nullptr || exchange->response.HeadComplete()) {
    exchanges_.emplace_back();
    exchange = &exchanges_.back();
    exchange->number = static_cast<int>(exchanges_.size());
    exchange->connection = connection;
    exchange->send_begin = begin;
  }
  Keep(&exchange->sent, bytes, keep_all_);
  exchange->sent_bytes += bytes.size();
  exchange->send_end = end;
}

void Trace::SendFailed(int connection, double at, int error, const std::string& text) {
  if (Current(connection) == nullptr) Sent(connection, at, at, "");
  Step& send = Current(connection)->send;
  send.failed = true;
  send.end = at;
  send.error = error;
  send.text = text;
}

void Trace::Received(int connection, double at, std::string_view bytes) {
  if (Current(connection) == nullptr) Sent(connection, at, at, "");
  Exchange* const exchange = Current(connection);
  const bool had_head = exchange->response.HeadComplete();
  if (exchange->first_byte < 0) exchange->first_byte = at;
  exchange->response.Feed(bytes);
  if (!had_head && exchange->response.HeadComplete()) exchange->head_end = at;
  exchange->last_byte = at;
  exchange->received_bytes += bytes.size();
  exchange->empty_waits = 0;
  exchange->waited = 0;
  Keep(&exchange->received, bytes, keep_all_);
  if (exchange->received.size() == exchange->received_bytes) {
    exchange->pieces.push_back({at, bytes.size()});
  }
}

void Trace::Waited(int connection, double begin, double end, bool ready) {
  Exchange* const exchange = Current(connection);
  if (exchange == nullptr || ready) return;
  ++exchange->empty_waits;
  exchange->waited += end - begin;
}

// Only the first end is kept: what is read after it repeats it.
void Trace::Ended(int connection, double at, End end, int error, const std::string& text) {
  Exchange* const exchange = Current(connection);
  if (exchange == nullptr || exchange->ended >= 0) return;
  exchange->end = end;
  exchange->ended = at;
  exchange->error = error;
  exchange->error_text = text;
}

const Exchange* Trace::LastExchange() const {
  return exchanges_.empty() ? nullptr : &exchanges_.back();
}

const Connection* Trace::LastConnection() const {
  return connections_.empty() ? nullptr : &connections_.back();
}
