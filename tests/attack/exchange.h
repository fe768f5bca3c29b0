// One exchange: the operation, and all that the hostile server does. It depends on the seed and the
// exchange's number alone.
#ifndef TARNWICK_TESTS_ATTACK_EXCHANGE_H_
#define TARNWICK_TESTS_ATTACK_EXCHANGE_H_

#include <cstdint>
#include <string>
#include <vector>

#include "tests/attack/attacked_operations.h"
#include "tests/attack/attacks.h"
#include "tests/attack/response.h"

// How the server leaves a connection.
enum class End {
  kHalfClose,  // its side only, by a close notice over TLS, and waits for the client's end
  kNoNotice,   // the same without the notice
  kClose,      // both sides, whatever the client still sends
  kReset,
  kAlert,  // over TLS by a fatal alert, which bytes that are no record bring about
  kKeep,   // takes another request, and closes when none comes
};

// One response on its way.
struct Delivery {
  Response response;
  bool before_request = false;
  std::vector<size_t> pieces;  // sizes; the last piece takes the rest
  unsigned delay_us = 0;       // between pieces
  long stall_piece = -1;       // the one that a pause precedes; -1: no pause
  unsigned stall_ms = 0;
  bool cut_records = false;  // over TLS: the pieces are of records, not of what they hold
  size_t missing = 0;        // bytes at the end of the last record that are never sent
  bool key_update = false;   // TLS 1.3: before the first piece
  End end = End::kHalfClose;
};

// What may be wrong with a TLS handshake.
enum class HandshakeFault { kNone, kNoise, kPlainText, kAlertRecord, kCut, kFlip, kStall };

struct TlsPlan {
  HandshakeFault fault = HandshakeFault::kNone;
  size_t connection = 0;  // which one it is for
  size_t at = 0;          // byte of the server's part
  unsigned stall_ms = 0;
  std::string noise;
  bool only_tls12 = false;
  bool stranger = false;  // a certificate of another authority for another host
  bool http2 = false;     // takes HTTP/2 when the client offers it, and does not speak it
};

struct HostileExchange {
  uint64_t number = 0;
  const AttackedOperation* operation = nullptr;
  OperationSettings target;
  bool escaped = false;  // inside a TWRequestScope with SetEscapedLog
  bool stalls = false;
  TlsPlan tls;
  std::vector<Delivery> deliveries;  // of the requests in their order; later ones get the last
};

// Shares in per cent.
struct Shares {
  size_t tls = 25;
  size_t stall = 12;
};

// Whether the server pauses in it, which is known without making it.
bool Stalls(uint64_t seed, uint64_t number, const Shares& shares);

HostileExchange MakeExchange(uint64_t seed, uint64_t number, const Shares& shares);

// For people: the operation and its settings on one line; with the bytes and delays.
std::string Summary(const HostileExchange& exchange);
std::string Description(const HostileExchange& exchange);

#endif  // TARNWICK_TESTS_ATTACK_EXCHANGE_H_
