#include "tests/support/faults.h"

#include <netdb.h>

#include <cerrno>
#include <cstdio>

namespace {

// A plain pointer: the allocating calls come here before any constructor has run.
thread_local Faults* current = nullptr;

struct UsualFailure {
  const char* name;
  int error;
  long result;
};

constexpr UsualFailure kUsualFailures[] = {
#define TEST_CALL(call, error, result) {#call, error, result},
#include "tests/support/wrapped_calls.inc"
};

int Index(Call call) {
  return static_cast<int>(call);
}

}  // namespace

const char* CallName(Call call) {
  return kUsualFailures[Index(call)].name;
}

Faults::Faults() {
  EXPECT_EQ(current, nullptr) << "one Faults object a thread at a time";
  current = this;
}

Faults::~Faults() {
  current = nullptr;
}

Faults* Faults::Current() {
  return current;
}

Faults& Faults::FailNth(Call call, int n, int error, long result) {
  return FailRange(call, n, n, error, result);
}

Faults& Faults::FailFrom(Call call, int n, int error, long result) {
  return FailRange(call, n, INT_MAX, error, result);
}

Faults& Faults::FailRange(Call call, int first, int last, int error, long result) {
  const UsualFailure& usual = kUsualFailures[Index(call)];
  const Verdict verdict = {result == kUsual ? usual.result : result,
                           error == kUsual ? usual.error : error};
  rules_.push_back({call, first, last, verdict});
  return *this;
}

Faults& Faults::Return(Call call, int first, int last, long result) {
  rules_.push_back({call, first, last, {result, 0}});
  return *this;
}

Faults& Faults::FailCurlOption(CURLoption option, CURLcode code) {
  refused_options_.emplace_back(option, code);
  return *this;
}

Faults& Faults::Limit(Call call, size_t bytes) {
  limits_[Index(call)] = bytes;
  return *this;
}

Faults& Faults::Before(Call call, std::function<void(int)> action) {
  before_[Index(call)] = std::move(action);
  return *this;
}

Faults& Faults::Clock(std::function<struct timeval()> clock) {
  clock_ = std::move(clock);
  return *this;
}

Faults& Faults::SocketError(int error) {
  socket_error_ = error;
  return *this;
}

int Faults::Count(Call call) const {
  return counts_[Index(call)];
}

const std::vector<size_t>& Faults::Sizes(Call call) const {
  return sizes_[Index(call)];
}

bool Faults::HasOption(CURLoption option) const {
  for (const CurlOption& given : curl_options_) {
    if (given.option == option) return true;
  }
  return false;
}

CurlOption Faults::OptionGiven(CURLoption option) const {
  for (size_t i = curl_options_.size(); i-- > 0;) {
    if (curl_options_[i].option == option) return curl_options_[i];
  }
  ADD_FAILURE() << "curl option " << option << " was not given";
  return {option, 0, "", {}, nullptr};
}

const Faults::Rule* Faults::RuleFor(Call call, int n) const {
  for (const Rule& rule : rules_) {
    if (rule.call == call && rule.first <= n && n <= rule.last) return &rule;
  }
  return nullptr;
}

std::optional<Faults::Verdict> Faults::Next(Call call) {
  const int n = ++counts_[Index(call)];
  if (const std::function<void(int)>& before = before_[Index(call)]) {
    current = nullptr;  // what the action itself calls is not the library's
    before(n);
    current = this;
  }
  const Rule* rule = RuleFor(call, n);
  if (rule == nullptr) return std::nullopt;
  struck_ = true;
  return rule->verdict;
}

std::optional<Faults::Verdict> Faults::NextSized(Call call, size_t size) {
  sizes_[Index(call)].push_back(size);
  return Next(call);
}

std::optional<Faults::Verdict> Faults::NextCurlOption(CurlOption option) {
  const CURLoption wanted = option.option;
  curl_options_.push_back(std::move(option));
  const std::optional<Verdict> verdict = Next(Call::kCurlEasySetopt);
  if (verdict) return verdict;
  for (const auto& [refused, code] : refused_options_) {
    if (refused != wanted) continue;
    struck_ = true;
    return Verdict{code, 0};
  }
  return std::nullopt;
}

size_t Faults::Allowed(Call call, size_t wanted) const {
  const size_t limit = limits_[Index(call)];
  return limit != 0 && limit < wanted ? limit : wanted;
}

bool Faults::ReadClock(struct timeval* now) const {
  if (!clock_) return false;
  *now = clock_();
  return true;
}
