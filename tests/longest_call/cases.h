// The table of calls whose duration is derived, for docs/longest-call.md, and measured.
#ifndef TARNWICK_TESTS_LONGEST_CALL_CASES_H_
#define TARNWICK_TESTS_LONGEST_CALL_CASES_H_

#include <functional>
#include <string>
#include <vector>

#include "tests/support/peer_steps.h"

// The time-out of every case, in seconds: T in the table.
inline constexpr int kTimeout = 1;

// How long a peer holds a call that has no limit, in seconds: longer than any limited silence.
inline constexpr double kHold = 17;

enum class Peer { kPlain, kTls, kTlsByteByByte, kBlackHole };

// A call, what its peer does, and the longest that it can take.
struct Case {
  const char* name;   // as the document has it
  const char* bound;  // the same; T is the time-out
  double seconds;     // the bound of this run; 0 when there is none, and the peer gives way
  std::vector<Script> scripts;
  std::function<int(int port)> operation;
  int result;  // of the operation: what tells that the peer did what the case is about
  Peer peer = Peer::kPlain;
};

std::vector<Case> SocketCases();
std::vector<Case> ClientCases();
std::vector<Case> BodyCases();
std::vector<Case> CurlCases();

// Calls that wait for another process; the log's lock stops every other case, so they come last.
std::vector<Case> LockCases();

// Holds the connection still for so long.
Step Pause(double seconds);

// A pause, and then a byte behind the other with the same pause in between.
Script Drip(const std::string& bytes, double pause);

// What a peer does that never answers, and one that gives way after kHold.
Script Silent();
Script SilentBehind(const std::string& bytes);
Script GivesWay();

#endif  // TARNWICK_TESTS_LONGEST_CALL_CASES_H_
