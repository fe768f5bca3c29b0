// The floors of the log: the least that a line in a file takes, and what the interface asks for.
#include <fcntl.h>
#include <sys/file.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <ctime>

#include "bench/log_works.h"

namespace {

// open, write, close: a text that is ready but for the numbers of its message
class FloorLine : public LineWriter {
 public:
  static constexpr char kPath[] = "/var/log/tarnwick/floor.log";

  void Write(int process, int number) override {
    char line[256];
    const int size = std::snprintf(line, sizeof(line), BENCH_MESSAGE "\n", process, number);
    const int fd = open(kPath, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
    Expect(write(fd, line, static_cast<size_t>(size)) == size, kFloor, "cannot write");
    close(fd);
  }
};

// open, fcntl (the stream's look at the descriptor), flock, getpid, gettid, write, flock, close; a
// stream on a buffer of the stack, with the time and the tags in front of the message
class RequiredLine : public LineWriter {
 public:
  static constexpr char kPath[] = "/var/log/tarnwick/required.log";

  void Write(int process, int number) override {
    const int fd = open(kPath, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
    FILE* const stream = fdopen(fd, "a");
    char buffer[4096];
    setvbuf(stream, buffer, _IOFBF, sizeof(buffer));
    flock(fd, LOCK_EX);
    const pid_t own = getpid();
    Expect(syscall(SYS_gettid) == own, kRequired, "is not in the main thread");
    const time_t now = time(nullptr);
    struct tm local;
    char text[64];
    localtime_r(&now, &local);
    strftime(text, sizeof(text), "%b %e %T", &local);
    std::fprintf(stream, "%s [%d][%s][%s] %s:%d:%s(): " BENCH_MESSAGE "\n", text, own, "camera",
                 "warn", "compare", __LINE__, __func__, process, number);
    std::fflush(stream);
    flock(fd, LOCK_UN);
    std::fclose(stream);
  }
};

template <typename Writer>
std::unique_ptr<LineWriter> Make() {
  return std::make_unique<Writer>();
}

// The least that a gate can be: a load of a level that may change, and a comparison.
void LoadAndCompare(int count) {
  static int level = 3;
  for (int i = 0; i < count; ++i) {
    if (__atomic_load_n(&level, __ATOMIC_RELAXED) >= 5) std::abort();
    Use(&level);
  }
}

void AddFloors(Registry* registry) {
  registry->AddTimed("log_disabled", kFloor, LoadAndCompare);
  registry->AddTimed("log_disabled_record", kFloor, LoadAndCompare);
  AddLogger(registry, {kFloor, FloorLine::kPath, Make<FloorLine>});
  AddLogger(registry, {kRequired, RequiredLine::kPath, Make<RequiredLine>});
}

const Family kFloorLog(AddFloors);

}  // namespace
