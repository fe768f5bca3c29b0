// The two bytes after a chunk: one read in buffered mode, whatever it delivers; in direct mode they
// are read until both have come.
#include "tests/http/http_test_util.h"
#include "tests/net/net_test_util.h"

namespace {

using Calls = std::vector<std::string>;

// A client that has read the head of a chunked response.
class ChunkClient : public TWHttpClient {
 public:
  ChunkClient(bool buffered, std::vector<IoAnswer> reads)
      : socket(new ScriptedSocket(buffered, std::move(reads))) {
    m_pSocket = socket;
    m_connState = 2;
    m_strTransferEncoding = "chunked";
  }

  std::string Body() {
    std::string body;
    EXPECT_EQ(ReadBody(body), HTTP_RET_OK);
    EXPECT_TRUE(socket->ScriptEnded());
    return body;
  }

  ScriptedSocket* const socket;
};

// What a buffered client waits for and reads, when it makes `count` reads of its buffer.
Calls BufferedReads(size_t count) {
  Calls calls;
  for (; count > 0; --count) {
    calls.emplace_back("wait to read");
    calls.emplace_back("read 64512");
  }
  return calls;
}

std::vector<IoAnswer> Then(std::vector<IoAnswer> reads, const std::vector<IoAnswer>& more) {
  reads.insert(reads.end(), more.begin(), more.end());
  return reads;
}

TEST(ChunkEnd, InBufferedModeAFailureAfterItsFirstByteIsNotFollowedByAnotherRead) {
  ChunkClient client(true, Then({Gives("3\r\nold\r"), Fails(EAGAIN)}, Times(7, Fails(EAGAIN))));
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->calls, BufferedReads(9));  // the buffer, its end, the next size line
}

TEST(ChunkEnd, InBufferedModeTheByteThatComesAfterAFailureBeginsTheNextSizeLine) {
  ChunkClient client(true, {Gives("3\r\nold\r"), Fails(EAGAIN), Gives("\n3\r\nnew\r\n0\r\n")});
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->Unread(), "3\r\nnew\r\n0\r\n");
}

TEST(ChunkEnd, InBufferedModeTheEndOfTheStreamAfterItsFirstByteIsReadOnceMoreForTheSizeAlone) {
  ChunkClient client(true, {Gives("3\r\nold\r"), Ends(), Ends()});
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->calls, BufferedReads(3));
}

TEST(ChunkEnd, InBufferedModeItsBytesMayComeInTwoPieces) {
  ChunkClient client(true, {Gives("3\r\nold\r"), Gives("\n3\r\nnew"), Gives("\r\n0\r\n")});
  EXPECT_EQ(client.Body(), "oldnew");
}

TEST(ChunkEnd, InDirectModeAFirstReadOfOneByteIsFollowedByOneMore) {
  ChunkClient client(false, {Gives("3"), Gives("\r"), Gives("\n"), Gives("old"), Gives("\r"),
                             Gives("\n"), Gives("0"), Gives("\r"), Gives("\n")});
  EXPECT_EQ(client.Body(), "old");
  Calls expected;
  for (const char* len : {"1", "1", "1", "3", "2", "1", "1", "1", "1"}) {
    expected.emplace_back("wait to read");
    expected.push_back(std::string("read ") + len);
  }
  EXPECT_EQ(client.socket->calls, expected);
}

TEST(ChunkEnd, InDirectModeAFirstReadThatDeliversNothingIsNotFollowedByAnother) {
  for (const IoAnswer& nothing : {Fails(EAGAIN), Ends()}) {
    ChunkClient client(false, {Gives("3"), Gives("\r"), Gives("\n"), Gives("old"), nothing,
                               Gives("\n"), Gives("3")});
    std::string body;
    EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
    EXPECT_EQ(body, "old");
    EXPECT_EQ(client.socket->calls.size(), 12u);  // the line feed is an empty size line
  }
}

}  // namespace
