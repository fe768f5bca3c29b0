// Node.js: its http and https modules.
#include <gtest/gtest.h>

#include <cstdlib>

#include "tests/interop/peer_case.h"

namespace {

constexpr PeerCase kCases[] = {
    {"GetsJson", Op::kHttpGet, "", "json", "none", OneCall(0, "GET")},
    {"GetsJsonInTwoWrites", Op::kHttpGet, " (no length)", "stream", "none", OneCall(0, "true")},
    {"GetsAnArray", Op::kHttpGet, " (array)", "array", "none", OneCall(-2, "true"),
     "not possible: no member \"success\" (-2)"},
    {"IsSentElsewhere", Op::kHttpGet, " (302)", "moved", "none", OneCall(-1),
     "not possible: redirects are not followed (-1)"},
    {"PostsAForm", Op::kHttpPost, "", "json", "none", OneCall(0)},
    {"Gets", Op::kGet, "", "text", "none", Got("GET ")},
    {"LogsInByBasic", Op::kGet, "", "basic", "Basic, when asked", Got("GET ")},
    {"IsRefused", Op::kGet, ", refused", "basic", "wrong password",
     Responded(HTTP_RET_UNAUTHORIZED, 401, "refused")},
    {"GetsChunks", Op::kGet, " (HTTP/1.1, chunked)", "stream", "none", Got("{\"success\":true}"),
     "passed", "PORT", "plain", HTTP_VERSION_1_1},
    {"WaitsForTheEndOfALength", Op::kGet, " (HTTP/1.1)", "text", "none", KeptOpen("GET "),
     kKeptOpenGet, "PORT", "plain", HTTP_VERSION_1_1},
    {"GetsCookies", Op::kGet, " (cookies)", "cookie", "none", Got("none")},
    {"PostsAFormAndWaits", Op::kForm, "", "text", "none", KeptOpen("POST pan=3&tilt=-4"),
     kKeptOpenForm},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "PORT", "plain", HTTP_VERSION_1_0},
    {"PostsWithLibcurl", Op::kPost, "", "basic?pan=3", "Basic", ByCurl(HTTP_RET_OK)},
    {"PostsAnEnvelope", Op::kSoap, "", "xml", "none", Got("<response method=\"POST\"/>")},
    {"PostsAnEnvelopeForChunks", Op::kSoap, " (chunked)", "xmlstream", "none", NoLength(),
     kNoLength},
    {"LogsInToPostAnEnvelope", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo")},
    {"GetsXml", Op::kXmlGet, "", "xml", "none", ByCurl(HTTP_RET_OK, "GET")},
    {"PutsXml", Op::kXmlPut, "", "xml", "none", ByCurl(HTTP_RET_OK, "PUT")},
    {"GetsWithLibcurl", Op::kCurl, "", "basic", "Basic", ByCurl(HTTP_RET_OK, "GET ")},
    {"GetsOverTls12", Op::kGet, "", "text", "none", Got("GET "), "passed", "TLS12_PORT", "TLS 1.2"},
    {"GetsOverTls13", Op::kGet, "", "text", "none", Got("GET "), "passed", "TLS13_PORT", "TLS 1.3"},
    {"PostsAnEnvelopeOverTls13", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo"), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"GetsJsonOverTls12", Op::kHttpsGet, "", "stream", "none", OneCall(0, "true"), "passed",
     "TLS12_PORT", "TLS 1.2"},
    {"GetsJsonOverTls13", Op::kHttpsGet, "", "json", "none", OneCall(0, "GET"), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"ShowsNoCertificateOverTls12", Op::kGet, ", client certificate wanted", "text", "none",
     NoResponse(HTTP_RET_NOT_READY),
     "not possible: the client has no certificate to show (the handshake fails)", "MUTUAL12_PORT",
     "TLS 1.2"},
    {"ShowsNoCertificateOverTls13", Op::kGet, ", client certificate wanted", "text", "none",
     NoResponse(),
     "not possible: the client has no certificate to show (the response does not come)",
     "MUTUAL13_PORT", "TLS 1.3"},
};

class NodePeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, NodePeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(NodePeer, RespondsAsTheTableSays) {
  Play(Node(), GetParam());
}

// ---- the blank before a colon in the head of an upload

constexpr PeerCase kUploads[] = {
    {"Lenient", Op::kUpload, "", "json", "none", UploadAwaited(), kUploadAwaited},
    {"Strict", Op::kUpload, "", "json", "none", UploadRefused(), kBlankRefused},
};

int MajorVersion() {
  std::string version;  // "v20.20.2"
  EXPECT_EQ(RunProgram({"/usr/bin/node", "--version"}, &version).code, 0);
  return atoi(version.c_str() + 1);
}

// Measured with 18.20.4, which goes on to wait for the body, and 20.20.2.
TEST(NodePeerUpload, IsRefusedFromVersion20On) {
  Play(Node(), kUploads[MajorVersion() >= 20 ? 1 : 0]);
}

}  // namespace
