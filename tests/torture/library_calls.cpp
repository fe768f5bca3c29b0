// Library calls that are treated as system calls: OpenSSL's reads and writes, which may be short of what
// their callers want, and the start of a thread, whose system call is made with all signals blocked
// and so cannot be trapped.
#include <dlfcn.h>
#include <openssl/ssl.h>
#include <pthread.h>

#include <cerrno>

#include "tests/torture/injection.h"

namespace {

constexpr CallKind kSslRead = {"SSL_read", ECONNRESET, 2, false, false};
constexpr CallKind kSslWrite = {"SSL_write", ECONNRESET, 2, false, false};
constexpr CallKind kPthreadCreate = {"pthread_create", EAGAIN, -1, false, false};

Verdict Ask(const CallKind& kind) {
  return t_injection.armed ? NextCall(kind) : Verdict{Verdict::kPass, 0};
}

// The function that this program's hides.
template <typename Function>
Function Next(const char* name, Function /*same_type*/) {
  return reinterpret_cast<Function>(dlsym(RTLD_NEXT, name));
}

// What OpenSSL's callers see after a failed system call.
int SslFailure(int error) {
  errno = error;
  return -1;
}

}  // namespace

// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name): theirs are short or reserved
extern "C" int SSL_read(SSL* ssl, void* buf, int length) {
  static const auto next = Next("SSL_read", SSL_read);
  const Verdict verdict = Ask(kSslRead);
  if (verdict.kind == Verdict::kFail) return SslFailure(verdict.error);
  return next(ssl, buf, verdict.kind == Verdict::kShort && length > 1 ? 1 : length);
}

extern "C" int SSL_write(SSL* ssl, const void* buf, int length) {
  static const auto next = Next("SSL_write", SSL_write);
  const Verdict verdict = Ask(kSslWrite);
  if (verdict.kind == Verdict::kFail) return SslFailure(verdict.error);
  return next(ssl, buf, verdict.kind == Verdict::kShort && length > 1 ? 1 : length);
}

extern "C" int pthread_create(pthread_t* thread, const pthread_attr_t* attributes,
                              void* (*start)(void*), void* argument) noexcept {
  static const auto next = Next("pthread_create", pthread_create);
  const Verdict verdict = Ask(kPthreadCreate);
  if (verdict.kind == Verdict::kFail) return verdict.error;
  return next(thread, attributes, start, argument);
}
// NOLINTEND(readability-inconsistent-declaration-parameter-name)
