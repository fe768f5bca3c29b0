// The shared record: levels that change while others read them, loading and unloading, and records
// that are not as they should be.
#include <dlfcn.h>
#include <sched.h>
#include <sys/ipc.h>
#include <sys/shm.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tests/stress/level_values.h"
#include "tests/stress/processes.h"
#include "tests/stress/stress.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

constexpr int kReaders = 64;
constexpr double kSeconds = 120;

struct LevelReader {
  std::atomic<bool> ready;
  std::atomic<long> reads;
  std::atomic<long> changes;   // a level was another than at the reader's last look at it
  std::atomic<long> problems;  // a level that nobody wrote
};

// Reads all levels over and over, as the gate of a log call does, with a pause between the rounds.
int ReadLevels(LevelReader& mine, const std::atomic<bool>& stop) {
  FreeDbgCfg();
  InitDbgCfg();  // an attachment of its own, as a daemon has it
  if (g_pDbgLogCfg == nullptr) return 1;
  int last[LOG_CATEG_COUNT] = {};
  while (!stop) {
    for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
      const auto categ = static_cast<LOG_CATEG>(i);
      const int level = g_pDbgLogCfg->Level(categ);
      if (!IsWrittenLevel(level)) ++mine.problems;
      if (level != last[i]) ++mine.changes;
      last[i] = level;
    }
    mine.reads += LOG_CATEG_COUNT;
    mine.ready = true;
    usleep(200);
  }
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
    if (g_pDbgLogCfg->Level(static_cast<LOG_CATEG>(i)) != WrittenLevel(i)) return 2;
  }
  FreeDbgCfg();
  return 0;
}

// Ends with a level in each category that its number tells. Pauses now and then, so that readers
// run in between also where there are fewer processors than readers.
void WriteLevels(int writes) {
  for (int i = 0; i < writes; ++i) {
    g_pDbgLogCfg->SetLevel(static_cast<LOG_CATEG>(i % LOG_CATEG_COUNT), WrittenLevel(i));
    g_pDbgLogCfg->SetTimeScale(i % 2 == 0);
    if (i % 500 == 0) usleep(100);
  }
  for (int i = 0; i < LOG_CATEG_COUNT; ++i) {
    g_pDbgLogCfg->SetLevel(static_cast<LOG_CATEG>(i), WrittenLevel(i));
  }
}

void ReadersOfAMillionWrites(CaseResult& result) {
  const int writes = result.Pick(1000000, 200000);
  const LogCapture log(WrittenLevel(0));
  Shared<LevelReader> readers(kReaders);
  Shared<std::atomic<bool>> stop;
  std::vector<pid_t> pids;
  for (size_t i = 0; i < kReaders; ++i) {
    pids.push_back(Spawn([&, i] { return ReadLevels(readers[i], *stop); }));
  }
  for (size_t i = 0; i < kReaders; ++i) {
    for (int waits = 0; !readers[i].ready && waits < 10000; ++waits) usleep(1000);
  }
  WriteLevels(writes);
  *stop = true;
  long changes = 0;
  for (size_t i = 0; i < kReaders; ++i) {
    const auto status = WaitFor(pids[i], kSeconds);
    result.Expect(status == 0, "reader " + std::to_string(i) + ": " + StatusText(status));
    result.Expect(readers[i].problems == 0, "reader " + std::to_string(i) + " saw torn levels");
    result.Expect(readers[i].changes > 0, "reader " + std::to_string(i) + " saw no change");
    result.Checked(readers[i].reads);
    changes += readers[i].changes;
  }
  result.Done("64 readers, %d writes, %ld changes seen", writes, changes);
}

// The attachments of the record's segment; -1 when there is none.
long Attachments() {
  const int id = shmget(kRecordKey, 0, 0);
  shmid_ds status = {};
  if (id == -1 || shmctl(id, IPC_STAT, &status) != 0) return -1;
  return static_cast<long>(status.shm_nattch);
}

// What a load and an unload of the shared library did.
struct LoadOutcome {
  bool loaded = false;
  bool attached = false;
  long during = 0;
  long after = 0;
};

LoadOutcome LoadAndUnload() {
  LoadOutcome outcome;
  void* const library = dlopen(TARNWICK_LIBRARY, RTLD_NOW | RTLD_LOCAL);
  if (library == nullptr) return outcome;
  auto* const record = static_cast<TWDbgLogCfg**>(dlsym(library, "g_pDbgLogCfg"));
  outcome.loaded = record != nullptr;
  outcome.attached = record != nullptr && *record != nullptr;
  outcome.during = Attachments();
  dlclose(library);
  outcome.after = Attachments();
  return outcome;
}

long MappedBytes() {
  long pages = 0;
  FILE* const file = fopen("/proc/self/statm", "re");
  if (file == nullptr || fscanf(file, "%ld", &pages) != 1) pages = 0;
  if (file != nullptr) fclose(file);
  return pages * 4096;
}

void LoadManyTimes(int rounds, bool attached, CaseResult& result) {
  const long before = Attachments();
  LoadAndUnload();  // what stays of the first time, such as the C library's lists, is no leak
  const long mapped = MappedBytes();
  const DescriptorGuard descriptors;
  for (int i = 0; i < rounds; ++i) {
    const LoadOutcome outcome = LoadAndUnload();
    result.Checked(1);
    if (!outcome.loaded) return result.Fail("the library cannot be loaded");
    result.Expect(outcome.attached == attached, attached ? "not attached" : "attached");
    result.Expect(!attached || outcome.during == before + 1, "no attachment was added");
    result.Expect(outcome.after == before, "an attachment is left");
  }
  const long grown = MappedBytes() - mapped;
  result.Expect(grown <= (1 << 20), std::to_string(grown) + " bytes of memory are left");
}

