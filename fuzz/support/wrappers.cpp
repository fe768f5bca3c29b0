// What the symbols of wrapped_calls.txt become.
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/select.h>
#include <sys/socket.h>
#include <sys/time.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>

#include "fuzz/support/wire.h"
#include "tarnwick/log/twdebuglog.h"

extern "C" {

int __real_socket(int domain, int type, int protocol);
int __real_connect(int fd, const sockaddr* address, socklen_t length);
int __real_bind(int fd, const sockaddr* address, socklen_t length);
int __real_select(int nfds, fd_set* r, fd_set* w, fd_set* e, timeval* timeout);
ssize_t __real_read(int fd, void* buf, size_t len);
ssize_t __real_write(int fd, const void* buf, size_t len);
int __real_close(int fd);
int __real_fcntl64(int fd, int command, ...);
int __real_ioctl(int fd, unsigned long request, ...);
int __real_getsockopt(int fd, int level, int option, void* value, socklen_t* length);
int __real_setsockopt(int fd, int level, int option, const void* value, socklen_t length);
int __real_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                       addrinfo** list);
void __real_freeaddrinfo(addrinfo* list);
int __real_usleep(useconds_t us);
time_t __real_time(time_t* out);

int __wrap_socket(int domain, int type, int protocol) {
  Wire* wire = Wire::Current();
  return wire != nullptr ? wire->Socket() : __real_socket(domain, type, protocol);
}

int __wrap_connect(int fd, const sockaddr* address, socklen_t length) {
  if (Wire::IsOurs(fd)) return Wire::Current()->Connect(fd);
  return __real_connect(fd, address, length);
}

// Half of the addresses are not this machine's.
int __wrap_bind(int fd, const sockaddr* address, socklen_t length) {
  if (!Wire::IsOurs(fd)) return __real_bind(fd, address, length);
  sockaddr_in inet;
  std::memcpy(&inet, address, sizeof(inet));
  if (inet.sin_addr.s_addr % 2 == 0) return 0;
  errno = EADDRNOTAVAIL;
  return -1;
}

int __wrap_select(int nfds, fd_set* r, fd_set* w, fd_set* e, timeval* timeout) {
  if (Wire::IsOurs(nfds - 1)) return Wire::Current()->Select(nfds, r, w, e);
  return __real_select(nfds, r, w, e, timeout);
}

ssize_t __wrap_read(int fd, void* buf, size_t len) {
  return Wire::IsOurs(fd) ? Wire::Current()->Read(fd, buf, len) : __real_read(fd, buf, len);
}

ssize_t __wrap_write(int fd, const void* buf, size_t len) {
  return Wire::IsOurs(fd) ? Wire::Current()->Write(fd, buf, len) : __real_write(fd, buf, len);
}

int __wrap_close(int fd) {
  return Wire::IsOurs(fd) ? Wire::Current()->Close(fd) : __real_close(fd);
}

int __wrap_fcntl64(int fd, int command, ...) {
  va_list arguments;
  va_start(arguments, command);
  void* argument = va_arg(arguments, void*);
  va_end(arguments);
  if (!Wire::IsOurs(fd)) return __real_fcntl64(fd, command, argument);
  return Wire::Current()->Control(fd, command, static_cast<int>(reinterpret_cast<long>(argument)));
}

int __wrap_ioctl(int fd, unsigned long request, ...) {
  va_list arguments;
  va_start(arguments, request);
  void* argument = va_arg(arguments, void*);
  va_end(arguments);
  return Wire::IsOurs(fd) ? 0 : __real_ioctl(fd, request, argument);
}

int __wrap_getsockopt(int fd, int level, int option, void* value, socklen_t* length) {
  if (!Wire::IsOurs(fd)) return __real_getsockopt(fd, level, option, value, length);
  const int error = Wire::Current()->SocketError(fd);
  std::memcpy(value, &error, sizeof(error));
  return 0;
}

int __wrap_setsockopt(int fd, int level, int option, const void* value, socklen_t length) {
  return Wire::IsOurs(fd) ? 0 : __real_setsockopt(fd, level, option, value, length);
}

int __wrap_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                       addrinfo** list) {
  Wire* wire = Wire::Current();
  if (wire == nullptr) return __real_getaddrinfo(node, service, hints, list);
  auto* entry = static_cast<addrinfo*>(std::calloc(1, sizeof(addrinfo) + sizeof(sockaddr_in)));
  if (entry == nullptr) return EAI_MEMORY;
  entry->ai_family = AF_INET;
  entry->ai_socktype = SOCK_STREAM;
  entry->ai_addrlen = sizeof(sockaddr_in);
  entry->ai_addr = reinterpret_cast<sockaddr*>(entry + 1);
  wire->Opened();
  *list = entry;
  return 0;
}

void __wrap_freeaddrinfo(addrinfo* list) {
  Wire* wire = Wire::Current();
  if (wire == nullptr) return __real_freeaddrinfo(list);
  wire->Closed();
  std::free(list);
}

// A paced retry need not be waited for.
int __wrap_usleep(useconds_t us) {
  return Wire::Current() != nullptr ? 0 : __real_usleep(us);
}

time_t __wrap_time(time_t* out) {
  if (g_fuzz_time < 0) return __real_time(out);
  if (out != nullptr) *out = g_fuzz_time;
  return g_fuzz_time;
}

void __wrap__Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z(LOG_TYPE, const char*, const char*, const char*,
                                                  int, const char*, const char* format, ...)
    __attribute__((format(printf, 7, 8)));

// Formats the line, so that every argument is looked at, and throws it away.
void __wrap__Z8TWPrintf8LOG_TYPEPKcS1_S1_iS1_S1_z(LOG_TYPE, const char*, const char*, const char*,
                                                  int, const char*, const char* format, ...) {
  char line[4096];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(line, sizeof(line), format, arguments);
  va_end(arguments);
}

}  // extern "C"
