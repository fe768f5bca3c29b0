// What one operation of the soak does: chosen by the client, carried to the server inside the
// request itself, so that both sides know what has to come back and which fault the server plays.
#ifndef TARNWICK_TESTS_SOAK_PLAN_H_
#define TARNWICK_TESTS_SOAK_PLAN_H_

#include <cstddef>
#include <random>
#include <string>

enum class Operation {
  // with the server, over the client's socket
  kGet,            // SendRequestByGet, ReadBody
  kGetAgain,       // the same, with one object for the whole run
  kGetPieces,      // SendRequestByGet, ReadData
  kLoginGet,       // SendRequest(GET)
  kFormPost,       // SendRequestBySocketPost
  kSoap,           // SendReqBySocketPost
  kSoapLogin,      // SendAuthReqBySocketPost
  kSoapXml,        // SendReqByXMLSocketPost
  kUpload,         // OpenRawDataUpload, WriteData, GetResp
  kSecondRequest,  // SendRequestByGet, WriteData, GetResp
  kLines,          // TWSocket and SSLSocket alone
  kJsonGet,        // SendHttpGet
  kJsonPost,       // SendHttpPost
  // with the server, through libcurl
  kCurlGet,     // SendRequestByCurl(GET)
  kCurlPost,    // SendRequestByCurl(POST)
  kDownload,    // SendRequestByCurl(GET) into a file
  kLoginPost,   // SendRequest(POST)
  kXmlGet,      // SendReqByXMLGet, GetResponseXML
  kXmlPost,     // SendReqByXMLPost, GetResponseXML
  kXmlPut,      // SendReqByXMLPut, GetResponseXML
  kXmlDelete,   // SendReqByXMLDelete, GetResponseXML
  kJsonGetTls,  // SendHttpsGet
  // without a server
  kSettings,  // one key of the settings file, set and read
  kLevels,    // SaveDbgLogSettings, LoadDbgLogSettings
  kLog,       // TW_LOG and TWPrintf
  kEncoding,  // the encodings and texts of utils
  kThread,    // CreateThread
  kWriteFd,   // WriteFd, DelayTimer
  kCount_
};
constexpr int kOperations = static_cast<int>(Operation::kCount_);

enum class Fault {
  kNone,
  kSlow,  // a right reply in many small pieces: no fault, though it looks like one
  // on ports of their own
  kRefused,         // nobody listens
  kBlackHole,       // the connection is never made
  kHangUp,          // accepted and closed at once
  kNoise,           // bytes that nobody asked for, in place of a TLS handshake too
  kSilence,         // accepted and never answered, the TLS handshake neither
  kBadCertificate,  // another host's
  // played by the server behind the request
  kReset,         // no reply
  kStall,         // no reply in time
  kGarbage,       // a reply that is none
  kCutHead,       // closed within the head
  kCutBody,       // closed within the body
  kResetBody,     // reset within the body
  kStallBody,     // no further byte of the body in time
  kLongLength,    // the length announced is too large
  kShortLength,   // and too small
  kBadChunk,      // no number in place of a chunk's size
  kUnauthorized,  // 401, whatever the login
  kServerError,   // 500
  kCount_
};
constexpr int kFaults = static_cast<int>(Fault::kCount_);

enum class Framing { kLength, kChunked, kClose };
enum class Login { kNone, kBasic, kDigest, kOldDigest };

struct Plan {
  Operation operation = Operation::kGet;
  Fault fault = Fault::kNone;
  unsigned id = 0;
  size_t size = 1;  // of the answer's variable part
  Framing framing = Framing::kLength;
  Login login = Login::kNone;
  bool tls = false;
};

constexpr char kUser[] = "soak";
constexpr char kPassword[] = "pa55 word";
constexpr char kRealm[] = "soak realm";
constexpr char kBoundary[] = "-----------QUENMULTIPART_BOUNDARY-----------";

// A query with characters to encode, and as it must arrive.
constexpr char kQuery[] = "?a=1 2&b=x+y";
constexpr char kEncodedQuery[] = "?a=1%202&b=x%2By";

const char* NameOf(Operation operation);
const char* NameOf(Fault fault);

bool UsesServer(Operation operation);
bool UsesCurl(Operation operation);
bool IsSoap(Operation operation);

// The next operation, with a fault in 5 of 100 of those that use the server.
using Random = std::mt19937;
Plan NextPlan(unsigned id, Random* random);
size_t Below(size_t limit, Random* random);

// The plan as a path without leading "/", and the first one found in a request.
std::string ToPath(const Plan& plan);
bool FindPlan(const std::string& request, Plan* plan);

// What the answer's body is, and what a request with a body sends in it.
std::string AnswerOf(const Plan& plan);
std::string RequestBodyOf(const Plan& plan);

// The text in the answer's XML element or JSON member.
std::string ValueOf(const Plan& plan);

#endif  // TARNWICK_TESTS_SOAK_PLAN_H_
