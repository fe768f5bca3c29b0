// Bodies and header lines, beside a plain way to read them, on input that is cut at random places.
#include <malloc.h>
#include <strings.h>

#include <algorithm>
#include <random>

#include "tarnwick/http/chunk_size.h"
#include "tarnwick/http/head_parser.h"
#include "tests/http/http_test_util.h"

namespace {

// Delivers a text in pieces, and notes what is asked of it.
class PieceSocket : public TWSocket {
 public:
  PieceSocket(std::string text, unsigned seed)
      : TWSocket("pieces", 0, 5, true), text_(std::move(text)), random_(seed) {}

  int DoSelect(SELECT_TYPE /*type*/) override {
    calls += "select\n";
    return 1;
  }

  int _Read(void* buf, unsigned int len) override {
    calls += "read " + std::to_string(len) + "\n";
    size_t size = random_() % (random_() % 2 == 0 ? 4 : 20000) + 1;
    size = std::min({size, size_t{len}, text_.size() - at_});
    memcpy(buf, text_.data() + at_, size);
    at_ += size;
    return static_cast<int>(size);
  }

  std::string calls;

 private:
  const std::string text_;
  size_t at_ = 0;
  std::mt19937 random_;
};

// A client behind a head, whose body is what a PieceSocket delivers.
class PieceClient : public TWHttpClient {
 public:
  PieceClient(const std::string& text, unsigned seed, const std::string& encoding)
      : pieces(new PieceSocket(text, seed)) {
    m_pSocket = pieces;
    m_connState = 2;
    m_strTransferEncoding = encoding;
  }

