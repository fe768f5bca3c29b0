// A body over a socket that reads directly has nothing of what an earlier connection had read
// ahead: such bytes stay in the socket, and nobody looks at them in that mode.
#include "tests/http/http_test_util.h"
#include "tests/net/net_test_util.h"

namespace {

// A client after a head, on a socket with bytes of before.
class DirectClient : public TWHttpClient {
 public:
  DirectClient(const std::string& encoding, std::vector<IoResult> reads, const std::string& before)
      : socket(new ScriptedSocket(false, std::move(reads))) {
    socket->Buffer(before);
    m_pSocket = socket;
    m_connState = 2;
    m_strTransferEncoding = encoding;
  }

  ScriptedSocket* const socket;
};

TEST(DirectBody, ChunksHaveNothingOfWhatWasReadAheadBefore) {
  const std::string before = "3\r\nold\r\n0\r\n";
  DirectClient client("chunked",
                      {Returns("3"), Returns("\r"), Returns("\n"), Returns("new"), Returns("\r"),
                       Returns("\n"), Returns("0"), Returns("\r"), Returns("\n")},
                      before);
  std::string body;
  EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
  EXPECT_EQ(body, "new");
  EXPECT_TRUE(client.socket->ScriptEnded());
  EXPECT_EQ(client.socket->Unread(), before);
}

TEST(DirectBody, ToTheEndHasNothingOfWhatWasReadAheadBefore) {
  const std::string before(9000, 'o');
  DirectClient client("", {Returns("new"), Returns("er"), Ends()}, before);
  std::string body;
  EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
  EXPECT_EQ(body, "newer");
  EXPECT_EQ(client.socket->Unread(), before);
}

}  // namespace
