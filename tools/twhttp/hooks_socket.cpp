// The hooks of the socket calls.
#include <arpa/inet.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <map>
#include <optional>

#include "tarnwick/platform/unique.h"
#include "tools/twhttp/fake_peer.h"
#include "tools/twhttp/hooks.h"
#include "tools/twhttp/watchdog.h"

namespace {

Hooks* g_hooks = nullptr;
std::map<int, int> g_connections;  // by descriptor
int g_newest = 0;                  // the connection whose look-up comes next
double g_start = 0;                // seconds since boot

double SinceBoot() {
  const auto now = std::chrono::steady_clock::now().time_since_epoch();
  return std::chrono::duration<double>(now).count();
}

Connection* Watched(int fd) {
  return g_hooks != nullptr ? g_hooks->trace->Find(ConnectionOf(fd)) : nullptr;
}

void Finish(Step* step, bool good, int error, const char* text) {
  step->end = g_hooks->Now();
  step->failed = !good;
  step->error = good ? 0 : error;
  step->text = good ? "" : text;
}

std::string AddressText(const sockaddr* address) {
  if (address->sa_family != AF_INET) return "";
  sockaddr_in in = {};
  std::memcpy(&in, address, sizeof(in));
  char text[INET_ADDRSTRLEN] = "";
  inet_ntop(AF_INET, &in.sin_addr, text, sizeof(text));
  return std::string(text) + ":" + std::to_string(ntohs(in.sin_port));
}

// A call that a signal has cut ends with ECANCELED when it is to stop, or else would be repeated.
void TurnIntoCancelled() {
  const bool cut = errno == EINTR || errno == EAGAIN;
  if (cut && StopReason() != Stop::kNone) errno = ECANCELED;
}

bool StillConnecting(const Connection& connection) {
  return connection.connect.begin >= 0 && connection.connect.end < 0;
}

void NoteRead(int fd, const void* buf, ssize_t count) {
  const tarnwick::ErrnoSaver keeper;
  const int number = ConnectionOf(fd);
  const double now = g_hooks->Now();
  if (count > 0) {
    g_hooks->trace->Received(number, now,
                             {static_cast<const char*>(buf), static_cast<size_t>(count)});
    g_hooks->Moved();
  } else if (count == 0) {
    g_hooks->trace->Ended(number, now, End::kClosed, 0, "");
  } else if (errno == ECONNRESET) {
    g_hooks->trace->Ended(number, now, End::kReset, errno, std::strerror(errno));
  } else if (errno != EAGAIN && errno != EINTR) {
    g_hooks->trace->Ended(number, now, End::kFailed, errno, std::strerror(errno));
  }
}

}  // namespace

double Hooks::Now() const {
  return SinceBoot() - g_start;
}

void Hooks::Moved() const {
  if (trace->curl.used) RestartWatchdog();
  if (on_transfer) on_transfer();
}

Hooks* CurrentHooks() {
  return g_hooks;
}

int ConnectionOf(int fd) {
  const auto found = g_connections.find(fd);
  return found != g_connections.end() ? found->second : 0;
}

void Observe(Hooks* hooks, const std::function<void()>& operation) {
  g_start = SinceBoot();
  g_hooks = hooks;
  const LogAtFullDetail detail;
  operation();
  hooks->trace->finished = hooks->Now();
  g_hooks = nullptr;
  g_connections.clear();
}

extern "C" int __real_socket(int domain, int type, int protocol);
extern "C" int __wrap_socket(int domain, int type, int protocol) {
  if (g_hooks == nullptr || domain != AF_INET) return __real_socket(domain, type, protocol);
  const int fd = __real_socket(domain, type, protocol);
  if (fd < 0) return fd;
  g_newest = g_hooks->trace->Open(false).number;
  g_connections[fd] = g_newest;
  return fd;
}

extern "C" int __real_bind(int fd, const sockaddr* address, socklen_t length);
extern "C" int __wrap_bind(int fd, const sockaddr* address, socklen_t length) {
  Connection* const connection = Watched(fd);
  if (connection != nullptr && g_hooks->peer != nullptr) return 0;
  const int result = __real_bind(fd, address, length);
  if (connection == nullptr) return result;
  const tarnwick::ErrnoSaver keeper;
  Finish(&connection->source, result == 0, errno, std::strerror(errno));
  return result;
}

extern "C" int __real_getaddrinfo(const char* host, const char* port, const addrinfo* hints,
                                  addrinfo** list);
