// When the process dies, which exchange or call the dying thread was at.
#ifndef TARNWICK_TESTS_ATTACK_IN_FLIGHT_H_
#define TARNWICK_TESTS_ATTACK_IN_FLIGHT_H_

#include <cstdint>

// From now on a report of a sanitizer's and a fatal signal print this thread's seed and number.
void PrintInFlightAtDeath();

void SetInFlight(uint64_t seed, uint64_t number);

#endif  // TARNWICK_TESTS_ATTACK_IN_FLIGHT_H_
