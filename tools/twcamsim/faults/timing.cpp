// Faults of timing: answers that come late, slowly or never.
#include "tools/twcamsim/faults.h"

namespace {

using std::chrono::milliseconds;

constexpr int64_t kMostMs = 3600000;
constexpr int64_t kMostBytes = INT32_MAX;
const ArgumentRule kSpan = {"MS", "0", 0, kMostMs};  // 0: for good

FaultType OnWire(const char* name, const char* meaning, void (*hook)(Wire*, const FaultContext&),
                 std::vector<ArgumentRule> rules) {
  FaultHooks hooks;
  hooks.wire = hook;
  return {name, "timing", std::move(rules), meaning, hooks};
}

FaultType OnBehaviour(const char* name, const char* meaning,
                      void (*hook)(Behaviour*, const FaultContext&),
                      std::vector<ArgumentRule> rules) {
  FaultHooks hooks;
  hooks.behaviour = hook;
  return {name, "timing", std::move(rules), meaning, hooks};
}

WireStep Wait(int64_t ms) {
  return {ms == 0 ? Action::kStall : Action::kPause, Part::kWait, "", milliseconds(ms)};
}

void InsertAt(Wire* wire, size_t index, const WireStep& step) {
  wire->insert(wire->begin() + static_cast<Wire::difference_type>(std::min(index, wire->size())),
               step);
}

// Waits behind the first `bytes` of the step at `index`.
void WaitInside(Wire* wire, size_t index, size_t bytes, const WireStep& wait) {
  if (index >= wire->size()) return;
  WireStep rest = (*wire)[index];
  bytes = std::min(bytes, rest.bytes.size());
  rest.bytes.erase(0, bytes);
  (*wire)[index].bytes.resize(bytes);
  InsertAt(wire, index + 1, wait);
  InsertAt(wire, index + 2, rest);
}

void StallInBody(Wire* wire, const FaultContext& context) {
  const size_t body = FindPart(*wire, Part::kBody);
  const size_t bytes = static_cast<size_t>(context.Number(0));
  if (body == wire->size()) {  // an endless body, or none
    wire->push_back(Wait(context.Number(1)));
    return;
  }
  WaitInside(wire, body, bytes, Wait(context.Number(1)));
}

std::vector<FaultType> StallFaults() {
  return {
      OnWire("stall-before-status", "waits in front of the status line (0: for good)",
             [](Wire* wire, const FaultContext& context) {
               InsertAt(wire, 0, Wait(context.Number(0)));
             },
             {kSpan}),
      OnWire("stall-in-status", "waits behind 8 bytes of the status line (0: for good)",
             [](Wire* wire, const FaultContext& context) {
               WaitInside(wire, 0, 8, Wait(context.Number(0)));
             },
             {kSpan}),
      OnWire("stall-after-status", "waits behind the status line (0: for good)",
             [](Wire* wire, const FaultContext& context) {
               InsertAt(wire, 1, Wait(context.Number(0)));
             },
             {kSpan}),
      OnWire("stall-in-head", "waits in front of the blank line (0: for good)",
             [](Wire* wire, const FaultContext& context) {
               InsertAt(wire, FindPart(*wire, Part::kBlank), Wait(context.Number(0)));
             },
             {kSpan}),
      OnWire("stall-after-head", "waits behind the head (0: for good)",
             [](Wire* wire, const FaultContext& context) {
               InsertAt(wire, FindPart(*wire, Part::kBlank) + 1, Wait(context.Number(0)));
             },
             {kSpan}),
      OnWire("stall-in-body", "waits behind so many bytes of the body (0: for good)", StallInBody,
             {{"BYTES", "1", 0, kMostBytes}, kSpan}),
      OnWire(
          "stall-at-end", "keeps the connection open behind the answer and sends nothing more",
          [](Wire* wire, const FaultContext& context) { wire->push_back(Wait(context.Number(0))); },
          {kSpan}),
  };
}

std::vector<FaultType> PaceFaults() {
  return {
      OnBehaviour("slow", "sends so many bytes each so many milliseconds",
                  [](Behaviour* to, const FaultContext& context) {
                    to->write_piece = static_cast<size_t>(context.Number(0));
                    to->write_interval = milliseconds(context.Number(1));
                  },
                  {{"BYTES", "1", 1, kMostBytes}, {"MS", "50", 0, kMostMs}}),
      OnBehaviour(
          "stall-after-request", "reads the request and never answers",
          [](Behaviour* to, const FaultContext&) { to->after_request = AfterRequest::kStall; }, {}),
  };
}

}  // namespace

std::vector<FaultType> TimingFaults() {
  std::vector<FaultType> types = StallFaults();
  for (FaultType& type : PaceFaults()) types.push_back(std::move(type));
  return types;
}
