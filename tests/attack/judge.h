// What an exchange may come to, and what is a finding.
#ifndef TARNWICK_TESTS_ATTACK_JUDGE_H_
#define TARNWICK_TESTS_ATTACK_JUDGE_H_

#include <string>
#include <vector>

#include "tests/attack/exchange.h"
#include "tests/attack/peer_thread.h"

// One exchange after it has been played.
struct Played {
  OperationResult outcome;
  PeerRecord record;
  double seconds = 0;
  double without_processor = 0;  // of these seconds; see SecondsWithoutProcessor
  std::string log;               // what the library has logged
};

// The seconds that the exchange may take at most. A pause of the server's holds a call for as long
// as it lasts, or for the operation's waits of docs/longest-call.md if that is less; to this comes
// the time that the server took to send, the time that either thread was ready and had no processor,
// and a margin in seconds.
double LongestAllowed(const HostileExchange& exchange, const Played& played, double margin);

// The findings; empty when there are none.
std::vector<std::string> Judge(const HostileExchange& exchange, const Played& played,
                               double margin);

// Whether a clean response came whole, so that the status and the body were compared.
bool IsUnderstood(const HostileExchange& exchange, const PeerRecord& record);

// What is wrong with log lines that were written inside SetEscapedLog; empty for nothing.
std::string EscapedLogProblem(const std::string& log);

#endif  // TARNWICK_TESTS_ATTACK_JUDGE_H_
