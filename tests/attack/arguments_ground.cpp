#include "tests/attack/arguments_ground.h"

#include <fcntl.h>
#include <sys/mman.h>
#include <unistd.h>

#include <climits>
#include <iterator>

Ground::Ground(const ArgumentsPeer& peer, uint64_t seed) : peer_(peer), draw_(seed) {}

Ground::~Ground() {
  for (int i = 0; ended_ < started_ && i < 10000; ++i) usleep(1000);
  Expect(ended_ == started_, "a thread did not end");
  while (!scopes_.empty()) DropScope();
  plain_.reset();
  tls_.reset();
  DropClient();
  for (FILE* file : files_) fclose(file);
  for (const int fd : descriptors_) close(fd);
}

std::string Ground::Host() {
  constexpr const char* kHosts[] = {"127.0.0.1", "127.0.0.1", "127.0.0.1", "127.0.0.1",
                                    "localhost", "0.0.0.0",   "::1",       "255.255.255.255",
                                    "127.1",     "224.0.0.1", "192.0.2.1"};
  if (draw_.OneIn(6)) return draw_.Text();
  return kHosts[draw_.Below(std::size(kHosts))];
}

int Ground::Port(bool tls) {
  if (draw_.OneIn(8)) return draw_.Int();
  if (draw_.OneIn(6)) return peer_.ClosedPortNumber();
  const unsigned number = draw_.Below(1000);
  return tls != draw_.OneIn(8) ? peer_.TlsPort(number) : peer_.PlainPort(number);
}

void Ground::NewPlain(bool with_arguments) {
  if (!with_arguments) {
    plain_ = std::make_unique<TWSocket>();
    return;
  }
  const std::string host = Host();
  const int port = Port(false);
  plain_ = std::make_unique<TWSocket>(host, port, draw_.Seconds(), draw_.Bool());
}

void Ground::NewTls(bool with_arguments) {
  if (!with_arguments) {
    tls_ = std::make_unique<SSLSocket>();
    return;
  }
  const std::string host = Host();
  const int port = Port(true);
  tls_ = std::make_unique<SSLSocket>(host, port, draw_.Seconds(), draw_.Bool());
}

void Ground::NewClient(bool with_arguments) {
  if (!with_arguments) {
    client_ = {std::make_unique<TWHttpClient>(), false};
    return;
  }
  const bool https = draw_.OneIn(5);
  const std::string host = Host();
  const int port = Port(https);
  const std::string& path = draw_.Text();
  const std::string& user = draw_.Text();
  const std::string& password = draw_.Text();
  client_.client = std::make_unique<TWHttpClient>(
      host, port, path, user, password, draw_.Seconds(), https, draw_.Bool(), draw_.Bool(),
      draw_.Bool(), static_cast<HTTP_VERSION>(draw_.Bool() ? draw_.Below(3) : draw_.Unsigned()),
      draw_.Text());
  client_.has_socket = true;
}

TWSocket& Ground::Plain() {
  if (!plain_) NewPlain(!draw_.OneIn(6));
  return *plain_;
}

SSLSocket& Ground::Tls() {
  if (!tls_) NewTls(!draw_.OneIn(6));
  return *tls_;
}

TWSocket& Ground::AnySocket() {
  if (draw_.OneIn(5)) return Tls();
  return Plain();
}

HeldClient& Ground::Client() {
  if (!client_.client) NewClient(!draw_.OneIn(6));
  return client_;
}

PacedTimer& Ground::Timer() {
  if (!timer_.timer) {
    timer_.period = draw_.Int();
    timer_.timer = std::make_unique<DelayTimer>(timer_.period);
  }
  return timer_;
}

void Ground::NewScope() {
  if (scopes_.size() < 50) scopes_.push_back(std::make_unique<TWRequestScope>());
}

TWRequestScope& Ground::Scope() {
  if (scopes_.empty()) NewScope();
  return *scopes_.back();
}

int Ground::Kept(int fd) {
  if (fd >= 0) descriptors_.push_back(fd);
  return fd;
}

int Ground::Descriptor() {
  int ends[2];
  switch (draw_.Below(9)) {
    case 0:
      return draw_.OneIn(2) ? -1 : INT_MIN;
    case 1:
      return draw_.OneIn(2) ? 1000000 : INT_MAX;
    case 2: {
      const int closed = dup(STDERR_FILENO);
      close(closed);
      return closed;
    }
    case 3:
      return Kept(open("/dev/full", O_WRONLY | O_CLOEXEC));
    case 4:
      return Kept(open("/", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    case 5:  // a pipe that nobody reads
      if (pipe2(ends, O_NONBLOCK | O_CLOEXEC) != 0) return -1;
      close(ends[0]);
      return Kept(ends[1]);
    case 6:  // a pipe that has room for every text: WriteFd waits for a full one without a limit
      if (pipe2(ends, O_NONBLOCK | O_CLOEXEC) != 0) return -1;
      fcntl(ends[1], F_SETPIPE_SZ, 1 << 20);
      Kept(ends[0]);
      return Kept(ends[1]);
    case 7:
      return Kept(open("/dev/null", O_RDONLY | O_CLOEXEC));
    default:
      return Kept(memfd_create("written", MFD_CLOEXEC));
  }
}

FILE* Ground::ResponseFile() {
  FILE* file = nullptr;
  switch (draw_.Below(4)) {
    case 0:
      return nullptr;
    case 1:
      file = fopen("/dev/full", "we");
      break;
    case 2:
      file = fopen("/dev/null", "re");
      break;
    default:
      file = tmpfile();
  }
  if (file != nullptr) files_.push_back(file);
  return file;
}

const char* Ground::SettingsPath() {
  constexpr const char* kPaths[] = {"/var/packages/Tarnwick/etc/settings.conf",
                                    "conf",
                                    "",
                                    ".",
                                    "/dev/null",
                                    "no/such/folder/conf",
                                    "conf/",
                                    "%s%n",
                                    "a\r\nb",
                                    "\xff\xfe"};
  if (draw_.OneIn(10)) return nullptr;
  if (draw_.OneIn(10)) {
    static const std::string kLong(70000, 'a');
    return kLong.c_str();
  }
  return kPaths[draw_.Below(std::size(kPaths))];
}
