// Faults of Content-Length.
#include <cstdlib>

#include "tools/twcamsim/faults.h"

namespace {

constexpr char kLength[] = "Content-Length";
constexpr int64_t kMostBytes = int64_t{1} << 40;

// A length that chunks make superfluous would be none.
void WholeBody(Response* response, const FaultContext&) {
  response->chunked = false;
}

FaultType Make(const char* name, const char* meaning, void (*hook)(Wire*, const FaultContext&),
               std::vector<ArgumentRule> rules = {}) {
  FaultHooks hooks;
  hooks.response = WholeBody;
  hooks.wire = hook;
  return {name, "length", std::move(rules), meaning, hooks};
}

int64_t BodySize(const Wire& wire) {
  const size_t body = FindPart(wire, Part::kBody);
  return body < wire.size() ? static_cast<int64_t>(wire[body].bytes.size()) : 0;
}

void SetLength(Wire* wire, const std::string& value) {
  SetWireHeader(wire, kLength, value);
}

// Behind a body that is shorter than announced, a client can only wait; the connection closes so
// that the wait has an end.
void CloseBehind(Wire* wire) {
  SetWireHeader(wire, "Connection", "close");
  wire->push_back({Action::kClose, Part::kBody, "", {}});
}

void TooLong(Wire* wire, const FaultContext& context) {
  SetLength(wire, std::to_string(BodySize(*wire) + context.Number(0)));
  CloseBehind(wire);
}

void TooShort(Wire* wire, const FaultContext& context) {
  SetLength(wire, std::to_string(std::max<int64_t>(BodySize(*wire) - context.Number(0), 0)));
  CloseBehind(wire);
}

void Missing(Wire* wire, const FaultContext&) {
  RemoveWireHeader(wire, kLength);
  CloseBehind(wire);
}

void Double(Wire* wire, const FaultContext& context) {
  const std::string second = std::to_string(BodySize(*wire) + context.Number(0));
  SetLength(wire, std::to_string(BodySize(*wire)) + "\r\nContent-Length: " + second);
}

void Huge(Wire* wire, const FaultContext&) {
  SetLength(wire, "99999999999999999999");
  CloseBehind(wire);
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
           [](Wire* wire, const FaultContext&) { SetLength(wire, "-1"); }),
      Make("length-zero", "Content-Length is 0 in front of a body",
           [](Wire* wire, const FaultContext&) { SetLength(wire, "0"); }),
      Make("length-huge", "Content-Length is a number of 20 digits", Huge),
      Make("length-text", "Content-Length is no number",
           [](Wire* wire, const FaultContext&) { SetLength(wire, "many"); }),
      Make("length-empty", "Content-Length has no value",
           [](Wire* wire, const FaultContext&) { SetLength(wire, ""); }),
  };
}
