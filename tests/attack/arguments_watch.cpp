#include "tests/attack/arguments_watch.h"

#include <pthread.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <ctime>

#include "tests/attack/death.h"

namespace {

constexpr long kLongest = 60;

std::atomic<uint64_t> seed_now{0};
std::atomic<long> round_now{0};
std::atomic<const char*> call_now{"no call"};

void Tell() {
  fprintf(stderr, "died in %s: --seed %llu --only %ld\n", call_now.load(),
          static_cast<unsigned long long>(seed_now.load()), round_now.load());
}

long Now() {
  timespec now = {};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return now.tv_sec;
}

}  // namespace

DeathNote::DeathNote(uint64_t seed) {
  seed_now = seed;
  TellAtDeath(Tell);
  watcher_ = std::thread([this] { Watch(); });
}

DeathNote::~DeathNote() {
  done_ = true;
  watcher_.join();
}

void DeathNote::Begin(long round, const char* call) {
  round_now = round;
  call_now = call;
  begun_ = Now();
}

// The signals of the calls are for the thread that makes them.
void DeathNote::Watch() {
  sigset_t all;
  sigfillset(&all);
  pthread_sigmask(SIG_BLOCK, &all, nullptr);
  while (!done_) {
    usleep(100000);
    const long begun = begun_;
    if (begun == 0 || Now() - begun < kLongest) continue;
    fprintf(stderr, "the call hangs; it ");
    Tell();
    _exit(1);
  }
}
