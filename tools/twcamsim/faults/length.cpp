// Faults of Content-Length.
#include <cstdlib>

#include "tools/twcamsim/faults.h"

namespace {

constexpr char kLength[] = "Content-Length";
constexpr int64_t kMostBytes = int64_t{1} << 40;

// A chunked response has no Content-Length that could be wrong.
void WholeBody(Response* response, const FaultContext&) {
  response->chunked = false;
}

FaultType Make(const char* name, const char* meaning, void (*hook)(Steps*, const FaultContext&),
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.response = WholeBody;
  hooks.steps = hook;
  return {name, "length", std::move(rules), meaning, hooks};
}

int64_t BodySize(const Steps& steps) {
  const size_t body = FindPart(steps, Part::kBody);
  return body < steps.size() ? static_cast<int64_t>(steps[body].bytes.size()) : 0;
}

void SetLength(Steps* steps, const std::string& value) {
  SetHeader(steps, kLength, value);
}

// After a body that is shorter than announced, a client can only wait; the connection closes so
// that the wait has an end.
void CloseAfterBody(Steps* steps) {
  SetHeader(steps, "Connection", "close");
  steps->push_back({Action::kClose, Part::kBody, "", {}});
}

void TooLong(Steps* steps, const FaultContext& context) {
  SetLength(steps, std::to_string(BodySize(*steps) + context.Number(0)));
  CloseAfterBody(steps);
}

void TooShort(Steps* steps, const FaultContext& context) {
  SetLength(steps, std::to_string(std::max<int64_t>(BodySize(*steps) - context.Number(0), 0)));
  CloseAfterBody(steps);
}

void Missing(Steps* steps, const FaultContext&) {
  RemoveHeader(steps, kLength);
  CloseAfterBody(steps);
}

void Double(Steps* steps, const FaultContext& context) {
  const std::string second = std::to_string(BodySize(*steps) + context.Number(0));
  SetLength(steps, std::to_string(BodySize(*steps)) + "\r\nContent-Length: " + second);
}

void Huge(Steps* steps, const FaultContext&) {
  SetLength(steps, "99999999999999999999");
  CloseAfterBody(steps);
}

}  // namespace

std::vector<FaultType> LengthFaults() {
  return {
      Make("length-too-long", "Content-Length announces so many bytes too many", TooLong,
           {{"BYTES", "10", 1, kMostBytes}}),
      Make("length-too-short", "Content-Length announces so many bytes too few", TooShort,
           {{"BYTES", "5", 1, kMostBytes}}),
      Make("length-missing", "no Content-Length; the body ends with the connection", Missing),
      Make("length-double", "two Content-Length lines, the second larger by so many bytes", Double,
           {{"BYTES", "10", 0, kMostBytes}}),
      Make("length-negative", "Content-Length is -1",
           [](Steps* steps, const FaultContext&) { SetLength(steps, "-1"); }),
      Make("length-zero", "Content-Length is 0 in front of a body",
           [](Steps* steps, const FaultContext&) { SetLength(steps, "0"); }),
      Make("length-huge", "Content-Length is a number of 20 digits", Huge),
      Make("length-text", "Content-Length is no number",
           [](Steps* steps, const FaultContext&) { SetLength(steps, "many"); }),
      Make("length-empty", "Content-Length has no value",
           [](Steps* steps, const FaultContext&) { SetLength(steps, ""); }),
  };
}
