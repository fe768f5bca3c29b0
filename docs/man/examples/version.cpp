// tarnwick_version(3): what the program was built with, and what it runs with.
#include <cstdio>

#include "docs/man/examples/examples.h"
#include "tarnwick/version.h"

bool LibraryIsNewEnough() {
  if (TWVersionNumber() >= TARNWICK_VERSION_NUMBER) return true;
  std::fprintf(stderr, "libtarnwick %s is older than what this was built with\n", TWVersion());
  return false;
}
