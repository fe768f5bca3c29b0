// How many bytes of requests all connections together may hold.
#ifndef TARNWICK_TOOLS_TWCAMSIM_MEMORY_BUDGET_H_
#define TARNWICK_TOOLS_TWCAMSIM_MEMORY_BUDGET_H_

#include <atomic>
#include <cstddef>

// Threads: any.
class MemoryBudget {
 public:
  // The largest body, 64 MiB, and room for the other connections beside it.
  static constexpr size_t kBytes = size_t{80} << 20;

  // Results: false when so many are not left; none are taken then.
  bool Take(size_t bytes) {
    if (used_.fetch_add(bytes) + bytes <= kBytes) return true;
    Release(bytes);
    return false;
  }
  void Release(size_t bytes) { used_.fetch_sub(bytes); }

 private:
  std::atomic<size_t> used_{0};
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_MEMORY_BUDGET_H_
