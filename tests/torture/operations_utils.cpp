// The utilities: threads, whole writes, pacing and the texts that allocate.
#include <sys/socket.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unique.h"
#include "tarnwick/utils/utils.h"
#include "tests/support/flag.h"
#include "tests/torture/operations.h"

using namespace tarnwick;

namespace {

void* SetFlag(void* flag) {
  static_cast<Flag*>(flag)->Set();
  return nullptr;
}

// Waits for the thread, if there is one.
struct StartedThread {
  ~StartedThread() {
    if (result != 1) return;
    ran.Wait();
    if (detached == 0) pthread_join(handle, nullptr);
  }
  int detached;
  Flag ran = {};
  pthread_t handle = {};
  int result = -1;
};

void StartThread(TestRun& test, unsigned stack_size, int detached) {
  StartedThread thread = {detached};
  test.Run([&] {
    thread.result = CreateThread(SetFlag, &thread.ran, stack_size, detached, &thread.handle);
  });
  test.ExpectEither(thread.result == 1, thread.result == 0, "the result is wrong");
  if (thread.result == 1) test.Expect(thread.ran.Wait(), "the thread does not run");
}

void JoinableThread(TestRun& test) {
  StartThread(test, 1 << 20, 0);
}

void DetachedThread(TestRun& test) {
  StartThread(test, 0, 1);
}

void WholeWrite(TestRun& test) {
  int ends[2];
  socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends);
  const UniqueFd writes(ends[0]);
  const UniqueFd reads(ends[1]);
  const std::string text(3000, 'w');
  int result = -1;
  test.Run([&] { result = WriteFd(ends[0], text.data(), static_cast<int>(text.size())); });
  char arrived[4096];
  const ssize_t count = recv(ends[1], arrived, sizeof(arrived), MSG_DONTWAIT);
  test.ExpectEither(result == 3000, result >= 0, "the result is wrong");
  test.Expect(result == (count < 0 ? 0 : count), "the result is not what was written");
}

void Delay(TestRun& test) {
  int result = -2;
  test.Run([&] {
    DelayTimer timer(500);
    result = timer.Delay();
  });
  test.ExpectEither(result == 0, result == -1, "the result is wrong");
}

// A text, or std::bad_alloc.
template <typename Make>
void ExpectText(TestRun& test, Make make, const char* expected) {
  std::string text;
  const bool made = test.RunMayThrow<std::bad_alloc>([&] { text = make(); });
  test.Expect(!made || text == expected, "the text is wrong");
}

void Texts(TestRun& test) {
  ExpectText(
      test, [] { return UrlEncode("a text with blanks and /", "/"); },
      "a%20text%20with%20blanks%20and%20/");
  ExpectText(
      test, [] { return TrimString("  a text between some blanks ", " "); },
      "a text between some blanks");
  ExpectText(
      test, [] { return IntToString(-1234567890123456789); }, "-1234567890123456789");
  ExpectText(
      test, [] { return FormatUtcTimeStamp(0); }, "19700101T000000.000Z");
  ExpectText(
      test, [] { return GetFileBaseName("some/longer/path/to/a file of a name"); },
      "a file of a name");
  const unsigned char digest[16] = {};
  ExpectText(
      test, [&] { return Md5ToHex(digest); }, "00000000000000000000000000000000");
}

void Base64(TestRun& test) {
  char* encoded = nullptr;
  test.Run([&] { encoded = Base64Encode("user:password"); });
  test.ExpectEither(encoded != nullptr && strcmp(encoded, "dXNlcjpwYXNzd29yZA==") == 0,
                    encoded == nullptr, "the encoding is wrong");
  free(encoded);
}

}  // namespace

std::vector<Operation> UtilsOperations() {
  return {
      {"thread_joinable", PeerKind::kNone, JoinableThread},
      {"thread_detached", PeerKind::kNone, DetachedThread},
      {"write_fd", PeerKind::kNone, WholeWrite},
      {"delay", PeerKind::kNone, Delay},
      {"texts", PeerKind::kNone, Texts},
      {"base64", PeerKind::kNone, Base64},
  };
}
