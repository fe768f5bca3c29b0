// The longest that each call can take, derived from the code, and measured with peers at their
// worst.
//
//   scripts/sandbox tarnwick_longest_call TWCAMSIM [SLACK]
//
// All cases run at once, with a time-out of one second, each against an endpoint of the simulated
// camera TWCAMSIM or a script of its own. It fails for a call that took longer than its bound and
// SLACK seconds (0.9), or ended earlier than its peer let it, which shows that the bound is wrong
// or the case is another one.
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/http/twcurl.h"
#include "tests/longest_call/camera.h"
#include "tests/longest_call/cases.h"
#include "tests/longest_call/world.h"
#include "tests/support/scripted_peer.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

using Clock = std::chrono::steady_clock;

// The peers that are just in time are that much early.
constexpr double kEarliest = 0.93;

struct Measured {
  double seconds = 0;
  int result = 0;
};

Measured Time(const Case& one, int port) {
  const auto start = Clock::now();
  const int result = one.operation(port);
  return {std::chrono::duration<double>(Clock::now() - start).count(), result};
}

// The peers' own limit for a step is longer than any case.
PeerOptions Patient() {
  PeerOptions options;
  options.deadline = std::chrono::seconds(120);
  return options;
}

Measured PlayScripts(const Case& one) {
  if (!one.peer.byte_by_byte) {
    const ScriptedPeer peer(one.peer.scripts, Patient());
    return Time(one, peer.Port());
  }
  TlsOptions tls;
  tls.max_version = TLS1_2_VERSION;  // whose records tell a session ticket from data
  const TlsScriptedPeer peer(one.peer.scripts, tls, Patient());
  const SlowRelay relay(peer.Port());
  return Time(one, relay.Port());
}

Measured Play(const Case& one, int camera_port) {
  return one.peer.scripts.empty() ? Time(one, camera_port) : PlayScripts(one);
}

bool IsWithin(const Case& one, const Measured& measured, double slack) {
  if (measured.result != one.result) return false;
  if (one.seconds == 0) return measured.seconds >= kHold * kEarliest;
  return measured.seconds >= one.seconds * kEarliest && measured.seconds <= one.seconds + slack;
}

std::string Duration(const Case& one, const Measured& measured) {
  char text[64];
  snprintf(text, sizeof(text), "%.1f s", measured.seconds);
  return one.seconds == 0 ? std::string(text) + ", when the peer gave way" : text;
}

// Who was at the other end: the camera's endpoint in its own words, so that it can be had again.
std::string PeerWords(const Case& one) {
  return one.peer.endpoint.empty() ? "scripted" : "`" + one.peer.endpoint + "`";
}

// Results: the cases whose measured time is not what was derived.
int Report(const std::vector<Case>& cases, const std::vector<Measured>& measured, double slack) {
  int wrong = 0;
  for (size_t i = 0; i < cases.size(); ++i) {
    std::printf("| %s | %s | %s | %s |\n", cases[i].name, cases[i].bound,
                Duration(cases[i], measured[i]).c_str(), PeerWords(cases[i]).c_str());
    if (IsWithin(cases[i], measured[i], slack)) continue;
    ++wrong;
    std::fprintf(stderr, "longest_call: %s: %.2f s, result %d; expected %.1f s, result %d\n",
                 cases[i].name, measured[i].seconds, measured[i].result, cases[i].seconds,
                 cases[i].result);
  }
  return wrong;
}

// The words of the cases that have the camera as their peer, in the cases' order.
std::vector<std::string> Endpoints(const std::vector<Case>& cases) {
  std::vector<std::string> endpoints;
  for (const Case& one : cases) {
    if (!one.peer.endpoint.empty()) endpoints.push_back(one.peer.endpoint);
  }
  return endpoints;
}

// REQUIRES: the camera has the Endpoints of these cases.
int RunAll(const std::vector<Case>& cases, const SimulatedCamera& camera, double slack) {
  std::vector<Measured> measured(cases.size());
  std::vector<std::thread> threads;
  size_t endpoint = 0;
  for (size_t i = 0; i < cases.size(); ++i) {
    const int port = cases[i].peer.endpoint.empty() ? 0 : camera.Port(endpoint++);
    threads.emplace_back([&, i, port] { measured[i] = Play(cases[i], port); });
  }
  for (std::thread& thread : threads) thread.join();
  return Report(cases, measured, slack);
}

std::vector<Case> CasesOfPeers() {
  std::vector<Case> all;
  for (const auto& group : {SocketCases(), ClientCases(), BodyCases(), CurlCases()}) {
    all.insert(all.end(), group.begin(), group.end());
  }
  return all;
}

}  // namespace

int main(int argc, char** argv) {
  ::testing::InitGoogleTest(&argc, argv);
  if (getenv("TARNWICK_SANDBOX") == nullptr) {
    std::fprintf(stderr, "%s changes the system's limits: run it by scripts/sandbox\n", argv[0]);
    return 2;
  }
  if (argc < 2) {
    std::fprintf(stderr, "usage: %s TWCAMSIM [SLACK]\n", argv[0]);
    return 2;
  }
  const double slack = argc > 2 ? std::atof(argv[2]) : 0.9;
  const SilentNameServer nameServer;
  if (!RepeatConnectsOnce()) {
    std::perror("longest_call: tcp_syn_retries");
    return 2;
  }
  const std::vector<Case> cases = CasesOfPeers();
  if (!MissedOperations().empty()) {
    std::fprintf(stderr, "longest_call: no case of:%s\n", MissedOperations().c_str());
    return 2;
  }
  const SimulatedCamera camera(argv[1], Endpoints(cases), kHold);
  if (!camera.Serves()) {
    std::fprintf(stderr, "longest_call: no simulated camera\n");
    return 2;
  }
  curl_easy_cleanup(TWCurlInit());
  std::printf("| call and peer | longest | measured | peer |\n|---|---|---|---|\n");
  const int wrong = RunAll(cases, camera, slack) + RunAll(LockCases(), camera, slack);
  return wrong == 0 && !::testing::Test::HasFailure() ? 0 : 1;
}
