#include "tests/operations/operations.h"

#include "tests/operations/parts.h"

namespace {

const std::vector<int> kSent = {HTTP_RET_OK, HTTP_RET_IO_ERROR};
const std::vector<int> kTransferred = {HTTP_RET_OK, HTTP_RET_IO_ERROR, HTTP_RET_CERT_ERROR};
const std::vector<int> kOutcome = {HTTP_RET_OK,           HTTP_RET_NOT_READY,    HTTP_RET_IO_ERROR,
                                   HTTP_RET_UNAUTHORIZED, HTTP_RET_BAD_RESPONSE, HTTP_RET_REDIRECT,
                                   HTTP_RET_URI_TOO_LONG};

}  // namespace

// The waits are those of docs/longest-call.md for one silence: of the head 7 T and T, of a chunked
// body 14 T and 2 T; an operation that reads on after a failure waits for each. libcurl asks four
// times where a server changes between Basic and Digest, and more often than kMostDeliveries where
// it calls each nonce stale.
const std::vector<PeerOperation>& PeerOperations() {
  constexpr auto kEither = OverTls::kEither;
  constexpr auto kNever = OverTls::kNever;
  constexpr auto kWaits = Limit::kWaits;
  constexpr auto kAll = Limit::kTransfer;
  constexpr auto kNone = Limit::kNone;
  constexpr auto kNothing = Shows::kNothing;
  constexpr auto kStatus = Shows::kStatus;
  constexpr auto kSuccess = Shows::kSuccess;
  static constexpr char kGet[] = "GET /attack.cgi?a=1 HTTP/1.";
  static constexpr char kPost[] = "POST /attack.cgi?a=1 HTTP/1.1";
  static const std::vector<PeerOperation> operations = {
      {"get_body", GetBody, kEither, false, kWaits, 14, 2, kSent, kGet, kStatus},
      {"get_data", GetData, kEither, false, kWaits, 7, 1, kSent, kGet, kStatus},
      {"get_lines", GetLines, kEither, false, kWaits, 14, 3, kSent, kGet, kStatus},
      {"get_twice", GetTwice, kEither, false, kWaits, 14, 2, kSent, kGet, kStatus, false, 2},
      {"get_head_again", GetHeadAgain, kEither, false, kWaits, 21, 3, kSent, kGet, kStatus},
      {"login_get", LoginGet, kEither, false, kWaits, 14, 2, kSent, kGet, kStatus, false, 2},
      {"form_post", FormPost, kEither, false, kWaits, 14, 2, kSent, "POST /attack.cgi?a=1 HTTP/1.",
       kStatus},
      {"soap", Soap, kEither, false, kWaits, 7, 1, kSent, kPost, kStatus},
      {"soap_login", SoapLogin, kEither, false, kWaits, 7, 1, kOutcome, kPost, kStatus, false, 2},
      {"soap_xml", SoapXml, kEither, false, kWaits, 7, 1, kSent, kPost, kStatus},
      {"upload", Upload, kEither, false, kWaits, 14, 2, kSent, kPost, kStatus, true},
      {"second_request", SecondRequest, kEither, false, kWaits, 21, 4, kSent, kGet, kNothing, false,
       2},
      {"json_get", JsonGet, kNever, false, kWaits, 7, 7, {0, -1, -2}, kGet, Shows::kJson, false, 2},
      {"json_post", JsonPost, kNever, false, kWaits, 7, 7, {0, -1}, kPost, kNothing},
      {"json_get_tls",
       JsonGetOverTls,
       OverTls::kAlways,
       true,
       kAll,
       0,
       0,
       {0, -1, -2, -3},
       kGet,
       kNothing},
      {"curl_get", CurlGet, kEither, true, kAll, 0, 0, kTransferred, kGet, kSuccess},
      {"curl_get_file", CurlGetToFile, kEither, true, kAll, 0, 0, kTransferred, kGet, kSuccess},
      {"curl_post", CurlPost, kEither, true, kAll, 0, 0, kTransferred, "POST / HTTP/1.", kSuccess},
      {"curl_post_file", CurlPostToFile, kEither, true, kAll, 0, 0, kTransferred, "POST / HTTP/1.",
       kSuccess},
      {"curl_form", CurlForm, kNever, true, kNone, 0, 0, kSent, "POST /attack.cgi", kSuccess, false,
       kMostDeliveries},
      {"curl_login_form", CurlFormDispatched, kNever, true, kNone, 0, 0, kSent, "POST /attack.cgi",
       kSuccess, false, kMostDeliveries},
      {"xml_get", XmlGet, kNever, true, kAll, 0, 0, kSent, kGet, kSuccess, false, kMostDeliveries},
      {"xml_post", XmlPost, kNever, true, kNone, 0, 0, kSent, kPost, kSuccess},
      {"xml_put", XmlPut, kNever, true, kNone, 0, 0, kSent, "PUT /attack.cgi?a=1 HTTP/1.",
       kSuccess},
      {"xml_delete", XmlDelete, kNever, true, kNone, 0, 0, kSent, "DELETE /attack.cgi?a=1 HTTP/1.",
       kSuccess},
      {"curl_handle", CurlHandle, kEither, true, kAll, 0, 0, {0, 1}, kGet, kNothing},
      {"socket_data", SocketData, kEither, false, kWaits, 7, 1, {0, -1}, kGet, kNothing},
      {"socket_lines", SocketLines, kEither, false, kWaits, 7, 2, {0, -1}, kGet, kNothing},
      {"socket_raw", SocketRaw, kEither, false, kWaits, 2, 2, {0, -1}, kGet, kNothing},
  };
  return operations;
}
