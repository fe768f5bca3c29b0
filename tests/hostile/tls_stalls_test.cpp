// TLS servers that stall in the handshake.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <openssl/ssl.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include "tarnwick/net/sslsocket.h"
#include "tests/hostile/hostile_util.h"
#include "tests/hostile/server_tls.h"
#include "tests/hostile/tls_cases.h"

namespace {

using ::testing::ElementsAre;

// Stalls.

struct StallCase {
  std::string name;
  int version;
  size_t records;  // that come before it
  bool within_record;
  bool resumes;
  std::chrono::milliseconds length{30};
};

std::ostream& operator<<(std::ostream& out, const StallCase& test) {
  return out << test.name;
}

std::vector<StallCase> StallTable() {
  std::vector<StallCase> table;
  for (const int version : {TLS1_2_VERSION, TLS1_3_VERSION}) {
    const std::string protocol = version == TLS1_2_VERSION ? "Tls12" : "Tls13";
    const size_t records = version == TLS1_2_VERSION ? 7 : 6;
    for (size_t sent = 0; sent < records; ++sent) {
      const std::string name = protocol + "After" + std::to_string(sent) + "Records";
      table.push_back({name + "ThenEnds", version, sent, false, false});
      table.push_back({name + "ThenGoesOn", version, sent, false, true});
      table.push_back({name + "AndAHalfThenEnds", version, sent, true, false});
      table.push_back({name + "AndAHalfThenGoesOn", version, sent, true, true});
    }
  }
  // The handshake has no time limit: these stalls are longer than the socket's.
  const std::chrono::milliseconds longer(1200);
  table.push_back({"LongerThanTheTimeLimitBeforeTheHello", TLS1_3_VERSION, 0, false, true, longer});
  table.push_back({"LongerThanTheTimeLimitAfterTheHello", TLS1_2_VERSION, 1, false, true, longer});
  table.push_back({"LongerThanTheTimeLimitInARecord", TLS1_3_VERSION, 3, true, false, longer});
  return table;
}

Script StallingPeer(const StallCase& test, const Flag& stalled, const Flag& go_on) {
  const SharedTls tls = TlsOf(test.version);
  Script script = {SendRecords(tls, test.records)};
  if (test.within_record) script.push_back(SendHalfARecord(tls));
  script.push_back(SetFlag(stalled));
  script.push_back(WaitFor(go_on));
  if (test.resumes) script.push_back(FinishHandshake(tls));
  return Concat(script, EndOfStream());
}

const StallCase kLibcurlStalls[] = {
    {"BeforeTheHello", TLS1_3_VERSION, 0, false, false},
    {"AfterTheHello", TLS1_2_VERSION, 1, false, false},
    {"InARecord", TLS1_3_VERSION, 3, true, false},
};

Script StallUntilTheClientGoes(const StallCase& test) {
  const SharedTls tls = TlsOf(test.version);
  Script script = {SendRecords(tls, test.records)};
  if (test.within_record) script.push_back(SendHalfARecord(tls));
  script.push_back(DiscardUntilEnd());
  return script;
}

class TlsStalls : public ::testing::TestWithParam<StallCase> {};

class TlsStallsOfLibcurl : public ::testing::TestWithParam<StallCase> {};

}  // namespace

TEST_P(TlsStalls, LastAsLongAsThePeerIsSilent) {
  const StallCase& test = GetParam();
  const Flag stalled, go_on;
  auto peer =
      std::make_unique<ScriptedPeer>(std::vector<Script>{StallingPeer(test, stalled, go_on)});
  const int port = peer->Port();
  std::atomic<bool> returned{false};
  std::thread client([&] {
    RunOnSmallStack(kSmallStack, [&] {
      const auto socket = std::make_unique<SSLSocket>("127.0.0.1", port, 1, true);
      EXPECT_EQ(socket->Connect(), test.resumes ? 0 : -1);
      returned = true;
    });
  });
  EXPECT_TRUE(stalled.Wait());
  std::this_thread::sleep_for(test.length);
  EXPECT_FALSE(returned);
  go_on.Set();
  peer.reset();  // ends the connection, also when its script has failed
  client.join();
}

INSTANTIATE_TEST_SUITE_P(Hostile, TlsStalls, ::testing::ValuesIn(StallTable()), NameOf<StallCase>);

// libcurl counts the handshake into the transfer's time limit.
TEST_P(TlsStallsOfLibcurl, EndWithTheTimeLimit) {
  const LogCapture log(5);
  ScriptedPeer peer({StallUntilTheClientGoes(GetParam())});
  RunOnSmallStack(kSmallStack, [&] {
    ClientSettings settings;
    settings.https = true;
    ExposedClient client(peer.Port(), settings);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, false, 1), HTTP_RET_IO_ERROR);
  });
  EXPECT_THAT(HttpLog(log),
              ElementsAre("SendRequestByCurl: Failed to make http connection, return value=28\n"));
}

INSTANTIATE_TEST_SUITE_P(Hostile, TlsStallsOfLibcurl, ::testing::ValuesIn(kLibcurlStalls),
                         NameOf<StallCase>);
