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

void StartThread(Stage& stage, unsigned stack_size, int detached) {
  StartedThread thread = {detached};
  stage.Run([&] {
    thread.result = CreateThread(SetFlag, &thread.ran, stack_size, detached, &thread.handle);
  });
  stage.ExpectEither(thread.result == 1, thread.result == 0, "the result is wrong");
  if (thread.result == 1) stage.Expect(thread.ran.Wait(), "the thread does not run");
}

void JoinableThread(Stage& stage) {
  StartThread(stage, 1 << 20, 0);
}

void DetachedThread(Stage& stage) {
  StartThread(stage, 0, 1);
}

void WholeWrite(Stage& stage) {
  int ends[2];
  socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends);
  const UniqueFd writes(ends[0]);
  const UniqueFd reads(ends[1]);
  const std::string text(3000, 'w');
  int result = -1;
  stage.Run([&] { result = WriteFd(ends[0], text.data(), static_cast<int>(text.size())); });
  char arrived[4096];
  const ssize_t count = recv(ends[1], arrived, sizeof(arrived), MSG_DONTWAIT);
  stage.ExpectEither(result == 3000, result >= 0, "the result is wrong");
  stage.Expect(result == (count < 0 ? 0 : count), "the result is not what was written");
}

void Delay(Stage& stage) {
  int result = -2;
  stage.Run([&] {
    DelayTimer timer(500);
    result = timer.Delay();
  });
  stage.ExpectEither(result == 0, result == -1, "the result is wrong");
}

// A text, or std::bad_alloc.
template <typename Make>
void ExpectText(Stage& stage, Make make, const char* expected) {
  std::string text;
  const bool made = stage.RunMayThrow<std::bad_alloc>([&] { text = make(); });
  stage.Expect(!made || text == expected, "the text is wrong");
}

void Texts(Stage& stage) {
  ExpectText(
      stage, [] { return UrlEncode("a text with blanks and /", "/"); },
      "a%20text%20with%20blanks%20and%20/");
  ExpectText(
      stage, [] { return TrimString("  a text between some blanks ", " "); },
      "a text between some blanks");
  ExpectText(
      stage, [] { return IntToString(-1234567890123456789); }, "-1234567890123456789");
  ExpectText(
      stage, [] { return FormatUtcTimeStamp(0); }, "19700101T000000.000Z");
  ExpectText(
      stage, [] { return GetFileBaseName("some/longer/path/to/a file of a name"); },
      "a file of a name");
  const unsigned char digest[16] = {};
  ExpectText(
      stage, [&] { return Md5ToHex(digest); }, "00000000000000000000000000000000");
}

void Base64(Stage& stage) {
  char* encoded = nullptr;
  stage.Run([&] { encoded = Base64Encode("user:password"); });
  stage.ExpectEither(encoded != nullptr && strcmp(encoded, "dXNlcjpwYXNzd29yZA==") == 0,
                     encoded == nullptr, "the encoding is wrong");
  free(encoded);
}

}  // namespace

std::vector<Operation> UtilsOperations() {
  return {
      {"thread_joinable", Peer::kNone, JoinableThread},
      {"thread_detached", Peer::kNone, DetachedThread},
      {"write_fd", Peer::kNone, WholeWrite},
      {"delay", Peer::kNone, Delay},
      {"texts", Peer::kNone, Texts},
      {"base64", Peer::kNone, Base64},
  };
}
