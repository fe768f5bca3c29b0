#include "bench/measured.h"

#include <cstdio>
#include <cstdlib>

void Fail(const char* who, const std::string& what) {
  std::fprintf(stderr, "bench: %s %s\n", who, what.c_str());
  std::exit(1);
}
