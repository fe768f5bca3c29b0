// The response of a JSON service: the input is its body.
#include "tarnwick/http/json_response.h"

#include <json/json.h>
#include <pthread.h>

#include <algorithm>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <string>

#include "fuzz/oracle/json_response.h"
#include "fuzz/support/target.h"

using namespace tarnwick;

namespace {

constexpr int kSurelyParsed = 900;    // levels that fit the parser's own limit and a usual stack
constexpr int kSurelyRefused = 1002;  // levels beyond the parser's own limit

struct Parsed {
  int result;
  Json::Value value;
};

// What the parser itself says, for text that is no JSON by the letter: it takes some of it.
Parsed ByReader(const std::string& text) {
  Parsed parsed = {-1, {}};
  try {
    Json::Reader reader;
    if (!reader.parse(text, parsed.value, true)) return parsed;
  } catch (const Json::Exception&) {
    return parsed;
  }
  parsed.result = -2;
  if (!parsed.value.isObject() || !parsed.value.isMember("success")) return parsed;
  const Json::Value& success = parsed.value["success"];
  const bool decides = success.isBool() || success.isNumeric();
  if (decides && success.asBool()) parsed.result = 0;
  return parsed;
}

int Levels(const Json::Value& value) {
  int deepest = 0;
  for (const Json::Value& member : value) deepest = std::max(deepest, Levels(member));
  return value.isArray() || value.isObject() ? deepest + 1 : 0;
}

void CheckStrict(const oracle::JsonVerdict& verdict, const Parsed& library) {
  ExpectSame("JsonParse of a text that is JSON", library.result, verdict.success ? 0 : -2);
  ExpectSame("the levels of the value", Levels(library.value), verdict.depth);
}

void CheckDepth(const std::string& text, const oracle::JsonVerdict& verdict) {
  const int depth = JsonDepth(text);
  if (verdict.strict) ExpectSame("JsonDepth", depth, verdict.depth);
  const int nesting = oracle::NestingOf(text);
  Expect("JsonDepth never falls short", depth >= nesting);
}

void Check(const std::string& text) {
  Parsed library = {0, "before"};
  library.result = JsonParse(text, library.value);
  if (text.empty()) {
    Expect("an empty text leaves the value", library.result == 0 && library.value == "before");
    return;
  }
  const oracle::JsonVerdict verdict = oracle::JudgeJson(text);
  CheckDepth(text, verdict);
  const int nesting = oracle::NestingOf(text);
  if (verdict.strict && verdict.certain && nesting <= kSurelyParsed) CheckStrict(verdict, library);
  if (nesting > kSurelyRefused && verdict.strict) {
    ExpectSame("JsonParse of a deep text", library.result, -1);
  }
  if (nesting > kSurelyParsed) return;
  const Parsed expected = ByReader(text);
  ExpectSame("JsonParse", library.result, expected.result);
  if (expected.result == -1) return;
  Expect("the parsed value is the reader's", library.value == expected.value);
  Expect("JsonDepth covers the value", JsonDepth(text) >= Levels(expected.value));
}

// A thread that stays: making one for each text would take longer than all the rest.
class Worker {
 public:
  explicit Worker(size_t stack) {
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    Expect("the stack size is taken", pthread_attr_setstacksize(&attributes, stack) == 0);
    pthread_t thread;
    Expect("a thread starts", pthread_create(&thread, &attributes, Work, this) == 0);
    pthread_detach(thread);
    pthread_attr_destroy(&attributes);
  }

  void Do(const std::function<void()>& work) {
    std::unique_lock<std::mutex> lock(mutex_);
    work_ = &work;
    changed_.notify_all();
    changed_.wait(lock, [this] { return work_ == nullptr; });
  }

 private:
  static void* Work(void* self) {
    auto* worker = static_cast<Worker*>(self);
    std::unique_lock<std::mutex> lock(worker->mutex_);
    for (;;) {
      worker->changed_.wait(lock, [worker] { return worker->work_ != nullptr; });
      (*worker->work_)();
      worker->work_ = nullptr;
      worker->changed_.notify_all();
    }
    return nullptr;
  }

  std::mutex mutex_;
  std::condition_variable changed_;
  const std::function<void()>* work_ = nullptr;
};

// The library looks at the stack for text of more levels than this. Of the main thread it would
// have to read a file to learn its stack, so that deep text is left to other threads.
constexpr int kDeep = 12;
constexpr size_t kUsualStack = size_t{8} << 20;
constexpr size_t kSmallStack = size_t{160} << 10;  // with room for what the sanitizers add

void CheckDeep(const std::string& text) {
  static auto* const usual = new Worker(kUsualStack);
  static auto* const small = new Worker(kSmallStack);
  usual->Do([&text] { Check(text); });
  // Its guard page is the judge.
  small->Do([&text] {
    Json::Value value;
    JsonParse(text, value);
  });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string text(reinterpret_cast<const char*>(data), size);
  oracle::NestingOf(text) > kDeep ? CheckDeep(text) : Check(text);
  return 0;
}
