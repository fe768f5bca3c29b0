// Faults of timing: responses that come late, slowly or never.
#include "tools/twcamsim/faults.h"

namespace {

using std::chrono::milliseconds;

constexpr int64_t kMostMs = 3600000;
constexpr int64_t kMostBytes = INT32_MAX;
const ArgumentRule kSpan = {"MS", "0", 0, kMostMs};  // 0: for good

FaultType OnSteps(const char* name, const char* meaning, void (*hook)(Steps*, const FaultContext&),
                  std::vector<ArgumentRule> rules) {
  FaultHooks hooks;
  hooks.steps = hook;
  return {name, "timing", std::move(rules), meaning, hooks};
}

FaultType OnBehaviour(const char* name, const char* meaning,
                      void (*hook)(Behaviour*, const FaultContext&),
                      std::vector<ArgumentRule> rules) {
  FaultHooks hooks;
  hooks.behaviour = hook;
  return {name, "timing", std::move(rules), meaning, hooks};
}

Step Wait(int64_t ms) {
  return {ms == 0 ? Action::kStall : Action::kPause, Part::kWait, "", milliseconds(ms)};
}

void InsertAt(Steps* steps, size_t index, const Step& step) {
  steps->insert(
      steps->begin() + static_cast<Steps::difference_type>(std::min(index, steps->size())), step);
}

// Waits after the first `bytes` of the step at `index`.
void WaitInside(Steps* steps, size_t index, size_t bytes, const Step& wait) {
  if (index >= steps->size()) return;
  Step rest = (*steps)[index];
  bytes = std::min(bytes, rest.bytes.size());
  rest.bytes.erase(0, bytes);
  (*steps)[index].bytes.resize(bytes);
  InsertAt(steps, index + 1, wait);
  InsertAt(steps, index + 2, rest);
}

void StallInBody(Steps* steps, const FaultContext& context) {
  const size_t body = FindPart(*steps, Part::kBody);
  const size_t bytes = static_cast<size_t>(context.Number(0));
  if (body == steps->size()) {  // an endless body, or none
    steps->push_back(Wait(context.Number(1)));
    return;
  }
  WaitInside(steps, body, bytes, Wait(context.Number(1)));
}

std::vector<FaultType> StallFaults() {
  return {
      OnSteps("stall-before-status", "waits in front of the status line (0: for good)",
              [](Steps* steps, const FaultContext& context) {
                InsertAt(steps, 0, Wait(context.Number(0)));
              },
              {kSpan}),
      OnSteps("stall-in-status", "waits after 8 bytes of the status line (0: for good)",
              [](Steps* steps, const FaultContext& context) {
                WaitInside(steps, 0, 8, Wait(context.Number(0)));
              },
              {kSpan}),
      OnSteps("stall-after-status", "waits after the status line (0: for good)",
              [](Steps* steps, const FaultContext& context) {
                InsertAt(steps, 1, Wait(context.Number(0)));
              },
              {kSpan}),
      OnSteps("stall-in-head", "waits in front of the blank line (0: for good)",
              [](Steps* steps, const FaultContext& context) {
                InsertAt(steps, FindPart(*steps, Part::kBlank), Wait(context.Number(0)));
              },
              {kSpan}),
      OnSteps("stall-after-head", "waits after the head (0: for good)",
              [](Steps* steps, const FaultContext& context) {
                InsertAt(steps, FindPart(*steps, Part::kBlank) + 1, Wait(context.Number(0)));
              },
              {kSpan}),
      OnSteps("stall-in-body", "waits after so many bytes of the body (0: for good)", StallInBody,
              {{"BYTES", "1", 0, kMostBytes}, kSpan}),
      OnSteps("stall-at-end", "keeps the connection open after the response and sends nothing more",
              [](Steps* steps, const FaultContext& context) {
                steps->push_back(Wait(context.Number(0)));
              },
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
          "stall-after-request", "reads the request and never responds",
          [](Behaviour* to, const FaultContext&) { to->after_request = AfterRequest::kStall; }, {}),
  };
}

}  // namespace

std::vector<FaultType> TimingFaults() {
  std::vector<FaultType> types = StallFaults();
  for (FaultType& type : PaceFaults()) types.push_back(std::move(type));
  return types;
}
