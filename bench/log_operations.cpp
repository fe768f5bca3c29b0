// Log calls at a level that is off, without and with a record of levels, and one line to the file.
#define TW_LOG_SOURCE "bench"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/shm.h>
#include <unistd.h>

#include <cstdio>
#include <ctime>

#include "bench/operations.h"
#include "tarnwick/log/twdebuglog.h"

namespace {

class DisabledLine : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG, "camera %d does not answer\n", i);
      Use(&g_pDbgLogCfg);  // it may change from call to call
    }
  }
};

class DisabledLineWithRecord : public DisabledLine {
 public:
  DisabledLineWithRecord()
      : m_segment(shmget(TWShmDbgLogIPCKey(), sizeof(TWDbgLogCfg), IPC_CREAT | 0600)) {
    InitDbgCfg();
    if (g_pDbgLogCfg != nullptr) g_pDbgLogCfg->Init(0);
  }
  ~DisabledLineWithRecord() override {
    FreeDbgCfg();
    shmctl(m_segment, IPC_RMID, nullptr);
  }

 private:
  int m_segment;
};

// The least that a gate can be: the level of a category, read each time, and a comparison.
class LoadAndCompare : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      if (__atomic_load_n(&m_level, __ATOMIC_RELAXED) >= LOG_LEVEL_DEBUG) Use(&i);
    }
  }

 private:
  int m_level = LOG_LEVEL_NOTICE;
};

class Line : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) {
      TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "camera %d does not answer\n", 100);
    }
  }
};

// Open, lock, stream, write, unlock and close, and a line of the same form.
class LineFloor : public Operation {
 public:
  void Run(int count) override {
    for (int i = 0; i < count; ++i) WriteLine();
  }

 private:
  static void WriteLine() {
    const int fd = open("/var/log/tarnwick/tarnwick.log", O_WRONLY | O_CREAT | O_APPEND, 0666);
    if (fd < 0) return;
    FILE* const stream = fdopen(fd, "a");
    char buffer[4096];
    setvbuf(stream, buffer, _IOFBF, sizeof(buffer));
    flock(fd, LOCK_EX);
    const time_t now = time(nullptr);
    struct tm local;
    char text[64];
    localtime_r(&now, &local);
    strftime(text, sizeof(text), "%b %e %T", &local);
    const pid_t process = getpid();
    if (process != gettid()) return;
    fprintf(stream, "%s [%d][%s][%s] %s:%d:%s(): camera %d does not answer\n", text, process,
            "camera", "warn", "bench", __LINE__, __func__, 100);
    fflush(stream);
    flock(fd, LOCK_UN);
    fclose(stream);
  }
};

}  // namespace

void AddLogOperations(std::vector<Entry>* entries) {
  entries->push_back({"log_disabled", "log_disabled_floor", 10000, 0, Make<DisabledLine>});
  entries->push_back(
      {"log_disabled_record", "log_disabled_floor", 10000, 0, Make<DisabledLineWithRecord>});
  entries->push_back({"log_disabled_floor", "", 10000, 0, Make<LoadAndCompare>});
  entries->push_back({"log_line", "log_line_floor", 48, 0, Make<Line>});
  entries->push_back({"log_line_floor", "", 48, 0, Make<LineFloor>});
}
