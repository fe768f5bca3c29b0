#include "tarnwick/platform/fork_hold.h"

#include <fcntl.h>
#include <pthread.h>
#include <stdio_ext.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <ctime>

#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/owned.h"

namespace {

constexpr int kKinds = 2;

// How long a fork waits for the holds of other threads, and how often it looks.
constexpr long kLongestWaitNs = 100L * 1000 * 1000;
constexpr long kPauseNs = 50L * 1000;

// The holds of all threads, and of this one. A hold is counted here first and there last, so that a
// signal handler that forks in between takes its own thread's hold for another's.
std::atomic<int> g_holds[kKinds];
thread_local int t_holds[kKinds];

// Forks that wait or run. While there is one, holds that begin wait for g_fork.
std::atomic<int> g_forks{0};
pthread_mutex_t g_fork = PTHREAD_MUTEX_INITIALIZER;

// How often this thread is in fork(): in a signal handler more than once.
thread_local int t_forks = 0;

// The files that are open now, and the mutex around a change of the list. It is held for a few
// instructions; a signal handler that forks in one of them finds a list that can be read.
UninheritedFile* g_files = nullptr;
pthread_mutex_t g_list = PTHREAD_MUTEX_INITIALIZER;
thread_local bool t_has_list = false;

bool g_locks_are_lost = false;

bool IsAlone(int kind) {
  return g_holds[kind] == t_holds[kind];
}

long NanosecondsSince(const struct timespec& start) {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return (now.tv_sec - start.tv_sec) * 1000000000L + (now.tv_nsec - start.tv_nsec);
}

void WaitForOtherHolds() {
  const NoCancel no_cancel;
  const struct timespec pause = {0, kPauseNs};
  struct timespec start;
  clock_gettime(CLOCK_MONOTONIC, &start);
  while (!(IsAlone(ForkHold::kDescriptor) && IsAlone(ForkHold::kLibraryLock)) &&
         NanosecondsSince(start) < kLongestWaitNs) {
    nanosleep(&pause, nullptr);
  }
}

void LockList() {
  t_has_list = true;
  pthread_mutex_lock(&g_list);
}

void UnlockList() {
  pthread_mutex_unlock(&g_list);
  t_has_list = false;
}

void PrepareFork() {
  if (t_forks++ > 0) return;
  const ErrnoKeeper keeper;
  ++g_forks;
  pthread_mutex_lock(&g_fork);
  WaitForOtherHolds();
  if (!t_has_list) pthread_mutex_lock(&g_list);
}

void EndFork() {
  if (t_forks > 1) {
    --t_forks;
    return;
  }
  if (!t_has_list) pthread_mutex_unlock(&g_list);
  pthread_mutex_unlock(&g_fork);
  --g_forks;
  --t_forks;
}

}  // namespace

// The threads that opened them do not exist in the child. Closing leaves their locks to the parent.
void CloseInheritedFiles() {
  const ErrnoKeeper keeper;
  for (const UninheritedFile* file = g_files; file != nullptr; file = file->m_next) {
    if (file->m_stream != nullptr) __fpurge(file->m_stream);
    close(file->m_fd);
  }
  g_files = nullptr;
}

namespace {

// A hold of this thread itself goes on, in a signal handler's child too, and so does its lock.
void StartChild() {
  CloseInheritedFiles();
  if (g_holds[ForkHold::kLibraryLock] != 0) g_locks_are_lost = true;
  for (int kind = 0; kind < kKinds; ++kind) g_holds[kind] = t_holds[kind];
  g_forks = 1;
  EndFork();
}

__attribute__((constructor)) void RegisterForkHandlers() {
  pthread_atfork(PrepareFork, EndFork, StartChild);
}

// A hold inside another one must not wait: the fork waits for the outer one.
bool MayWait() {
  return t_forks == 0 && t_holds[ForkHold::kDescriptor] == 0 &&
         t_holds[ForkHold::kLibraryLock] == 0;
}

}  // namespace

ForkHold::ForkHold(Kind kind) : m_kind(kind) {
  ++g_holds[kind];
  while (g_forks != 0 && MayWait()) {
    --g_holds[kind];
    pthread_mutex_lock(&g_fork);
    pthread_mutex_unlock(&g_fork);
    ++g_holds[kind];
  }
  ++t_holds[kind];
}

ForkHold::~ForkHold() {
  --t_holds[m_kind];
  --g_holds[m_kind];
}

bool ForkHold::LocksAreLost() {
  return g_locks_are_lost;
}

UninheritedFile::UninheritedFile(const char* path, int flags, mode_t mode) : m_fd(-1) {
  if (path == nullptr) {
    errno = EFAULT;  // what open gives for a path that is none
    return;
  }
  const ForkHold hold(ForkHold::kDescriptor);
  m_fd = open(path, flags, mode);
  if (Valid()) Register();
}

UninheritedFile::~UninheritedFile() {
  if (!Valid()) return;
  const ErrnoKeeper keeper;
  const ForkHold hold(ForkHold::kDescriptor);
  Unregister();
  if (m_stream != nullptr) {
    fclose(m_stream);
  } else {
    close(m_fd);
  }
}

void UninheritedFile::Register() {
  LockList();
  m_next = g_files;
  m_link = &g_files;
  if (m_next != nullptr) m_next->m_link = &m_next;
  g_files = this;
  UnlockList();
}

void UninheritedFile::Unregister() {
  LockList();
  *m_link = m_next;
  if (m_next != nullptr) m_next->m_link = m_link;
  UnlockList();
}

bool UninheritedFile::MakeStream(const char* mode, char* buffer, size_t size) {
  FILE* const stream = fdopen(m_fd, mode);
  if (stream != nullptr) setvbuf(stream, buffer, _IOFBF, size);
  m_stream = stream;
  return stream != nullptr;
}

bool UninheritedFile::Flush() {
  if (fflush(m_stream) == 0 && ferror(m_stream) == 0) return true;
  __fpurge(m_stream);
  return false;
}
