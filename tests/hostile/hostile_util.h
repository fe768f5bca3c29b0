// Tables of hostile peers. Each line of a table is a test of its own: a name, what the peer does,
// the operation that meets it, and what comes of that.
//
//   class Heads : public ::testing::TestWithParam<Scenario> {};
//   TEST_P(Heads, EndAsTheTableSays) { PlayScenario(GetParam()); }
//   INSTANTIATE_TEST_SUITE_P(Hostile, Heads, ::testing::ValuesIn(kTable), ScenarioName);
#ifndef TARNWICK_TESTS_HOSTILE_HOSTILE_UTIL_H_
#define TARNWICK_TESTS_HOSTILE_HOSTILE_UTIL_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "tests/http/http_test_util.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"
#include "tests/support/scripted_peer.h"
#include "tests/support/tls_scripted_peer.h"

// The stack that a daemon's thread has at the least.
inline constexpr size_t kSmallStack = 64 << 10;

inline std::string Repeated(int count, const std::string& text) {
  std::string all;
  all.reserve(static_cast<size_t>(count) * text.size());
  for (int i = 0; i < count; ++i) all += text;
  return all;
}

// What an operation returned and left.
struct Outcome {
  int result = HTTP_RET_OK;    // what it returned
  int response = HTTP_RET_OK;  // what CheckResponse returns afterwards
  int status = 0;              // and the status that it stores
  std::string text;            // the body, or what else the operation returns
};

// The outcomes that most rows expect.

// A response of status 200 was read to its end.
inline Outcome Success(const std::string& text) {
  return {HTTP_RET_OK, HTTP_RET_OK, 200, text};
}

// The operation succeeded, whatever the response was.
inline Outcome Sent(int response, int status, const std::string& text) {
  return {HTTP_RET_OK, response, status, text};
}

// No status line was read, or libcurl's transfer failed.
inline Outcome NoResponse(const std::string& text = "") {
  return {HTTP_RET_IO_ERROR, HTTP_RET_IO_ERROR, 0, text};
}

// The head was read, its status is 200, and the body failed after `text`.
inline Outcome BodyFailed(const std::string& text) {
  return {HTTP_RET_IO_ERROR, HTTP_RET_OK, 200, text};
}

// A one-call function leaves no client whose response could be asked for.
inline Outcome OneCall(int result, const std::string& text) {
  return {result, 0, 0, text};
}

inline bool operator==(const Outcome& a, const Outcome& b) {
  return a.result == b.result && a.response == b.response && a.status == b.status &&
         a.text == b.text;
}

inline std::ostream& operator<<(std::ostream& out, const Outcome& outcome) {
  return out << "result " << outcome.result << ", response " << outcome.response << ", status "
             << outcome.status << ", " << outcome.text.size() << " bytes ["
             << ::testing::PrintToString(outcome.text.substr(0, 300)) << "]";
}

// The outcome of an operation that returned `result` on a client, with a text that came of it.
inline Outcome OutcomeOf(TWHttpClient& client, int result, const std::string& text = "") {
  Outcome outcome = {result, 0, 0, text};
  outcome.response = client.CheckResponse(outcome.status);
  return outcome;
}

struct Scenario {
  std::string name;  // letters and digits
  std::vector<Script> peer;
  std::function<Outcome(int port)> operation;
  Outcome expected;

  // What the category http logs, down to level debug: "function: message" each.
  std::vector<std::string> log = {};

  bool tls = false;
  size_t stack = kSmallStack;
  PeerOptions options = {};
};

inline std::ostream& operator<<(std::ostream& out, const Scenario& scenario) {
  return out << scenario.name;
}

// A row in which the peer plays one connection, or none.
inline Scenario Meets(const std::string& name, const Script& peer,
                      const std::function<Outcome(int port)>& operation, const Outcome& expected,
                      const std::vector<std::string>& log = {}, bool tls = false) {
  const std::vector<Script> connections(peer.empty() ? 0 : 1, peer);
  return {name, connections, operation, expected, log, tls};
}

inline std::string ScenarioName(const ::testing::TestParamInfo<Scenario>& info) {
  return info.param.name;
}

inline std::vector<std::string> HttpLog(const LogCapture& log) {
  std::vector<std::string> lines;
  for (const LogLine& line : log.Lines("http"))
    lines.push_back(line.function + ": " + line.message);
  return lines;
}

