// A response file whose writes fail, and one that has failed before: the outcome is this transfer's
// own.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <string>
#include <vector>

#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"

namespace {

using ::testing::Contains;
using ::testing::IsEmpty;
using ::testing::StartsWith;

constexpr char kOk[] = "HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody";
constexpr char kInFile[] = "Content-Length: 4\r\n\r\nbody";

// Requests into `file`. Results: the one that the request returns, and CheckResponse after it.
int Fetch(TWHttpClient& client, FILE* file) {
  client.SetCurlRespFile(file);
  const int result = client.SendRequestByCurl(HTTP_METHOD_GET, true, 10);
  int status = 0;
  EXPECT_EQ(client.CheckResponse(status), result);
  return result;
}

// A stream of which chosen writes fail, as on a disk that is full for a while.
class FailingStream {
 public:
  // The writes that fail, counted from 1.
  explicit FailingStream(std::vector<int> failing)
      : failing_(std::move(failing)),
        stream_(fopencookie(this, "w", {nullptr, Write, nullptr, {}})) {
    EXPECT_NE(stream_, nullptr);
  }
  ~FailingStream() { fclose(stream_); }
  FailingStream(const FailingStream&) = delete;
  FailingStream& operator=(const FailingStream&) = delete;

  FILE* Stream() { return stream_; }
  const std::string& Written() const { return written_; }

 private:
  static ssize_t Write(void* cookie, const char* bytes, size_t size) {
    auto* const self = static_cast<FailingStream*>(cookie);
    const bool fails = std::count(self->failing_.begin(), self->failing_.end(), ++self->count_) > 0;
    errno = ENOSPC;
    if (fails) return 0;
    self->written_.append(bytes, size);
    return static_cast<ssize_t>(size);
  }

  const std::vector<int> failing_;
  int count_ = 0;
  std::string written_;
  FILE* const stream_;
};

}  // namespace

TEST(ResponseFile, AnErrorFlagOfBeforeDoesNotFailATransferThatIsWhole) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
  FILE* const file = tmpfile();
  const int fd = dup(fileno(file));
  FILE* const write_only = fdopen(fd, "we");
  EXPECT_EQ(fgetc(write_only), EOF);
  ASSERT_NE(ferror(write_only), 0);
  ExposedClient client(peer.Port());
  LogCapture log;
  EXPECT_EQ(Fetch(client, write_only), HTTP_RET_OK);
  EXPECT_EQ(Fetch(client, write_only), HTTP_RET_OK);
  EXPECT_THAT(log.Lines("http"), IsEmpty());
  EXPECT_NE(ferror(write_only), 0) << "the flag is the caller's to clear";
  EXPECT_EQ(ReadFile("/proc/self/fd/" + std::to_string(fileno(file))),
            std::string(kInFile) + kInFile);
  fclose(write_only);
  fclose(file);
}

TEST(ResponseFile, ADiskThatWasFullOnceFailsThatTransferAlone) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk), Exchange(kOk)});
  FileInMemory space;
  FILE* const file = fopen("/dev/full", "we");
  ExposedClient client(peer.Port());
  EXPECT_EQ(Fetch(client, file), HTTP_RET_IO_ERROR);
  ASSERT_GE(dup3(fileno(space.Stream()), fileno(file), O_CLOEXEC), 0);  // space again
  EXPECT_EQ(Fetch(client, file), HTTP_RET_OK);
  EXPECT_EQ(Fetch(client, file), HTTP_RET_OK);
  EXPECT_EQ(space.Content(), std::string(kInFile) + kInFile);
  fclose(file);
}

TEST(ResponseFile, AHeaderLineThatWasLostFailsTheTransferThoughAllElseWasWritten) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk)});
  FailingStream file({1});
  ExposedClient client(peer.Port());
  LogCapture log;
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_IO_ERROR);
  EXPECT_EQ(file.Written(), "\r\nbody");
  EXPECT_THAT(log.Messages(), Contains(StartsWith("CURL Error(23): ")));
  EXPECT_NE(ferror(file.Stream()), 0);
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_OK);
  EXPECT_EQ(file.Written(), std::string("\r\nbody") + kInFile);
}

TEST(ResponseFile, AFailureOfItsLastFlushFailsTheTransferAlsoAfterAnEarlierOne) {
  ScriptedPeer peer({Exchange(kOk), Exchange(kOk), Exchange(kOk)});
  FailingStream file({3, 6});  // a write for each header line and one for the body
  ExposedClient client(peer.Port());
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_IO_ERROR);
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_IO_ERROR);
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_OK);
}

TEST(ResponseFile, AFailedTransferOrAnotherStatusIsToldAsSuchWhateverTheFile) {
  ScriptedPeer peer({Exchange("HTTP/1.1 404 No\r\nContent-Length: 4\r\n\r\ngone")});
  FailingStream file({1});
  ExposedClient client(peer.Port());
  LogCapture log;
  EXPECT_EQ(Fetch(client, file.Stream()), HTTP_RET_IO_ERROR);
  EXPECT_EQ(log.Messages(),
            std::vector<std::string>{"Failed to make http connection, response=404\n"});
}
