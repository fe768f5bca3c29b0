#include "tests/support/stack_use.h"

#include <gtest/gtest.h>
#include <pthread.h>
#include <sys/mman.h>

#include <cstring>

namespace {

constexpr size_t kPainted = 8 << 20;
constexpr int kPaint = 0xa5;

void* CallIt(void* body) {
  (*static_cast<const std::function<void()>*>(body))();
  return nullptr;
}

}  // namespace

size_t StackUsedBy(const std::function<void()>& body) {
  void* const memory =
      mmap(nullptr, kPainted, PROT_READ | PROT_WRITE, MAP_PRIVATE | MAP_ANONYMOUS, -1, 0);
  EXPECT_NE(memory, MAP_FAILED);
  memset(memory, kPaint, kPainted);
  pthread_attr_t attributes;
  pthread_attr_init(&attributes);
  pthread_attr_setstack(&attributes, memory, kPainted);
  pthread_t thread;
  EXPECT_EQ(pthread_create(&thread, &attributes, CallIt,
                           const_cast<void*>(static_cast<const void*>(&body))),
            0);
  pthread_join(thread, nullptr);
  pthread_attr_destroy(&attributes);
  const unsigned char* const bytes = static_cast<const unsigned char*>(memory);
  size_t untouched = 0;
  while (untouched < kPainted && bytes[untouched] == kPaint) ++untouched;
  munmap(memory, kPainted);
  return kPainted - untouched;
}
