// lighttpd: Digest with MD5, and forms for a program.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/interop/servers.h"

namespace {

using ::testing::HasSubstr;

constexpr char kLighttpd[] = "lighttpd";

class LighttpdTest : public ::testing::TestWithParam<Mode> {
 protected:
  std::unique_ptr<ExposedClient> Client(const std::string& path) {
    ClientSettings settings = LoginTo(GetParam(), path);
    settings.timeout = 1;
    return NewClient(Lighttpd(), settings);
  }
};

INSTANTIATE_TEST_SUITE_P(, LighttpdTest, ::testing::ValuesIn(kModes),
                         [](const auto& test) { return NameOf(test.param); });

TEST_P(LighttpdTest, LogsInByDigestWithMd5) {
  Worked("SendRequest (GET)", kLighttpd, "Digest, MD5", GetParam());
  auto client = Client("digest/text.cgi?zoom=3");
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  EXPECT_THAT(BodyOf(client.get()), HasSubstr("query zoom=3\n"));
}

TEST_P(LighttpdTest, GivesUpWhenTheCredentialsAreRefusedAgain) {
  Worked("SendRequest (GET), refused", kLighttpd, "wrong password", GetParam());
  ClientSettings settings = LoginTo(GetParam(), "digest/text.cgi");
  settings.password = "gate-8";
  auto client = NewClient(Lighttpd(), settings);
  ASSERT_EQ(client->SendRequest(HTTP_METHOD_GET, ""), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 401);
}

TEST_P(LighttpdTest, PostsAForm) {
  Worked("SendRequestBySocketPost", kLighttpd, "none", GetParam());
  auto client = Client("cgi/text.cgi");
  ASSERT_EQ(client->SendRequestBySocketPost("pan=3&tilt=-4"), HTTP_RET_OK);
  EXPECT_EQ(StatusOf(client.get()), 200);
  const std::string body = BodyOf(client.get());
  EXPECT_THAT(body, HasSubstr("type application/x-www-form-urlencoded; charset=utf-8\n"));
  EXPECT_THAT(body, HasSubstr("body pan=3&tilt=-4\n"));
}

TEST_P(LighttpdTest, LogsInToPostAnEnvelope) {
  Worked("SendAuthReqBySocketPost", kLighttpd, "Digest, MD5", GetParam());
  auto client = Client("digest/xml.cgi");
  std::string response;
  ASSERT_EQ(client->SendAuthReqBySocketPost("<envelope/>", response), HTTP_RET_OK);
  EXPECT_THAT(response, HasSubstr("<envelope/>"));
}

TEST_P(LighttpdTest, PostsWithLibcurlAfterDigest) {
  if (GetParam().tls || !GetParam().buffered) return;  // plain alone, and libcurl reads by itself
  WorkedByCurl("SendRequestByPost", kLighttpd, "Digest, MD5", false);
  auto client = Client("digest/text.cgi?pan=3");
  EXPECT_EQ(client->SendRequestByPost("?"), HTTP_RET_OK);
}

}  // namespace
