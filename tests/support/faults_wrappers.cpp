// The functions that the linker puts before the real ones.
#include <dlfcn.h>
#include <fcntl.h>
#include <libxml/tree.h>
#include <netdb.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sched.h>
#include <sys/file.h>
#include <sys/ioctl.h>
#include <sys/select.h>
#include <sys/shm.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <type_traits>

#include "tests/support/faults.h"

namespace {

using Verdict = Faults::Verdict;

std::optional<Verdict> Ask(Call call) {
  Faults* faults = Faults::Current();
  return faults != nullptr ? faults->Next(call) : std::nullopt;
}

std::optional<Verdict> AskSized(Call call, size_t size) {
  Faults* faults = Faults::Current();
  return faults != nullptr ? faults->NextSized(call, size) : std::nullopt;
}

size_t Allowed(Call call, size_t wanted) {
  const Faults* faults = Faults::Current();
  return faults != nullptr ? faults->Allowed(call, wanted) : wanted;
}

template <typename T>
T Give(const Verdict& verdict) {
  if (verdict.error != 0) errno = verdict.error;
  if constexpr (std::is_pointer_v<T>) {
    return reinterpret_cast<T>(static_cast<intptr_t>(verdict.result));
  } else {
    return static_cast<T>(verdict.result);
  }
}

void Clear(int nfds, fd_set* set) {
  if (set == nullptr) return;
  constexpr int kWordBits = static_cast<int>(8 * sizeof(long));
  const int words = (nfds + kWordBits - 1) / kWordBits;
  memset(set, 0, static_cast<size_t>(words) * sizeof(long));
}

// The log alone appends. The call of fcntl by its number is not counted as one of the library's.
Call WriteTo(int fd) {
  const long flags = syscall(SYS_fcntl, fd, F_GETFL);
  return flags != -1 && (flags & O_APPEND) != 0 ? Call::kAppend : Call::kWrite;
}

}  // namespace

// A wrapper that only asks and passes on.
#define PASS(call, ret, name, params, args)                         \
  extern "C" ret __real_##name params;                              \
  extern "C" ret __wrap_##name params {                             \
    if (const auto verdict = Ask(call)) return Give<ret>(*verdict); \
    return __real_##name args;                                      \
  }

// One whose length is recorded and may be cut.
#define PASS_SIZED(call, ret, name, params, args, len)                         \
  extern "C" ret __real_##name params;                                         \
  extern "C" ret __wrap_##name params {                                        \
    if (const auto verdict = AskSized(call, static_cast<size_t>(len))) {       \
      return Give<ret>(*verdict);                                              \
    }                                                                          \
    len = static_cast<decltype(len)>(Allowed(call, static_cast<size_t>(len))); \
    return __real_##name args;                                                 \
  }

PASS(Call::kSocket, int, socket, (int domain, int type, int protocol), (domain, type, protocol))
PASS(Call::kBind, int, bind, (int fd, const sockaddr* address, socklen_t length),
     (fd, address, length))
PASS(Call::kConnect, int, connect, (int fd, const sockaddr* address, socklen_t length),
     (fd, address, length))
PASS(Call::kPoll, int, poll, (pollfd * fds, nfds_t count, int timeout), (fds, count, timeout))
PASS(Call::kPoll, int, __poll_chk, (pollfd * fds, nfds_t count, int timeout, size_t size),
     (fds, count, timeout, size))
PASS(Call::kSetsockopt, int, setsockopt,
     (int fd, int level, int option, const void* value, socklen_t length),
     (fd, level, option, value, length))
PASS(Call::kClose, int, close, (int fd), (fd))
PASS_SIZED(Call::kRead, ssize_t, read, (int fd, void* buf, size_t len), (fd, buf, len), len)
PASS_SIZED(Call::kRead, ssize_t, __read_chk, (int fd, void* buf, size_t len, size_t room),
           (fd, buf, len, room), len)
PASS_SIZED(WriteTo(fd), ssize_t, write, (int fd, const void* buf, size_t len), (fd, buf, len), len)
PASS(Call::kFopencookie, FILE*, fopencookie,
     (void* cookie, const char* mode, cookie_io_functions_t calls), (cookie, mode, calls))
