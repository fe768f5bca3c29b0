#include "tarnwick/platform/fork_guard.h"

#include <fcntl.h>
#include <pthread.h>
#include <stdio_ext.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <ctime>

#include "tarnwick/platform/cancel.h"
#include "tarnwick/platform/unique.h"

namespace tarnwick {

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

// The files that are open now, and the mutex around a change of the list. A fork does not ask for it,
// since a thread that has it may be in a signal handler that forks as well, and wait for the first
// fork's end: at each instruction of a change the list can be read.
ForkClosedFile* g_files = nullptr;
pthread_mutex_t g_list = PTHREAD_MUTEX_INITIALIZER;
thread_local bool t_has_list = false;

// Of the fork that has g_fork.
bool g_lock_is_held = false;

bool g_locks_are_lost = false;

bool IsAlone(int kind) {
  return g_holds[kind] == t_holds[kind];
}

long NanosecondsSince(const struct timespec& start) {
  struct timespec now;
  clock_gettime(CLOCK_MONOTONIC, &now);
  return (now.tv_sec - start.tv_sec) * 1000000000L + (now.tv_nsec - start.tv_nsec);
}

// Results: whether a lock of the C library may be held at the fork. A hold that begins later waits for
// the fork's end, and is counted for a moment before.
bool WaitForOtherHolds() {
  const NoCancel no_cancel;
  const struct timespec pause = {0, kPauseNs};
  struct timespec start;
  clock_gettime(CLOCK_MONOTONIC, &start);
  while (!(IsAlone(ForkGuard::kDescriptor) && IsAlone(ForkGuard::kLibraryLock))) {
    if (NanosecondsSince(start) >= kLongestWaitNs) return g_holds[ForkGuard::kLibraryLock] != 0;
    nanosleep(&pause, nullptr);
  }
  return t_holds[ForkGuard::kLibraryLock] != 0;
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
  const ErrnoSaver keeper;
  ++g_forks;
  pthread_mutex_lock(&g_fork);
  g_lock_is_held = WaitForOtherHolds();
}

void EndFork() {
  if (t_forks > 1) {
    --t_forks;
    return;
  }
  pthread_mutex_unlock(&g_fork);
  --g_forks;
  --t_forks;
}

}  // namespace

// The threads that opened them do not exist in the child. Closing leaves their locks to the parent.
void CloseFilesInChild() {
  const ErrnoSaver keeper;
  for (const ForkClosedFile* file = g_files; file != nullptr; file = file->m_next) {
    if (file->m_stream != nullptr) __fpurge(file->m_stream);
    close(file->m_fd);
  }
  g_files = nullptr;
}

namespace {

// A hold of this thread itself goes on, in a signal handler's child too, and so does its lock.
void StartChild() {
  CloseFilesInChild();
  if (!t_has_list) g_list = PTHREAD_MUTEX_INITIALIZER;  // another thread may have had it
  // The fork of a signal handler inside another fork has not waited.
  const bool inner = t_forks > 1;
  if (inner ? g_holds[ForkGuard::kLibraryLock] != 0 : g_lock_is_held) g_locks_are_lost = true;
  for (int kind = 0; kind < kKinds; ++kind) g_holds[kind] = t_holds[kind];
  g_forks = 1;
  EndFork();
}

__attribute__((constructor)) void RegisterForkHandlers() {
  pthread_atfork(PrepareFork, EndFork, StartChild);
}

// A hold inside another one must not wait: the fork waits for the outer one.
bool MayWait() {
  return t_forks == 0 && t_holds[ForkGuard::kDescriptor] == 0 &&
         t_holds[ForkGuard::kLibraryLock] == 0;
}

bool IsRegular(int fd) {
  struct stat attributes;
  if (fstat(fd, &attributes) != 0) return false;
  if (S_ISREG(attributes.st_mode)) return true;
  errno = ENXIO;  // what open gives for a FIFO without a reader
  return false;
}

// A regular file that is leased is waited for, as without O_NONBLOCK (F_SETLEASE in fcntl(2)).
int OpenRegular(const char* path, int flags, mode_t mode) {
  flags |= O_NOCTTY;
  int opened = open(path, flags | O_NONBLOCK, mode);
  if (opened < 0 && errno == EWOULDBLOCK) opened = open(path, flags, mode);
  UniqueFd fd(opened);
  return fd.Valid() && IsRegular(fd.Get()) ? fd.Release() : -1;
}

// What stdio calls for a stream of an ForkClosedFile. A result of 0 tells it of a failure.
ssize_t WriteToFile(void* file, const char* data, size_t size) {
  const int fd = static_cast<ForkClosedFile*>(file)->Get();
  size_t written = 0;
  while (written < size) {
    const ssize_t count = write(fd, data + written, size - written);
    if (count <= 0) break;
    written += static_cast<size_t>(count);
  }
  return static_cast<ssize_t>(written);
}

}  // namespace

ForkGuard::ForkGuard(Kind kind) : m_kind(kind) {
  ++g_holds[kind];
  while (g_forks != 0 && MayWait()) {
    --g_holds[kind];
    pthread_mutex_lock(&g_fork);
    pthread_mutex_unlock(&g_fork);
    ++g_holds[kind];
  }
  ++t_holds[kind];
}

ForkGuard::~ForkGuard() {
  --t_holds[m_kind];
  --g_holds[m_kind];
}

bool ForkGuard::LocksAreLost() {
  return g_locks_are_lost;
}

ForkClosedFile::ForkClosedFile(const char* path, int flags, mode_t mode) : m_fd(-1) {
  if (path == nullptr) {
    errno = EFAULT;  // what open gives for a path that is none
    return;
  }
  const ForkGuard hold(ForkGuard::kDescriptor);
  m_fd = OpenRegular(path, flags, mode);
  if (Valid()) Register();
}

ForkClosedFile::~ForkClosedFile() {
  if (!Valid()) return;
  const ErrnoSaver keeper;
  const ForkGuard hold(ForkGuard::kDescriptor);
  Unregister();
  if (m_stream != nullptr) fclose(m_stream);
  close(m_fd);
}

void ForkClosedFile::Register() {
  LockList();
  m_next = g_files;
  m_link = &g_files;
  if (m_next != nullptr) m_next->m_link = &m_next;
  std::atomic_signal_fence(std::memory_order_release);  // a handler may fork here
  g_files = this;
  UnlockList();
}

void ForkClosedFile::Unregister() {
  LockList();
  *m_link = m_next;
  if (m_next != nullptr) m_next->m_link = m_link;
  UnlockList();
}

// fdopen asks the kernel for the flags of the descriptor, which are known here: the call goes into
// the look at the file's type instead.
bool ForkClosedFile::MakeStream(char* buffer, size_t size) {
  m_stream = fopencookie(this, "a", {nullptr, WriteToFile, nullptr, nullptr});
  if (m_stream != nullptr) setvbuf(m_stream, buffer, _IOFBF, size);
  return m_stream != nullptr;
}

bool ForkClosedFile::Flush() {
  if (fflush(m_stream) == 0 && ferror(m_stream) == 0) return true;
  __fpurge(m_stream);
  return false;
}

}  // namespace tarnwick
