// The operations that the hostile server attacks: those of the table that read a response, with
// what the headers and docs/longest-call.md say of each.
#ifndef TARNWICK_TESTS_ATTACK_ATTACKED_OPERATIONS_H_
#define TARNWICK_TESTS_ATTACK_ATTACKED_OPERATIONS_H_

#include <string>
#include <vector>

#include "tests/operations/operations.h"

// How long a peer that is silent once can hold an operation.
enum class Limit {
  kWaits,     // a number of waits of T
  kTransfer,  // t in all
  kNone,
};

// What an operation shows of the response's status.
enum class Shows {
  kNothing,
  kStatus,   // the status itself
  kSuccess,  // HTTP_RET_OK for those from 200 to 299 alone
  kJson,     // the same with -1 for all others
};

struct AttackedOperation : PeerOperation {
  Limit limit;
  int waits_buffered;  // of kWaits: with read-ahead and without
  int waits_direct;
  const char* request;  // its first line begins so
  Shows shows = Shows::kNothing;
  const char* body = "";
  int most_requests = 1;
  bool decoded = false;  // its text is the response's content
  bool upload = false;   // the request has no end
};

// A server of an attack responds to so many requests of one operation, and closes then.
inline constexpr int kMostDeliveries = 12;

const std::vector<AttackedOperation>& AttackedOperations();

// The operations of the table that are missed, each with a blank in front; empty for none.
std::string MissedOperations();

// The settings that all attacks share.
OperationSettings AttackSettings(const AttackedOperation& operation, size_t piece);

#endif  // TARNWICK_TESTS_ATTACK_ATTACKED_OPERATIONS_H_
