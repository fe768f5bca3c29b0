// One run over a range of exchanges, from its set-up to its verdict.
#ifndef TARNWICK_TESTS_ATTACK_EXCHANGE_RUN_H_
#define TARNWICK_TESTS_ATTACK_EXCHANGE_RUN_H_

#include "tests/attack/exchange_worker.h"

// Plays the run's exchanges and adds what only their sum shows to its findings: descriptors and
// memory. REQUIRES: the calling thread is the only one.
void PlayRun(ExchangeRun* run);

// That every planted violation is found, and found again by its number alone. Results: as an
// attack's.
int CheckExchanges(const AttackOptions& options);

#endif  // TARNWICK_TESTS_ATTACK_EXCHANGE_RUN_H_
