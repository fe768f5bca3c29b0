// Processes and memory that a stress case shares with them.
#ifndef TARNWICK_TESTS_STRESS_PROCESSES_H_
#define TARNWICK_TESTS_STRESS_PROCESSES_H_

#include <sys/mman.h>
#include <sys/types.h>

#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <new>
#include <optional>
#include <string>

// Starts a process that runs `body` and exits with its result. REQUIRES: no other threads.
pid_t Spawn(const std::function<int()>& body);

// The wait status of `pid`, reaped; nothing when it did not end within `seconds`. A process that is
// waited for with 0 seconds is asked once.
std::optional<int> WaitFor(pid_t pid, double seconds);

// What became of a process: "exit code 3", "signal 25", "still running".
std::string StatusText(const std::optional<int>& status);

// Gives up all capabilities, so that root meets permissions as anybody does.
// Results: false when that failed.
bool DropCapabilities();

// The open descriptors whose file's path holds `part`.
int DescriptorsOn(const std::string& part);

// `count` zeroed T that processes started later share.
// REQUIRES: T is at home in zeroed memory and in several processes, as atomics are.
template <typename T>
class Shared {
 public:
  explicit Shared(size_t count = 1) : size_(count * sizeof(T)) {
    void* const memory =
        mmap(nullptr, size_, PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) {
      perror("no shared memory");
      abort();  // nothing can be checked without it
    }
    items_ = new (memory) T[count]();
  }
  ~Shared() { munmap(items_, size_); }
  Shared(const Shared&) = delete;
  Shared& operator=(const Shared&) = delete;

  T& operator[](size_t i) { return items_[i]; }
  const T& operator[](size_t i) const { return items_[i]; }
  T* operator->() { return items_; }
  T& operator*() { return *items_; }

 private:
  size_t size_;
  T* items_;
};

#endif  // TARNWICK_TESTS_STRESS_PROCESSES_H_
