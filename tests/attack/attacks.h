// The attacks that the program knows, and the options that it hands to them.
#ifndef TARNWICK_TESTS_ATTACK_ATTACKS_H_
#define TARNWICK_TESTS_ATTACK_ATTACKS_H_

#include <cstdint>
#include <string>

// The words of the command line. Each attack uses those that it has a meaning for.
struct AttackOptions {
  unsigned long count = 0;  // how many exchanges or calls; 0: as many as the attack takes by itself
  uint64_t seed = 1;        // the same seed and number give the same exchange or call
  long only = -1;           // the number of the one to run; -1: all
  int threads = 0;          // 0: as many as the attack takes by itself
  int tls = -1;             // per cent of the exchanges over TLS; -1: the attack's own share
  int stall = -1;           // per cent of the exchanges with a stall; -1: the attack's own share
  bool quick = false;       // the short form
  bool verbose = false;     // prints what the one of --only sends and does
  bool self_check = false;  // violations are planted, and each must be found
  std::string plant;        // the one violation to plant
};

// Results of an attack: 0 without a finding, 1 with one, 2 when it could not run.
int RunExchanges(const AttackOptions& options);
int RunArguments(const AttackOptions& options);

#endif  // TARNWICK_TESTS_ATTACK_ATTACKS_H_
