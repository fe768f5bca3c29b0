// A parser with a fault on purpose: the test fuzz_planted_fault fails when this target runs through,
// for then the detectors are off. It takes a header line apart and copies its value without a look
// at the size.
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string>

namespace {

constexpr size_t kMostValue = 16;

// Results: the length of the value of "Name: value".
size_t CopyValue(const std::string& line, char* value) {
  const size_t colon = line.find(": ");
  if (colon == std::string::npos) return 0;
  const std::string rest = line.substr(colon + 2);
  std::memcpy(value, rest.data(), rest.size());  // the planted fault
  return rest.size();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  char value[kMostValue] = {};
  return CopyValue(std::string(reinterpret_cast<const char*>(data), size), value) > SIZE_MAX / 2;
}
