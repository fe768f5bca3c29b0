#include "tests/attack/exchange.h"

#include <algorithm>
#include <cstdio>

namespace {

constexpr size_t kCleanShare = 30;  // per cent of the responses

// Silences that only the client's limit ends, of those that have one; and of the others.
constexpr unsigned kSilenceMs = 45000;
constexpr unsigned kPoliteSilenceMs = 1500;

constexpr int kTimeout = 10;
constexpr int kTimeoutOfStalls = 1;

const AttackedOperation& PickOperation(bool tls, Dice* dice) {
  const std::vector<AttackedOperation>& all = AttackedOperations();
  const OverTls impossible = tls ? OverTls::kNever : OverTls::kAlways;
  for (;;) {
    const AttackedOperation& operation = all[dice->Below(all.size())];
    if (operation.tls != impossible) return operation;
  }
}

BodyKind KindFor(const AttackedOperation& operation, Dice* dice) {
  const std::string name = operation.name;
  if (name.find("json") != std::string::npos) return BodyKind::kJson;
  if (name.find("xml") != std::string::npos) return BodyKind::kXml;
  return dice->OneIn(4) ? BodyKind::kJson : BodyKind::kAny;
}

OperationSettings PickTarget(const AttackedOperation& operation, bool tls, bool stalls,
                             Dice* dice) {
  static constexpr size_t kPieces[] = {16, 64, 512, 1500, 8192};
  OperationSettings target = AttackSettings(operation, dice->Pick(kPieces));
  target.https = tls;
  target.buffered = dice->PerCent(75);
  target.verify = dice->OneIn(2);
  target.encode_query = dice->OneIn(2);
  target.version = static_cast<HTTP_VERSION>(dice->Below(3));
  target.timeout = target.limit = stalls ? kTimeoutOfStalls : kTimeout;
  if (dice->OneIn(4)) target.cookie = "id=1;";
  return target;
}

End PickEnd(bool tls, Dice* dice) {
  const size_t chance = dice->Below(100);
  if (chance < 45) return End::kHalfClose;
  if (chance < 65) return End::kClose;
  if (chance < 78) return End::kReset;
  if (chance < 85) return End::kKeep;
  if (tls && chance < 92) return End::kAlert;
  return End::kNoNotice;
}

// Where the response is cut into pieces, and how long the pauses between them are.
void PickPieces(Delivery* delivery, Dice* dice) {
  constexpr size_t kMostSingleBytes = 150;
  const size_t size = delivery->response.bytes.size();
  const size_t chance = dice->Below(100);
  if (chance < 60 || size < 2) return;
  if (chance < 94) {
    for (size_t i = dice->Between(1, 6); i > 0; --i) {
      delivery->pieces.push_back(dice->Between(1, size / (1 + dice->Below(20)) + 1));
    }
    if (chance >= 88) delivery->delay_us = static_cast<unsigned>(dice->Between(50, 1000));
    return;
  }
  // Single bytes, from the first one or from anywhere.
  if (dice->OneIn(2)) delivery->pieces.push_back(dice->Between(1, size));
  delivery->pieces.insert(delivery->pieces.end(), dice->Between(5, kMostSingleBytes), 1);
  delivery->delay_us = static_cast<unsigned>(dice->Below(200));
}

unsigned PickStall(const AttackedOperation& operation, Dice* dice) {
  if (dice->PerCent(98)) return static_cast<unsigned>(dice->Between(100, 1300));
  return operation.limit == Limit::kNone ? kPoliteSilenceMs : kSilenceMs;
}

// A pause at any byte, before the first one too.
void PickStallPlace(const AttackedOperation& operation, Delivery* delivery, Dice* dice) {
  delivery->stall_ms = PickStall(operation, dice);
  delivery->stall_piece = 0;
  if (delivery->response.bytes.empty() || dice->OneIn(5)) return;
  // Half of them within what is mostly the head.
  const size_t size = delivery->response.bytes.size();
  const size_t at = 1 + dice->Below(dice->OneIn(2) ? size : std::min<size_t>(size, 150));
  delivery->pieces.assign(1, at);
  delivery->delay_us = 0;
  delivery->stall_piece = 1;
}

void PickRecordFaults(Delivery* delivery, Dice* dice) {
  delivery->cut_records = dice->OneIn(3);
  if (dice->OneIn(12)) {
    delivery->missing = dice->Between(1, 60);
    delivery->response.clean_head = delivery->response.clean_body = false;
  }
  delivery->key_update = dice->OneIn(20);
}

Delivery PickDelivery(const HostileExchange& exchange, Dice* dice) {
  Delivery delivery;
  const bool clean = dice->PerCent(kCleanShare);
  const BodyKind kind = KindFor(*exchange.operation, dice);
  delivery.response = clean ? CleanResponse(kind, dice) : HostileResponse(kind, dice);
  PickPieces(&delivery, dice);
  if (!clean) {
    delivery.end = PickEnd(exchange.target.https, dice);
    delivery.before_request = dice->OneIn(25);
  }
  if (exchange.target.https) PickRecordFaults(&delivery, dice);
  return delivery;
}

TlsPlan PickTls(const AttackedOperation& operation, Dice* dice) {
  TlsPlan plan;
  plan.only_tls12 = dice->OneIn(3);
  plan.stranger = operation.curl && dice->OneIn(12);
  plan.http2 = operation.curl && !plan.stranger && dice->OneIn(10);
  if (!dice->OneIn(8)) return plan;
  static constexpr HandshakeFault kFaults[] = {
      HandshakeFault::kNoise, HandshakeFault::kPlainText, HandshakeFault::kAlertRecord,
      HandshakeFault::kCut,   HandshakeFault::kCut,       HandshakeFault::kFlip,
      HandshakeFault::kFlip};
  plan.fault = dice->Pick(kFaults);
  plan.connection = dice->OneIn(5) ? 1 : 0;
  plan.at = dice->Below(dice->OneIn(2) ? 120 : 1200);
  plan.noise = dice->Bytes(dice->Between(1, 300));
  // The first byte of a handshake record, so that more than that is looked at.
  if (dice->OneIn(2)) plan.noise[0] = '\x16';
  return plan;
}

std::string Escaped(const std::string& bytes) {
  constexpr size_t kMostShown = 6000;
  std::string text;
  for (const char c : bytes.substr(0, kMostShown)) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte < 0x7f && byte != '\\') {
      text += c;
      continue;
    }
    char code[8];
    snprintf(code, sizeof(code), c == '\n' ? "\\n\n" : c == '\r' ? "\\r" : "\\x%02x", byte);
    text += code;
  }
  return bytes.size() > kMostShown ? text + " ..." : text;
}

}  // namespace

