// The first calls of Enum2String in a process: one that runs out of memory, then eight at once.
#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <new>
#include <set>
#include <thread>
#include <vector>

#include "tarnwick/log/log_names.h"

namespace {

std::atomic<int> allocations_left{1 << 30};

}  // namespace

void* operator new(std::size_t size) {
  if (allocations_left.fetch_sub(1) <= 0) throw std::bad_alloc();
  if (void* memory = std::malloc(size)) return memory;
  throw std::bad_alloc();
}
void operator delete(void* memory) noexcept {
  std::free(memory);
}
void operator delete(void* memory, std::size_t) noexcept {
  std::free(memory);
}

namespace {

void RunOutOfMemory() {
  allocations_left = 10;  // some of the 74 entries fit
  try {
    Enum2String(LOG_CATEG_HTTP);
  } catch (const std::bad_alloc&) {
    printf("out of memory\n");
  }
  allocations_left = 1 << 30;
}

}  // namespace

int main() {
  RunOutOfMemory();
  std::atomic<bool> start{false};
  std::vector<const void*> maps(8);
  std::vector<std::thread> threads;
  for (const void*& map : maps) {
    threads.emplace_back([&] {
      while (!start) std::this_thread::yield();
      Enum2String(LOG_CATEG_HTTP);
      map = &NamesOf<LOG_CATEG>();
    });
  }
  start = true;
  for (std::thread& thread : threads) thread.join();
  const std::set<const void*> different(maps.begin(), maps.end());
  printf("%zu entries, %zu map\n", NamesOf<LOG_CATEG>().size(), different.size());
  return 0;
}
