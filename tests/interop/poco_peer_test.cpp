// Poco's HTTPServer, which keeps connections on one port and closes them on the other.
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

constexpr char kBlankTaken[] = "passed: the server takes the blank before the colon";

constexpr PeerCase kCases[] = {
    {"GetsJson", Op::kHttpGet, "", "json", "none", OneCall(0, "GET")},
    {"GetsChunksForJson", Op::kHttpGet, " (chunked)", "stream", "none", OneCall(-2),
     "not possible: the server sends chunks to HTTP/1.0, which SendHttpGet does not decode (-2)"},
    {"PostsAForm", Op::kHttpPost, "", "json", "none", OneCall(0)},
    {"Gets", Op::kGet, "", "text", "none", Got("GET ")},
    {"GetsFromTheServerThatKeeps", Op::kGet, "", "text", "none", Got("GET "), "passed",
     "KEEP_PORT"},
    {"GetsChunks", Op::kGet, " (chunked)", "stream", "none", Got("{\"success\":true}")},
    {"GetsChunksByHttp11", Op::kGet, " (HTTP/1.1, chunked)", "stream", "none",
     Got("{\"success\":true}"), "passed", "KEEP_PORT", "plain", HTTP_VERSION_1_1},
    {"GetsALengthByHttp11", Op::kGet, " (HTTP/1.1, keep-alive off)", "text", "none", Got("GET "),
     "passed", "PORT", "plain", HTTP_VERSION_1_1},
    {"WaitsForTheEndOfALength", Op::kGet, " (HTTP/1.1)", "text", "none", KeptOpen("GET "),
     kKeptOpenGet, "KEEP_PORT", "plain", HTTP_VERSION_1_1},
    {"IsSentElsewhere", Op::kGet, " (302)", "moved", "none", Responded(HTTP_RET_REDIRECT, 302)},
    {"PostsAFormAndWaits", Op::kForm, "", "text", "none", KeptOpen("POST pan=3&tilt=-4"),
     kKeptOpenForm, "KEEP_PORT"},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "KEEP_PORT", "plain", HTTP_VERSION_1_0},
    {"PostsAFormToTheServerThatCloses", Op::kForm, " (keep-alive off)", "text", "none",
     Got("POST pan=3&tilt=-4")},
    {"PostsWithLibcurl", Op::kPost, "", "json?pan=3", "none", ByCurl(HTTP_RET_OK)},
    {"PostsAnEnvelope", Op::kSoap, "", "text", "none", Got("POST <?xml"), "passed", "KEEP_PORT"},
    {"PostsAnEnvelopeForChunks", Op::kSoap, " (chunked)", "stream", "none", NoLength(), kNoLength},
    {"GetsXml", Op::kXmlGet, "", "xml", "none", ByCurl(HTTP_RET_OK, "GET")},
    {"PutsXml", Op::kXmlPut, "", "xml", "none", ByCurl(HTTP_RET_OK, "PUT")},
    {"GetsWithLibcurl", Op::kCurl, "", "stream", "none", ByCurl(HTTP_RET_OK, "true")},
    {"Uploads",
     Op::kUpload,
     "",
     "upload",
     "none",
     {HTTP_RET_OK, HTTP_RET_OK, 200, "{\"success\":true}", false},
     kBlankTaken},
};

class PocoPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, PocoPeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(PocoPeer, RespondsAsTheTableSays) {
  Play(Poco(), GetParam());
}

}  // namespace
