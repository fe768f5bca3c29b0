// A shared library that is initialised before the library, and so ends after it.
#include <malloc.h>

#include <cstdio>

extern "C" int LastEndIsLinked() {
  return 1;
}

__attribute__((destructor)) static void TellTheHeap() {
  printf("%zu\n", mallinfo2().uordblks);
}
