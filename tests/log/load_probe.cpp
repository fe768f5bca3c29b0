// Loads and unloads the shared library and tells what that does to the shared record.
//
//   load_probe LIBRARY ROUNDS
//   load_probe LIBRARY ROUNDS names    the bytes of heap that are left in use, in place of that; the
//   load_probe LIBRARY ROUNDS none     library has built the names of the categories, or has not
#include <dlfcn.h>
#include <malloc.h>
#include <sys/ipc.h>
#include <sys/shm.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>

namespace {

// -1: there is no segment.
long Attachments() {
  const int id = shmget(0x18180004, 0, 0);
  shmid_ds status = {};
  if (id == -1 || shmctl(id, IPC_STAT, &status) != 0) return -1;
  return static_cast<long>(status.shm_nattch);
}

// Loads and unloads the library. Results: the bytes of heap that are in use then.
size_t HeapAfter(const char* path, bool with_names) {
  void* const library = dlopen(path, RTLD_NOW | RTLD_LOCAL);
  void* const name_of = library != nullptr ? dlsym(library, "_Z9TWLogName9LOG_CATEG") : nullptr;
  if (name_of == nullptr) exit(1);
  const auto name = reinterpret_cast<const char* (*)(int)>(name_of);
  if (with_names && name(26)[0] != 'h') exit(1);
  dlclose(library);
  return mallinfo2().uordblks;
}

void TellTheHeap(const char* path, int rounds, bool with_names) {
  size_t heap = 0;
  for (int round = 0; round < rounds; ++round) heap = HeapAfter(path, with_names);
  printf("%zu\n", heap);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc == 4) TellTheHeap(argv[1], atoi(argv[2]), strcmp(argv[3], "names") == 0);
  if (argc == 4) return 0;
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
