// Loads and unloads the shared library and tells what that does to the shared record.
//
//   load_probe LIBRARY ROUNDS
#include <dlfcn.h>
#include <sys/ipc.h>
#include <sys/shm.h>

#include <cstdio>
#include <cstdlib>

namespace {

// -1: there is no segment.
long Attachments() {
  const int id = shmget(0x18180004, 0, 0);
  shmid_ds status = {};
  if (id == -1 || shmctl(id, IPC_STAT, &status) != 0) return -1;
  return static_cast<long>(status.shm_nattch);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) return 2;
  for (int round = 0; round < atoi(argv[2]); ++round) {
    const long before = Attachments();
    void* library = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) {
      printf("%s\n", dlerror());
      return 1;
    }
    void* const* record = static_cast<void**>(dlsym(library, "g_pDbgLogCfg"));
    if (record == nullptr) return 1;
    printf("record %s, ", *record != nullptr ? "attached" : "null");
    const long loaded = Attachments();
    dlclose(library);
    printf("%+ld %+ld\n", loaded - before, Attachments() - before);
  }
  return 0;
}
