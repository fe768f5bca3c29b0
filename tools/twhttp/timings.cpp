#include "tools/twhttp/timings.h"

#include "tools/twhttp/failure.h"

namespace {

constexpr char kNone[] = "none";

struct Limits {
  std::string connect;
  std::string wait;
  std::string total;
};

Limits LimitsOf(const Options& options) {
  const std::string seconds = std::to_string(options.timeout) + " s";
  if (options.operation->by_curl) {
    const bool limited = options.operation->Uses(kTimeout) && options.timeout > 0;
    return {limited ? "the total's" : kNone, limited ? "the total's" : kNone,
            limited ? seconds : kNone};
  }
  return {options.timeout < 0 ? kNone : seconds, WaitLimit(options), kNone};
}

void AddStep(const char* phase, int exchange, const Step& step, const std::string& limit,
             std::vector<Timing>* timings) {
  if (step.end < 0) return;
  timings->push_back({phase, exchange, step.end, step.Length(), limit});
}

void AddConnection(const Connection& connection, int exchange, const Limits& limits,
                   std::vector<Timing>* timings) {
  AddStep("look-up", exchange, connection.look_up, kNone, timings);
  AddStep("connect", exchange, connection.connect, limits.connect, timings);
  AddStep("TLS", exchange, connection.handshake, limits.total == kNone ? kNone : limits.connect,
          timings);
}

void AddExchange(const Exchange& exchange, const Limits& limits, std::vector<Timing>* timings) {
  const auto add = [&](const char* phase, double from, double to, const std::string& limit) {
    if (to < 0 || from < 0) return;
    timings->push_back({phase, exchange.number, to, to - from, limit});
  };
  add("written", exchange.send_begin, exchange.send_end,
      limits.total == kNone ? kNone : limits.wait);
  add("first byte", exchange.send_end, exchange.first_byte, limits.wait);
  add("head", exchange.first_byte, exchange.head_end, limits.wait);
  if (exchange.head_end >= 0) add("body", exchange.head_end, exchange.last_byte, limits.wait);
}

}  // namespace

std::vector<Timing> TimingsOf(const Trace& trace, const Options& options) {
  std::vector<Timing> timings;
  const Limits limits = LimitsOf(options);
  int connection = 0;
  int exchange_number = 0;
  for (const Exchange& exchange : trace.Exchanges()) {
    exchange_number = exchange.number;
    if (exchange.connection != connection) {
      connection = exchange.connection;
      if (const Connection* const made = trace.Find(connection)) {
        AddConnection(*made, exchange.number, limits, &timings);
      }
    }
    AddExchange(exchange, limits, &timings);
  }
  const Connection* const last = trace.LastConnection();
  if (last != nullptr && last->number != connection) {
    AddConnection(*last, exchange_number + 1, limits, &timings);
  }
  timings.push_back({"total", 0, trace.finished, trace.finished, limits.total});
  return timings;
}
