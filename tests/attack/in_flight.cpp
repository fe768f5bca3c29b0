#include "tests/attack/in_flight.h"

#include <signal.h>
#include <unistd.h>

#include <cstdio>
#include <initializer_list>

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#include <sanitizer/common_interface_defs.h>
#endif

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

void PrintAndDie(int signal_number) {
  Print();
  signal(signal_number, SIG_DFL);
  raise(signal_number);
}

}  // namespace

void SetInFlight(uint64_t seed, uint64_t number) {
  t_seed = seed;
  t_number = number;
}

void PrintInFlightAtDeath() {
  signal(SIGABRT, PrintAndDie);
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  __sanitizer_set_death_callback(Print);
#else
  for (const int fatal : {SIGSEGV, SIGBUS, SIGFPE, SIGILL}) signal(fatal, PrintAndDie);
#endif
}
