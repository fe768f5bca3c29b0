// Size lines of chunks whose length is near that of the buffers they are read into. All of a response
// is buffered at once, so that nothing but the line's length decides.
#include "tests/http/http_test_util.h"
#include "tests/net/net_test_util.h"

namespace {

// A client after a head, whose body comes with one read.
class BufferedClient : public TWHttpClient {
 public:
  explicit BufferedClient(const std::string& text) {
    m_pSocket = new ScriptedSocket(true, {Returns(text)});
    m_connState = 2;
    m_strTransferEncoding = "chunked";
  }
};

// The body of a chunk of five bytes with a size line of `length` characters, and one of three.
std::string BodyAfterLineOf(size_t length) {
  const std::string line = "5;" + std::string(length - 2, 'x');
  BufferedClient client(line + "\r\nzzzzz\r\n3\r\nabc\r\n0\r\n\r\n");
  std::string body;
  EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK) << length;
  return body;
}

TEST(ChunkLineCut, ALineThatFitsIsTakenWhole) {
  for (size_t length = 2; length <= 8191; length += length < 600 || length > 8100 ? 1 : 97) {
    ASSERT_EQ(BodyAfterLineOf(length), "zzzzzabc") << length;
  }
}

TEST(ChunkLineCut, OfALongerLineTheRestIsData) {
  // The 8,192nd character is lost; what follows it is the chunk's data.
  EXPECT_EQ(BodyAfterLineOf(8192), "\r\nzzz");
  EXPECT_EQ(BodyAfterLineOf(8193), "x\r\nzz");
  EXPECT_EQ(BodyAfterLineOf(8200), "xxxxx");
  EXPECT_EQ(BodyAfterLineOf(30000), "xxxxx");
}

}  // namespace
