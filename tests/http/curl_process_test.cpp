// What a request through libcurl leaves alone: the process's signals, and the programs it starts.
#include <dirent.h>
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>

#include <csignal>
#include <cstdlib>

#include "tests/http/curl_test_util.h"
#include "tests/http/http_test_util.h"
#include "tests/support/ports.h"
#include "tests/support/scripted_peer.h"

namespace {

using ::testing::ElementsAre;

void OwnHandler(int /*signal*/) {}

// What a transfer looks like from inside, seen while libcurl delivers the body.
struct Seen {
  int writes = 0;
  bool handler_kept = true;
  int inherited_connections = 0;
};

bool HandlerIsOwn() {
  struct sigaction current = {};
  sigaction(SIGPIPE, nullptr, &current);
  return current.sa_handler == OwnHandler;
}

bool IsInheritedConnection(int fd) {
  int domain = 0;
  socklen_t size = sizeof(domain);
  return getsockopt(fd, SOL_SOCKET, SO_DOMAIN, &domain, &size) == 0 && domain == AF_INET &&
         (fcntl(fd, F_GETFD) & FD_CLOEXEC) == 0;
}

int InheritedConnections() {
  int count = 0;
  DIR* const directory = opendir("/proc/self/fd");
  while (const dirent* entry = readdir(directory)) {
    if (IsInheritedConnection(std::atoi(entry->d_name))) ++count;
  }
  closedir(directory);
  return count;
}

ssize_t Look(void* cookie, const char* /*bytes*/, size_t size) {
  Seen* const seen = static_cast<Seen*>(cookie);
  ++seen->writes;
  seen->handler_kept = seen->handler_kept && HandlerIsOwn();
  seen->inherited_connections += InheritedConnections();
  return static_cast<ssize_t>(size);
}

class CurlProcess : public ::testing::Test {
 protected:
  CurlProcess() {
    struct sigaction own = {};
    own.sa_handler = OwnHandler;
    sigaction(SIGPIPE, &own, &before_);
    cookie_io_functions_t functions = {};
    functions.write = Look;
    file_ = fopencookie(&seen_, "w", functions);
    setvbuf(file_, nullptr, _IONBF, 0);
  }
  ~CurlProcess() override {
    std::fclose(file_);
    sigaction(SIGPIPE, &before_, nullptr);
  }

  Seen seen_;
  FILE* file_ = nullptr;

 private:
  struct sigaction before_ = {};
};

TEST_F(CurlProcess, ATransferKeepsTheHandlerOfTheProcessAndItsConnectionFromPrograms) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody")});
  TWHttpClient client("127.0.0.1", peer.Port(), "x", "", "", 5, false, true, false, false,
                      HTTP_VERSION_NONE, "");
  client.SetCurlRespFile(file_);
  EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_OK);
  EXPECT_GT(seen_.writes, 0);
  EXPECT_TRUE(seen_.handler_kept);
  EXPECT_EQ(seen_.inherited_connections, 0);
  EXPECT_TRUE(HandlerIsOwn());
}

TEST_F(CurlProcess, TheMaskOfTheThreadIsAsBefore) {
  sigset_t before;
  pthread_sigmask(SIG_SETMASK, nullptr, &before);
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n")});
  TWHttpClient client("127.0.0.1", peer.Port(), "x?", "", "", 5, false, true, false, false,
                      HTTP_VERSION_NONE, "");
  EXPECT_EQ(client.SendRequest(HTTP_METHOD_POST, "?"), HTTP_RET_OK);
  sigset_t after;
  pthread_sigmask(SIG_SETMASK, nullptr, &after);
  EXPECT_EQ(sigismember(&after, SIGPIPE), sigismember(&before, SIGPIPE));
}

TEST(CurlProcessOptions, ARefusedOneEndsTheRequest) {
  for (const CURLoption option : {CURLOPT_NOSIGNAL, CURLOPT_MAXREDIRS, CURLOPT_OPENSOCKETFUNCTION,
                                  CURLOPT_SSL_SESSIONID_CACHE}) {
    const LogCapture log;
    TWHttpClient client("127.0.0.1", ClosedPort().Port(), "x", "", "", 5, false, true, false, false,
                        HTTP_VERSION_NONE, "");
    Faults faults;
    faults.FailCurlOption(option, CURLE_UNKNOWN_OPTION);
    EXPECT_EQ(client.SendRequestByCurl(HTTP_METHOD_GET, true, 5), HTTP_RET_IO_ERROR);
    EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
    EXPECT_THAT(log.Lines("http"),
                ElementsAre(IsLog("http", "debug", "twhttp", "SendRequestByCurl",
                                  "Failed to make http connection, return value=48\n")));
  }
}

}  // namespace
