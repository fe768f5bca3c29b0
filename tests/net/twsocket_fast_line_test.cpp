// Lines are taken out of the read-ahead buffer in one go. Here that is held against reading them
// byte by byte, on input that is cut at random places.
#include <random>

#include "tests/net/net_test_util.h"

namespace {

// What ReadToLineEnd promises, by nothing but reads of one byte.
int PlainReadToLineEnd(TWSocket* socket, char* buf, int bufLen) {
  int length = 0;
  for (char byte;;) {
    const int count = socket->ReadData(&byte, 1);
    if (count < 0) return -1;
    if (count == 0 || byte == '\n') break;
    if (byte == '\r') {
      if (socket->ReadData(&byte, 1) <= 0) return -1;
      break;
    }
    buf[length] = byte;
    if (length + 1 == bufLen) break;
    ++length;
  }
  buf[length] = '\0';
  return length;
}

class Random {
 public:
  explicit Random(unsigned seed) : generator_(seed) {}

  size_t Below(size_t limit) { return generator_() % limit; }

  // Line ends, zero bytes and runs of others, long enough for every step of the search.
  std::string Text(size_t size) {
    std::string text;
    while (text.size() < size) {
      static constexpr size_t kRuns[] = {0, 1, 2, 3, 30, 254, 255, 256, 257, 700};
      text += std::string(kRuns[Below(10)], 'x');
      text += std::string("\n\r\r\0a", 5)[Below(5)];
    }
    return text;
  }

  // `text` in pieces, with reads that fail in between, and the end of the stream or a failure.
  std::vector<IoResult> Answers(const std::string& text) {
    std::vector<IoResult> answers;
    for (size_t at = 0; at < text.size();) {
      const size_t size = std::min(1 + Below(Below(2) == 0 ? 3 : 900), text.size() - at);
      answers.push_back(Returns(text.substr(at, size)));
      at += size;
      if (Below(8) == 0) answers.push_back(Fails(Below(2) == 0 ? EAGAIN : ECONNRESET));
    }
    const IoResult last = Below(2) == 0 ? Ends() : Fails(ECONNRESET);
    answers.insert(answers.end(), 400, last);
    return answers;
  }

 private:
  std::mt19937 generator_;
};

// The state that callers and derived classes see.
void ExpectTheSame(const ScriptedSocket& fast, const ScriptedSocket& plain) {
  ASSERT_EQ(fast.IsEOF(), plain.IsEOF());
  ASSERT_EQ(fast.IsConnected(), plain.IsConnected());
  ASSERT_EQ(fast.m_readPos, plain.m_readPos);
  ASSERT_EQ(fast.m_readLen, plain.m_readLen);
  ASSERT_EQ(fast.calls, plain.calls);
  ASSERT_TRUE(std::string(fast.m_readBuf, 65536) == std::string(plain.m_readBuf, 65536));
}

// Reads one line in both ways; the caller's memory beyond it must be the same as well.
void ReadLineInBoth(ScriptedSocket* fast, ScriptedSocket* plain, int bufLen) {
  std::string fastLine(static_cast<size_t>(bufLen), '#');
  std::string plainLine = fastLine;
  errno = 0;
  const int fastResult = fast->ReadToLineEnd(fastLine.data(), bufLen);
  const int fastError = errno;
  errno = 0;
  const int plainResult = PlainReadToLineEnd(plain, plainLine.data(), bufLen);
  ASSERT_EQ(fastResult, plainResult);
  ASSERT_EQ(fastError, errno);
  // After a line that was cut, what the lost byte was is nobody's business.
  const size_t certain = fastResult < 0 ? fastLine.size() : static_cast<size_t>(fastResult) + 1;
  ASSERT_EQ(fastLine.substr(0, certain), plainLine.substr(0, certain));
}

void ReadInBoth(ScriptedSocket* fast, ScriptedSocket* plain, Random* random) {
  static constexpr int kLengths[] = {1, 2, 3, 64, 255, 256, 257, 258, 600, 2048};
  const int length = kLengths[random->Below(10)];
  switch (random->Below(6)) {
    case 0:
      ASSERT_EQ(ReadSome(*fast, static_cast<size_t>(length)),
                ReadSome(*plain, static_cast<size_t>(length)));
      break;
    case 1: {
      std::string back = random->Text(random->Below(20));
      ASSERT_EQ(fast->RestoreData(back.data(), static_cast<int>(back.size())),
                plain->RestoreData(back.data(), static_cast<int>(back.size())));
      break;
    }
    default:
      ReadLineInBoth(fast, plain, length);
  }
}

TEST(FastLines, AreTheLinesThatReadsOfOneByteGive) {
  LogCapture log;
  for (unsigned seed = 0; seed < 300; ++seed) {
    SCOPED_TRACE(seed);
    Random random(seed);
    const auto answers = random.Answers(random.Text(4000));
    ScriptedSocket fast(true, answers);
    ScriptedSocket plain(true, answers);
    for (int i = 0; i < 40; ++i) {
      ReadInBoth(&fast, &plain, &random);
      if (HasFatalFailure()) return;
      ExpectTheSame(fast, plain);
      if (HasFatalFailure()) return;
    }
  }
}

TEST(FastLines, OfADirectSocketAreReadByteByByte) {
  ScriptedSocket socket(false, {Returns("a"), Returns("b"), Returns("\r"), Returns("\n")});
  EXPECT_EQ(ReadLine(socket), (Delivered{2, "ab"}));
  EXPECT_TRUE(socket.ScriptEnded());
}

}  // namespace
