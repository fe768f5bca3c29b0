#include "tests/soak/operations.h"

#include <algorithm>

Outcome RunOperation(const Plan& plan, Session* session) {
  return UsesServer(plan) ? RunPeerOperation(plan, session) : RunLocalOperation(plan, session);
}

Outcome Compare(const std::string& got, const std::string& wanted) {
  if (got == wanted) return {Outcome::kRight, ""};
  if (wanted.compare(0, got.size(), got) == 0) return {Outcome::kCut, ""};
  const auto differ = std::mismatch(got.begin(), got.end(), wanted.begin(), wanted.end());
  return Wrong(std::to_string(got.size()) + " bytes where " + std::to_string(wanted.size()) +
               " were due, different from byte " + std::to_string(differ.first - got.begin()));
}

Outcome Wrong(const std::string& detail) {
  return {Outcome::kWrong, detail};
}
