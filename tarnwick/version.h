// The library's version: what a program was compiled with, and what it runs with.
//
//   if (TWVersionNumber() < TARNWICK_VERSION_NUMBER) puts("older than what I was built with");
#ifndef TARNWICK_VERSION_H_
#define TARNWICK_VERSION_H_

#include "tarnwick/platform/export.h"

// Programs that were built with the same major version run with this library; a minor version adds
// names, a patch adds none.
#define TARNWICK_VERSION_MAJOR 1
#define TARNWICK_VERSION_MINOR 1
#define TARNWICK_VERSION_PATCH 0

// The version as one number that grows: 10203 is 1.2.3.
#define TARNWICK_VERSION_NUMBER \
  (TARNWICK_VERSION_MAJOR * 10000 + TARNWICK_VERSION_MINOR * 100 + TARNWICK_VERSION_PATCH)

// The version of the library that the program runs with: TARNWICK_VERSION_NUMBER of its build.
// Threads: any.
TARNWICK_API int TWVersionNumber();

// The same as a string, for example "1.0.0". It lives as long as the library is loaded.
// Threads: any.
TARNWICK_API const char* TWVersion();

#endif  // TARNWICK_VERSION_H_
