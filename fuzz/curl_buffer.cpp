// The buffer that collects a response in memory. Each line is a step:
//
//   write TEXT        appends the text
//   items N TEXT      appends as many items of N bytes as the text has
//   fail TEXT         appends while there is no memory
//   huge N            N bytes are said to come, which no memory holds
//   lost N            a buffer that has lost N bytes before
//   free              the owner fetches the bytes
#include <malloc.h>

#include <algorithm>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <string>
#include <string_view>

#include "fuzz/oracle/curl_buffer.h"
#include "fuzz/support/script.h"
#include "fuzz/support/target.h"
#include "tarnwick/http/curl_callbacks.h"

using namespace tarnwick;

namespace {

constexpr uint64_t kMemory = 1 << 20;  // no larger block is to be had

// The library's allocations fail while `g_watched` is set, when they shall or are too large.
bool g_watched = false;
bool g_fails = false;

bool Fails(uint64_t size) {
  return g_watched && (g_fails || size > kMemory);
}

}  // namespace

extern "C" {

void* __real_malloc(size_t size);
void* __real_calloc(size_t count, size_t size);
void* __real_realloc(void* memory, size_t size);

void* __wrap_malloc(size_t size) {
  return Fails(size) ? nullptr : __real_malloc(size);
}

void* __wrap_calloc(size_t count, size_t size) {
  return Fails(count * size) ? nullptr : __real_calloc(count, size);
}

void* __wrap_realloc(void* memory, size_t size) {
  return Fails(size) ? nullptr : __real_realloc(memory, size);
}

}  // extern "C"

namespace {

class Collector {
 public:
  ~Collector() { Free(); }

  void Append(std::string text, size_t itemSize, bool fails) {
    const size_t count = text.size() / itemSize;
    text.resize(count * itemSize);
    Call(text, itemSize, count, fails);
  }

  // The bytes do not exist: they must not be looked at.
  void AppendHuge(uint64_t count) { Call("", 1, std::max(count, kMemory), true); }

  void Lose(uint64_t size) {
    Free();
    buffer_.size = model_.size = static_cast<uint32_t>(std::min<uint64_t>(size, UINT_MAX));
  }

  void Free() {
    std::free(buffer_.data);
    buffer_ = {};
    model_ = {};
  }

 private:
  void Call(const std::string& text, size_t itemSize, size_t count, bool fails) {
    char* const before = buffer_.data;
    const std::string kept = model_.bytes;
    std::unique_ptr<char[]> piece(new char[text.size()]);  // the sanitizer sees its end
    std::copy(text.begin(), text.end(), piece.get());
    const uint64_t needed = model_.Needed(itemSize * count);
    g_fails = fails;
    g_watched = true;
    const size_t taken = CurlBufferWrite(piece.get(), itemSize, count, &buffer_);
    g_watched = false;
    ExpectSame("the bytes taken", static_cast<int64_t>(taken),
               static_cast<int64_t>(itemSize * count));
    const bool memory = !fails && needed <= kMemory;
    model_.Append(text, memory);
    if (!memory) CheckLost(before, kept);
    Compare();
    if (memory) Expect("the memory held", malloc_usable_size(buffer_.data) == needed);
  }

  // A block that cannot grow stays as it is.
  static void CheckLost(char* block, const std::string& bytes) {
    if (block == nullptr) return;
    ExpectSame("the lost block", std::string_view(block, bytes.size()), bytes);
    std::free(block);
  }

  void Compare() const {
    ExpectSame("having memory", buffer_.data != nullptr, model_.there);
    ExpectSame("the size", buffer_.size, model_.size);
    if (!model_.there) return;
    ExpectSame("the bytes", std::string_view(buffer_.data, buffer_.size), model_.bytes);
    ExpectSame("the byte after them", buffer_.data[buffer_.size], 0);
  }

  CurlMemBuffer buffer_ = {};
  oracle::Buffer model_;
};

// Takes the first word off `line`, and the blank after it.
std::string_view TakeWord(std::string_view* line) {
  const std::string_view word = line->substr(0, line->find(' '));
  line->remove_prefix(std::min(word.size() + 1, line->size()));
  return word;
}

uint64_t NumberIn(std::string_view word) {
  return std::strtoull(std::string(word).c_str(), nullptr, 10);
}

void Play(std::string_view step, Collector* collector) {
  const std::string_view word = TakeWord(&step);
  if (word == "write") collector->Append(std::string(step), 1, false);
  if (word == "fail") collector->Append(std::string(step), 1, true);
  if (word == "items") {
    const uint64_t size = std::clamp<uint64_t>(NumberIn(TakeWord(&step)), 1, 1024);
    collector->Append(std::string(step), size, false);
  }
  if (word == "huge") collector->AppendHuge(std::min<uint64_t>(NumberIn(step), LONG_MAX));
  if (word == "lost") collector->Lose(NumberIn(step));
  if (word == "free") collector->Free();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  std::string_view input(reinterpret_cast<const char*>(data), size);
  Collector collector;
  while (!input.empty()) Play(TakeLine(&input), &collector);
  return 0;
}
