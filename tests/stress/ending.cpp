// A process that ends while it logs:
//
//   ending lines   detached threads write lines
//   ending gate    detached threads pass log calls of a level that is off
//   ending static  a static object, older than the first line, logs in its destructor
#include <unistd.h>

#include <atomic>
#include <cstdlib>
#include <cstring>
#include <thread>

#include "tarnwick/log/twdebuglog.h"

namespace {

constexpr int kThreads = 2;

std::atomic<int> running{0};

void WriteLine() {
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "a line\n");
}

void AskTheLevel() {
  TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG3, "no line\n");
}

class LogsAtTheEnd {
 public:
  ~LogsAtTheEnd() {
    if (wanted) WriteLine();
  }
  bool wanted = false;
};
LogsAtTheEnd last;

void LogForEver(void (*log)()) {
  log();
  ++running;
  for (;;) log();
}

}  // namespace

int main(int argc, char** argv) {
  const char* const form = argc > 1 ? argv[1] : "";
  if (strcmp(form, "static") == 0) {
    last.wanted = true;
    WriteLine();
    return 0;
  }
  void (*const log)() = strcmp(form, "gate") == 0 ? AskTheLevel : WriteLine;
  for (int i = 0; i < kThreads; ++i) std::thread(LogForEver, log).detach();
  while (running < kThreads) std::this_thread::yield();
  usleep(static_cast<useconds_t>(getpid() % 7 * 100));
  return 0;
}
