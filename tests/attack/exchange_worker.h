// One client thread with its hostile server: takes exchanges by their numbers, plays and judges
// them.
#ifndef TARNWICK_TESTS_ATTACK_EXCHANGE_WORKER_H_
#define TARNWICK_TESTS_ATTACK_EXCHANGE_WORKER_H_

#include <atomic>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "tests/attack/exchange.h"
#include "tests/attack/figures.h"
#include "tests/attack/judge.h"
#include "tests/attack/peer_thread.h"

// What all workers count together.
struct ExchangeTally {
  unsigned long exchanges = 0;
  unsigned long over_tls = 0;
  unsigned long by_curl = 0;
  unsigned long stalled = 0;  // the server did pause
  unsigned long stalled_over_tls = 0;
  unsigned long understood = 0;  // of clean responses, whose status was compared
  unsigned long escaped = 0;
  unsigned long requests = 0;
  unsigned long findings = 0;
};

struct ExchangeRun {
  AttackOptions options;
  Shares shares;
  const PeerContexts* contexts = nullptr;
  uint64_t first = 0;
  uint64_t end = 0;  // after the last number
  uint64_t step = 1;
  double margin = 3;                       // seconds; see LongestAllowed
  std::atomic<uint64_t> next[2] = {0, 0};  // of those without a pause and with one
  Footprint start;
  Footprint third;  // after the first third of the exchanges
  Footprint finish;
  long seconds = 0;
  LongestCall longest;
  LongestCall longest_without_pause;
  std::mutex mutex;  // of what follows
  ExchangeTally tally;
  std::vector<std::string> findings;  // the first ones, and the numbers of their exchanges
  std::vector<uint64_t> found;
};

class ExchangeWorker {
 public:
  // Plays the exchanges in which the server pauses, or the others. The first sleep most of the time
  // and many of them overlap; of the others a few keep the processors busy.
  ExchangeWorker(ExchangeRun* run, bool stalls);
  ~ExchangeWorker();
  ExchangeWorker(const ExchangeWorker&) = delete;
  ExchangeWorker& operator=(const ExchangeWorker&) = delete;

  // Seconds of the steady clock at which the exchange under way began; 0 without one.
  long BusySince() const { return busy_since_; }
  uint64_t Number() const { return number_; }

 private:
  void Work();
  void PlayOne(uint64_t number);
  Played Play(const HostileExchange& exchange, const std::string& plant);
  std::string WordsToPlayAgain(uint64_t number) const;
  void Note(const HostileExchange& exchange, const Played& played);
  void NoteTime(const HostileExchange& exchange, double seconds, bool stalled);

  ExchangeRun* const run_;
  const bool stalls_;
  PeerThread peer_;
  std::atomic<long> busy_since_{0};
  std::atomic<uint64_t> number_{0};
  std::thread thread_;
};

long SteadySeconds();

#endif  // TARNWICK_TESTS_ATTACK_EXCHANGE_WORKER_H_
