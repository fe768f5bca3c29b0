// GNU libmicrohttpd: Basic, Digest with MD5 and with SHA-256, chunks, and connections that it
// keeps.
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

constexpr char kSha256[] = "Digest, SHA-256";
constexpr char kNoSha256[] =
    "not possible: the client knows Digest with MD5 alone, so the 401 stays";

constexpr PeerCase kCases[] = {
    {"GetsJson", Op::kHttpGet, "", "json", "none", OneCall(0, "GET")},
    {"PostsAForm", Op::kHttpPost, "", "json", "none", OneCall(0)},
    {"Gets", Op::kGet, "", "text", "none", Got("GET ")},
    {"GetsAStream", Op::kGet, " (no length)", "stream", "none", Got("line xx\nline xx\n")},
    {"GetsChunks", Op::kGet, " (HTTP/1.1, chunked)", "stream", "none", Got("line xx\nline xx\n"),
     "passed", "PORT", "plain", HTTP_VERSION_1_1},
    {"WaitsForTheEndOfALength", Op::kGet, " (HTTP/1.1)", "text", "none", KeptOpen("GET "),
     kKeptOpenGet, "PORT", "plain", HTTP_VERSION_1_1},
    {"LogsInByBasic", Op::kGet, "", "basic/text", "Basic, when asked", Got("GET ")},
    {"LogsInByMd5", Op::kGet, "", "md5/text?zoom=3", "Digest, MD5", Got("GET ")},
    {"DoesNotLogInBySha256", Op::kGet, "", "sha256/text", kSha256,
     Responded(HTTP_RET_UNAUTHORIZED, 401, "refused"), kNoSha256},
    {"IsRefused", Op::kGet, ", refused", "md5/text", "wrong password",
     Responded(HTTP_RET_UNAUTHORIZED, 401, "refused")},
    {"PostsAFormAndWaits", Op::kForm, "", "text", "none", KeptOpen("POST pan=3&tilt=-4"),
     kKeptOpenForm},
    {"PostsAFormOfHttp10", Op::kForm, " (HTTP/1.0)", "text", "none", Got("POST pan=3&tilt=-4"),
     "passed", "PORT", "plain", HTTP_VERSION_1_0},
    {"PostsWithLibcurlAndBasic", Op::kPost, "", "basic/text?pan=3", "Basic", ByCurl(HTTP_RET_OK)},
    {"PostsWithLibcurlAndMd5", Op::kPost, "", "md5/text?pan=3", "Digest, MD5", ByCurl(HTTP_RET_OK)},
    {"PostsWithLibcurlAndSha256", Op::kPost, "", "sha256/text?pan=3", kSha256, ByCurl(HTTP_RET_OK)},
    {"PostsAnEnvelope", Op::kSoap, "", "text", "none", Got("POST <?xml")},
    {"PostsAnEnvelopeForChunks", Op::kSoap, " (chunked)", "stream", "none", NoLength(), kNoLength},
    {"LogsInByBasicToPostAnEnvelope", Op::kSoapAuth, "", "basic/text", "Basic", Got("POST <?xml")},
    {"LogsInByMd5ToPostAnEnvelope", Op::kSoapAuth, "", "md5/text", "Digest, MD5",
     Got("POST <?xml")},
    {"DoesNotLogInBySha256ToPostAnEnvelope", Op::kSoapAuth, "", "sha256/text", kSha256,
     Refused(HTTP_RET_UNAUTHORIZED, 401), kNoSha256},
    {"GetsXmlByBasic", Op::kXmlGet, "", "basic/xml", "Basic", ByCurl(HTTP_RET_OK, "GET")},
    {"GetsXmlByMd5", Op::kXmlGet, "", "md5/xml", "Digest, MD5", ByCurl(HTTP_RET_OK, "GET")},
    {"GetsXmlBySha256", Op::kXmlGet, "", "sha256/xml", kSha256, ByCurl(HTTP_RET_OK, "GET")},
    {"PutsXmlByBasic", Op::kXmlPut, "", "basic/xml", "Basic", ByCurl(HTTP_RET_OK, "PUT")},
    {"PutsNoXmlByMd5", Op::kXmlPut, "", "md5/xml", "Digest, MD5", ByCurl(HTTP_RET_IO_ERROR),
     kBasicAlone},
    {"GetsWithLibcurlAndBasic", Op::kCurl, "", "basic/text", "Basic", ByCurl(HTTP_RET_OK, "GET ")},
    {"GetsNothingWithLibcurlAndMd5", Op::kCurl, "", "md5/text", "Digest, MD5",
     ByCurl(HTTP_RET_IO_ERROR, "refused"), kBasicAlone},
    {"WaitsForTheWholeUpload", Op::kUpload, "", "text", "none", UploadAwaited(), kUploadAwaited},
};

class MicrohttpdPeer : public ::testing::TestWithParam<PeerCase> {};

INSTANTIATE_TEST_SUITE_P(, MicrohttpdPeer, ::testing::ValuesIn(kCases),
                         [](const auto& test) { return test.param.name; });

TEST_P(MicrohttpdPeer, RespondsAsTheTableSays) {
  Play(Microhttpd(), GetParam());
}

}  // namespace
