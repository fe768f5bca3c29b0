// What every fuzz target does at its start and at a difference.
#ifndef TARNWICK_FUZZ_SUPPORT_TARGET_H_
#define TARNWICK_FUZZ_SUPPORT_TARGET_H_

#include <cstdint>
#include <string>
#include <string_view>

// The library logs at the most talkative level, so that the arguments of every message are built.
void LogEverything();

// Compares what the library gave to what the oracle expects: a difference prints both and aborts.
void ExpectSame(const char* what, int64_t library, int64_t oracle);
void ExpectSame(const char* what, std::string_view library, std::string_view oracle);

// Aborts with `what` unless `holds`.
void Expect(const char* what, bool holds);

#endif  // TARNWICK_FUZZ_SUPPORT_TARGET_H_
