#include "tests/attack/attacked_operations.h"

namespace {

constexpr char kForm[] = "pan=3&tilt=-4";
constexpr char kEnvelope[] = "<Envelope><Body><Get/></Body></Envelope>";
constexpr char kSocketRequest[] = "GET /attack.cgi?a=1 HTTP/1.1\r\nHost: 127.0.0.1\r\n\r\n";
constexpr char kUploadEnd[] = "\r\n-------------QUENMULTIPART_BOUNDARY-------------\r\n";

// They send no request, or do what socket_data and socket_lines do.
const std::vector<std::string> kLeftOut = {"connect", "reconnect", "keep_alive", "probe",
                                           "socket_exchange"};

AttackedOperation Waits(const char* name, int buffered, int direct, const char* request,
                        Shows shows, const char* body = "", int most_requests = 1,
                        bool decoded = false) {
  return {OperationNamed(name), Limit::kWaits, buffered, direct, request, shows, body,
          most_requests,        decoded};
}

AttackedOperation Limited(const char* name, Limit limit, const char* request, Shows shows,
                          const char* body = "", int most_requests = 1, bool decoded = false) {
  return {OperationNamed(name), limit, 0, 0, request, shows, body, most_requests, decoded};
}

}  // namespace

// The waits are those of docs/longest-call.md for one silence: of the head 7 T and T, of a chunked
// body 14 T and 2 T; an operation that reads on after a failure waits for each. libcurl asks four
// times where a server changes between Basic and Digest, and more often than kMostDeliveries where
// it calls each nonce stale.
const std::vector<AttackedOperation>& AttackedOperations() {
  constexpr auto kAll = Limit::kTransfer;
  constexpr auto kNone = Limit::kNone;
  constexpr auto kNothing = Shows::kNothing;
  constexpr auto kStatus = Shows::kStatus;
  constexpr auto kSuccess = Shows::kSuccess;
  static constexpr char kGet[] = "GET /attack.cgi?a=1 HTTP/1.";
  static constexpr char kPost[] = "POST /attack.cgi?a=1 HTTP/1.1";
  static const std::vector<AttackedOperation> operations = [] {
    std::vector<AttackedOperation> all = {
        Waits("get_body", 14, 2, kGet, kStatus, "", 1, true),
        Waits("get_data", 7, 1, kGet, kStatus),
        Waits("get_lines", 14, 3, kGet, kStatus),
        Waits("get_twice", 14, 2, kGet, kStatus, "", 2),
        Waits("get_head_again", 21, 3, kGet, kStatus),
        Waits("login_get", 14, 2, kGet, kStatus, "", 2, true),
        Waits("form_post", 14, 2, "POST /attack.cgi?a=1 HTTP/1.", kStatus, kForm, 1, true),
        Waits("soap", 7, 1, kPost, kStatus, kEnvelope),
        Waits("soap_login", 7, 1, kPost, kStatus, kEnvelope, 2),
        Waits("soap_xml", 7, 1, kPost, kStatus, kEnvelope),
        Waits("upload", 14, 2, kPost, kStatus, kUploadEnd, 1, true),
        Waits("second_request", 21, 4, kGet, kNothing, "", 2),
        Waits("json_get", 7, 7, kGet, Shows::kJson, "", 2),
        Waits("json_post", 7, 7, kPost, kNothing, kForm),
        Limited("json_get_tls", kAll, kGet, kNothing),
        Limited("curl_get", kAll, kGet, kSuccess, "", 1, true),
        Limited("curl_get_file", kAll, kGet, kSuccess),
        Limited("curl_post", kAll, "POST / HTTP/1.", kSuccess, "", 1, true),
        Limited("curl_post_file", kAll, "POST / HTTP/1.", kSuccess),
        Limited("curl_form", kNone, "POST /attack.cgi", kSuccess, "", kMostDeliveries),
        Limited("curl_login_form", kNone, "POST /attack.cgi", kSuccess, "", kMostDeliveries),
        Limited("xml_get", kAll, kGet, kSuccess, "", kMostDeliveries),
        Limited("xml_post", kNone, kPost, kSuccess, kEnvelope),
        Limited("xml_put", kNone, "PUT /attack.cgi?a=1 HTTP/1.", kSuccess, kEnvelope),
        Limited("xml_delete", kNone, "DELETE /attack.cgi?a=1 HTTP/1.", kSuccess),
        Limited("curl_handle", kAll, kGet, kNothing),
        Waits("socket_data", 7, 1, kGet, kNothing, kSocketRequest),
        Waits("socket_lines", 7, 2, kGet, kNothing, kSocketRequest),
        Waits("socket_raw", 2, 2, kGet, kNothing, kSocketRequest),
    };
    for (AttackedOperation& operation : all) operation.upload = operation.body == kUploadEnd;
    return all;
  }();
  return operations;
}

std::string MissedOperations() {
  std::vector<std::string> names;
  for (const AttackedOperation& operation : AttackedOperations())
    names.emplace_back(operation.name);
  return Unmatched(names, kLeftOut);
}

OperationSettings AttackSettings(const AttackedOperation& operation, size_t piece) {
  OperationSettings settings;
  settings.path = "attack.cgi?a=1";
  settings.user = "user";
  settings.password = "pass word";
  settings.piece = piece;
  settings.body = operation.body;
  if (operation.upload) settings.body.insert(0, piece, 'x');
  settings.second = kSocketRequest;
  settings.go_on = true;
  return settings;
}
