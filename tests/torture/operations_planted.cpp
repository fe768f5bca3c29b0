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

void Leak(TestRun& test) {
  test.Run([] {
    if (!Allocate()) g_block = malloc(100);
  });
}

void LeftDescriptor(TestRun& test) {
  test.Run([] {
    if (!Allocate()) open("/dev/null", O_RDONLY | O_CLOEXEC);
  });
}

void LeftFile(TestRun& test) {
  test.Run([] {
    if (Allocate()) return;
    const int fd = open("/tmp/planted", O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
    if (fd >= 0) close(fd);
  });
}

void LeftLock(TestRun& test) {
  static int fd = -1;
  test.Run([] {
    if (Allocate() || fd >= 0) return;
    fd = open("/var/packages/Tarnwick/etc", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    flock(fd, LOCK_EX);
  });
}

void LeftThread(TestRun& test) {
  test.Run([] {
    if (!Allocate()) std::thread(pause).detach();
  });
}

void ChangedMask(TestRun& test) {
  test.Run([] {
    if (Allocate()) return;
    sigset_t set;
    sigemptyset(&set);
    sigaddset(&set, SIGUSR1);
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
  });
}

void WrongResult(TestRun& test) {
  bool done = false;
  test.Run([&] { done = Allocate(); });
  test.ExpectEither(done, done, "the result is wrong");
}

void Exception(TestRun& test) {
  test.Run([] {
    if (!Allocate()) throw std::bad_alloc();
  });
}

// Fails for good after its first failure.
void Broken(TestRun& test) {
  static bool broken = false;
  test.Run([] { broken = broken || !Allocate(); });
  test.Expect(!broken || test.Struck(), "it works no more");
}

void Death(TestRun& test) {
  test.Run([] {
    if (!Allocate()) kill(getpid(), SIGKILL);
  });
}

#ifdef TARNWICK_TORTURE_ASAN
void UseAfterFree(TestRun& test) {
  test.Run([] {
    if (Allocate()) return;
    g_block = malloc(10);
    free(g_block);
    if (g_block != nullptr) *static_cast<volatile char*>(g_block) = 1;
  });
}
#endif

void Hang(TestRun& test) {
  test.Run([] {
    if (Allocate()) return;
    for (;;) pause();
  });
}

// Takes a short read for the whole, and a signal for the end.
void ShortRead(TestRun& test) {
  char text[4] = "";
  ssize_t count = 0;
  test.Run([&] {
    const int fd = open("/dev/zero", O_RDONLY | O_CLOEXEC);
    count = read(fd, text, sizeof(text));
    if (fd >= 0) close(fd);
  });
  test.ExpectEither(count == 4, count == -1, "the read is short");
}

// Its thread may be cancelled between the two calls.
[[maybe_unused]] void LostDescriptor(TestRun& test) {
  test.Run([] {
    const int fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (fd >= 0) close(fd);
  });
}

struct ClosesInItsDestructor {
  ~ClosesInItsDestructor() { close(-1); }
};

// A cancel in a destructor ends the process.
[[maybe_unused]] void CancelledDestructor(TestRun& test) {
  test.Run([] { const ClosesInItsDestructor closes; });
}

// Fills a cache with its first failure, which is no mistake.
void Cache(TestRun& test) {
  static void* cache = nullptr;
  test.Run([] {
    if (!Allocate() && cache == nullptr) cache = malloc(100);
  });
}

}  // namespace

std::vector<PlantedOperation> PlantedOperations() {
  return {
      {{"planted_leak", PeerKind::kNone, Leak}, "blocks of memory are left"},
      {{"planted_descriptor", PeerKind::kNone, LeftDescriptor}, "is left open"},
      {{"planted_file", PeerKind::kNone, LeftFile}, "the file /tmp/planted is left"},
      {{"planted_lock", PeerKind::kNone, LeftLock}, "is left locked"},
      {{"planted_thread", PeerKind::kNone, LeftThread}, "number of threads"},
      {{"planted_mask", PeerKind::kNone, ChangedMask}, "signal mask"},
      {{"planted_result", PeerKind::kNone, WrongResult}, "the result is wrong"},
      {{"planted_exception", PeerKind::kNone, Exception}, "threw std::bad_alloc"},
      {{"planted_broken", PeerKind::kNone, Broken}, "the next run without a fault"},
      {{"planted_death", PeerKind::kNone, Death}, "ended by signal"},
#ifdef TARNWICK_TORTURE_ASAN
      {{"planted_use_after_free", PeerKind::kNone, UseAfterFree}, "ended with exit code"},
#endif
      {{"planted_hang", PeerKind::kNone, Hang}, "longer than its limit", 1},
      {{"planted_short", PeerKind::kNone, ShortRead}, "the read is short"},
      {{"planted_cache", PeerKind::kNone, Cache}, nullptr},
#ifndef TARNWICK_TORTURE_ASAN
      {{"planted_lost_descriptor", PeerKind::kNone, LostDescriptor},
       "is left open",
       10,
       Fault::kCancelled},
      {{"planted_destructor", PeerKind::kNone, CancelledDestructor},
       "ended by signal",
       10,
       Fault::kCancelled},
#endif
  };
}