  PieceSocket* const pieces;
};

// The body by reads into a buffer, each of them appended.
std::string PlainToEnd(PieceClient* client) {
  std::string body;
  char piece[8192];
  for (int n; (n = client->ReadData(piece, sizeof(piece))) > 0;) {
    body.append(piece, static_cast<size_t>(n));
  }
  return body;
}

std::string PlainChunks(PieceClient* client) {
  std::string body;
  char piece[8192];
  for (;;) {
    const int length = client->ReadToLineEnd(piece, sizeof(piece));
    uint32_t size =
        length < 1 ? 0 : ParseChunkSize(std::string(piece, static_cast<size_t>(length)));
    if (size == 0) return body;
    while (size > 0) {
      const int n = client->ReadData(piece, static_cast<int>(std::min(size, uint32_t{8192})));
      if (n < 0) return body;
      body.append(piece, static_cast<size_t>(n));
      size -= static_cast<uint32_t>(n);
      if (client->pieces->IsEOF()) break;
    }
    client->ReadData(piece, 2);
  }
}

std::string RandomChunks(std::mt19937* random) {
  static constexpr size_t kSizes[] = {1, 2, 63, 64, 1023, 1024, 4096, 8191, 8192, 8193, 20000};
  std::string text;
  for (size_t left = (*random)() % 30; left > 0; --left) {
    const size_t size = kSizes[(*random)() % 11];
    char line[32];
    snprintf(line, sizeof(line), "%zx%s\r\n", size, (*random)() % 4 == 0 ? ";a=b" : "");
    text += line + std::string(size, static_cast<char>('a' + left % 26)) + "\r\n";
  }
  text += "0\r\n\r\nrest";
  if ((*random)() % 4 == 0) text.resize((*random)() % text.size());
  return text;
}

// What is left on the connection, and how it was read, must be the same too.
void ExpectTheSameBehind(PieceClient* fast, PieceClient* plain) {
  EXPECT_EQ(fast->pieces->IsEOF(), plain->pieces->IsEOF());
  EXPECT_EQ(PlainToEnd(fast), PlainToEnd(plain));
  EXPECT_EQ(fast->pieces->calls, plain->pieces->calls);
}

TEST(FastBody, OfChunksIsWhatReadsIntoABufferGive) {
  for (unsigned seed = 0; seed < 200 && !testing::Test::HasFailure(); ++seed) {
    SCOPED_TRACE(seed);
    std::mt19937 random(seed);
    const std::string text = RandomChunks(&random);
    PieceClient fast(text, seed, "chunked");
    PieceClient plain(text, seed, "chunked");
    std::string body;
    EXPECT_EQ(fast.ReadBody(body), HTTP_RET_OK);
    EXPECT_TRUE(body == PlainChunks(&plain));
    ExpectTheSameBehind(&fast, &plain);
  }
}

TEST(FastBody, ToTheEndIsWhatReadsIntoABufferGive) {
  for (unsigned seed = 0; seed < 60 && !testing::Test::HasFailure(); ++seed) {
    SCOPED_TRACE(seed);
    std::mt19937 random(seed);
    std::string text(random() % 400000, 'x');
    for (size_t i = 0; i < text.size(); i += 97) text[i] = static_cast<char>(random());
    PieceClient fast(text, seed, "");
    PieceClient plain(text, seed, "");
    std::string body;
    EXPECT_EQ(fast.ReadBody(body), HTTP_RET_OK);
    EXPECT_TRUE(body == text);
    EXPECT_TRUE(PlainToEnd(&plain) == text);
    ExpectTheSameBehind(&fast, &plain);
  }
}

// A header line by splitting it at its delimiters first.
HeaderLine PlainParse(const std::string& line) {
  static constexpr char kEnds[] = " :;=";
  static constexpr const char* kNames[] = {"content-type", "content-length",   "content-range",
                                           "set-cookie",   "www-authenticate", "transfer-encoding"};
  HeaderLine result;
  const size_t begin = std::min(line.find_first_not_of(kEnds), line.size());
  const size_t end = std::min(line.find_first_of(kEnds, begin), line.size());
  const std::string name = line.substr(begin, end - begin);
  result.hasName = !name.empty();
  for (int i = 5; i >= 0; --i) {
    if (strncasecmp(name.c_str(), kNames[i], strlen(kNames[i])) == 0) {
      result.header = static_cast<Header>(i);
      result.value = std::string_view(line).substr(std::min(end + 1, line.size()));
    }
  }
  return result;
}

TEST(FastHead, ALineGivesWhatSplittingItGives) {
  static constexpr const char* kWords[] = {"Content-Type",
                                           "content-length",
                                           "CONTENT-RANGE",
                                           "Set-Cookie",
                                           "WWW-Authenticate",
                                           "Transfer-Encoding",
                                           "Content-",
                                           "Set",
                                           "X-Device",
                                           "-2",
                                           " ",
                                           ":",
                                           ";",
                                           "=",
                                           "\t",
                                           "v"};
  std::mt19937 random(7);
  for (int round = 0; round < 20000; ++round) {
    std::string line;
    for (size_t words = random() % 6; words > 0; --words) line += kWords[random() % 16];
    if (!line.empty() && random() % 4 == 0)
      line[random() % line.size()] = static_cast<char>(random());
    const HeaderLine fast = ParseHeaderLine(line);
    const HeaderLine plain = PlainParse(line);
    ASSERT_EQ(fast.hasName, plain.hasName) << line;
    ASSERT_EQ(fast.header, plain.header) << line;
    ASSERT_EQ(fast.value, plain.value) << line;
  }
}

size_t ResidentKilobytes() {
  const std::string status = ReadFile("/proc/self/status");
  return strtoul(status.c_str() + status.find("VmRSS:") + 6, nullptr, 10);
}

// The buffer of 64 KiB counts only as far as the answer used it.
TEST(IdleClient, KeepsFewPagesResidentAfterASmallGet) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "the sanitizer's memory is not the library's";
#endif
  ReplyServer server("HTTP/1.0 200 OK\r\nContent-Type: text/plain\r\n\r\nsmall");
  std::vector<std::unique_ptr<ClientProbe>> clients;
  malloc_trim(0);
  const size_t before = ResidentKilobytes();
  for (int i = 0; i < 200; ++i) {
    clients.push_back(std::make_unique<ClientProbe>(server.Port()));
    ASSERT_EQ(clients.back()->SendRequestByGet(), HTTP_RET_OK);
  }
  EXPECT_LT(ResidentKilobytes(), before + 200 * 24);
}

}  // namespace
