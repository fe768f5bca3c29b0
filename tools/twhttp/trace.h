// What happened on the wire during an operation: connections, exchanges, times. Plain data and the
// steps that build it; who observes the calls is hooks_*.cpp.
#ifndef TARNWICK_TOOLS_TWHTTP_TRACE_H_
#define TARNWICK_TOOLS_TWHTTP_TRACE_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "tools/twhttp/message.h"

// One step of a connection. Times are seconds since the operation began; -1: not reached.
struct Step {
  double begin = -1;
  double end = -1;
  int error = 0;  // errno, getaddrinfo's or OpenSSL's code; 0 with `failed` when none is known
  bool failed = false;
  std::string text;  // the system's words for the failure

  bool Done() const { return end >= 0 && !failed; }
  double Length() const { return end < 0 || begin < 0 ? 0 : end - begin; }
};

// How the peer's side of an exchange ended.
enum class End { kKept, kClosed, kReset, kSilent, kFailed };

struct Connection {
  int number = 0;
  bool tls = false;
  Step look_up;
  Step connect;
  Step handshake;
  Step source;          // binding the source address
  std::string address;  // "192.0.2.7:80"
  std::string tls_facts;
  std::string certificate;
  bool close_notice = false;
};

struct Piece {
  double at;
  size_t bytes;
};

struct Exchange {
  int number = 0;
  int connection = 0;  // its number
  std::string sent;    // of at most kKeptBytes, unless everything is kept
  uint64_t sent_bytes = 0;
  double send_begin = -1;
  double send_end = -1;
  Step send;  // its failure
  ResponseMessage response;
  std::string received;  // as `sent`
  std::vector<Piece> pieces;
  uint64_t received_bytes = 0;
  double first_byte = -1;
  double head_end = -1;
  double last_byte = -1;
  int empty_waits = 0;  // waits that passed without a byte, since the last one
  double waited = 0;    // seconds in them
  End end = End::kKept;
  double ended = -1;
  int error = 0;
  std::string error_text;
};

// libcurl's own account of a transfer, in seconds from its beginning.
struct CurlFigures {
  bool used = false;
  int code = 0;
  int os_error = 0;
  std::string text;
  double look_up = 0;
  double connect = 0;
  double handshake = 0;
  double total = 0;
};

class Trace {
 public:
  static constexpr size_t kKeptBytes = 1 << 20;

  // Everything is kept for a recording; else the bytes of an endless response are only counted.
  explicit Trace(bool keep_all = false) : keep_all_(keep_all) {}

  Connection& Open(bool tls);
  Connection* Find(int connection);
  const Connection* Find(int connection) const;

  void Sent(int connection, double begin, double end, std::string_view bytes);
  void SendFailed(int connection, double at, int error, const std::string& text);
  void Received(int connection, double at, std::string_view bytes);
  void Waited(int connection, double begin, double end, bool ready);
  void Ended(int connection, double at, End end, int error, const std::string& text);

  const std::vector<Connection>& Connections() const { return connections_; }
  const std::vector<Exchange>& Exchanges() const { return exchanges_; }
  const Exchange* LastExchange() const;
  const Connection* LastConnection() const;

  CurlFigures curl;
  std::vector<std::string> notes;  // libcurl's lines
  std::vector<std::string> log;    // the library's lines
  double finished = 0;             // when the operation returned

 private:
  Exchange* Current(int connection);

  bool keep_all_;
  std::vector<Connection> connections_;
  std::vector<Exchange> exchanges_;
};

#endif  // TARNWICK_TOOLS_TWHTTP_TRACE_H_
