// What libcurl calls during a transfer.
#include "tarnwick/http/curl_callbacks.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <climits>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/faults.h"

using namespace tarnwick;

using namespace std::string_literals;

namespace {

struct Closer {
  void operator()(FILE* file) const { fclose(file); }
};
using File = std::unique_ptr<FILE, Closer>;

std::string ContentOf(FILE* file) {
  std::string content;
  rewind(file);
  for (int c; (c = fgetc(file)) != EOF;) content += static_cast<char>(c);
  return content;
}

// A buffer that is freed at the end, as its owner does it.
struct OwnedBuffer : CurlMemBuffer {
  OwnedBuffer() : CurlMemBuffer{nullptr, 0} {}
  ~OwnedBuffer() { free(data); }
  OwnedBuffer(const OwnedBuffer&) = delete;
  OwnedBuffer& operator=(const OwnedBuffer&) = delete;

  size_t Append(std::string bytes) {
    return CurlBufferWrite(bytes.data(), 1, bytes.size(), static_cast<CurlMemBuffer*>(this));
  }
};

// The header lines as they arrive in the file.
std::string HeadersInFile(const std::vector<std::string>& lines) {
  const File file(tmpfile());
  for (std::string line : lines) {
    EXPECT_EQ(CurlHeaderToFile(line.data(), 1, line.size(), file.get()), line.size()) << line;
  }
  return ContentOf(file.get());
}

}  // namespace

TEST(CurlDiscardWrite, TakesEverythingAndNeedsNoPlace) {
  char text[] = "abcdef";
  EXPECT_EQ(CurlDiscardWrite(text, 2, 3, nullptr), 6u);
  EXPECT_EQ(CurlDiscardWrite(nullptr, 1, 0, nullptr), 0u);
}

TEST(CurlStringWrite, AppendsSizeTimesCountBytes) {
  std::string text = "x";
  char bytes[] = "a\0bcdef";
  EXPECT_EQ(CurlStringWrite(bytes, 2, 3, &text), 6u);
  EXPECT_EQ(text, "xa\0bcde"s);
  EXPECT_EQ(CurlStringWrite(bytes, 1, 0, &text), 0u);
  EXPECT_EQ(text.size(), 7u);
}

TEST(CurlStringWrite, MoreThanAStringHoldsEndsTheTransferWithoutAnException) {
  std::string text = "x";
  char bytes[] = "a";
  EXPECT_NO_THROW(EXPECT_EQ(CurlStringWrite(bytes, 1, SIZE_MAX, &text), 0u));
  EXPECT_EQ(text, "x");
}

TEST(CurlFileWrite, ReturnsTheItemsThatTheFileTook) {
  const File file(tmpfile());
  char bytes[] = "abcdef";
  EXPECT_EQ(CurlFileWrite(bytes, 2, 3, file.get()), 3u);
  EXPECT_EQ(CurlFileWrite(bytes, 1, 1, file.get()), 1u);
  EXPECT_EQ(ContentOf(file.get()), "abcdefa");
}

TEST(CurlFileWrite, AFileThatTakesNothingReturnsZero) {
  const File file(fopen("/dev/null", "re"));
  char bytes[] = "abc";
  EXPECT_EQ(CurlFileWrite(bytes, 1, 3, file.get()), 0u);
}

TEST(CurlFileRead, ReturnsTheItemsThatTheFileHad) {
  const File file(tmpfile());
  fputs("abcde", file.get());
  rewind(file.get());
  char bytes[8] = "";
  EXPECT_EQ(CurlFileRead(bytes, 2, 2, file.get()), 2u);
  EXPECT_STREQ(bytes, "abcd");
  EXPECT_EQ(CurlFileRead(bytes, 1, 4, file.get()), 1u);
  EXPECT_EQ(bytes[0], 'e');
  EXPECT_EQ(CurlFileRead(bytes, 1, 4, file.get()), 0u);
}

TEST(CurlBufferWrite, AppendsAndKeepsAZeroByteAfterTheData) {
  OwnedBuffer buffer;
  EXPECT_EQ(buffer.Append("abc"), 3u);
  EXPECT_EQ(buffer.size, 3u);
  EXPECT_STREQ(buffer.data, "abc");
  char more[] = "defg";
  EXPECT_EQ(CurlBufferWrite(more, 2, 2, static_cast<CurlMemBuffer*>(&buffer)), 4u);
  EXPECT_EQ(buffer.size, 7u);
  EXPECT_STREQ(buffer.data, "abcdefg");
}

TEST(CurlBufferWrite, AnEmptyPieceMakesAnEmptyString) {
  OwnedBuffer buffer;
  EXPECT_EQ(buffer.Append(""), 0u);
  ASSERT_NE(buffer.data, nullptr);
  EXPECT_STREQ(buffer.data, "");
  EXPECT_EQ(buffer.size, 0u);
}

