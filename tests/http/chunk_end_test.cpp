// The two bytes after a chunk: one read in buffered mode, whatever it delivers; in direct mode they
// are read until both have come.
#include "tests/http/http_test_util.h"
#include "tests/net/net_test_util.h"

namespace {

using Calls = std::vector<std::string>;

// A client that has read the head of a chunked response.
class ChunkClient : public TWHttpClient {
 public:
  ChunkClient(bool buffered, std::vector<IoResult> reads)
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

std::vector<IoResult> Then(std::vector<IoResult> reads, const std::vector<IoResult>& more) {
  reads.insert(reads.end(), more.begin(), more.end());
  return reads;
}

TEST(ChunkEnd, InBufferedModeAFailureAfterItsFirstByteIsNotFollowedByAnotherRead) {
  ChunkClient client(true, Then({Returns("3\r\nold\r"), Fails(EAGAIN)}, Times(7, Fails(EAGAIN))));
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->calls, BufferedReads(9));  // the buffer, its end, the next size line
}

TEST(ChunkEnd, InBufferedModeTheByteThatComesAfterAFailureBeginsTheNextSizeLine) {
  ChunkClient client(true, {Returns("3\r\nold\r"), Fails(EAGAIN), Returns("\n3\r\nnew\r\n0\r\n")});
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->Unread(), "3\r\nnew\r\n0\r\n");
}

TEST(ChunkEnd, InBufferedModeTheEndOfTheStreamAfterItsFirstByteIsReadOnceMoreForTheSizeAlone) {
  ChunkClient client(true, {Returns("3\r\nold\r"), Ends(), Ends()});
  EXPECT_EQ(client.Body(), "old");
  EXPECT_EQ(client.socket->calls, BufferedReads(3));
}

TEST(ChunkEnd, InBufferedModeItsBytesMayComeInTwoPieces) {
  ChunkClient client(true, {Returns("3\r\nold\r"), Returns("\n3\r\nnew"), Returns("\r\n0\r\n")});
  EXPECT_EQ(client.Body(), "oldnew");
}

TEST(ChunkEnd, InDirectModeAFirstReadOfOneByteIsFollowedByOneMore) {
  ChunkClient client(false,
                     {Returns("3"), Returns("\r"), Returns("\n"), Returns("old"), Returns("\r"),
                      Returns("\n"), Returns("0"), Returns("\r"), Returns("\n")});
  EXPECT_EQ(client.Body(), "old");
  Calls expected;
  for (const char* len : {"1", "1", "1", "3", "2", "1", "1", "1", "1"}) {
    expected.emplace_back("wait to read");
    expected.push_back(std::string("read ") + len);
  }
  EXPECT_EQ(client.socket->calls, expected);
}

TEST(ChunkEnd, InDirectModeAFirstReadThatDeliversNothingIsNotFollowedByAnother) {
  for (const IoResult& nothing : {Fails(EAGAIN), Ends()}) {
    ChunkClient client(false, {Returns("3"), Returns("\r"), Returns("\n"), Returns("old"), nothing,
                               Returns("\n"), Returns("3")});
    std::string body;
    EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
    EXPECT_EQ(body, "old");
    EXPECT_EQ(client.socket->calls.size(), 12u);  // the line feed is an empty size line
  }
}

}  // namespace
