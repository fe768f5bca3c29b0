// The operations that talk with a peer: those of the shared table, with the settings that they are
// tortured with, and what a fault may do to them.
#include <json/reader.h>
#include <json/value.h>
#include <netinet/in.h>

#include <algorithm>
#include <sstream>

#include "tests/operations/operations.h"
#include "tests/torture/operations.h"
#include "tests/torture/peer_process.h"

namespace {

enum Trait : unsigned {
  kTls = 1U << 0,
  kCold = 1U << 1,        // see Operation
  kSlow = 1U << 2,        // see Operation
  kDirect = 1U << 3,      // without read-ahead
  kHeadOnly = 1U << 4,    // does not read the body
  kKeepsHead = 1U << 5,   // the response has the header fields that a client keeps
  kMayBeCut = 1U << 6,    // a read that breaks off may end the text as a success, as documented
  kRefused = 1U << 7,     // nobody listens
  kAtOnce = 1U << 8,      // Basic without a challenge
  kByName = 1U << 9,      // the host's
  kByAddress = 1U << 10,  // without name resolution
  kBlocking = 1U << 11,
};

struct Row {
  const char* name;
  const char* operation;  // of the table
  const char* path;       // at PeerProcess; the request of a socket
  std::string text;       // that it must read; empty: it reads none, or anything
  unsigned traits = 0;
  int plain_steps = 0;  // so many steps come before the fault: they are tortured elsewhere
};

constexpr char kStatusLine[] = "HTTP/1.1 200 OK";
constexpr char kLengthRequest[] = "GET /length HTTP/1.1\r\n\r\n";

// The operations of the table that are left out: what else a client makes of a response may throw,
// and has rows of its own; the peer takes one request per connection; lines one after the other are
// thousands of the same calls.
const std::vector<std::string> kLeftOut = {"get_head_again", "second_request", "get_lines",
                                           "socket_lines"};

std::string JsonText() {
  Json::Value value;
  std::istringstream(kJsonBody) >> value;
  return value.toStyledString();
}

// After the status line.
std::string RestOfLength() {
  return LengthResponse().substr(sizeof(kStatusLine) + 1);
}

std::vector<Row> SocketRows() {
  return {
      {"connect", "connect", "", ""},
      {"connect_blocking", "connect", "", "", kBlocking | kDirect},
      {"connect_from", "connect", "", "", kByAddress},
      {"connect_by_name", "connect", "", "", kByName},
      {"connect_refused", "connect", "", "", kRefused | kCold},
      {"keep_alive", "keep_alive", "", "", 0, 1},
      {"probe", "probe", kLengthRequest, "", 0, 2},
      {"exchange", "socket_exchange", kLengthRequest, RestOfLength(), 0, 1},
      {"exchange_direct", "socket_exchange", kLengthRequest, RestOfLength(), kDirect, 1},
      {"exchange_data", "socket_data", kLengthRequest, LengthResponse(), 0, 1},
      {"exchange_raw", "socket_raw", kLengthRequest, "", kDirect, 1},
      {"handshake", "connect", "", "", kTls | kSlow},
      {"handshake_again", "reconnect", "", "", kTls | kSlow, 1},
      {"exchange_tls", "socket_exchange", kLengthRequest, RestOfLength(), kTls, 1},
      {"exchange_tls_direct", "socket_exchange", kLengthRequest, RestOfLength(), kTls | kDirect, 1},
  };
}

std::vector<Row> ClientRows() {
  return {
      {"json_get", "json_get", "json?a=b c", JsonText(), kCold},
      {"json_post", "json_post", "json", ""},
      {"get", "get_body", "get?a=b c&d=/", "", kHeadOnly | kKeepsHead | kCold},
      {"get_tls", "get_body", "get", "", kHeadOnly | kKeepsHead | kTls | kSlow},
      {"get_digest", "login_get", "digest/body", "", kHeadOnly},
      {"get_basic", "login_get", "basic/body", "", kHeadOnly},
      {"get_basic_at_once", "login_get", "basic/body", "", kHeadOnly | kAtOnce},
      {"get_data", "get_data", "body", Body()},
      {"get_twice", "get_twice", "chunked", Body(), kMayBeCut},
      {"body", "get_body", "body", Body()},
      {"body_direct", "get_body", "body", Body(), kDirect},
      {"body_chunked", "get_body", "chunked", Body(), kMayBeCut},
      {"body_chunked_direct", "get_body", "chunked", Body(), kMayBeCut | kDirect},
      // The handshake is part of the GET's own torture.
      {"body_tls", "get_body", "chunked", Body(), kMayBeCut | kTls, 1},
      {"form_post", "form_post", "form/length", "", kHeadOnly},
      {"upload", "upload", "upload", Body()},
      {"upload_tls", "upload", "upload", Body(), kTls | kSlow},
      {"soap", "soap", "soap/xml", kXmlBody, kMayBeCut},
      {"soap_digest", "soap_login", "digest/xml", kXmlBody, kMayBeCut},
      {"soap_basic", "soap_login", "basic/xml", kXmlBody, kMayBeCut},
      {"soap_xml", "soap_xml", "soap/xml", kXmlBody, kCold},
  };
}

std::vector<Row> CurlRows() {
  const std::string file = "Connection: close\r\n\r\n" + Body();
  return {
      {"curl_handle", "curl_handle", "length", Body(), kCold},
      {"curl_get", "curl_get", "basic/length", Body(), kCold},
      {"curl_get_chunked", "curl_get", "chunked", Body()},
      {"curl_get_file", "curl_get_file", "chunked", file},
      {"curl_get_tls", "curl_get", "length", Body(), kTls | kSlow},
      {"curl_post", "curl_post", "a=1&b=2", Body()},
      {"curl_post_file", "curl_post_file", "a=1&b=2", ""},
      {"curl_form", "curl_form", "length?a=1&b=2", ""},
      {"curl_form_digest", "curl_form", "digest/length?a=1&b=2", ""},
      {"curl_form_dispatched", "curl_login_form", "basic/length?a=1", ""},
      {"xml_get", "xml_get", "xml", kXmlBody},
      {"xml_get_digest", "xml_get", "digest/xml", kXmlBody},
      {"xml_post", "xml_post", "whole/xml", kXmlBody},
      {"xml_put", "xml_put", "whole/xml", kXmlBody, kCold},
      {"xml_delete", "xml_delete", "basic/xml", kXmlBody},
      {"json_get_tls", "json_get_tls", "json", JsonText(), kTls | kSlow},
  };
}

std::vector<Row> AllRows() {
  std::vector<Row> all = SocketRows();
  for (const auto& rows : {ClientRows(), CurlRows()})
    all.insert(all.end(), rows.begin(), rows.end());
  return all;
}

std::string BodyFor(const Row& row) {
  const std::string name = row.operation;
  if (name == "upload") return std::string(5000, 'u') + kUploadEnd;
  if (name.compare(0, 3, "xml") == 0) return kXmlBody;
  if (name.compare(0, 4, "soap") == 0) return "<soap/>";
  if (name == "form_post") return "a=1&b=2&c=a value that is longer than a short string";
  return name == "json_post" ? "a=1" : row.path;
}

OperationSettings SettingsOf(const Row& row, int port) {
  const auto has = [&](Trait trait) { return (row.traits & trait) != 0; };
  OperationSettings settings;
  settings.port = has(kRefused) ? 1 : port;
  settings.path = row.path;
  settings.version = HTTP_VERSION_1_1;
  settings.user = "user";
  settings.password = "password";
  settings.cookie = "s=1";
  settings.body = BodyFor(row);
  settings.timeout = has(kBlocking) ? -1 : 2;
  settings.limit = 3;
  settings.piece = has(kDirect) ? 4000 : 700;
  settings.https = has(kTls);
  settings.buffered = !has(kDirect);
  settings.basic_auth = has(kAtOnce);
  settings.encode_query = settings.path.find(' ') != std::string::npos;
  settings.read_body = !has(kHeadOnly);
  // The peer waits for the rest of what was not written whole.
  settings.go_on = settings.path != "upload" && settings.path != kLengthRequest;
  if (has(kByName)) settings.host = "localhost";
  if (has(kByAddress)) settings.address = htonl(INADDR_LOOPBACK);
  return settings;
}

// A head that was read whole, or was spoilt by the fault.
void JudgeHead(TestRun& test, const Row& row, const OperationResult& result) {
  const bool whole = result.response == HTTP_RET_OK && result.status == 200;
  test.ExpectEither(whole, result.response != HTTP_RET_OK, "the outcome is wrong");
  if (!whole || (row.traits & kKeepsHead) == 0) return;
  test.Expect(result.Field(HTTP_CONTENT_RANGE) == "bytes 0-9/10", "a header field is lost");
  test.Expect(result.cookie == "id=42;", "the cookie is lost");
}

// When they fail they may leave the text of a refusal, or half of a value.
bool LeavesAnotherText(const PeerOperation& operation) {
  const std::string name = operation.name;
  return operation.curl || name == "soap_login" || name == "json_get";
}

// The text is the peer's, or a front part of it.
void JudgeText(TestRun& test, const Row& row, const OperationResult& result) {
  const bool any = result.result != 0 && LeavesAnotherText(OperationNamed(row.operation));
  const bool front = row.text.compare(0, result.text.size(), result.text) == 0;
  test.Expect(front || any, "the text is not the peer's");
  const bool whole = result.has_text && result.text == row.text;
  const bool cut = (row.traits & kMayBeCut) != 0 && test.MayFail() && result.head;
  test.Expect(!result.has_text || whole || cut, "half a text is a success");
  test.Expect(whole || test.MayFail(), "the text is not whole");
}

void Judge(TestRun& test, const Row& row, const OperationResult& result) {
  const PeerOperation& operation = OperationNamed(row.operation);
  test.Expect(result.mistake.empty(), result.mistake);
  if ((row.traits & kRefused) != 0) {
    test.Expect(result.result != 0, "a refused connection is a success");
    return;
  }
  const std::vector<int>& failures = operation.failures;
  const bool documented =
      std::find(failures.begin(), failures.end(), result.result) != failures.end();
  test.ExpectEither(result.result == 0, documented, "the result is wrong");
  test.Expect(result.healthy || test.MayFail(), "a smaller call has failed");
  const bool has_head = result.status != -1 && !operation.curl;
  if (has_head && result.result == HTTP_RET_OK) JudgeHead(test, row, result);
  if (row.operation == std::string("socket_exchange")) {
    test.ExpectEither(result.first == kStatusLine, result.read == -1, "the line is wrong");
  }
  if (!row.text.empty()) JudgeText(test, row, result);
}

void RunRow(TestRun& test, const Row& row) {
  OperationSettings settings = SettingsOf(row, test.Port());
  int step = 0;
  settings.run_step = [&](const std::function<void()>& run) {
    if (step++ < row.plain_steps) {
      run();
    } else {
      test.Run(run);
    }
  };
  Judge(test, row, OperationNamed(row.operation).run(settings));
}

}  // namespace

std::vector<Operation> PeerOperationsUnderTorture() {
  std::vector<Operation> operations;
  for (const Row& row : AllRows()) {
    const PeerKind peer = (row.traits & kRefused) != 0 ? PeerKind::kNone
                          : (row.traits & kTls) != 0   ? PeerKind::kTls
                                                       : PeerKind::kPlain;
    operations.push_back({row.name, peer, [row](TestRun& test) { RunRow(test, row); },
                          (row.traits & kCold) != 0, (row.traits & kSlow) != 0});
  }
  return operations;
}

std::string OperationsWithoutTorture() {
  std::vector<std::string> names;
  for (const Row& row : AllRows()) names.emplace_back(row.operation);
  return Unmatched(names, kLeftOut);
}
