#include "tarnwick/platform/fork_hold.h"

#include <fcntl.h>
#include <pthread.h>
#include <stdio_ext.h>
#include <unistd.h>

#include <cerrno>

#include "tarnwick/platform/owned.h"

namespace {

pthread_mutex_t g_mutex = PTHREAD_MUTEX_INITIALIZER;

// How often this thread has locked it. A recursive mutex would know its owner by a thread id that a
// forked child's thread does not have. Counted before the mutex is locked and after it is unlocked:
// a signal handler that forks in between goes on without it instead of waiting for itself.
thread_local int t_locks = 0;

// The files that are open now. Under the mutex.
UninheritedFile* g_files = nullptr;

void Lock() {
  if (++t_locks == 1) pthread_mutex_lock(&g_mutex);
}

void Unlock() {
  if (t_locks == 1) pthread_mutex_unlock(&g_mutex);
  --t_locks;
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

void StartChild() {
  CloseInheritedFiles();
  Unlock();
}

__attribute__((constructor)) void RegisterForkHandlers() {
  pthread_atfork(Lock, Unlock, StartChild);
}

}  // namespace

ForkHold::ForkHold() {
  Lock();
}

ForkHold::~ForkHold() {
  Unlock();
}

UninheritedFile::UninheritedFile(const char* path, int flags, mode_t mode) : m_fd(-1) {
  if (path == nullptr) {
    errno = EFAULT;  // what open gives for a path that is none
    return;
  }
  const ForkHold hold;
  m_fd = open(path, flags, mode);
  if (!Valid()) return;
  m_next = g_files;
  m_link = &g_files;
  if (m_next != nullptr) m_next->m_link = &m_next;
  g_files = this;
}

UninheritedFile::~UninheritedFile() {
  if (!Valid()) return;
  const ErrnoKeeper keeper;
  const ForkHold hold;
  *m_link = m_next;
  if (m_next != nullptr) m_next->m_link = m_link;
  if (m_stream != nullptr) {
    fclose(m_stream);
  } else {
    close(m_fd);
  }
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
