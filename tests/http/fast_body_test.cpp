// Bodies and header lines, beside a plain way to read them, on input that is cut at random places.
#include <malloc.h>
#include <strings.h>
#include <unistd.h>

#include <algorithm>
#include <cinttypes>
#include <random>
#include <sstream>

#include "tarnwick/http/chunk_size.h"
#include "tarnwick/http/head_parser.h"
#include "tests/http/http_test_util.h"

using namespace tarnwick;

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

// A client after a head, whose body is what a PieceSocket delivers.
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

// What stands between the digits of a size line and the chunk: mostly a line end alone.
std::string RandomLineRest(std::mt19937* random) {
  static constexpr size_t kExtensions[] = {0, 0, 0, 0, 0, 4, 250, 253, 254, 255, 300, 9000};
  static constexpr const char* kEnds[] = {"\r\n", "\r\n", "\n", "\rx"};
  const std::string extension(kExtensions[(*random)() % 12], ';');
  return extension + kEnds[(*random)() % 4];
}

std::string RandomChunks(std::mt19937* random) {
  static constexpr size_t kSizes[] = {1, 2, 3, 63, 64, 65, 1023, 1024, 4096, 8191, 8192, 20000};
  std::string text;
  const size_t kinds = (*random)() % 2 == 0 ? 6 : 12;  // often so small that many are read at once
  for (size_t left = (*random)() % 200; left > 0; --left) {
    const size_t size = kSizes[(*random)() % kinds];
    char digits[32];
    snprintf(digits, sizeof(digits), (*random)() % 2 == 0 ? "%zx" : "%09zX", size);
    text += digits + RandomLineRest(random);
    text += std::string(size, static_cast<char>('a' + left % 26));
    text += (*random)() % 8 == 0 ? "ab" : "\r\n";
  }
  text += "0\r\n\r\nrest";
  if ((*random)() % 4 == 0) text.resize((*random)() % text.size());
  return text;
}

// The chunk at the front, by the reads of a socket that has the bytes in its buffer.
std::string PlainWholeChunk(const std::string& bytes) {
  PieceClient client("", 0, "chunked");
  if (client.pieces->RestoreData(const_cast<char*>(bytes.data()), static_cast<int>(bytes.size()))) {
    return "";
  }
  char piece[8192];
  const int length = client.ReadToLineEnd(piece, sizeof(piece));
  const uint32_t size = length < 1 ? 0 : ParseChunkSize({piece, static_cast<size_t>(length)});
  if (size == 0 || size > sizeof(piece)) return "";
  if (client.ReadData(piece, static_cast<int>(size)) < static_cast<int>(size)) return "";
  char ending[2];
  return client.ReadData(ending, 2) == 2 ? std::string(piece, size) : "";
}

// What is left on the connection, and how it was read, must be the same too.
void ExpectTheSameAfter(PieceClient* fast, PieceClient* plain) {
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
    ExpectTheSameAfter(&fast, &plain);
  }
}

TEST(FastBody, OfAWholeChunkIsWhatReadsGiveOrNothing) {
  std::mt19937 random(11);
  static constexpr const char* kWords[] = {"1", "a",        "F",         "0",         ";x",
                                           " ", "\r\n",     "\r\n",      "\n",        "\r",
                                           "g", "abcdefgh", "100000001", "data of 10"};
  size_t whole = 0;
  for (int round = 0; round < 30000 && !testing::Test::HasFailure(); ++round) {
    std::string bytes;
    for (size_t words = random() % 8; words > 0; --words) bytes += kWords[random() % 14];
    SCOPED_TRACE(testing::PrintToString(bytes));
    EXPECT_EQ(FirstCompleteChunk(bytes), PlainWholeChunk(bytes));
    if (!FirstCompleteChunk(bytes).empty()) ++whole;
  }
  EXPECT_GT(whole, 1000u);  // else nothing was compared
}

TEST(FastBody, LeavesLongSizeLinesToTheLineReader) {
  const std::string chunk = "\r\ndata\r\n";
  EXPECT_EQ(FirstCompleteChunk("4" + std::string(254, ';') + chunk), "data");
  EXPECT_EQ(FirstCompleteChunk("4" + std::string(255, ';') + chunk), "");
  EXPECT_EQ(FirstCompleteChunk(std::string(255, '0') + "4" + chunk), "");
}

