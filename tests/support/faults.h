// Fault injection: makes a chosen call of the library fail, counts calls and records what they were
// given. It works by the linker's --wrap on the statically linked library; libcurl, OpenSSL and the
// C library itself are not affected by it.
//
//   Faults faults;
//   faults.FailNth(Call::kConnect, 1, ENETUNREACH);
//   EXPECT_EQ(socket.Connect(), -1);
//   EXPECT_EQ(faults.Count(Call::kConnect), 1);
//
// Threads: a Faults object acts on the calls of the thread that made it, and on no other; the
// scripted peers, which run on their own threads, never meet it.
#ifndef TARNWICK_TESTS_SUPPORT_FAULTS_H_
#define TARNWICK_TESTS_SUPPORT_FAULTS_H_

#include <curl/curl.h>
#include <gtest/gtest.h>
#include <sys/time.h>

#include <climits>
#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <utility>
#include <vector>

enum class Call {
#define TEST_CALL(call, error, result) call,
#include "tests/support/wrapped_calls.inc"
  kCount_
};

const char* CallName(Call call);

// One curl_easy_setopt that the library made.
struct CurlOption {
  CURLoption option;
  long number = 0;                // of a numeric option
  std::string text;               // of a string option and of CURLOPT_POSTFIELDS
  std::vector<std::string> list;  // of a header list
  const void* pointer = nullptr;  // of any pointer option
};

// The faults of the current thread, from construction to destruction. Calls are numbered from 1,
// counted from the construction. When several rules hit a call, the first one made decides.
// REQUIRES: one object a thread at a time.
class Faults {
 public:
  static constexpr int kUsual = INT_MIN;  // the error or result of the call's usual failure

  Faults();
  ~Faults();
  Faults(const Faults&) = delete;
  Faults& operator=(const Faults&) = delete;

  // Make the n-th call fail, every call from the n-th on, or the calls from `first` to `last`.
  //
  // `error` goes into errno and `result` is what the call returns. For the calls that report by
  // their result alone (curl, getaddrinfo, pthread_create ...) give the result.
  Faults& FailNth(Call call, int n, int error = kUsual, long result = kUsual);
  Faults& FailFrom(Call call, int n, int error = kUsual, long result = kUsual);
  Faults& FailRange(Call call, int first, int last, int error = kUsual, long result = kUsual);

  // Fakes a result without an error for the calls from `first` to `last`: the real call is not
  // made. A faked select has empty sets, a faked getaddrinfo an empty list.
  Faults& Return(Call call, int first, int last, long result);

  // Fails the curl_easy_setopt of one option.
  Faults& FailCurlOption(CURLoption option, CURLcode code);

  // Lets read, write, SSL_read and SSL_write move at most `bytes` a call.
  Faults& Limit(Call call, size_t bytes);

  // Runs `action(n)` before the n-th call of this kind; not for the allocating calls.
  Faults& Before(Call call, std::function<void(int)> action);

  // The clock that gettimeofday and time show.
  Faults& Clock(std::function<struct timeval()> clock);

  // The value that getsockopt returns for SO_ERROR.
  Faults& SocketError(int error);

  // True once a rule has decided about a call.
  bool Struck() const { return struck_; }

  // The calls made so far, failed ones included.
  int Count(Call call) const;

  // The lengths given to read, write, SSL_read and SSL_write, and the microseconds given to usleep,
  // in the order of the calls.
  const std::vector<size_t>& Sizes(Call call) const;

  // The options given to curl_easy_setopt, refused ones included.
  const std::vector<CurlOption>& CurlOptions() const { return curl_options_; }

  // The option as it was given last; fails the test when it was not given.
  CurlOption OptionGiven(CURLoption option) const;
  bool HasOption(CURLoption option) const;

  // For the wrappers: the next call's fate.
  struct Verdict {
    long result;
    int error;
  };
  static Faults* Current();
  std::optional<Verdict> Next(Call call);
  std::optional<Verdict> NextSized(Call call, size_t size);
  std::optional<Verdict> NextCurlOption(CurlOption option);
  size_t Allowed(Call call, size_t wanted) const;
  bool ReadClock(struct timeval* now) const;
  std::optional<int> ForcedSocketError() const { return socket_error_; }

 private:
  static constexpr int kCalls = static_cast<int>(Call::kCount_);

  struct Rule {
    Call call;
    int first;
    int last;
    Verdict verdict;
  };

  const Rule* RuleFor(Call call, int n) const;

  bool struck_ = false;
  std::vector<Rule> rules_;
  int counts_[kCalls] = {};
  size_t limits_[kCalls] = {};
  std::vector<size_t> sizes_[kCalls];
  std::function<void(int)> before_[kCalls];
  std::function<struct timeval()> clock_;
  std::optional<int> socket_error_;
  std::vector<CurlOption> curl_options_;
  std::vector<std::pair<CURLoption, CURLcode>> refused_options_;
};

// Runs `operation(faults)` with the first call failing, then with the second one, and so on, until
// a run makes fewer calls than that. The operation does its own checks; `faults.Struck()` tells it
// whether its run met the failure, which the last one does not.
//
// Results: the number of runs that met the failure. The test fails when there is no end of them.
template <typename Operation>
int ForEachFailingCall(Call call, Operation operation, int error = Faults::kUsual,
                       long result = Faults::kUsual) {
  constexpr int kMostRuns = 300;
  for (int n = 1; n <= kMostRuns; ++n) {
    SCOPED_TRACE(std::string(CallName(call)) + ": call " + std::to_string(n) + " fails");
    Faults faults;
    faults.FailNth(call, n, error, result);
    operation(faults);
    if (faults.Count(call) < n) return n - 1;
  }
  ADD_FAILURE() << CallName(call) << ": still more calls after " << kMostRuns << " runs";
  return kMostRuns;
}

#endif  // TARNWICK_TESTS_SUPPORT_FAULTS_H_
