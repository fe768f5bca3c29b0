// Small helpers that the daemons share: pacing, text and encodings, whole-buffer writes, threads.
//
// Unless a declaration says otherwise, the functions are safe from any thread, do not wait and do
// not log. Those that take or return a std::string by value throw std::bad_alloc when memory runs
// out. WriteFd and DelayTimer::Delay are cancellation points (pthread_cancel); nothing is lost
// there but what is not yet written.
#ifndef TARNWICK_UTILS_UTILS_H_
#define TARNWICK_UTILS_UTILS_H_

#include <pthread.h>
#include <sys/time.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "tarnwick/platform/export.h"

// Where time_t has 64 bits on a 32-bit system, a class that holds a time has another size than with
// 32 bits, so it has other names for the linker too: a program and a library of different kinds do
// not load together.
#if __SIZEOF_POINTER__ == 4 && (!defined(__GLIBC__) || __TIMESIZE == 64 || \
                                defined(__USE_TIME_BITS64) || defined(__USE_TIME64_REDIRECTS))
#define TARNWICK_HOLDS_TIME __attribute__((abi_tag("time64")))
static_assert(sizeof(time_t) == 8, "of this kind are systems with 64 bits");
#else
#define TARNWICK_HOLDS_TIME
static_assert(sizeof(time_t) == sizeof(void*), "of this kind are systems with a word's bits");
#endif

// Paces a loop to a fixed period without drift:
//
//   DelayTimer timer(40000);  // 25 rounds a second
//   while (running) {
//     GrabFrame();
//     timer.Delay();
//   }
//
// Threads: one thread uses an object at a time.
class TARNWICK_API TARNWICK_HOLDS_TIME DelayTimer {
 public:
  // Starts a period of `periodUs` microseconds now.
  explicit DelayTimer(int periodUs);

  // Starts a period now.
  void BeginTiming();

  // Changes the period, in microseconds; the current one keeps its start.
  void SetDelayTime(int periodUs);

  // Sleeps until the current period has passed and starts the next one where it ended. When the
  // period has passed already, or the clock was set back, yields the processor instead and starts a
  // period now. A period of 0 or less never sleeps.
  // Results: those of the sleep or the yield: 0, or -1 with errno EINTR when a signal cut the
  //   sleep; the next period starts where this one would have ended.
  // Blocks for one period at most.
  int Delay();

 private:
  int m_delay;            // microseconds
  struct timeval m_mark;  // start of the current period; zero seconds: not started
};

// Percent-encodes `text`: ASCII letters and digits, the characters _ ~ ( ) * , - . and those of
// `keep` stay; white space becomes %20, whichever it is, even when `keep` holds it; any other byte
// becomes % and two upper-case hex digits. Which bytes are letters and spaces follows the C locale
// that the process has set.
TARNWICK_API std::string UrlEncode(std::string text, std::string keep);

// Erases every `ch` from `text`.
TARNWICK_API void RemoveChar(std::string& text, char ch);

// `text` without the characters of the zero-terminated `set` at either end; `text` itself when
// `set` is null.
TARNWICK_API std::string TrimString(std::string text, const char* set);

// Copies the zero-terminated `src` into `dest`, a buffer of `size` bytes: at most size - 1
// characters, the rest of the buffer filled with zero bytes. Does nothing when `size` is 0 or a
// pointer is null.
// Results: `dest`.
TARNWICK_API char* StrNCopy(char* dest, const char* src, size_t size);

// Encodes the zero-terminated `text` as base64 (RFC 4648, section 4; padded, without line breaks).
// Results: a new zero-terminated buffer, which the caller frees with `free`; null when memory runs
//   out or `text` is null.
TARNWICK_API char* Base64Encode(const char* text);

// The 16 bytes at `digest` as 32 lower-case hex digits; an empty string when `digest` is null.
// Computes no hash.
TARNWICK_API std::string Md5ToHex(const unsigned char* digest);

// `value` in decimal.
TARNWICK_API std::string IntToString(int64_t value);

// The UTC time `microseconds` after the epoch as, for example, 20240305T140309.417Z. Where time_t
// has 32 bits, the calendar starts again in 1901 after 20380119T031407.999Z.
TARNWICK_API std::string FormatUtcTimeStamp(int64_t microseconds);

// Writes the `len` bytes at `buf` to the descriptor, which may be non-blocking.
//
// Results: the bytes written: `len`; fewer after an error, and after the sixth write that took
//   nothing; 0 when `len` is less than 1. After an error errno is that of write(2), EPIPE when the
//   peer is gone, which raises no SIGPIPE: the caller's signal handler and mask stay. After six
//   writes that took nothing it says nothing.
// Logs: an error, in category utils at notice: "Write fd[N] error[N]", the descriptor and errno.
// Blocks without a limit while the descriptor takes nothing, trying again every 10 milliseconds.
// Threads: one writer per descriptor at a time.
TARNWICK_API int WriteFd(int fd, const void* buf, int len);

// Starts a thread that runs `start(arg)` and stores its handle in `*thread`.
//
// Arguments: `stackSize` in bytes, 0 for the system's default, which also serves when the size is
//   refused; `detached` other than 0 for a thread that nobody joins; the caller joins any other one
//   with pthread_join(3).
// Results: 1; 0 when the thread could not be started or `start` or `thread` is null; `*thread` is
//   then of no use, and errno says nothing.
// Logs: a failure, in category utils at error: "Failed to create thread."
TARNWICK_API int CreateThread(void* (*start)(void*), void* arg, unsigned stackSize, int detached,
                              pthread_t* thread);

#endif  // TARNWICK_UTILS_UTILS_H_