extern "C" int __wrap_getaddrinfo(const char* host, const char* port, const addrinfo* hints,
                                  addrinfo** list) {
  if (g_hooks == nullptr) return __real_getaddrinfo(host, port, hints, list);
  if (g_hooks->peer != nullptr) return __real_getaddrinfo("127.0.0.1", port, hints, list);
  const double begin = g_hooks->Now();
  const int result = __real_getaddrinfo(host, port, hints, list);
  const int error = errno;
  if (Connection* const connection = g_hooks->trace->Find(g_newest)) {
    connection->look_up.begin = begin;
    Finish(&connection->look_up, result == 0, result,
           result == EAI_SYSTEM ? std::strerror(error) : gai_strerror(result));
  }
  errno = error;
  return result;
}

extern "C" int __real_connect(int fd, const sockaddr* address, socklen_t length);
extern "C" int __wrap_connect(int fd, const sockaddr* address, socklen_t length) {
  Connection* const connection = Watched(fd);
  if (connection == nullptr) return __real_connect(fd, address, length);
  connection->address = AddressText(address);
  connection->connect.begin = g_hooks->Now();
  const WatchedWait wait;
  if (g_hooks->peer != nullptr) {
    address = reinterpret_cast<const sockaddr*>(&g_hooks->peer->Address());
  }
  const int result = __real_connect(fd, address, length);
  const tarnwick::ErrnoSaver keeper;
  if (result == 0 || errno != EINPROGRESS) {
    Finish(&connection->connect, result == 0, errno, std::strerror(errno));
  }
  return result;
}

extern "C" int __real_getsockopt(int fd, int level, int option, void* value, socklen_t* length);
extern "C" int __wrap_getsockopt(int fd, int level, int option, void* value, socklen_t* length) {
  const int result = __real_getsockopt(fd, level, option, value, length);
  Connection* const connection = Watched(fd);
  if (connection == nullptr || option != SO_ERROR || !StillConnecting(*connection)) return result;
  const tarnwick::ErrnoSaver keeper;
  const int error = result == 0 ? *static_cast<int*>(value) : errno;
  Finish(&connection->connect, error == 0, error, std::strerror(error));
  return result;
}

extern "C" int __real_select(int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
                             timeval* left);
extern "C" int __wrap_select(int count, fd_set* readable, fd_set* writable, fd_set* exceptional,
                             timeval* left) {
  Connection* const connection = Watched(count - 1);  // the library waits for one descriptor
  if (connection == nullptr) return __real_select(count, readable, writable, exceptional, left);
  const double begin = g_hooks->Now();
  // A wait for writing is part of the write, which may need many of them.
  std::optional<WatchedWait> wait;
  if (readable != nullptr) wait.emplace();
  int result = -1;
  errno = EINTR;
  if (StopReason() == Stop::kNone) {
    result = __real_select(count, readable, writable, exceptional, left);
  }
  if (result < 0) TurnIntoCancelled();
  const tarnwick::ErrnoSaver keeper;
  if (StillConnecting(*connection)) {
    if (result > 0) return result;
    const int error = result == 0 ? ETIMEDOUT : errno;
    Finish(&connection->connect, false, error, std::strerror(error));
  } else if (readable != nullptr && result >= 0) {
    g_hooks->trace->Waited(connection->number, begin, g_hooks->Now(), result > 0);
  }
  return result;
}

extern "C" ssize_t __real_read(int fd, void* buf, size_t length);
extern "C" ssize_t __wrap_read(int fd, void* buf, size_t length) {
  if (Watched(fd) == nullptr) return __real_read(fd, buf, length);
  const WatchedWait wait;
  const ssize_t count = __real_read(fd, buf, length);
  if (count < 0) TurnIntoCancelled();
  NoteRead(fd, buf, count);
  return count;
}

extern "C" ssize_t __real_write(int fd, const void* buf, size_t length);
extern "C" ssize_t __wrap_write(int fd, const void* buf, size_t length) {
  if (Watched(fd) == nullptr) return __real_write(fd, buf, length);
  const double begin = g_hooks->Now();
  StartWatchdog();
  const ssize_t count = __real_write(fd, buf, length);
  if (count < 0) TurnIntoCancelled();
  const tarnwick::ErrnoSaver keeper;
  const int number = ConnectionOf(fd);
  if (count > 0) {
    StopWatchdog();
    g_hooks->trace->Sent(number, begin, g_hooks->Now(),
                         {static_cast<const char*>(buf), static_cast<size_t>(count)});
    g_hooks->Moved();
  } else if (count < 0 && errno != EAGAIN && errno != EINTR) {
    g_hooks->trace->SendFailed(number, g_hooks->Now(), errno, std::strerror(errno));
  }
  return count;
}

extern "C" int __real_close(int fd);
extern "C" int __wrap_close(int fd) {
  if (g_hooks != nullptr) g_connections.erase(fd);
  return __real_close(fd);
}
