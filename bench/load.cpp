// Loads libraries as a program's start does, and prints how many nanoseconds the measured took:
//
//   tarnwick_bench_load [BEFORE...] -- MEASURED...
#include <dlfcn.h>

#include <cstdio>
#include <cstring>
#include <ctime>

namespace {

bool Load(const char* library) {
  if (dlopen(library, RTLD_NOW | RTLD_GLOBAL) != nullptr) return true;
  std::fprintf(stderr, "%s\n", dlerror());
  return false;
}

double Nanoseconds() {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return static_cast<double>(now.tv_sec) * 1e9 + static_cast<double>(now.tv_nsec);
}

}  // namespace

int main(int argc, char** argv) {
  int i = 1;
  for (; i < argc && std::strcmp(argv[i], "--") != 0; ++i) {
    if (!Load(argv[i])) return 1;
  }
  const double start = Nanoseconds();
  for (++i; i < argc; ++i) {
    if (!Load(argv[i])) return 1;
  }
  std::printf("%.0f\n", Nanoseconds() - start);
}
