// The library's log: calls at a level that is off, without and with a record of levels, and lines.
#define TW_LOG_SOURCE "compare"

#include <sys/shm.h>

#include "bench/log_works.h"
#include "tarnwick/log/twdebuglog.h"

namespace {

void CallDisabled(int count) {
  for (int i = 0; i < count; ++i) {
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG, BENCH_MESSAGE "\n", 0, i);
    Use(&g_pDbgLogCfg);
  }
}

// With a record of its own in this namespace, as a daemon finds the product's.
class DisabledWithRecord : public TimedContender {
 public:
  DisabledWithRecord()
      : m_segment(shmget(TWShmDbgLogIPCKey(), sizeof(TWDbgLogCfg), IPC_CREAT | 0600)) {
    InitDbgCfg();
    Expect(g_pDbgLogCfg != nullptr, kLibrary, "has no record");
    g_pDbgLogCfg->Init(0);
  }
  ~DisabledWithRecord() override {
    FreeDbgCfg();
    shmctl(m_segment, IPC_RMID, nullptr);
  }

 private:
  void Run(int count) override { CallDisabled(count); }
  const int m_segment;
};

class LibraryLine : public LineWriter {
 public:
  void Write(int process, int number) override {
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, BENCH_MESSAGE "\n", process, number);
  }
};

void AddLibraryLog(Registry* registry) {
  registry->AddTimed("log_disabled", kLibrary, CallDisabled);
  registry->Add("log_disabled_record", kLibrary,
                [] { return std::make_unique<DisabledWithRecord>(); });
  AddLogger(registry,
            {kLibrary, "/var/log/tarnwick/tarnwick.log",
             []() -> std::unique_ptr<LineWriter> { return std::make_unique<LibraryLine>(); }});
}

const Family kLibraryLog(AddLibraryLog);

}  // namespace
