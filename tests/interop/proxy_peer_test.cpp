// haproxy and stunnel in front of Node.js.
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

constexpr PeerCase kHaproxyCases[] = {
    {"GetsJson", Op::kHttpGet, "", "json", "none", OneCall(0, "GET")},
    {"Gets", Op::kGet, "", "basic", "Basic, when asked", Got("GET ")},
    {"GetsChunks", Op::kGet, " (HTTP/1.1, chunked)", "stream", "none", Got("{\"success\":true}"),
     "passed", "PORT", "plain", HTTP_VERSION_1_1},
    {"FindsNobodyThere", Op::kGet, " (503)", "text", "none",
     Responded(HTTP_RET_BAD_RESPONSE, 503, "503"), "passed: the server that it asks is down",
     "DOWN_PORT"},
    {"PostsAFormAndWaits", Op::kForm, "", "text", "none", KeptOpen("POST pan=3&tilt=-4"),
     kKeptOpenForm},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "PORT", "plain", HTTP_VERSION_1_0},
    {"PostsAnEnvelope", Op::kSoap, "", "xml", "none", Got("<response method=\"POST\"/>")},
    {"LogsInToPostAnEnvelope", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo")},
    {"PutsXml", Op::kXmlPut, "", "xml", "none", ByCurl(HTTP_RET_OK, "PUT")},
    {"RefusesAnUpload", Op::kUpload, "", "json", "none", UploadRefused(), kBlankRefused},
    {"GetsOverTls", Op::kGet, "", "text", "none", Got("GET "), "passed", "TLS_PORT", "TLS"},
    {"PostsAnEnvelopeOverTls", Op::kSoap, "", "xml", "none", Got("<response method=\"POST\"/>"),
     "passed", "TLS_PORT", "TLS"},
    {"GetsJsonOverTls", Op::kHttpsGet, "", "json", "none", OneCall(0, "GET"), "passed", "TLS_PORT",
     "TLS"},
    {"GetsWithLibcurlOverTls", Op::kCurl, "", "text", "none", ByCurl(HTTP_RET_OK, "GET "), "passed",
     "TLS_PORT", "TLS"},
};

constexpr PeerCase kStunnelCases[] = {
    {"GetsOverTls12", Op::kGet, "", "basic", "Basic, when asked", Got("GET "), "passed",
     "TLS12_PORT", "TLS 1.2"},
    {"GetsOverTls13", Op::kGet, "", "basic", "Basic, when asked", Got("GET "), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"GetsChunks", Op::kGet, " (HTTP/1.1, chunked)", "stream", "none", Got("{\"success\":true}"),
     "passed", "TLS13_PORT", "TLS 1.3", HTTP_VERSION_1_1},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "TLS12_PORT", "TLS 1.2", HTTP_VERSION_1_0},
    {"PostsAnEnvelope", Op::kSoapAuth, "", "basic", "Basic", Got("GetInfo"), "passed", "TLS13_PORT",
     "TLS 1.3"},
    {"GetsJsonOverTls12", Op::kHttpsGet, "", "json", "none", OneCall(0, "GET"), "passed",
     "TLS12_PORT", "TLS 1.2"},
    {"GetsWithLibcurl", Op::kCurl, "", "text", "none", ByCurl(HTTP_RET_OK, "GET "), "passed",
     "TLS13_PORT", "TLS 1.3"},
    {"ShowsNoCertificate", Op::kGet, ", client certificate wanted", "text", "none", NoResponse(),
     "not possible: the client has no certificate to show (the response does not come)",
     "MUTUAL13_PORT", "TLS 1.3"},
};

class HaproxyPeer : public ::testing::TestWithParam<PeerCase> {};
class StunnelPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, HaproxyPeer, ::testing::ValuesIn(kHaproxyCases),
                         [](const auto& test) { return test.param.name; });
INSTANTIATE_TEST_SUITE_P(, StunnelPeer, ::testing::ValuesIn(kStunnelCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(HaproxyPeer, RespondsAsTheTableSays) {
  Play(Haproxy(), GetParam());
}

TEST_P(StunnelPeer, RespondsAsTheTableSays) {
  Play(Stunnel(), GetParam());
}

}  // namespace
