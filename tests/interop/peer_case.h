// What one operation makes of one peer, as a line of a table:
//
//   {"GetsJson", Op::kHttpGet, "", "json", "none", OneCall(0, "true")},
//
// A line is a test, and a row of the table of compatibility.
#ifndef TARNWICK_TESTS_INTEROP_PEER_CASE_H_
#define TARNWICK_TESTS_INTEROP_PEER_CASE_H_

#include <ostream>

#include "tests/interop/servers.h"

enum class Op {
  kHttpGet,   // SendHttpGet
  kHttpPost,  // SendHttpPost
  kHttpsGet,  // SendHttpsGet, with the authority of the tests trusted
  kGet,       // SendRequest(HTTP_METHOD_GET) and ReadBody
  kForm,      // SendRequestBySocketPost and ReadBody
  kPost,      // SendRequest(HTTP_METHOD_POST)
  kSoap,      // SendReqBySocketPost
  kSoapAuth,  // SendAuthReqBySocketPost
  kXmlGet,    // SendReqByXMLGet and GetResponseXML
  kXmlPut,    // SendReqByXMLPut and GetResponseXML
  kCurl,      // SendRequestByCurl(HTTP_METHOD_GET)
  kUpload,    // OpenRawDataUpload, a short body and GetResp
};

struct Outcome {
  int result;        // of the operation; of ReadBody where that belongs to it
  int check;         // CheckResponse after it
  int status;        // the status of the last response over the socket, 0 without one
  const char* text;  // a part of the body, of the document's root or of the JSON value
  bool waits;        // the operation ends by time-outs
};

// After a status from 200 to 299.
constexpr Outcome Got(const char* text) {
  return {HTTP_RET_OK, HTTP_RET_OK, 200, text, false};
}

// The same, but the server does not close: the whole body comes, and then nothing for three
// time-outs.
constexpr Outcome KeptOpen(const char* text) {
  return {HTTP_RET_IO_ERROR, HTTP_RET_OK, 200, text, true};
}

// A response of SOAP without a length.
constexpr Outcome NoLength() {
  return {HTTP_RET_IO_ERROR, HTTP_RET_OK, 200, "", false};
}

// The peer ends the connection instead of responding. CheckResponse has not seen the request when
// the end comes before that is written.
inline constexpr int kIoErrorOrNotReady = -1;
constexpr Outcome NoResponse(int check = kIoErrorOrNotReady) {
  return {HTTP_RET_IO_ERROR, check, 0, "", false};
}

// A SendRequest or ReadBody that succeeds after another status.
constexpr Outcome Responded(int check, int status, const char* text = "") {
  return {HTTP_RET_OK, check, status, text, false};
}

// SendAuthReqBySocketPost, which returns the outcome of the last response.
constexpr Outcome Refused(int check, int status) {
  return {check, check, status, "", false};
}

// An upload whose head is refused at once.
constexpr Outcome UploadRefused() {
  return {HTTP_RET_OK, HTTP_RET_BAD_RESPONSE, 400, "{\"error\":true}", false};
}

// An upload without a response.
constexpr Outcome UploadAwaited() {
  return {HTTP_RET_OK, HTTP_RET_IO_ERROR, 0, "{\"error\":true}", true};
}

// Through libcurl: the outcome of the transfer, and no status.
constexpr Outcome ByCurl(int result, const char* text = "") {
  return {result, result, 0, text, false};
}

// A function without a client, so without a state afterwards.
constexpr Outcome OneCall(int result, const char* text = "") {
  return {result, 0, 0, text, false};
}

struct PeerCase {
  const char* name;  // of the test
  Op op;
  const char* note;  // what the table adds to the name of the operation
  const char* path;
  const char* login;  // as the table shows it; "wrong password" sends one
  Outcome expected;
  const char* result = "passed";  // as the table shows it
  const char* port = "PORT";
  const char* transport = "plain";
  HTTP_VERSION version = HTTP_VERSION_NONE;
};

std::ostream& operator<<(std::ostream& out, const PeerCase& c);

// Results that several peers share.
inline constexpr char kNoLength[] =
    "not possible: the response must announce its Content-Length (HTTP_RET_IO_ERROR)";
inline constexpr char kKeptOpenForm[] =
    "not possible: the server ignores \"Connection: close;\"; the whole body, then "
    "HTTP_RET_IO_ERROR after three time-outs";
inline constexpr char kKeptOpenGet[] =
    "not possible: the server keeps the connection; the whole body, then HTTP_RET_IO_ERROR after "
    "three time-outs";
inline constexpr char kBlankRefused[] =
    "not possible: the server refuses a header name with a blank before its colon (400)";
inline constexpr char kUploadAwaited[] =
    "not possible: the server waits for the 128 GiB that the head announces";
inline constexpr char kBasicAlone[] =
    "not possible: this operation logs in by Basic alone, so the 401 stays";

// Plays `c` against `server`: over the client's socket once buffered and, unless that waits, once
// direct.
void Play(const WebServer& server, const PeerCase& c);

#endif  // TARNWICK_TESTS_INTEROP_PEER_CASE_H_