TEST(CurlBufferWrite, ZeroBytesAreBytes) {
  OwnedBuffer buffer;
  buffer.Append("a\0b"s);
  buffer.Append("\0"s);
  EXPECT_EQ(std::string(buffer.data, buffer.size + 1), "a\0b\0\0"s);
}

TEST(CurlBufferWrite, AFailingFirstAllocationTakesTheBytesAndLeavesTheBufferEmpty) {
  OwnedBuffer buffer;
  Faults faults;
  faults.FailFrom(Call::kMalloc, 1).FailFrom(Call::kCalloc, 1).FailFrom(Call::kRealloc, 1);
  EXPECT_EQ(buffer.Append("abc"), 3u);
  EXPECT_EQ(buffer.data, nullptr);
  EXPECT_EQ(buffer.size, 0u);
}

TEST(CurlBufferWrite, AFailingReallocationLosesTheBlockAndKeepsTheOldSize) {
  OwnedBuffer buffer;
  buffer.Append("abc");
  const std::unique_ptr<char, decltype(&free)> lost(buffer.data, &free);
  Faults faults;
  faults.FailFrom(Call::kRealloc, 1).FailFrom(Call::kMalloc, 1).FailFrom(Call::kCalloc, 1);
  EXPECT_EQ(buffer.Append("defg"), 4u);
  EXPECT_EQ(buffer.data, nullptr);
  EXPECT_EQ(buffer.size, 3u);
  EXPECT_STREQ(lost.get(), "abc");  // not freed here
}

TEST(CurlBufferWrite, AfterAFailureTheLostPartShowsZeroBytes) {
  OwnedBuffer buffer;
  buffer.Append("abc");
  const std::unique_ptr<char, decltype(&free)> lost(buffer.data, &free);
  {
    Faults faults;
    faults.FailNth(Call::kRealloc, 1);
    buffer.Append("defg");
  }
  EXPECT_EQ(buffer.Append("hi"), 2u);
  EXPECT_EQ(buffer.size, 5u);
  EXPECT_EQ(std::string(buffer.data, 6), "\0\0\0hi\0"s);
}

TEST(CurlBufferWrite, MoreThanASizeHoldsIsLikeAFailingAllocation) {
  OwnedBuffer buffer;
  buffer.size = UINT_MAX - 3;
  EXPECT_EQ(buffer.Append("0123456789"), 10u);
  EXPECT_EQ(buffer.data, nullptr);
  EXPECT_EQ(buffer.size, UINT_MAX - 3);
}

TEST(CurlHeaderToFile, WritesHeaderLinesAndTheEmptyLineButNoStatusLine) {
  EXPECT_EQ(HeadersInFile({"HTTP/1.1 200 OK\r\n", "Server: s\r\n", "X:y\r\n", "\r\n"}),
            "Server: s\r\nX:y\r\n\r\n");
}

TEST(CurlHeaderToFile, TransferEncodingIsLeftOutInItsUsualCaseOnly) {
  EXPECT_EQ(HeadersInFile({"Transfer-Encoding: chunked\r\n", "transfer-encoding: chunked\r\n",
                           "X-Transfer-Encoding: x\r\n", "X: Transfer-Encoding:\r\n",
                           "Transfer-Encodings: x\r\n"}),
            "transfer-encoding: chunked\r\nTransfer-Encodings: x\r\n");
}

TEST(CurlHeaderToFile, ALineWithoutAColonIsSkippedUnlessItIsTheEmptyLine) {
  EXPECT_EQ(HeadersInFile({"junk\r\n", "\n", "\r\n", "", "\r\n\r\n", "HTTP/1.1 200 a:b\r\n"}),
            "\r\nHTTP/1.1 200 a:b\r\n");
}

TEST(CurlHeaderToFile, EachLineIsFlushed) {
  const File file(tmpfile());
  char line[] = "A: b\r\n";
  EXPECT_EQ(CurlHeaderToFile(line, 1, 6, file.get()), 6u);
  char seen[8] = "";
  EXPECT_EQ(pread(fileno(file.get()), seen, 6, 0), 6);
  EXPECT_STREQ(seen, line);
}

TEST(CurlHeaderToFile, ItReturnsWhatTheFileTookAndBytesForASkippedLine) {
  const File readable(fopen("/dev/null", "re"));
  char line[] = "A: b\r\n";
  EXPECT_EQ(CurlHeaderToFile(line, 1, 6, readable.get()), 0u);
  const File file(tmpfile());
  EXPECT_EQ(CurlHeaderToFile(line, 6, 1, file.get()), 1u);
  char status[] = "HTTP/1.1 200\r\n";
  EXPECT_EQ(CurlHeaderToFile(status, 7, 2, file.get()), 14u);
}

TEST(CurlHeaderToFile, ZeroBytesInALineAreBytes) {
  EXPECT_EQ(HeadersInFile({"A\0: b\r\n"s, "C\0\r\n"s}), "A\0: b\r\n"s);
}
