// The table of calls whose duration is derived, for docs/longest-call.md, and measured.
#ifndef TARNWICK_TESTS_LONGEST_CALL_CASES_H_
#define TARNWICK_TESTS_LONGEST_CALL_CASES_H_

#include <functional>
#include <string>
#include <utility>
#include <vector>

#include "tests/operations/operations.h"
#include "tests/support/peer_steps.h"

// The time-out of every case, in seconds: T in the table; and t.
inline constexpr int kTimeout = 1;

// How long a peer holds a call that has no limit, in seconds: longer than any limited silence.
inline constexpr int kHold = 17;

// Who is at the other end. At most one of the two is given; without both the case needs no port.
struct CasePeer {
  std::string endpoint;         // the simulated camera's, in the words of its command line
  std::vector<Script> scripts;  // of the connections, where the camera has no such fault
  bool byte_by_byte = false;    // the scripts speak TLS, through a relay that delays bytes
};

inline CasePeer Camera(const std::string& endpoint) {
  return {endpoint, {}};
}

inline CasePeer Scripted(std::vector<Script> scripts, bool byte_by_byte = false) {
  return {"", std::move(scripts), byte_by_byte};
}

// A call, what its peer does, and the longest that it can take.
struct Case {
  const char* name;   // as the document has it
  const char* bound;  // the same; T is the time-out
  double seconds;     // the bound of this run; 0 when there is none, and the peer gives way
  CasePeer peer;
  std::function<int(int port)> operation;
  int result;  // of the operation: what tells that the peer did what the case is about
};

// Runs an operation of tests/operations, with `change` made to its settings. It returns the first
// failure of its steps, or what its last read returned.
using Change = std::function<void(OperationSettings& settings)>;
std::function<int(int port)> Operation(const char* name, const Change& change = {});

std::vector<Case> SocketCases();
std::vector<Case> ClientCases();
std::vector<Case> BodyCases();
std::vector<Case> CurlCases();

// Calls that wait for another process; the log's lock stops every other case, so they come last.
std::vector<Case> LockCases();

// A pause in seconds, and then one byte after the other with the same pause in between.
Script Drip(const std::string& bytes, double pause);

// The operations of the table that no case runs, each with a blank in front, after CasesOfPeers.
std::string MissedOperations();

#endif  // TARNWICK_TESTS_LONGEST_CALL_CASES_H_
