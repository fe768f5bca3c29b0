// Exchanges whose responses are cut after every byte: by a close, by a reset, and over TLS with and
// without a close notice.
#ifndef TARNWICK_TESTS_HOSTILE_CUT_RUNS_H_
#define TARNWICK_TESTS_HOSTILE_CUT_RUNS_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/model/response.h"

// How a connection ends after the last byte that it carries.
enum class End { kClose, kReset, kTlsNotice, kTlsNoNotice, kTlsReset };

inline bool IsTls(End end) {
  return end != End::kClose && end != End::kReset;
}

inline bool IsReset(End end) {
  return end == End::kReset || end == End::kTlsReset;
}

inline Step EndingStep(End end) {
  if (IsReset(end)) return Reset();
  return end == End::kTlsNoNotice ? CloseWithoutNotice() : Close();
}

struct Expected {
  Outcome outcome;
  std::vector<std::string> log;
  size_t connections = 1;
};

// One exchange: the responses to its requests, what the client does, and what must come of responses
// that are cut.
struct ExchangeCase {
  std::string name;
  std::vector<std::string> responses;
  Outcome (*operation)(ExposedClient& client);
  std::function<Expected(const std::vector<Cut>& responses, bool buffered)> rule;
  std::string request_mark = "";  // what the request ends with, when it is no whole request
  size_t first_cut = 0;           // the responses before this one come whole
};

inline constexpr char kTypes[] = "Content-Type: a/b\r\n";
inline constexpr char kJson[] = "{\"success\":true,\"id\":7}";
inline constexpr char kXml[] = "<e><v>\r\n42</v></e>";

inline std::string Ok(const std::string& lines, const std::string& body) {
  return "HTTP/1.1 200 OK\r\n" + std::string(kTypes) + lines + "\r\n" + body;
}

inline std::string OkOfLength(const std::string& body) {
  return Ok("Content-Length: " + std::to_string(body.size()) + "\r\n", body);
}

inline const std::string kToTheEnd =
    Ok("Set-Cookie: sid=8; Path=/\r\n", "some text\nof two lines\n");
inline const std::string kOfALength = OkOfLength("sixteen bytes...");
inline const std::string kChunked =
    Ok("Transfer-Encoding: chunked\r\n",
       "4\r\nWiki\r\n1a;x=y\r\npedia, in a longer chunk..\r\n0\r\n\r\n");
inline const std::string kNotFound =
    "HTTP/1.1 404 Not Found\r\nContent-Length: 9\r\n\r\nnot here\n";
inline const std::string kDigest =
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Digest realm=\"r\", nonce=\"5f\", "
    "qop=\"auth\"\r\n"
    "Content-Length: 6\r\n\r\nlogin\n";
inline const std::string kClosedDigest =
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Digest realm=\"r\", nonce=\"5f\"\r\n"
    "Connection: close\r\nContent-Length: 0\r\n\r\n";
inline const std::string kBasic =
    "HTTP/1.1 401 Unauthorized\r\nWWW-Authenticate: Basic realm=\"r\"\r\nContent-Length: "
    "6\r\n\r\n"
    "login\n";

// One run: the responses, one of them cut, and what must come of it.
struct Run {
  std::string name;
  std::vector<Cut> responses;
  size_t cut = 0;  // which of them is
  Expected expected = {};
  Outcome outcome = {};
  std::vector<std::string> log = {};
};

inline std::vector<Run> RunsOf(const ExchangeCase& exchange, End end, bool buffered) {
  std::vector<Run> runs;
  for (size_t cut = exchange.first_cut; cut < exchange.responses.size(); ++cut) {
    for (size_t length = 0; length <= exchange.responses[cut].size(); ++length) {
      Run run;
      run.name = "response " + std::to_string(cut) + " cut at " + std::to_string(length);
      for (const std::string& response : exchange.responses) run.responses.push_back({response});
      run.cut = cut;
      run.responses[cut] = {exchange.responses[cut].substr(0, length), IsReset(end)};
      run.expected = exchange.rule(run.responses, buffered);
      runs.push_back(run);
    }
  }
  return runs;
}

