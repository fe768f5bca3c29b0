// Node.js: its http and https modules.
#include <gtest/gtest.h>

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
     Answered(HTTP_RET_UNAUTHORIZED, 401, "refused")},
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
    {"PostsAnEnvelope", Op::kSoap, "", "xml", "none", Got("<reply method=\"POST\"/>")},
    {"PostsAnEnvelopeForChunks", Op::kSoap, " (chunked)", "xmlstream", "none", NoLength(),
     kChunkedSoap},
    {"LogsInToPostAnEnvelope", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo")},
    {"GetsXml", Op::kXmlGet, "", "xml", "none", ByCurl(HTTP_RET_OK, "GET")},
    {"PutsXml", Op::kXmlPut, "", "xml", "none", ByCurl(HTTP_RET_OK, "PUT")},
    {"GetsWithLibcurl", Op::kCurl, "", "basic", "Basic", ByCurl(HTTP_RET_OK, "GET ")},
    {"RefusesAnUpload", Op::kUpload, "", "json", "none",
     Answered(HTTP_RET_BAD_RESPONSE, 400, "{\"error\":true}"), kBlankRefused},
    {"GetsOverTls12", Op::kGet, "", "text", "none", Got("GET "), "passed", "TLS12_PORT", "TLS 1.2"},
    {"GetsOverTls13", Op::kGet, "", "text", "none", Got("GET "), "passed", "TLS13_PORT", "TLS 1.3"},
    {"PostsAnEnvelopeOverTls13", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo"), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"GetsJsonOverTls12", Op::kHttpsGet, "", "stream", "none", OneCall(0, "true"), "passed",
     "TLS12_PORT", "TLS 1.2"},
    {"GetsJsonOverTls13", Op::kHttpsGet, "", "json", "none", OneCall(0, "GET"), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"ShowsNoCertificateOverTls12",
     Op::kGet,
     ", client certificate wanted",
     "text",
     "none",
     {HTTP_RET_IO_ERROR, HTTP_RET_NOT_READY, 0, "", false},
     "not possible: the client has no certificate to show (the handshake fails)",
     "MUTUAL12_PORT",
     "TLS 1.2"},
    {"ShowsNoCertificateOverTls13",
     Op::kGet,
     ", client certificate wanted",
     "text",
     "none",
     {HTTP_RET_IO_ERROR, HTTP_RET_IO_ERROR, 0, "", false},
     "not possible: the client has no certificate to show (the response does not come)",
     "MUTUAL13_PORT",
     "TLS 1.3"},
};

class NodePeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, NodePeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(NodePeer, AnswersAsTheTableSays) {
  Play(Node(), GetParam());
}

}  // namespace
