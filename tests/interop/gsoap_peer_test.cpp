// gSOAP: its stand-alone server, and a client that it has generated.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

using ::testing::HasSubstr;

constexpr char kResult[] = "<result>gate</result>";

constexpr PeerCase kCases[] = {
    {"PostsAnEnvelope", Op::kSoap, "", "camera", "none", Got(kResult)},
    {"GetsChunksForAnEnvelope", Op::kSoap, " (chunked)", "camera", "none", NoLength(), kNoLength,
     "CHUNK_PORT"},
    {"LogsInByBasic", Op::kSoapAuth, "", "basic", "Basic", Got(kResult)},
    {"IsRefusedByBasic", Op::kSoapAuth, ", refused", "basic", "wrong password",
     Refused(HTTP_RET_UNAUTHORIZED, 401)},
    {"LogsInByDigest", Op::kSoapAuth, "", "digest", "Digest, SHA-256 and MD5", Got(kResult),
     "passed", "DIGEST_PORT"},
    {"LogsInByDigestWithAQuery", Op::kSoapAuth, " (query)", "digest?channel=1",
     "Digest, SHA-256 and MD5", Got(kResult), "passed", "DIGEST_PORT"},
    {"IsRefusedByDigest", Op::kSoapAuth, ", refused", "digest", "wrong password",
     Refused(HTTP_RET_UNAUTHORIZED, 401), "passed", "DIGEST_PORT"},
    {"LogsInForChunks", Op::kSoapAuth, " (chunked)", "camera", "none", NoLength(), kNoLength,
     "CHUNK_PORT"},
    {"TakesNoGet", Op::kGet, " (405)", "camera", "none", Responded(HTTP_RET_BAD_RESPONSE, 405),
     "passed: the server takes POST alone"},
};

class GsoapPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, GsoapPeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(GsoapPeer, RespondsAsTheTableSays) {
  Play(Gsoap(), GetParam());
}

// ---- the other way round: gSOAP's client asks the simulated camera

#ifdef TARNWICK_TWCAMSIM

// What the client prints.
std::string AskCamera(const char* port, const std::vector<std::string>& login) {
  std::vector<std::string> command = {
      TARNWICK_PEERS_FOLDER "/gsoap_client",
      "http://127.0.0.1:" + std::to_string(SimulatedCamera().Port(port)) + "/device"};
  command.insert(command.end(), login.begin(), login.end());
  std::string output;
  EXPECT_EQ(RunProgram(command, &output).code, 0);
  return output;
}

TEST(GsoapPeerClient, AsksTheSimulatedCamera) {
  AddRow({"gSOAP's client", "twcamsim", "none", "plain", "gSOAP", "passed"});
  EXPECT_EQ(AskCamera("PORT", {}), "TW-1\n");
}

TEST(GsoapPeerClient, LogsInToTheSimulatedCameraByDigest) {
  AddRow({"gSOAP's client", "twcamsim", "Digest, qop auth", "plain", "gSOAP", "passed"});
  EXPECT_EQ(AskCamera("DIGEST_PORT", {kUser, kPassword}), "TW-1\n");
}

TEST(GsoapPeerClient, IsRefusedByTheSimulatedCamera) {
  AddRow({"gSOAP's client, refused", "twcamsim", "wrong password", "plain", "gSOAP", "passed"});
  EXPECT_THAT(AskCamera("DIGEST_PORT", {kUser, "gate-8"}), HasSubstr("Error 401"));
}

#endif

}  // namespace
