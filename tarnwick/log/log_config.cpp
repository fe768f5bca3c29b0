// The shared record: attaching it and its fields.
#include <sys/shm.h>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/unloading.h"

using namespace tarnwick;

TWDbgLogCfg* g_pDbgLogCfg = nullptr;

key_t TWShmDbgLogIPCKey() {
  return 0x18180004;
}

TWDbgLogCfg* TWShmDbgLogCfgAt() {
  // Size 0 and no flags: only a segment that the managing process has made.
  const int id = shmget(TWShmDbgLogIPCKey(), 0, 0);
  if (id == -1) return nullptr;
  void* const address = shmat(id, nullptr, 0);
  // shmat's error value is the address -1.
  if (reinterpret_cast<intptr_t>(address) == -1) return nullptr;
  return static_cast<TWDbgLogCfg*>(address);
}

__attribute__((constructor)) void InitDbgCfg() {
  g_pDbgLogCfg = TWShmDbgLogCfgAt();
}

void FreeDbgCfg() {
  if (g_pDbgLogCfg == nullptr) return;
  shmdt(g_pDbgLogCfg);
  g_pDbgLogCfg = nullptr;
}

namespace {

__attribute__((destructor)) void DetachRecord() {
  if (IsBeingUnloaded()) FreeDbgCfg();
}

}  // namespace

bool TWDbgLogCfg::TimeScale() const {
  return __atomic_load_n(&m_bTimeScale, __ATOMIC_RELAXED) != 0;
}

void TWDbgLogCfg::SetTimeScale(bool milliseconds) {
  __atomic_store_n(&m_bTimeScale, static_cast<uint8_t>(milliseconds), __ATOMIC_RELAXED);
}

void TWDbgLogCfg::SetLevel(LOG_CATEG categ, int level) {
  if (categ < 0 || categ >= LOG_CATEG_COUNT) return;
  __atomic_store_n(&m_levels[categ], level, __ATOMIC_RELAXED);
}
