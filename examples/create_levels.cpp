// Creates the shared record of log levels, as the product's managing process does before it starts
// the daemons: the record must be there when a daemon loads the library.
#include <sys/ipc.h>
#include <sys/shm.h>

#include <cstdio>

#include "tarnwick/log/twdebuglog.h"

namespace {

bool CreateRecord() {
  const int id = shmget(TWShmDbgLogIPCKey(), sizeof(TWDbgLogCfg), IPC_CREAT | IPC_EXCL | 0660);
  if (id == -1) {
    std::perror("create_levels: shmget");
    return false;
  }
  InitDbgCfg();
  return g_pDbgLogCfg != nullptr;
}

}  // namespace

int main() {
  if (!CreateRecord()) return 1;
  if (g_pDbgLogCfg->Init(0) == 0) {
    std::puts("record created with the saved levels");
    return 0;
  }
  // The first start of a machine: nothing is saved yet.
  if (g_pDbgLogCfg->SaveDbgLogSettings() != 0) {
    std::perror("create_levels: cannot save the levels");
    return 1;
  }
  std::puts("record created, every category at notice");
  return 0;
}
