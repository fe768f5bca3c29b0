// The first calls of Enum2String in a process: one that runs out of memory, then eight at once,
// which signals interrupt while one of them builds the names.
#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <new>
#include <set>
#include <thread>
#include <vector>

#include "tarnwick/log/log_names.h"

using namespace tarnwick;

namespace {

std::atomic<int> allocations_left{1 << 30};
std::atomic<bool> may_allocate{true};

}  // namespace

void* operator new(std::size_t size) {
  if (allocations_left.fetch_sub(1) <= 0) throw std::bad_alloc();
  while (!may_allocate) std::this_thread::yield();
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

void Interrupt(std::vector<std::thread>* threads) {
  constexpr int kRounds = 50;
  for (int i = 0; i < kRounds; ++i) {
    for (std::thread& thread : *threads) pthread_kill(thread.native_handle(), SIGUSR1);
    usleep(1000);
  }
}

}  // namespace

int main() {
  struct sigaction wake = {};
  wake.sa_handler = [](int) {};
  sigaction(SIGUSR1, &wake, nullptr);
  RunOutOfMemory();
  std::atomic<bool> start{false};
  std::atomic<int> errno_kept{0};
  std::vector<const void*> maps(8);
  std::vector<std::thread> threads;
  for (const void*& map : maps) {
    threads.emplace_back([&] {
      while (!start) std::this_thread::yield();
      errno = EDOM;
      Enum2String(LOG_CATEG_HTTP);
      errno_kept += errno == EDOM;
      map = &NameMap<LOG_CATEG>();
    });
  }
  may_allocate = false;
  start = true;
  Interrupt(&threads);
  may_allocate = true;
  for (std::thread& thread : threads) thread.join();
  const std::set<const void*> different(maps.begin(), maps.end());
  printf("%zu entries, %zu map, errno kept by %d\n", NameMap<LOG_CATEG>().size(), different.size(),
         errno_kept.load());
  return 0;
}
