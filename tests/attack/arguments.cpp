// Calls of the public functions with hostile arguments.
#include <cstdio>

#include "tests/attack/attacks.h"

int RunArguments(const AttackOptions& /*options*/) {
  puts("arguments: 0 calls");
  return 0;
}
