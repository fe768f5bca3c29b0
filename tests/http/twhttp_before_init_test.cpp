// The client object before Init, and with arguments that it refuses.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <netinet/in.h>

#include "tests/http/http_test_util.h"

using namespace tarnwick;

namespace {

constexpr char kPlainResponse[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";

}  // namespace

// Before Init every operation fails with its own failure value.

TEST(TWHttpClientBeforeInit, TheForwardsFail) {
  ExposedClient client;
  char buf[8] = "kept";
  for (const int state : {0, 1, 2}) {
    client.m_connState = state;
    EXPECT_EQ(client.ReadData(buf, 4), -1);
    EXPECT_EQ(client.WriteData(buf, 4), -1);
    EXPECT_EQ(client.ReadToLineEnd(buf, sizeof(buf)), -1);
    EXPECT_EQ(client.RestoreData(buf, 4), -1);
    EXPECT_FALSE(client.HasDataToRead(0));
  }
  EXPECT_STREQ(buf, "kept");
  client.SetSocketRemoteAddr(htonl(INADDR_LOOPBACK));
  EXPECT_EQ(client.m_pSocket, nullptr);
}

TEST(TWHttpClientBeforeInit, TheRequestsFail) {
  ExposedClient client;
  EXPECT_EQ(client.SendRequestByGet(), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_GET, "?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_POST, "?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.SendRequestByPost("?"), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_IO_ERROR);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_POST, true, 5), HTTP_RET_IO_ERROR);
}

TEST(TWHttpClientBeforeInit, TheParsersFail) {
  ExposedClient client;
  EXPECT_EQ(client.CheckHttpResponse(), HTTP_RET_NOT_READY);
  EXPECT_EQ(client.CheckContentType(), HTTP_RET_IO_ERROR);
  client.m_connState = 1;
  EXPECT_EQ(client.CheckHttpResponse(), HTTP_RET_IO_ERROR);
}

TEST(TWHttpClientBeforeInit, TheAccessorsWork) {
  ExposedClient client;
  std::string text;
  EXPECT_EQ(client.SetCookie("s=1"), 0);
  EXPECT_EQ(client.GetCookie(text), 0);
  EXPECT_EQ(client.GetTransferEncoding(), "");
  EXPECT_EQ(client.GetHttpContent(HTTP_CONTENT_TYPE, text), HTTP_RET_NOT_READY);
  EXPECT_EQ(client.GenBasicAccessAuth(), "Authorization: Basic Og==");
  client.SetPath("/p");
  client.SetCurlRespFile(nullptr);
  EXPECT_EQ(client.m_strPath, "p");
}

TEST(TWHttpClientBadInput, NullAndNegativeArgumentsAreRefused) {
  const auto client = ClientAfter(kPlainResponse);
  char buf[8] = "kept";
  EXPECT_EQ(client->ReadData(nullptr, 4), -1);
  EXPECT_EQ(client->ReadData(buf, -1), -1);
  EXPECT_EQ(client->WriteData(nullptr, 4), -1);
  EXPECT_EQ(client->WriteData(buf, -1), -1);
  EXPECT_EQ(client->ReadToLineEnd(nullptr, 8), -1);
  EXPECT_EQ(client->ReadToLineEnd(buf, 0), -1);
  EXPECT_EQ(client->RestoreData(nullptr, 4), -1);
  EXPECT_EQ(client->RestoreData(buf, -1), -1);
  EXPECT_STREQ(buf, "kept");
  EXPECT_EQ(ReadBody(*client), "body");
}

TEST(TWHttpClientBadInput, RestoreDataBeyondTheBufferIsRefusedAndLosesNothing) {
  const auto client = ClientAfter(kPlainResponse);
  std::string large(65536, 'x');
  EXPECT_EQ(client->RestoreData(large.data(), 65536), -1);
  EXPECT_EQ(client->RestoreData(large.data(), 65532), 0);
  EXPECT_EQ(ReadBody(*client), large.substr(0, 65532) + "body");
}
