#include "tests/attack/death.h"

#include <csignal>
#include <initializer_list>

// The sanitizers' runtime, when there is one.
extern "C" __attribute__((weak)) void __sanitizer_set_death_callback(void (*callback)());

namespace {

void (*g_tell)();

void TellAndDie(int number) {
  g_tell();
  signal(number, SIG_DFL);
  raise(number);
}

}  // namespace

void TellAtDeath(void (*tell)()) {
  g_tell = tell;
  if (__sanitizer_set_death_callback != nullptr) {
    __sanitizer_set_death_callback(tell);
  } else {
    for (const int number : {SIGSEGV, SIGBUS, SIGFPE, SIGILL}) signal(number, TellAndDie);
  }
  for (const int number : {SIGABRT, SIGPIPE}) signal(number, TellAndDie);
}
