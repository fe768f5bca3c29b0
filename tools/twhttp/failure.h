// Why a request failed: pure functions over what was observed.
#ifndef TARNWICK_TOOLS_TWHTTP_FAILURE_H_
#define TARNWICK_TOOLS_TWHTTP_FAILURE_H_

#include <string>
#include <vector>

#include "tools/twhttp/evidence.h"

enum class FailureClass {
  kNone,
  kOther,
  kLocalFile,
  kLookUp,
  kRefused,
  kUnreachable,
  kConnectTimeout,
  kReset,
  kNoReply,
  kWriteFailed,
  kReadTimeout,
  kKeptOpen,
  kGaveUp,
  kTls,
  kCertificate,
  kMalformedHead,
  kCutBody,
  kNoLength,
  kLoginRefused,
  kLoginWanted,
  kStatus,
  kXml,
  kJson,
  kNotSuccess,
  kEmptyBody,
  kInterrupted,
};

// A class's fixed part: its exit code, and what people are told.
struct ClassFacts {
  FailureClass id;
  int exit_code;
  const char* name;       // for --json and --repeat
  const char* meaning;    // one sentence
  const char* causes[4];  // the likeliest first; the rest is null
  const char* next;       // the next command; {host}, {port}, {url}, {operation} are filled in
};

const ClassFacts& FactsOf(FailureClass id);

// The exit codes as a table, for people.
std::string ExitCodeTable();

struct Failure {
  FailureClass id = FailureClass::kNone;
  std::string phase;   // "connect", "head" ...
  std::string peer;    // "camera:80 (192.0.2.7:80)"
  std::string detail;  // what was seen, in one sentence
  std::string system;  // the words of errno, OpenSSL or libcurl; may be empty
  double elapsed = 0;  // seconds, of the whole operation
  std::string limit;   // the limit that applies to the phase
  std::vector<std::string> causes;
  std::string next;
};

// The class alone, decided by the first rule that fits.
FailureClass Classify(const Evidence& evidence);

// The whole explanation. `id` is kNone when all went well.
Failure Explain(const Evidence& evidence);

// The tool's own limit for one wait, in seconds; 0 for none.
double GiveUpLimit(const Options& options);

// What the waits of the socket operations are limited by: "5 s a wait, 7 waits".
std::string WaitLimit(const Options& options);

#endif  // TARNWICK_TOOLS_TWHTTP_FAILURE_H_
