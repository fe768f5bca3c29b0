// The web servers where they keep connections: a form asks them to close by "Connection: close;".
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/interop/peer_case.h"

namespace {

using ::testing::HasSubstr;

struct KeepingServer {
  WebServer& (*server)();
  PeerCase form;
};

constexpr KeepingServer kServers[] = {
    {Apache,
     {"Apache", Op::kForm, "", "cgi/text.cgi", "none", Got("body pan=3&tilt=-4\n"), "passed",
      "KEEP_PORT"}},
    {Nginx,
     {"Nginx", Op::kForm, "", "upstream/text.cgi", "none", Got("body pan=3&tilt=-4\n"), "passed",
      "KEEP_PORT"}},
    {Lighttpd,
     {"Lighttpd", Op::kForm, "", "cgi/text.cgi", "none", Got("body pan=3&tilt=-4\n"), "passed",
      "KEEP_PORT"}},
};

class KeepingPeer : public ::testing::TestWithParam<KeepingServer> {};

INSTANTIATE_TEST_SUITE_P(, KeepingPeer, ::testing::ValuesIn(kServers),
                         [](const auto& test) { return test.param.form.name; });

TEST_P(KeepingPeer, ClosesAfterTheForm) {
  Play(GetParam().server(), GetParam().form);
}

TEST_P(KeepingPeer, KeepsTheConnectionWhenNothingAsksItToClose) {
  ClientSettings settings = LoginTo(kModes[0], GetParam().form.path);
  settings.version = HTTP_VERSION_1_1;
  ExposedClient client(GetParam().server().Port("KEEP_PORT"), settings);
  ASSERT_EQ(client.SendRequestByGet(), HTTP_RET_OK);
  std::string body(std::stoul(Content(client, HTTP_CONTENT_LENGTH)), '\0');
  const int size = static_cast<int>(body.size());
  ASSERT_EQ(client.ReadData(body.data(), size), size);
  const std::string second = "GET /" + std::string(GetParam().form.path) +
                             "?second HTTP/1.1\r\nHost: 127.0.0.1\r\nConnection: close\r\n\r\n";
  ASSERT_EQ(client.WriteData(second.data(), static_cast<int>(second.size())),
            static_cast<int>(second.size()));
  EXPECT_THAT(client.GetResp(), HasSubstr("query second\n"));
}

}  // namespace