PASS(Call::kFopen, FILE*, fopen, (const char* path, const char* mode), (path, mode))
PASS(Call::kFopen, FILE*, fopen64, (const char* path, const char* mode), (path, mode))
PASS(Call::kFlock, int, flock, (int fd, int operation), (fd, operation))
PASS(Call::kFstat, int, fstat, (int fd, struct stat* status), (fd, status))
PASS(Call::kFstat, int, fstat64, (int fd, struct stat64* status), (fd, status))
PASS(Call::kFchmod, int, fchmod, (int fd, mode_t mode), (fd, mode))
PASS(Call::kFchown, int, fchown, (int fd, uid_t user, gid_t group), (fd, user, group))
PASS(Call::kFsync, int, fsync, (int fd), (fd))
PASS(Call::kRename, int, rename, (const char* from, const char* to), (from, to))
PASS(Call::kUnlink, int, unlink, (const char* path), (path))
PASS(Call::kReadlinkat, ssize_t, readlinkat, (int fd, const char* path, char* target, size_t room),
     (fd, path, target, room))
PASS(Call::kReadlinkat, ssize_t, __readlinkat_chk,
     (int fd, const char* path, char* target, size_t length, size_t room),
     (fd, path, target, length, room))
PASS(Call::kMkostemp, int, mkostemp, (char* pattern, int flags), (pattern, flags))
PASS(Call::kMkostemp, int, mkostemp64, (char* pattern, int flags), (pattern, flags))
PASS(Call::kMkostemp, int, mkstemp, (char* pattern), (pattern))
PASS(Call::kMkostemp, int, mkstemp64, (char* pattern), (pattern))
PASS(Call::kTmpfile, FILE*, tmpfile, (), ())
PASS(Call::kTmpfile, FILE*, tmpfile64, (), ())
PASS(Call::kLocaltimeR, struct tm*, localtime_r, (const time_t* when, struct tm* parts),
     (when, parts))
PASS(Call::kGmtimeR, struct tm*, gmtime_r, (const time_t* when, struct tm* parts), (when, parts))
PASS_SIZED(Call::kUsleep, int, usleep, (useconds_t len), (len), len)
PASS(Call::kSchedYield, int, sched_yield, (), ())
PASS(Call::kShmget, int, shmget, (key_t key, size_t size, int flags), (key, size, flags))
PASS(Call::kShmat, void*, shmat, (int id, const void* address, int flags), (id, address, flags))
PASS(Call::kShmdt, int, shmdt, (const void* address), (address))
PASS(Call::kMalloc, void*, malloc, (size_t size), (size))
PASS(Call::kCalloc, void*, calloc, (size_t count, size_t size), (count, size))
PASS(Call::kRealloc, void*, realloc, (void* old, size_t size), (old, size))
PASS(Call::kStrdup, char*, strdup, (const char* text), (text))
PASS(Call::kPthreadCreate, int, pthread_create,
     (pthread_t * thread, const pthread_attr_t* attr, void* (*start)(void*), void* arg),
     (thread, attr, start, arg))
PASS(Call::kPthreadAttrSetstacksize, int, pthread_attr_setstacksize,
     (pthread_attr_t * attr, size_t size), (attr, size))
PASS(Call::kPthreadGetattrNp, int, pthread_getattr_np, (pthread_t thread, pthread_attr_t* attr),
     (thread, attr))
PASS(Call::kPthreadSigmask, int, pthread_sigmask, (int how, const sigset_t* set, sigset_t* old),
     (how, set, old))
PASS(Call::kSigtimedwait, int, sigtimedwait,
     (const sigset_t* set, siginfo_t* info, const struct timespec* timeout), (set, info, timeout))

PASS(Call::kSslCtxNew, SSL_CTX*, SSL_CTX_new, (const SSL_METHOD* method), (method))
PASS(Call::kSslNew, SSL*, SSL_new, (SSL_CTX * context), (context))
PASS(Call::kSslConnect, int, SSL_connect, (SSL * ssl), (ssl))
PASS_SIZED(Call::kSslRead, int, SSL_read, (SSL * ssl, void* buf, int len), (ssl, buf, len), len)
PASS_SIZED(Call::kSslWrite, int, SSL_write, (SSL * ssl, const void* buf, int len), (ssl, buf, len),
           len)
PASS(Call::kSslGetError, int, SSL_get_error, (const SSL* ssl, int result), (ssl, result))
PASS(Call::kSslShutdown, int, SSL_shutdown, (SSL * ssl), (ssl))
PASS(Call::kSslClear, int, SSL_clear, (SSL * ssl), (ssl))
PASS(Call::kSslSetFd, int, SSL_set_fd, (SSL * ssl, int fd), (ssl, fd))

PASS(Call::kCurlGlobalInit, CURLcode, curl_global_init, (long flags), (flags))
PASS(Call::kCurlEasyInit, CURL*, curl_easy_init, (), ())
PASS(Call::kCurlEasyPerform, CURLcode, curl_easy_perform, (CURL * easy), (easy))
PASS(Call::kCurlSlistAppend, curl_slist*, curl_slist_append, (curl_slist * list, const char* line),
     (list, line))
