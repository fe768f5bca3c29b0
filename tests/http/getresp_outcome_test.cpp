// What CheckResponse tells of a response that GetResp has read.
#include "tests/http/http_test_util.h"
#include "tests/support/tls_scripted_peer.h"

namespace {

constexpr char kErrorText[] = "{\"error\":true}";

// The peer's side of an upload.
Script Upload(const std::string& response) {
  return {ExpectUntil("\r\n\r\n"), ExpectExactly("part"), Send(response), Close()};
}

// Uploads, and returns what GetResp does.
std::string UploadWith(TWHttpClient& client) {
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.WriteData("part", 4), 4);
  return client.GetResp();
}

void ExpectOutcome(TWHttpClient& client, int result, int status) {
  int actual = -1;
  EXPECT_EQ(client.CheckResponse(actual), result);
  EXPECT_EQ(actual, status);
}

TEST(GetRespOutcome, OfAFreshClientsUploadIsTheResponses) {
  ScriptedPeer peer({Upload("HTTP/1.1 200 OK\r\n\r\ntaken")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(UploadWith(client), "taken");
  ExpectOutcome(client, HTTP_RET_OK, 200);
}

TEST(GetRespOutcome, OfARefusedUploadIsTheRefusal) {
  ScriptedPeer peer(
      {Exchange("HTTP/1.1 200 OK\r\n\r\nfine"), Upload("HTTP/1.1 400 Bad Request\r\n\r\nreason")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  ExpectOutcome(client, HTTP_RET_OK, 200);
  EXPECT_EQ(UploadWith(client), kErrorText);
  ExpectOutcome(client, HTTP_RET_BAD_RESPONSE, 400);
}

TEST(GetRespOutcome, OfAnUploadAfterAnEarlier404IsTheUploads) {
  for (const bool tls : {false, true}) {
    const std::vector<Script> scripts = {Exchange("HTTP/1.1 404 Not Found\r\n\r\n"),
                                         Upload("HTTP/1.1 200 OK\r\n\r\ntaken")};
    const std::unique_ptr<ScriptedPeer> peer =
        tls ? std::make_unique<TlsScriptedPeer>(scripts) : std::make_unique<ScriptedPeer>(scripts);
    ClientSettings settings;
    settings.https = tls;
    ExposedClient client(peer->Port(), settings);
    EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
    ExpectOutcome(client, HTTP_RET_BAD_RESPONSE, 404);
    EXPECT_EQ(UploadWith(client), "taken");
    ExpectOutcome(client, HTTP_RET_OK, 200);
  }
}

TEST(GetRespOutcome, OfAnUploadThatIsNotAnsweredIsAnIoError) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\nfine"), Upload("")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(UploadWith(client), kErrorText);
  ExpectOutcome(client, HTTP_RET_IO_ERROR, 0);
}

TEST(GetRespOutcome, OfAnUploadThatAsksForCredentialsIsUnauthorized) {
  ScriptedPeer peer({Upload("HTTP/1.1 401 No\r\nWWW-Authenticate: Basic x\r\n\r\n")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(UploadWith(client), kErrorText);
  ExpectOutcome(client, HTTP_RET_UNAUTHORIZED, 401);
}

TEST(GetRespOutcome, BeforeItIsCalledTheEarlierResponseIsKept) {
  ScriptedPeer peer({Exchange("HTTP/1.1 302 Found\r\n\r\n"), Upload("HTTP/1.1 200 OK\r\n\r\n")});
  ExposedClient client(peer.Port());
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  EXPECT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  ExpectOutcome(client, HTTP_RET_REDIRECT, 302);
  EXPECT_EQ(client.WriteData("part", 4), 4);
  EXPECT_EQ(client.GetResp(), "");
  ExpectOutcome(client, HTTP_RET_OK, 200);
}

TEST(GetRespOutcome, OfABodyThatBreaksOffIsItsHeads) {
  ScriptedPeer peer({{ExpectUntil("\r\n\r\n"), ExpectExactly("part"),
                      Send("HTTP/1.1 200 OK\r\n\r\n"), StallUntilFinish()}});
  ClientSettings settings;
  settings.timeout = 1;
  settings.buffered = false;
  ExposedClient client(peer.Port(), settings);
  EXPECT_EQ(UploadWith(client), kErrorText);
  ExpectOutcome(client, HTTP_RET_OK, 200);
  peer.Finish();
}

TEST(GetRespOutcome, WithoutASocketIsAnIoError) {
  ExposedClient client;
  EXPECT_EQ(client.GetResp(), kErrorText);
  ExpectOutcome(client, HTTP_RET_IO_ERROR, 0);
}

}  // namespace
