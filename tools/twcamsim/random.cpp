#include "tools/twcamsim/random.h"

namespace {

// The finishing step of splitmix64: neighbouring numbers come out far apart.
uint64_t Mix(uint64_t value) {
  value = (value ^ (value >> 30)) * 0xbf58476d1ce4e5b9u;
  value = (value ^ (value >> 27)) * 0x94d049bb133111ebu;
  return value ^ (value >> 31);
}

}  // namespace

Random::Random(uint64_t seed, uint64_t endpoint, uint64_t connection)
    : state_(Mix(Mix(Mix(seed) + endpoint) + connection)) {}

uint64_t Random::Next() {
  return Mix(state_ += 0x9e3779b97f4a7c15u);
}

uint64_t Random::Below(uint64_t limit) {
  return limit == 0 ? 0 : Next() % limit;
}

std::string Random::Hex(size_t bytes) {
  static constexpr char kDigits[] = "0123456789abcdef";
  std::string text;
  for (size_t i = 0; i < bytes; ++i) {
    const uint64_t byte = Next() & 0xff;
    text += kDigits[byte >> 4];
    text += kDigits[byte & 0xf];
  }
  return text;
}
