// tarnwick_platform(3): a setting that is read, changed and written.
#include <cstdlib>

#include "docs/man/examples/examples.h"
#include "tarnwick/platform/qlibcfile.h"

int DoubleSetting(const char* path, const char* key) {
  char value[32];
  const int length = QLIBCFileGetKeyValue(path, key, value, sizeof(value), 0);
  if (length < 0) return -1;                                 // errno tells why
  if (length >= static_cast<int>(sizeof(value))) return -1;  // the value was cut
  const std::string doubled = std::to_string(2 * std::strtol(value, nullptr, 10));
  return QLIBCFileSetKeyValue(path, key, doubled.c_str(), "%s=\"%s\"\n");
}
