// Is linked with the shared library and with one that ends after it, and tells the bytes of heap that
// are in use between the two ends.
//
//   exit_probe names     the library has built the names of the categories,
//   exit_probe none      or has not
#include <cstring>

#include "tarnwick/log/twdebuglog.h"

// In last_end.cpp: the linker keeps the library for this call.
extern "C" int LastEndIsLinked();

int main(int argc, char** argv) {
  if (argc != 2 || LastEndIsLinked() == 0) return 2;
  const bool with_names = strcmp(argv[1], "names") == 0;
  return with_names && strcmp(TWLogName(LOG_CATEG_HTTP), "http") != 0 ? 1 : 0;
}