// The text with N for each number: descriptors, ports, codes and sizes that are not sure.
inline std::string MaskNumbers(const std::string& text) {
  std::string result;
  for (const char c : text) {
    const bool digit = isdigit(static_cast<unsigned char>(c)) != 0;
    if (!digit) result += c;
    if (digit && (result.empty() || result.back() != 'N')) result += 'N';
  }
  return result;
}

inline std::unique_ptr<ScriptedPeer> PeerOf(const Scenario& scenario) {
  if (!scenario.tls) return std::make_unique<ScriptedPeer>(scenario.peer, scenario.options);
  return std::make_unique<TlsScriptedPeer>(scenario.peer, TlsOptions{}, scenario.options);
}

// Runs the operation against the peer on a small stack, and compares what came of it. No descriptor
// may be left.
inline void RunScenario(const Scenario& scenario) {
  constexpr int kDebug = 5;
  const DescriptorGuard descriptors;
  const LogCapture log(kDebug);
  const auto peer = PeerOf(scenario);
  Outcome outcome;
  RunOnSmallStack(scenario.stack, [&] { outcome = scenario.operation(peer->Port()); });
  EXPECT_EQ(outcome, scenario.expected);
  EXPECT_EQ(HttpLog(log), scenario.log);
}

// Sends bytes in pieces, for as long as the client takes them: one that has seen enough may go.
inline Step SendWhileRead(const std::string& bytes, size_t piece = std::string::npos) {
  return {"Offer()", [bytes, piece](PeerConnection& peer, std::string* error) {
            constexpr useconds_t kBetweenPieces = 100;
            for (size_t at = 0; at < bytes.size(); at += std::min(piece, bytes.size())) {
              if (at > 0) usleep(kBetweenPieces);
              if (!peer.Write(bytes.substr(at, piece))) break;
            }
            if (peer.DeadlinePassed()) *error = "deadline passed";
            return !peer.DeadlinePassed();
          }};
}

// A response that has the same outcome however it travels.
struct ResponseScenario {
  std::string name;
  std::string response;
  std::function<Outcome(ExposedClient&)> operation;
  Outcome expected;
  std::vector<std::string> log = {};

  // The operation makes one read, which delivers what has arrived when it is a direct one.
  bool buffered_only = false;
};

inline std::ostream& operator<<(std::ostream& out, const ResponseScenario& scenario) {
  return out << scenario.name;
}

inline std::string ResponseName(const ::testing::TestParamInfo<ResponseScenario>& info) {
  return info.param.name;
}

// How a response travels, and how the client reads it.
struct Delivery {
  const char* name;
  bool tls;
  bool buffered;
  size_t piece;
};

inline constexpr Delivery kDeliveries[] = {
    {"plain, buffered, at once", false, true, std::string::npos},
    {"plain, buffered, byte by byte", false, true, 1},
    {"plain, direct, at once", false, false, std::string::npos},
    {"plain, direct, byte by byte", false, false, 1},
    {"TLS, buffered, at once", true, true, std::string::npos},
    {"TLS, direct, record by record of a byte", true, false, 1},
};

// Of a long response, byte by byte, several bytes travel together, so that it does not take seconds.
inline size_t PieceOf(const Delivery& delivery, const std::string& response) {
  constexpr size_t kMostPieces = 500;
  return std::max(delivery.piece, response.size() / kMostPieces);
}

// Plays one response in each of the ways.
inline void RunInEachWay(const ResponseScenario& scenario) {
  for (const Delivery& delivery : kDeliveries) {
    if (scenario.buffered_only && !delivery.buffered) continue;
    SCOPED_TRACE(delivery.name);
    ClientSettings settings;
    settings.https = delivery.tls;
    settings.buffered = delivery.buffered;
    const auto operation = [&](int port) {
      ExposedClient client(port, settings);
      return scenario.operation(client);
    };
    const Script script = {ExpectRequest(),
                           SendWhileRead(scenario.response, PieceOf(delivery, scenario.response)),
                           Close()};
    RunScenario(
        {scenario.name, {script}, operation, scenario.expected, scenario.log, delivery.tls});
  }
}

#endif  // TARNWICK_TESTS_HOSTILE_HOSTILE_UTIL_H_
