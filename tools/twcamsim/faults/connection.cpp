// Faults of the connection: before, instead of and in the middle of a response.
#include "tools/twcamsim/faults.h"

namespace {

using std::chrono::milliseconds;

constexpr int64_t kMostBytes = int64_t{1} << 40;  // of an output or a request
constexpr int64_t kMostAtOnce = INT32_MAX;
constexpr int64_t kMostMs = 3600000;

FaultHooks OnBehaviour(void (*hook)(Behaviour*, const FaultContext&)) {
  FaultHooks hooks;
  hooks.behaviour = hook;
  return hooks;
}

FaultHooks OnSteps(void (*hook)(Steps*, const FaultContext&)) {
  FaultHooks hooks;
  hooks.steps = hook;
  return hooks;
}

constexpr char kGroup[] = "connection";

// Keeps the first `bytes` of what `part` and all after it send, and ends the connection there.
void CutAfter(Steps* steps, size_t first, size_t bytes, Action end) {
  for (size_t i = first; i < steps->size(); ++i) {
    Step& step = (*steps)[i];
    if (step.bytes.size() > bytes) {
      step.bytes.resize(bytes);
      steps->resize(i + 1);
      break;
    }
    bytes -= step.bytes.size();
  }
  steps->push_back({end, Part::kBody, "", {}});
}

size_t BytesFrom(const Steps& steps, size_t first) {
  size_t bytes = 0;
  for (size_t i = first; i < steps.size(); ++i) bytes += steps[i].bytes.size();
  return bytes;
}

// -1 stands for a point that the seed chooses, before the end.
void CutBody(Steps* steps, const FaultContext& context) {
  const size_t first = FindPart(*steps, Part::kBlank) + 1;
  const size_t all = first < steps->size() ? BytesFrom(*steps, first) : 0;
  const int64_t asked = context.Number(0);
  const size_t bytes =
      asked >= 0 ? static_cast<size_t>(asked) : static_cast<size_t>(context.random->Below(all));
  CutAfter(steps, std::min(first, steps->size()), bytes, Action::kClose);
}

void CutHead(Steps* steps, const FaultContext& context) {
  const size_t blank = std::min(FindPart(*steps, Part::kBlank) + 1, steps->size());
  const size_t head = BytesFrom(*steps, 0) - BytesFrom(*steps, blank);
  const int64_t asked = context.Number(0);
  const size_t bytes = asked >= 0 ? static_cast<size_t>(asked)
                                  : 1 + static_cast<size_t>(context.random->Below(head - 2));
  CutAfter(steps, 0, bytes, Action::kClose);
}

std::vector<FaultType> EarlyFaults() {
  return {
      {"refuse",
       kGroup,
       {},
       "nothing listens on the port: connections are refused",
       OnBehaviour([](Behaviour* to, const FaultContext&) { to->listening = Listening::kRefuse; })},
      {"black-hole",
       kGroup,
       {},
       "connections get no response at all: the accept queue is kept full, so SYNs are dropped",
       OnBehaviour(
           [](Behaviour* to, const FaultContext&) { to->listening = Listening::kBlackHole; })},
      {"slow-accept",
       kGroup,
       {{"MS", "1000", 0, kMostMs}},
       "the connection is taken up so many milliseconds late",
       OnBehaviour([](Behaviour* to, const FaultContext& context) {
         to->accept_delay = milliseconds(context.Number(0));
       })},
      {"close-at-once",
       kGroup,
       {},
       "closes each connection without reading from it",
       OnBehaviour([](Behaviour* to, const FaultContext&) { to->opening = Opening::kClose; })},
      {"reset-at-once",
       kGroup,
       {},
       "resets each connection without reading from it",
       OnBehaviour([](Behaviour* to, const FaultContext&) { to->opening = Opening::kReset; })},
      {"never-read",
       kGroup,
       {},
       "takes the connection and reads nothing from it",
       OnBehaviour([](Behaviour* to, const FaultContext&) { to->opening = Opening::kNeverRead; })},
  };
}

std::vector<FaultType> RequestFaults() {
  return {
      {"close-in-request",
       kGroup,
       {{"BYTES", "10", 0, kMostBytes}},
       "closes when so many bytes of the request have come",
       OnBehaviour([](Behaviour* to, const FaultContext& context) {
         to->request_limit = context.Number(0);
       })},
      {"close-after-request",
       kGroup,
       {},
       "reads the request and closes without a response",
       OnBehaviour(
           [](Behaviour* to, const FaultContext&) { to->after_request = AfterRequest::kClose; })},
      {"reset-after-request",
       kGroup,
       {},
       "reads the request and resets the connection",
       OnBehaviour(
           [](Behaviour* to, const FaultContext&) { to->after_request = AfterRequest::kReset; })},
      {"read-slowly",
       kGroup,
       {{"BYTES", "1024", 1, kMostAtOnce}, {"MS", "100", 0, kMostMs}},
       "reads the request by so many bytes each so many milliseconds",
       OnBehaviour([](Behaviour* to, const FaultContext& context) {
         to->read_piece = static_cast<size_t>(context.Number(0));
         to->read_interval = milliseconds(context.Number(1));
       })},
  };
}

void LimitOutput(Behaviour* to, int64_t bytes, bool reset) {
  to->output_limit = bytes;
  to->reset_at_limit = reset;
}

std::vector<FaultType> CutFaults() {
  return {
      {"reset-at",
       kGroup,
       {{"BYTES", "0", 0, kMostBytes}},
       "resets the connection after so many bytes of output",
       OnBehaviour([](Behaviour* to, const FaultContext& context) {
         LimitOutput(to, context.Number(0), true);
       })},
      {"cut-at",
       kGroup,
       {{"BYTES", "0", 0, kMostBytes}},
       "closes the connection after so many bytes of output",
       OnBehaviour([](Behaviour* to, const FaultContext& context) {
         LimitOutput(to, context.Number(0), false);
       })},
      {"cut-head",
       kGroup,
       {{"BYTES", "-1", -1, kMostAtOnce}},
       "closes after so many bytes of the head; -1: where the seed says",
       OnSteps(CutHead)},
      {"cut-body",
       kGroup,
       {{"BYTES", "-1", -1, kMostAtOnce}},
       "closes after so many bytes of the body; -1: where the seed says",
       OnSteps(CutBody)},
  };
}

}  // namespace

std::vector<FaultType> ConnectionFaults() {
  std::vector<FaultType> types = EarlyFaults();
  for (const auto part : {RequestFaults, CutFaults}) {
    for (FaultType& type : part()) types.push_back(std::move(type));
  }
  return types;
}
