// What the hostile XML may not touch, and the memory that libxml2 holds meanwhile.
#ifndef TARNWICK_TESTS_HOSTILE_XML_CANARIES_H_
#define TARNWICK_TESTS_HOSTILE_XML_CANARIES_H_

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <malloc.h>
#include <poll.h>
#include <sys/inotify.h>
#include <sys/socket.h>
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>
#include <vector>

#include "tests/hostile/hostile_util.h"
#include "tests/support/files.h"
#include "tests/support/ports.h"

// Counts what libxml2 holds.
inline std::atomic<long> held{0};
inline std::atomic<long> most_held{0};

inline void Hold(void* block) {
  const long now = held += static_cast<long>(malloc_usable_size(block));
  long most = most_held;
  while (now > most && !most_held.compare_exchange_weak(most, now)) {
  }
}

inline void LetGo(void* block) {
  if (block != nullptr) held -= static_cast<long>(malloc_usable_size(block));
}

inline void CountedFree(void* block) {
  LetGo(block);
  free(block);
}

inline void* CountedMalloc(size_t size) {
  void* const block = malloc(size);
  if (block != nullptr) Hold(block);
  return block;
}

inline void* CountedRealloc(void* block, size_t size) {
  LetGo(block);
  void* const grown = realloc(block, size);
  if (grown != nullptr) Hold(grown);
  return grown;
}

inline char* CountedStrdup(const char* text) {
  char* const copy = strdup(text);
  if (copy != nullptr) Hold(copy);
  return copy;
}

// A file and a port that nobody may touch.
class Canaries {
 public:
  Canaries() : watch_(inotify_init1(IN_NONBLOCK | IN_CLOEXEC)), listener_(BindLoopback(&port_)) {
    WriteFile(File(), "<!ENTITY canary 'sang'><!ELEMENT a ANY>");
    EXPECT_GE(inotify_add_watch(watch_, directory_.Path().c_str(), IN_OPEN | IN_ACCESS), 0);
    EXPECT_EQ(listen(listener_, 16), 0);
  }

  ~Canaries() {
    close(watch_);
    close(listener_);
  }

  Canaries(const Canaries&) = delete;
  Canaries& operator=(const Canaries&) = delete;

  std::string File() const { return directory_.File("canary.dtd"); }
  std::string Url() const { return "http://127.0.0.1:" + std::to_string(port_) + "/canary.dtd"; }

  bool FileWasOpened() const { return IsReadable(watch_); }
  bool PortWasConnected() const { return IsReadable(listener_); }

  // Waits for a connection and closes it. Results: false when none came.
  bool RefuseConnection() const {
    pollfd waiting = {listener_, POLLIN, 0};
    if (poll(&waiting, 1, 10000) <= 0) return false;
    return close(accept(listener_, nullptr, nullptr)) == 0;
  }

  // The document with the canaries' names in place of FILE and URL.
  std::string Named(std::string document) const {
    Replace(&document, "FILE", "file://" + File());
    Replace(&document, "PATH", File());
    Replace(&document, "URL", Url());
    return document;
  }

 private:
  static bool IsReadable(int fd) {
    pollfd waiting = {fd, POLLIN, 0};
    return poll(&waiting, 1, 0) > 0;
  }

  static void Replace(std::string* text, const std::string& mark, const std::string& by) {
    for (size_t i; (i = text->find(mark)) != std::string::npos;) text->replace(i, mark.size(), by);
  }

  TempDir directory_;
  int port_ = 0;
  int watch_;
  int listener_;
};

#endif  // TARNWICK_TESTS_HOSTILE_XML_CANARIES_H_
