// gSOAP: its stand-alone server, and a client that it has generated.
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

constexpr char kReply[] = "<result>gate</result>";

constexpr PeerCase kCases[] = {
    {"PostsAnEnvelope", Op::kSoap, "", "camera", "none", Got(kReply)},
    {"GetsChunksForAnEnvelope", Op::kSoap, " (chunked)", "camera", "none", NoLength(), kChunkedSoap,
     "CHUNK_PORT"},
    {"LogsInByBasic", Op::kSoapAuth, "", "basic", "Basic", Got(kReply)},
    {"IsRefusedByBasic", Op::kSoapAuth, ", refused", "basic", "wrong password",
     Refused(HTTP_RET_UNAUTHORIZED, 401)},
    {"LogsInByDigest", Op::kSoapAuth, "", "digest", "Digest, SHA-256 and MD5", Got(kReply),
     "passed", "DIGEST_PORT"},
    {"LogsInByDigestWithAQuery", Op::kSoapAuth, " (query)", "digest?channel=1",
     "Digest, SHA-256 and MD5", Got(kReply), "passed", "DIGEST_PORT"},
    {"IsRefusedByDigest", Op::kSoapAuth, ", refused", "digest", "wrong password",
     Refused(HTTP_RET_UNAUTHORIZED, 401), "passed", "DIGEST_PORT"},
    {"LogsInForChunks", Op::kSoapAuth, " (chunked)", "camera", "none", NoLength(), kChunkedSoap,
     "CHUNK_PORT"},
    {"TakesNoGet", Op::kGet, " (405)", "camera", "none", Answered(HTTP_RET_BAD_RESPONSE, 405),
     "passed: the server takes POST alone"},
};

class GsoapPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, GsoapPeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(GsoapPeer, AnswersAsTheTableSays) {
  Play(Gsoap(), GetParam());
}

}  // namespace
