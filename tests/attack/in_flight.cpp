#include "tests/attack/in_flight.h"

#include <unistd.h>

#include <cstdio>

#include "tests/attack/death.h"

namespace {

thread_local uint64_t t_seed;
thread_local uint64_t t_number;

void Print() {
  char text[120];
  const int length =
      snprintf(text, sizeof(text), "died at --seed %lu --only %lu\n",
               static_cast<unsigned long>(t_seed), static_cast<unsigned long>(t_number));
  if (write(STDOUT_FILENO, text, static_cast<size_t>(length)) != length) _exit(3);
}

}  // namespace

void SetInFlight(uint64_t seed, uint64_t number) {
  t_seed = seed;
  t_number = number;
}

void PrintInFlightAtDeath() {
  TellAtDeath(Print);
}
