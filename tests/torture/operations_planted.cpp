// Operations that make a mistake when a call of theirs fails, so that the torture shows what it
// would find.
#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <new>
#include <string>
#include <thread>

#include "tests/torture/operations.h"

namespace {

// Kept from the compiler, which may else leave an allocation out.
void* volatile g_block;

bool Allocate() {
  g_block = malloc(10);
  free(g_block);
  return g_block != nullptr;
}

void Leak(Stage& stage) {
  stage.Run([] {
    if (!Allocate()) g_block = malloc(100);
  });
}

void LeftDescriptor(Stage& stage) {
  stage.Run([] {
    if (!Allocate()) open("/dev/null", O_RDONLY | O_CLOEXEC);
  });
}

void LeftFile(Stage& stage) {
  stage.Run([] {
    if (Allocate()) return;
    const int fd = open("/tmp/planted", O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    if (fd >= 0) close(fd);
  });
}

void LeftLock(Stage& stage) {
  static int fd = -1;
  stage.Run([] {
    if (Allocate() || fd >= 0) return;
    fd = open("/var/packages/Tarnwick/etc", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    flock(fd, LOCK_EX);
  });
}

void LeftThread(Stage& stage) {
  stage.Run([] {
    if (!Allocate()) std::thread(pause).detach();
  });
}

void ChangedMask(Stage& stage) {
  stage.Run([] {
    if (Allocate()) return;
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, SIGUSR1);
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
  });
}

void WrongResult(Stage& stage) {
  bool done = false;
  stage.Run([&] { done = Allocate(); });
  stage.ExpectEither(done, done, "the result is wrong");
}

void Exception(Stage& stage) {
  stage.Run([] {
    if (!Allocate()) throw std::bad_alloc();
  });
}

// Fails for good after its first failure.
void Broken(Stage& stage) {
  static bool broken = false;
  stage.Run([] { broken = broken || !Allocate(); });
  stage.Expect(!broken || stage.Struck(), "it works no more");
}

void Death(Stage& stage) {
  stage.Run([] {
    if (!Allocate()) kill(getpid(), SIGKILL);
  });
}

#ifdef TARNWICK_TORTURE_ASAN
void UseAfterFree(Stage& stage) {
  stage.Run([] {
    if (Allocate()) return;
    g_block = malloc(10);
    free(g_block);
    if (g_block != nullptr) *static_cast<volatile char*>(g_block) = 1;
  });
}
#endif

void Hang(Stage& stage) {
  stage.Run([] {
    if (Allocate()) return;
    for (;;) pause();
  });
}

// Takes a short read for the whole, and a signal for the end.
void ShortRead(Stage& stage) {
  char text[4] = "";
  ssize_t count = 0;
  stage.Run([&] {
    const int fd = open("/dev/zero", O_RDONLY | O_CLOEXEC);
    count = read(fd, text, sizeof(text));
    if (fd >= 0) close(fd);
  });
  stage.ExpectEither(count == 4, count == -1, "the read is short");
}

// Its thread may be cancelled between the two calls.
void LostDescriptor(Stage& stage) {
  stage.Run([] {
    const int fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (fd >= 0) close(fd);
  });
}

struct ClosesInItsDestructor {
  ~ClosesInItsDestructor() { close(-1); }
};

// A cancel in a destructor ends the process.
void CancelledDestructor(Stage& stage) {
  stage.Run([] { const ClosesInItsDestructor closes; });
}

// Fills a cache with its first failure, which is no mistake.
void Cache(Stage& stage) {
  static void* cache = nullptr;
  stage.Run([] {
    if (!Allocate() && cache == nullptr) cache = malloc(100);
  });
}

}  // namespace

std::vector<PlantedOperation> PlantedOperations() {
  return {
      {{"planted_leak", Peer::kNone, Leak}, "blocks of memory are left"},
      {{"planted_descriptor", Peer::kNone, LeftDescriptor}, "is left open"},
      {{"planted_file", Peer::kNone, LeftFile}, "the file /tmp/planted is left"},
      {{"planted_lock", Peer::kNone, LeftLock}, "is left locked"},
      {{"planted_thread", Peer::kNone, LeftThread}, "number of threads"},
      {{"planted_mask", Peer::kNone, ChangedMask}, "signal mask"},
      {{"planted_result", Peer::kNone, WrongResult}, "the result is wrong"},
      {{"planted_exception", Peer::kNone, Exception}, "threw std::bad_alloc"},
      {{"planted_broken", Peer::kNone, Broken}, "the next run without a fault"},
      {{"planted_death", Peer::kNone, Death}, "ended by signal"},
#ifdef TARNWICK_TORTURE_ASAN
      {{"planted_use_after_free", Peer::kNone, UseAfterFree}, "ended with exit code"},
#endif
      {{"planted_hang", Peer::kNone, Hang}, "longer than its limit", 1},
      {{"planted_short", Peer::kNone, ShortRead}, "the read is short"},
      {{"planted_cache", Peer::kNone, Cache}, nullptr},
#ifndef TARNWICK_TORTURE_ASAN
      {{"planted_lost_descriptor", Peer::kNone, LostDescriptor},
       "is left open",
       10,
       Fault::kCancelled},
      {{"planted_destructor", Peer::kNone, CancelledDestructor},
       "ended by signal",
       10,
       Fault::kCancelled},
#endif
  };
}
