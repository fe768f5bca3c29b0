// Every operation of the HTTP client and of the sockets that reads from a peer: one table, with
// what the headers and docs/longest-call.md say of each.
#ifndef TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_
#define TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_

#include <string>
#include <vector>

#include "tarnwick/http/twhttp.h"

// The peer and the client's settings.
struct Target {
  int port = 0;  // on 127.0.0.1
  bool tls = false;
  bool buffered = true;
  bool verify = false;  // libcurl verifies the certificate
  HTTP_VERSION version = HTTP_VERSION_NONE;
  int timeout = 10;    // seconds
  size_t piece = 512;  // bytes of the caller's buffer
};

// What an operation came to.
struct OperationOutcome {
  int result = 0;
  int response = HTTP_RET_OK;  // of CheckResponse, and its status; -1 when it was not asked for
  int status = -1;
  bool has_text = false;  // the operation has read a body, which is `text`
  std::string text;
  std::string mistake;  // what no contract allows; empty when there is nothing
};

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

enum class OverTls { kNever, kEither, kAlways };

struct PeerOperation {
  const char* name;
  OperationOutcome (*run)(const Target& target);
  OverTls tls;
  bool curl;
  Limit limit;
  int waits_buffered;  // of kWaits: with read-ahead and without
  int waits_direct;
  std::vector<int> results;  // the documented ones
  const char* request;       // its first line begins so
  Shows shows = Shows::kNothing;
  bool upload = false;  // the request has no end
  int most_requests = 1;
};

// A server of an attack responds to so many requests of one operation, and closes then.
inline constexpr int kMostDeliveries = 12;

const std::vector<PeerOperation>& PeerOperations();

// What the requests carry.
inline constexpr char kAttackPath[] = "attack.cgi?a=1";
inline constexpr char kAttackUser[] = "user";
inline constexpr char kAttackPassword[] = "pass word";

#endif  // TARNWICK_TESTS_OPERATIONS_OPERATIONS_H_
