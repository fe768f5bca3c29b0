// Calls of utils.h.
#include <pthread.h>
#include <sys/time.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <csignal>
#include <cstdlib>
#include <cstring>

#include "tarnwick/utils/utils.h"
#include "tests/attack/arguments_calls.h"

namespace {

// A sleep of at most so many microseconds is waited for.
constexpr int kShortPeriod = 2000;

// While it lives, a signal comes every millisecond.
class Interruptions {
 public:
  Interruptions() {
    struct sigaction action = {};
    action.sa_handler = [](int) {};
    sigaction(SIGALRM, &action, &before_);
    const itimerval often = {{0, 1000}, {0, 1000}};
    setitimer(ITIMER_REAL, &often, nullptr);
  }
  ~Interruptions() {
    const itimerval never = {};
    setitimer(ITIMER_REAL, &never, nullptr);
    sigaction(SIGALRM, &before_, nullptr);
  }
  Interruptions(const Interruptions&) = delete;
  Interruptions& operator=(const Interruptions&) = delete;

 private:
  struct sigaction before_ = {};
};

void MakeTimer(Ground& ground, Draw& /*draw*/) {
  ground.DropTimer();
  ground.Timer();
}

void BeginTiming(Ground& ground, Draw& /*draw*/) {
  ground.Timer().timer->BeginTiming();
}

void SetDelayTime(Ground& ground, Draw& draw) {
  PacedTimer& timer = ground.Timer();
  timer.period = draw.Int();
  timer.timer->SetDelayTime(timer.period);
}

void Delay(Ground& ground, Draw& /*draw*/) {
  PacedTimer& timer = ground.Timer();
  if (timer.period <= kShortPeriod) {
    ground.Expect(timer.timer->Delay() == 0, "Delay was not 0");
    return;
  }
  const Interruptions interruptions;
  const int result = timer.timer->Delay();
  ground.Expect(result == 0 || (result == -1 && errno == EINTR), "neither 0 nor EINTR");
}

void Url(Ground& ground, Draw& draw) {
  const std::string& text = draw.Text();
  const std::string encoded = UrlEncode(text, "");
  ground.Expect(encoded.size() >= text.size() && encoded.size() <= 3 * text.size(),
                "a wrong length");
  ground.Expect(encoded.find_first_of(std::string("\0\r\n \"", 5)) == std::string::npos,
                "a character stays that is none of a URL");
  UrlEncode(text, draw.Text());
}

void Remove(Ground& ground, Draw& draw) {
  std::string text = draw.Text();
  const char ch = static_cast<char>(draw.Below(256));
  RemoveChar(text, ch);
  ground.Expect(text.find(ch) == std::string::npos, "the character is still there");
}

void Trim(Ground& ground, Draw& draw) {
  const std::string& text = draw.Text();
  const char* set = draw.CTextOrNull();
  const std::string trimmed = TrimString(text, set);
  ground.Expect(text.find(trimmed) != std::string::npos, "no part of the text");
  ground.Expect(set != nullptr || trimmed == text, "without a set the text changed");
}

void Copy(Ground& ground, Draw& draw) {
  const size_t size = draw.Size();
  const std::string& source = draw.Text();
  const std::unique_ptr<char[]> buffer(new char[size]);
  if (draw.OneIn(8)) {
    ground.Expect(StrNCopy(nullptr, source.c_str(), size) == nullptr, "another pointer");
    return;
  }
  const char* from = draw.OneIn(8) ? nullptr : source.c_str();
  ground.Expect(StrNCopy(buffer.get(), from, size) == buffer.get(), "another pointer");
  if (from == nullptr || size == 0) return;
  const size_t length = std::min(strlen(from), size - 1);
  ground.Expect(strlen(buffer.get()) == length && buffer[size - 1] == '\0', "a wrong length");
}

void Base64(Ground& ground, Draw& draw) {
  const char* text = draw.CTextOrNull();
  char* encoded = Base64Encode(text);
  ground.Expect((encoded == nullptr) == (text == nullptr), "null for a text, or none for null");
  if (encoded != nullptr) {
    ground.Expect(strlen(encoded) == (strlen(text) + 2) / 3 * 4, "a wrong length");
  }
  free(encoded);
}

void Md5(Ground& ground, Draw& draw) {
  unsigned char digest[16];
  for (unsigned char& byte : digest) byte = static_cast<unsigned char>(draw.Below(256));
  const bool none = draw.OneIn(4);
  ground.Expect(Md5ToHex(none ? nullptr : digest).size() == (none ? 0u : 32u), "a wrong length");
}

void Integer(Ground& ground, Draw& draw) {
  const int64_t value = draw.Long();
  ground.Expect(std::stoll(IntToString(value)) == value, "another number");
}

void TimeStamp(Ground& ground, Draw& draw) {
  const std::string stamp = FormatUtcTimeStamp(draw.Long());
  constexpr size_t kShortest = sizeof("90305T140309.417Z") - 1;  // of a year below 10
  ground.Expect(stamp.size() >= kShortest && stamp.back() == 'Z', "no time stamp");
}

void Write(Ground& ground, Draw& draw) {
  const std::string& text = draw.Text();
  const int fd = ground.Descriptor();
  const int size = static_cast<int>(text.size());
  const int len = draw.OneIn(4) ? -std::abs(draw.Int() / 2) : size;
  const char* from = len < 1 && draw.Bool() ? nullptr : text.data();
  const int written = WriteFd(fd, from, len);
  ground.Expect(written >= 0 && written <= std::max(len, 0), "a count that cannot be");
}

void* CountEnd(void* argument) {
  ++*static_cast<std::atomic<int>*>(argument);
  return nullptr;
}

void StartThread(Ground& ground, Draw& draw) {
  pthread_t thread = {};
  constexpr unsigned kSizes[] = {0, 1, 4096, 16384, 65536, 1 << 20, 1 << 26};
  const unsigned size = kSizes[draw.Below(std::size(kSizes))];
  const int detached = draw.Bool() ? 0 : draw.Int();
  const auto start = draw.OneIn(6) ? nullptr : CountEnd;
  pthread_t* const handle = draw.OneIn(6) ? nullptr : &thread;
  const int result = CreateThread(start, ground.Ended(), size, detached, handle);
  const bool right = start != nullptr && handle != nullptr;
  ground.Expect(result == (right ? 1 : 0), "a wrong result");
  if (result != 1) return;
  ground.StartedThread();
  if (detached == 0) pthread_join(thread, nullptr);
}

}  // namespace

std::vector<PublicCall> UtilsCalls() {
  return {
      {"DelayTimer::DelayTimer", MakeTimer},
      {"DelayTimer::BeginTiming", BeginTiming},
      {"DelayTimer::SetDelayTime", SetDelayTime},
      {"DelayTimer::Delay", Delay},
      {"UrlEncode", Url},
      {"RemoveChar", Remove},
      {"TrimString", Trim},
      {"StrNCopy", Copy},
      {"Base64Encode", Base64},
      {"Md5ToHex", Md5},
      {"IntToString", Integer},
      {"FormatUtcTimeStamp", TimeStamp},
      {"WriteFd", Write},
      {"CreateThread", StartThread},
  };
}
