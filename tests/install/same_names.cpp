// A daemon whose own classes and functions have the names of the library's internal ones. It must
// link with either kind of library, and none of its own must run in the library's place.
#include <cstddef>
#include <string>
#include <string_view>

#include "expect.h"
#include "tarnwick/http/twhttp.h"
#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/net/sslsocket.h"
#include "tarnwick/utils/utils.h"

namespace {
int calls_by_the_library = 0;
bool is_own_call = true;
}  // namespace

void Called() {
  if (!is_own_call) ++calls_by_the_library;
}

// In classes of headers alone: every program that uses one has copies of its functions, of which
// the linker takes the first.
class FileLock {
 public:
  explicit FileLock(int) { Called(); }
  ~FileLock() { Unlock(); }
  void Unlock() { Called(); }
};

class NoCancel {
 public:
  NoCancel() { Called(); }
  ~NoCancel() { Called(); }
};

class UniqueFd {
 public:
  explicit UniqueFd(int) { Called(); }
  ~UniqueFd() { Called(); }
};

class ErrnoSaver {
 public:
  ErrnoSaver() { Called(); }
  ~ErrnoSaver() { Called(); }
};

// With functions of their own object file: a second definition would be an error of the linker.
class SignalGuard {
 public:
  explicit SignalGuard(int signal);
  ~SignalGuard();
};
SignalGuard::SignalGuard(int) {
  Called();
}
SignalGuard::~SignalGuard() {
  Called();
}

class FdSet {
 public:
  explicit FdSet(int fd);
};
FdSet::FdSet(int) {
  Called();
}

class ForkGuard {
 public:
  enum Kind { kDescriptor };
  explicit ForkGuard(Kind kind);
  ~ForkGuard();
};
ForkGuard::ForkGuard(Kind) {
  Called();
}
ForkGuard::~ForkGuard() {
  Called();
}

class ForkClosedFile {
 public:
  ForkClosedFile(const char* path, int flags, unsigned mode);
};
ForkClosedFile::ForkClosedFile(const char*, int, unsigned) {
  Called();
}

class CurlRequest {
 public:
  explicit CurlRequest(const char* operation);
  int Perform();
};
CurlRequest::CurlRequest(const char*) {
  Called();
}
int CurlRequest::Perform() {
  Called();
  return 1;
}

std::string_view TrimSpaces(std::string_view text) {
  Called();
  return text;
}

int ReadSettingValue(const char*, const char*, char*, int) {
  Called();
  return -1;
}

namespace {

void UseOwnNames() {
  const FileLock lock(0);
  const NoCancel no_cancel;
  const UniqueFd fd(-1);
  const ErrnoSaver keeper;
  const SignalGuard guard(0);
  const FdSet set(0);
  const ForkGuard hold(ForkGuard::kDescriptor);
  const ForkClosedFile file("", 0, 0);
  CurlRequest request("own");
  char value[8];
  Expect(request.Perform() == 1, "the daemon's own request runs");
  Expect(TrimSpaces(" a ") == " a ", "the daemon's own function runs");
  Expect(ReadSettingValue("", "", value, 1) == -1, "the daemon's own settings are asked");
}

void UseTheLibrary() {
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "a line of a daemon with names of its own\n");
  InitDbgCfg();
  Json::Value response;
  Expect(SendHttpGet("127.0.0.1", 1, "/", response, 1, false) == -1, "a GET fails");
  Expect(SendHttpsGet("127.0.0.1", 1, "/", response, 1) == -1, "a GET over TLS fails");
  TWHttpClient client("127.0.0.1", 1, "/", "user", "password", 1, false, true, false, false,
                      HTTP_VERSION_1_1, "");
  std::string body;
  Expect(client.SendReqBySocketPost("<a/>", body) != 0, "a SOAP POST fails");
  FreeDbgCfg();
}

}  // namespace

int main() {
  UseOwnNames();
  is_own_call = false;
  UseTheLibrary();
  Expect(calls_by_the_library == 0, "the library calls its own functions");
  return failures == 0 ? 0 : 1;
}
