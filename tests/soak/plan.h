// What one operation of the soak does: chosen by the client, carried to the server inside the
// request itself, so that both sides know what has to come back and which fault the server plays.
#ifndef TARNWICK_TESTS_SOAK_PLAN_H_
#define TARNWICK_TESTS_SOAK_PLAN_H_

#include <cstddef>
#include <random>
#include <string>
#include <vector>

// What an operation sends in a body.
enum class Sends { kNothing, kEnvelope, kForm, kPreset, kIndentedPreset, kPath, kUpload };

enum Trait : unsigned {
  kSoap = 1U << 0,
  kXml = 1U << 1,            // a document comes back
  kJson = 1U << 2,           // or a value
  kLine = 1U << 3,           // or a line alone, without a head
  kLogsIn = 1U << 4,         // by whatever the server asks for
  kDecodesChunks = 1U << 5,  // the others read the body as it travels, or one of a known length
  kHasNoLimit = 1U << 6,     // where no connection is made, it would wait for minutes
  kSendsQuery = 1U << 7,     // with characters to encode
  kSendsCookie = 1U << 8,
  kOneObject = 1U << 9,  // for the whole run, as a daemon polls a camera
  kTwoRequests = 1U << 10,
  kReadsNothing = 1U << 11,
};

struct SoakOperation {
  const char* title;
  const char* name;  // in tests/operations; null: it needs no server
  unsigned traits = 0;
  Sends sends = Sends::kNothing;
};

// Those with a server come first.
const std::vector<SoakOperation>& SoakOperations();

// The operations of tests/operations that the soak misses, each with a blank in front.
std::string MissedOperations();

enum class Fault {
  kNone,
  kSlow,  // a right response in many small pieces: no fault, though it looks like one
  // on ports of their own
  kRefused,         // nobody listens
  kBlackHole,       // the connection is never made
  kHangUp,          // accepted and closed at once
  kNoise,           // bytes that nobody asked for, in place of a TLS handshake too
  kSilence,         // accepted and left without a byte, the TLS handshake too
  kBadCertificate,  // another host's
  // played by the server after the request
  kReset,         // no response
  kStall,         // no response in time
  kGarbage,       // bytes that are not a response
  kCutHead,       // closed within the head
  kCutBody,       // closed within the body
  kResetBody,     // reset within the body
  kStallBody,     // no further byte of the body in time
  kLongLength,    // the length announced is too large
  kShortLength,   // and too small
  kBadChunk,      // no number in place of a chunk's size
  kUnauthorized,  // 401, whatever the credentials
  kServerError,   // 500
  kCount_
};
constexpr int kFaults = static_cast<int>(Fault::kCount_);

enum class Framing { kLength, kChunked, kClose };
enum class Scheme { kNone, kBasic, kDigest, kOldDigest };

struct Plan {
  int operation = 0;  // its place among SoakOperations()
  Fault fault = Fault::kNone;
  unsigned id = 0;
  size_t size = 1;  // of the response's variable part
  Framing framing = Framing::kLength;
  Scheme scheme = Scheme::kNone;
  bool tls = false;
};

constexpr char kUser[] = "soak";
constexpr char kPassword[] = "pa55 word";
constexpr char kRealm[] = "soak realm";
constexpr char kBoundary[] = "-----------QUENMULTIPART_BOUNDARY-----------";

// A query with characters to encode, and as it must arrive.
constexpr char kQuery[] = "?a=1 2&b=x+y";
constexpr char kEncodedQuery[] = "?a=1%202&b=x%2By";

const char* NameOf(Fault fault);

const SoakOperation& OperationOf(const Plan& plan);
bool Has(const Plan& plan, Trait trait);
bool UsesServer(const Plan& plan);
bool UsesCurl(const Plan& plan);

// The next operation, with a fault in 5 of 100 of those that use the server.
using Random = std::mt19937;
Plan NextPlan(unsigned id, Random* random);
size_t Below(size_t limit, Random* random);

// The plan as a path without leading "/", and the first one found in a request.
std::string ToPath(const Plan& plan);
bool FindPlan(const std::string& request, Plan* plan);

// What the response's body is, and what a request with a body sends in it.
std::string ResponseBodyOf(const Plan& plan);
std::string RequestBodyOf(const Plan& plan);

// The text in the response's XML element or JSON member.
std::string ValueOf(const Plan& plan);

#endif  // TARNWICK_TESTS_SOAK_PLAN_H_