// A script for each connection that the runs make. A connection whose response is not cut is closed.
inline std::vector<Script> ScriptsOf(const ExchangeCase& exchange, const std::vector<Run>& runs,
                                     End end) {
  std::vector<Script> scripts;
  const Step request =
      exchange.request_mark.empty() ? ExpectRequest() : ExpectUntil(exchange.request_mark);
  for (const Run& run : runs) {
    for (size_t i = 0; i < run.expected.connections; ++i) {
      const Step ending = i == run.cut ? EndingStep(end) : Close();
      scripts.push_back({request, Send(run.responses[i].bytes), ending});
    }
  }
  return scripts;
}

inline std::unique_ptr<ScriptedPeer> NewPeer(std::vector<Script> scripts, End end) {
  if (!IsTls(end)) return std::make_unique<ScriptedPeer>(std::move(scripts));
  return std::make_unique<TlsScriptedPeer>(std::move(scripts));
}

inline void RunAll(const ExchangeCase& exchange, End end, bool buffered, std::vector<Run>* runs) {
  constexpr int kDebug = 5;
  LogCapture log(kDebug);
  const auto peer = NewPeer(ScriptsOf(exchange, *runs, end), end);
  // The operations that ask who answers are to trust the peer.
  const auto* const tls_peer = dynamic_cast<TlsScriptedPeer*>(peer.get());
  const auto trusted =
      tls_peer != nullptr ? std::make_unique<TrustedAuthority>(tls_peer->CaFile()) : nullptr;
  ClientSettings settings;
  settings.user = "u";
  settings.password = "p";
  settings.buffered = buffered;
  settings.https = IsTls(end);
  RunOnSmallStack(kSmallStack, [&] {
    for (Run& run : *runs) {
      log.Clear();
      ExposedClient client(peer->Port(), settings);
      run.outcome = exchange.operation(client);
      for (const std::string& line : HttpLog(log)) run.log.push_back(line);
    }
  });
}

inline void RunCuts(const ExchangeCase& exchange, End end, bool buffered) {
  const DescriptorGuard descriptors;
  std::vector<Run> runs = RunsOf(exchange, end, buffered);
  RunAll(exchange, end, buffered, &runs);
  for (const Run& run : runs) {
    std::vector<std::string> log;
    for (const std::string& line : run.log) log.push_back(MaskNumbers(line));
    std::vector<std::string> expected;
    for (const std::string& line : run.expected.log) expected.push_back(MaskNumbers(line));
    EXPECT_EQ(run.outcome, run.expected.outcome) << run.name;
    EXPECT_EQ(log, expected) << run.name;
  }
}

inline const std::pair<const char*, End> kEnds[] = {{"Close", End::kClose},
                                                    {"Reset", End::kReset},
                                                    {"TlsNotice", End::kTlsNotice},
                                                    {"TlsNoNotice", End::kTlsNoNotice},
                                                    {"TlsReset", End::kTlsReset}};

struct CutCase {
  std::string name;
  ExchangeCase exchange;
  End end;
  bool buffered;
};

inline std::ostream& operator<<(std::ostream& out, const CutCase& test) {
  return out << test.name;
}

template <size_t kSize>
std::vector<CutCase> CasesOf(const ExchangeCase (&exchanges)[kSize], bool plain, bool tls) {
  std::vector<CutCase> cases;
  for (const ExchangeCase& exchange : exchanges) {
    for (const auto& [name, end] : kEnds) {
      if (!(IsTls(end) ? tls : plain)) continue;
      cases.push_back({exchange.name + name, exchange, end, true});
    }
  }
  return cases;
}

inline std::string CutName(const ::testing::TestParamInfo<CutCase>& info) {
  return info.param.name;
}

#endif  // TARNWICK_TESTS_HOSTILE_CUT_RUNS_H_
