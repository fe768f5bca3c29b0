// What all that is measured needs.
#ifndef TARNWICK_BENCH_MEASURED_H_
#define TARNWICK_BENCH_MEASURED_H_

#include <string>

// Takes what an operation has computed, so that the compiler cannot leave it out, and makes it look
// at memory anew afterwards.
inline void Use(const void* result) {
  asm volatile("" : : "g"(result) : "memory");
}

// Ends the program with a line to stderr.
[[noreturn]] void Fail(const char* who, const std::string& what);

// The same when `good` is false. It stands in what is measured, so it makes no text before.
inline void Expect(bool good, const char* who, const char* what) {
  if (!good) Fail(who, what);
}

#endif  // TARNWICK_BENCH_MEASURED_H_
