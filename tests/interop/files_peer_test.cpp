// Servers of files: Caddy, which also asks Node.js, and busybox httpd, which also runs programs.
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

constexpr PeerCase kCaddyCases[] = {
    {"GetsJson", Op::kHttpGet, "", "info.json", "none", OneCall(0, "true")},
    {"LogsInByBasic", Op::kGet, "", "basic/info.json", "Basic, when asked", Got("true")},
    {"IsRefused", Op::kGet, ", refused", "basic/info.json", "wrong password",
     Responded(HTTP_RET_UNAUTHORIZED, 401)},
    {"FindsNothing", Op::kGet, " (404)", "nothing", "none", Responded(HTTP_RET_BAD_RESPONSE, 404)},
    {"GetsChunks", Op::kGet, " (HTTP/1.1, chunked)", "node/stream", "none",
     Got("{\"success\":true}"), "passed", "PORT", "plain", HTTP_VERSION_1_1},
    {"WaitsForTheEndOfALength", Op::kGet, " (HTTP/1.1)", "info.json", "none", KeptOpen("true"),
     kKeptOpenGet, "PORT", "plain", HTTP_VERSION_1_1},
    {"PostsAFormAndWaits", Op::kForm, "", "node/text", "none", KeptOpen("POST pan=3&tilt=-4"),
     kKeptOpenForm},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "node/text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "PORT", "plain", HTTP_VERSION_1_0},
    {"PostsAnEnvelope", Op::kSoap, "", "node/xml", "none", Got("<response method=\"POST\"/>")},
    {"PutsXml", Op::kXmlPut, "", "node/xml", "none", ByCurl(HTTP_RET_OK, "PUT")},
    {"RefusesAnUpload", Op::kUpload, "", "node/json", "none", UploadRefused(), kBlankRefused},
    {"GetsOverTls", Op::kGet, "", "info.json", "none", Got("true"), "passed", "TLS_PORT", "TLS"},
    {"GetsJsonOverTls", Op::kHttpsGet, "", "info.json", "none", OneCall(0, "true"), "passed",
     "TLS_PORT", "TLS"},
};

constexpr PeerCase kBusyboxCases[] = {
    {"GetsJson", Op::kHttpGet, "", "info.json", "none", OneCall(0, "true")},
    {"GetsJsonFromAProgram", Op::kHttpGet, " (CGI)", "cgi-bin/json.cgi?zoom=3", "none",
     OneCall(0, "zoom=3")},
    {"LogsInByBasic", Op::kGet, "", "basic/info.json", "Basic, when asked", Got("true")},
    {"IsRefused", Op::kGet, ", refused", "basic/info.json", "wrong password",
     Responded(HTTP_RET_UNAUTHORIZED, 401)},
    {"FindsNothing", Op::kGet, " (404)", "nothing", "none", Responded(HTTP_RET_BAD_RESPONSE, 404)},
    {"GetsByHttp11", Op::kGet, " (HTTP/1.1)", "info.json", "none", Got("true"), "passed", "PORT",
     "plain", HTTP_VERSION_1_1},
    {"PostsAFormToAProgram", Op::kForm, " (CGI)", "cgi-bin/text.cgi", "none",
     Got("body pan=3&tilt=-4")},
    {"PostsAnEnvelopeToAProgram", Op::kSoap, " (CGI)", "cgi-bin/xml.cgi", "none", Got("GetInfo")},
    {"PostsAnEnvelopeToAProgramWithoutALength", Op::kSoap, " (CGI, no length)",
     "cgi-bin/stream.cgi", "none", NoLength(), kNoLength},
    {"PostsWithLibcurlToAProgram", Op::kPost, " (CGI)", "cgi-bin/text.cgi?pan=3", "none",
     ByCurl(HTTP_RET_OK)},
    {"GetsXml", Op::kXmlGet, "", "info.xml", "none", ByCurl(HTTP_RET_OK, "GET")},
    {"RefusesAnUpload", Op::kUpload, "", "cgi-bin/text.cgi", "none", UploadRefused(),
     "not possible: the server refuses the length of 128 GiB (400)"},
};

class CaddyPeer : public ::testing::TestWithParam<PeerCase> {};
class BusyboxPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, CaddyPeer, ::testing::ValuesIn(kCaddyCases),
                         [](const auto& test) { return test.param.name; });
INSTANTIATE_TEST_SUITE_P(, BusyboxPeer, ::testing::ValuesIn(kBusyboxCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(CaddyPeer, RespondsAsTheTableSays) {
  Play(Caddy(), GetParam());
}

TEST_P(BusyboxPeer, RespondsAsTheTableSays) {
  Play(Busybox(), GetParam());
}

}  // namespace