PASS(Call::kXmlDocDump, int, xmlDocDump, (FILE * file, xmlDoc* doc), (file, doc))

extern "C" int __real_select(int, fd_set*, fd_set*, fd_set*, struct timeval*);
extern "C" int __wrap_select(int nfds, fd_set* reads, fd_set* writes, fd_set* exceptions,
                             struct timeval* timeout) {
  const auto verdict = Ask(Call::kSelect);
  if (!verdict) return __real_select(nfds, reads, writes, exceptions, timeout);
  if (verdict->result >= 0) {
    for (fd_set* set : {reads, writes, exceptions}) Clear(nfds, set);
  }
  return Give<int>(*verdict);
}

extern "C" int __real_getsockopt(int, int, int, void*, socklen_t*);
extern "C" int __wrap_getsockopt(int fd, int level, int option, void* value, socklen_t* length) {
  if (const auto verdict = Ask(Call::kGetsockopt)) return Give<int>(*verdict);
  const int result = __real_getsockopt(fd, level, option, value, length);
  const Faults* faults = Faults::Current();
  if (result == 0 && faults != nullptr && faults->ForcedSocketError() && level == SOL_SOCKET &&
      option == SO_ERROR) {
    *static_cast<int*>(value) = *faults->ForcedSocketError();
  }
  return result;
}

extern "C" int __real_getaddrinfo(const char*, const char*, const addrinfo*, addrinfo**);
extern "C" int __wrap_getaddrinfo(const char* node, const char* service, const addrinfo* hints,
                                  addrinfo** list) {
  const auto verdict = Ask(Call::kGetaddrinfo);
  if (!verdict) return __real_getaddrinfo(node, service, hints, list);
  if (verdict->result == 0) *list = nullptr;
  return Give<int>(*verdict);
}

extern "C" int __real_fclose(FILE*);
extern "C" int __wrap_fclose(FILE* file) {
  const auto verdict = Ask(Call::kFclose);
  const int result = __real_fclose(file);  // a failing fclose releases the stream as well
  return verdict ? Give<int>(*verdict) : result;
}

extern "C" int __real_gettimeofday(struct timeval*, void*);
extern "C" int __wrap_gettimeofday(struct timeval* now, void* zone) {
  if (const auto verdict = Ask(Call::kGettimeofday)) return Give<int>(*verdict);
  const Faults* faults = Faults::Current();
  if (faults != nullptr && faults->ReadClock(now)) return 0;
  return __real_gettimeofday(now, zone);
}

extern "C" time_t __real_time(time_t*);
extern "C" time_t __wrap_time(time_t* out) {
  if (const auto verdict = Ask(Call::kTime)) return Give<time_t>(*verdict);
  struct timeval now;
  const Faults* faults = Faults::Current();
  if (faults == nullptr || !faults->ReadClock(&now)) return __real_time(out);
  if (out != nullptr) *out = now.tv_sec;
  return now.tv_sec;
}

// The variadic calls: each takes one more argument at most, which fits a register.

#define PASS_OPEN(name)                                                    \
  extern "C" int __real_##name(const char* path, int flags, ...);          \
  extern "C" int __wrap_##name(const char* path, int flags, ...) {         \
    if (const auto verdict = Ask(Call::kOpen)) return Give<int>(*verdict); \
    va_list args;                                                          \
    va_start(args, flags);                                                 \
    const mode_t mode = va_arg(args, mode_t);                              \
    va_end(args);                                                          \
    return __real_##name(path, flags, mode);                               \
  }

PASS_OPEN(open)
PASS_OPEN(open64)
PASS(Call::kOpen, int, __open_2, (const char* path, int flags), (path, flags))
PASS(Call::kOpen, int, __open64_2, (const char* path, int flags), (path, flags))

#define PASS_ONE_MORE(call, name, type)                             \
  extern "C" int __real_##name(int fd, type request, ...);          \
  extern "C" int __wrap_##name(int fd, type request, ...) {         \
    if (const auto verdict = Ask(call)) return Give<int>(*verdict); \
    va_list args;                                                   \
    va_start(args, request);                                        \
    void* argument = va_arg(args, void*);                           \
    va_end(args);                                                   \
    return __real_##name(fd, request, argument);                    \
  }

PASS_ONE_MORE(Call::kFcntl, fcntl, int)
PASS_ONE_MORE(Call::kFcntl, fcntl64, int)
PASS_ONE_MORE(Call::kIoctl, ioctl, unsigned long)
