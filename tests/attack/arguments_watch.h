// Where the attack is, told when the process dies or a call hangs.
#ifndef TARNWICK_TESTS_ATTACK_ARGUMENTS_WATCH_H_
#define TARNWICK_TESTS_ATTACK_ARGUMENTS_WATCH_H_

#include <atomic>
#include <cstdint>
#include <thread>

// One at a time. A signal that ends the process, a report of a sanitizer and a call of more than a
// minute print the call and the --seed and --only that make it again.
class DeathNote {
 public:
  explicit DeathNote(uint64_t seed);
  ~DeathNote();
  DeathNote(const DeathNote&) = delete;
  DeathNote& operator=(const DeathNote&) = delete;

  // `call` lives as long as the process.
  void Begin(long round, const char* call);
  void End() { begun_ = 0; }

 private:
  void Watch();

  std::atomic<long> begun_{0};  // seconds; 0: no call is under way
  std::atomic<bool> done_{false};
  std::thread watcher_;
};

#endif  // TARNWICK_TESTS_ATTACK_ARGUMENTS_WATCH_H_
