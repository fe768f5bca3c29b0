// Exchanges with a hostile server.
#include <cstdio>

#include "tests/attack/attacks.h"

int RunExchanges(const AttackOptions& /*options*/) {
  puts("exchanges: 0");
  return 0;
}
