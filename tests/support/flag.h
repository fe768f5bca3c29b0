// A flag that threads wait for.
#ifndef TARNWICK_TESTS_SUPPORT_FLAG_H_
#define TARNWICK_TESTS_SUPPORT_FLAG_H_

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>

// Once set, it stays set. Copies share one flag, so it may be given to a peer's step by value.
// Threads: any.
class Flag {
 public:
  void Set() const {
    std::lock_guard<std::mutex> lock(state_->mutex);
    state_->set = true;
    state_->changed.notify_all();
  }

  bool IsSet() const {
    std::lock_guard<std::mutex> lock(state_->mutex);
    return state_->set;
  }

  // Results: false when it was not set in time.
  bool Wait(std::chrono::milliseconds limit = std::chrono::seconds(10)) const {
    std::unique_lock<std::mutex> lock(state_->mutex);
    const auto deadline = std::chrono::system_clock::now() + limit;
    return state_->changed.wait_until(lock, deadline, [this] { return state_->set; });
  }

 private:
  struct State {
    std::mutex mutex;
    std::condition_variable changed;
    bool set = false;
  };
  std::shared_ptr<State> state_ = std::make_shared<State>();
};

#endif  // TARNWICK_TESTS_SUPPORT_FLAG_H_
