// What is told when the process dies.
#ifndef TARNWICK_TESTS_ATTACK_DEATH_H_
#define TARNWICK_TESTS_ATTACK_DEATH_H_

// From now on a report of a sanitizer, and a signal that ends the process, call `tell` first, in the
// thread that dies.
void TellAtDeath(void (*tell)());

#endif  // TARNWICK_TESTS_ATTACK_DEATH_H_