bool Stalls(uint64_t seed, uint64_t number, const Shares& shares) {
  return Dice(seed, number).PerCent(shares.stall);
}

HostileExchange MakeExchange(uint64_t seed, uint64_t number, const Shares& shares) {
  Dice dice(seed, number);
  HostileExchange exchange;
  exchange.number = number;
  exchange.stalls = dice.PerCent(shares.stall);
  const bool tls = dice.PerCent(shares.tls);
  exchange.operation = &PickOperation(tls, &dice);
  exchange.target = PickTarget(*exchange.operation, tls, exchange.stalls, &dice);
  exchange.escaped = dice.OneIn(2);
  if (tls) exchange.tls = PickTls(*exchange.operation, &dice);
  constexpr int kMostPlanned = 3;
  for (int i = 0; i < std::min(exchange.operation->most_requests, kMostPlanned); ++i) {
    exchange.deliveries.push_back(PickDelivery(exchange, &dice));
  }
  if (!exchange.stalls) return exchange;
  if (tls && dice.OneIn(8)) {
    exchange.tls.fault = HandshakeFault::kStall;
    exchange.tls.connection = 0;
    exchange.tls.stall_ms = static_cast<unsigned>(dice.Between(100, 1300));
    return exchange;
  }
  const size_t which = dice.OneIn(4) ? dice.Below(exchange.deliveries.size()) : 0;
  PickStallPlace(*exchange.operation, &exchange.deliveries[which], &dice);
  return exchange;
}

std::string Summary(const HostileExchange& exchange) {
  const OperationSettings& target = exchange.target;
  return std::string(exchange.operation->name) + (target.https ? ", TLS" : ", plain") +
         (target.buffered ? ", buffered" : ", direct") + ", version " +
         std::to_string(target.version) + ", T " + std::to_string(target.timeout) +
         (exchange.escaped ? ", escaped log" : "") + (exchange.stalls ? ", stall" : "");
}

std::string Description(const HostileExchange& exchange) {
  static constexpr const char* kEnds[] = {"half close", "no notice", "close",
                                          "reset",      "alert",     "keep"};
  std::string text = Summary(exchange) + "\nhandshake fault " +
                     std::to_string(static_cast<int>(exchange.tls.fault)) + " at " +
                     std::to_string(exchange.tls.at) + "\n";
  for (const Delivery& delivery : exchange.deliveries) {
    text += "-- " + std::to_string(delivery.response.bytes.size()) + " bytes";
    text += delivery.before_request ? " before the request" : "";
    text += ", " + std::to_string(delivery.pieces.size() + 1) + " pieces, delay " +
            std::to_string(delivery.delay_us) + " us, pause of " +
            std::to_string(delivery.stall_ms) + " ms before piece " +
            std::to_string(delivery.stall_piece) +
            ", end: " + kEnds[static_cast<int>(delivery.end)] + "\n" +
            Escaped(delivery.response.bytes) + "\n";
  }
  return text;
}