// The mapping's flags; empty where the system does not tell.
std::string FlagsOfMapping(const void* address) {
  const auto wanted = reinterpret_cast<uintptr_t>(address);
  std::istringstream mappings(ReadFile("/proc/self/smaps"));
  bool found = false;
  for (std::string line; std::getline(mappings, line);) {
    uintptr_t begin = 0;
    uintptr_t end = 0;
    if (sscanf(line.c_str(), "%" SCNxPTR "-%" SCNxPTR " ", &begin, &end) == 2) {
      found = begin <= wanted && wanted < end;
    } else if (found && line.rfind("VmFlags:", 0) == 0) {
      return line;
    }
  }
  return "";
}

// A large body costs more for its page faults than for its bytes.
TEST(FastBody, OfManyMegabytesLiesInLargePages) {
  if (access("/sys/kernel/mm/transparent_hugepage/enabled", F_OK) != 0 || IsEmulated()) {
    GTEST_SKIP() << "the kernel has no large pages to ask for";
  }
  const std::string text(size_t{40} << 20, 'x');
  PieceClient client(text, 1, "");
  std::string body;
  EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
  EXPECT_TRUE(body == text);
  const std::string flags = FlagsOfMapping(body.data() + body.size() / 2);
  EXPECT_NE(flags.find(" hg"), std::string::npos) << flags;
}

// A body takes what arrived, whatever was announced.
TEST(FastBody, HasAtMostFourTimesItsLengthReserved) {
  for (const size_t size : {size_t{70000}, size_t{300000}, size_t{5} << 20}) {
    PieceClient client(std::string(size, 'x'), 2, "");
    std::string body;
    EXPECT_EQ(client.ReadBody(body), HTTP_RET_OK);
    EXPECT_EQ(body.size(), size);
    EXPECT_LE(body.capacity(), 4 * size);
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
    ExpectTheSameAfter(&fast, &plain);
  }
}

// A header line by splitting it at its delimiters first.
HeaderLine PlainParse(const std::string& line) {
  static constexpr char kEnds[] = " :;=";
  HeaderLine result;
  const size_t begin = std::min(line.find_first_not_of(kEnds), line.size());
  const size_t end = std::min(line.find_first_of(kEnds, begin), line.size());
  const std::string name = line.substr(begin, end - begin);
  result.hasName = !name.empty();
  for (const KeptField& field : kKeptFields) {
    if (strncasecmp(name.c_str(), field.name.data(), field.name.size()) == 0) {
      result.field = &field;
      result.value = std::string_view(line).substr(std::min(end + 1, line.size()));
    }
  }
  return result;
}

TEST(FastHead, ALineHasTheResultOfSplittingIt) {
  std::vector<std::string> words = {"Content-", "Set", "X-Device", "-2", " ",
                                    ":",        ";",   "=",        "\t", "v"};
  for (const KeptField& field : kKeptFields) words.emplace_back(field.name);
  std::mt19937 random(7);
  for (int round = 0; round < 20000; ++round) {
    std::string line;
    for (size_t count = random() % 6; count > 0; --count) line += words[random() % words.size()];
    if (!line.empty() && random() % 4 == 0)
      line[random() % line.size()] = static_cast<char>(random());
    const HeaderLine fast = ParseHeaderLine(line);
    const HeaderLine plain = PlainParse(line);
    ASSERT_EQ(fast.hasName, plain.hasName) << line;
    ASSERT_EQ(fast.field, plain.field) << line;
    ASSERT_EQ(fast.value, plain.value) << line;
  }
}

size_t ResidentKilobytes() {
  const std::string status = ReadFile("/proc/self/status");
  return strtoul(status.c_str() + status.find("VmRSS:") + 6, nullptr, 10);
}

// The buffer of 64 KiB counts only as far as the response used it.
TEST(IdleClient, KeepsFewPagesResidentAfterASmallGet) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "the sanitizer's memory is not the library's";
#endif
  RepeatingPeer server(Exchange("HTTP/1.0 200 OK\r\nContent-Type: text/plain\r\n\r\nsmall"));
  std::vector<std::unique_ptr<ExposedClient>> clients;
  malloc_trim(0);
  const size_t before = ResidentKilobytes();
  for (int i = 0; i < 200; ++i) {
    clients.push_back(std::make_unique<ExposedClient>(server.Port()));
    ASSERT_EQ(clients.back()->SendRequestByGet(), HTTP_RET_OK);
  }
  EXPECT_LT(ResidentKilobytes(), before + 200 * 24);
}

}  // namespace