void LoadAndUnloadManyTimes(CaseResult& result) {
  const int rounds = result.Pick(10000, 300);
  LoadManyTimes(rounds / 10, false, result);
  const LogCapture log(3);
  Shared<std::atomic<bool>> stop;
  const pid_t writer = Spawn([&] {
    while (!*stop) WriteLevels(1000);
    return 0;
  });
  LoadManyTimes(rounds, true, result);
  *stop = true;
  const auto status = WaitFor(writer, kSeconds);
  result.Expect(status == 0, "the writer of levels: " + StatusText(status));
  result.Done("%d loads without a record, %d with one that changes", rounds / 10, rounds);
}

constexpr int kOtherwiseAttached = 5;

// Everything that a daemon does with the record, in a process of its own: attaches it, reads and
// writes levels, loads and saves settings, logs, and loads and unloads the library.
int UseRecord(bool attached) {
  FreeDbgCfg();
  InitDbgCfg();
  if ((g_pDbgLogCfg != nullptr) != attached) return kOtherwiseAttached;
  if (g_pDbgLogCfg != nullptr) {
    for (int i = -1; i <= LOG_CATEG_COUNT; ++i) {
      const auto categ = static_cast<LOG_CATEG>(i);
      g_pDbgLogCfg->SetLevel(categ, g_pDbgLogCfg->Level(categ));
    }
    g_pDbgLogCfg->SaveDbgLogSettings();
    g_pDbgLogCfg->Init(0);
  }
  TW_LOG(LOG_CATEG_SHARE_LIB, LOG_LEVEL_ALARM, "alive\n");
  FreeDbgCfg();
  return LoadAndUnload().loaded ? 0 : 1;
}

// Makes a segment of `size` bytes and mode `mode` and lets processes use it, which give up the
// rights of root first when `drop` says so.
void UseOddRecord(size_t size, int mode, bool drop, CaseResult& result) {
  constexpr int kProcesses = 4;
  constexpr int kReadAndWrite = 0600;
  const bool attached = !drop || (mode & kReadAndWrite) == kReadAndWrite;
  RemoveSharedRecord();
  unlink(kMainLog);
  const int id = shmget(kRecordKey, size, IPC_CREAT | IPC_EXCL | mode);
  if (id == -1) return result.Fail("no segment of " + std::to_string(size) + " bytes");
  for (int i = 0; i < kProcesses; ++i) {
    const pid_t pid = Spawn([=] { return !drop || DropCapabilities() ? UseRecord(attached) : 9; });
    const auto status = WaitFor(pid, kSeconds);
    result.Checked(1);
    result.Expect(status == 0, std::to_string(size) + " bytes, mode " + std::to_string(mode) +
                                   ": " + StatusText(status));
  }
  shmid_ds status = {};
  result.Expect(shmctl(id, IPC_STAT, &status) == 0 && status.shm_nattch == 0,
                "an attachment is left");
  result.Expect(ParseLog(ReadFile(kMainLog)).size() == kProcesses, "lines are missing");
  shmctl(id, IPC_RMID, nullptr);
}

void WrongSize(CaseResult& result) {
  for (const size_t size : {1u, 4u, 100u, 299u, 300u, 301u, 4096u, 4097u, 1u << 20}) {
    UseOddRecord(size, 0666, false, result);
  }
  result.Done("9 sizes from 1 byte to 1 MiB, 4 processes each");
}

void ReadOnlyRecord(CaseResult& result) {
  for (const int mode : {0, 0400, 0444, 0200, 0600, 0666}) {
    UseOddRecord(300, mode, true, result);
    UseOddRecord(300, mode, false, result);
  }
  result.Done("6 modes, with and without the rights of root");
}

// The record goes, and a new one comes, under readers that stay attached to the old one.
void RemovedWhileAttached(CaseResult& result) {
  const int rounds = result.Pick(500, 50);
  for (int round = 0; round < rounds; ++round) {
    SharedRecord first(WrittenLevel(0));
    Shared<LevelReader> readers(8);
    Shared<std::atomic<bool>> stop;
    std::vector<pid_t> pids;
    for (size_t i = 0; i < 8; ++i) {
      pids.push_back(Spawn([&, i] { return ReadLevels(readers[i], *stop) == 1 ? 1 : 0; }));
    }
    for (size_t i = 0; i < 8; ++i) {
      for (int waits = 0; !readers[i].ready && waits < 10000; ++waits) usleep(500);
    }
    RemoveSharedRecord();
    const LoadOutcome without = LoadAndUnload();
    result.Expect(without.loaded && !without.attached, "a removed record was attached");
    const SharedRecord second(3);
    const LoadOutcome with = LoadAndUnload();
    result.Expect(with.attached && with.after == 1, "the new record was not attached");
    *stop = true;
    for (const pid_t pid : pids) {
      const auto status = WaitFor(pid, kSeconds);
      result.Checked(1);
      result.Expect(status == 0, "a reader of the removed record: " + StatusText(status));
    }
  }
  result.Done("%d records removed under 8 readers, a new one made", rounds);
}

}  // namespace

std::vector<StressCase> LevelsCases() {
  return {
      {"levels", "64 readers, one writer", ReadersOfAMillionWrites},
      {"levels", "load and unload of the library", LoadAndUnloadManyTimes},
      {"levels", "record of the wrong size", WrongSize},
      {"levels", "record that is read-only", ReadOnlyRecord},
      {"levels", "record removed while attached", RemovedWhileAttached},
  };
}
