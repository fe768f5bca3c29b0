#include "tarnwick/platform/unloading.h"

#include <dlfcn.h>

#include <cstdlib>

namespace {

// The library came with the program, which is never unloaded.
bool g_stays = false;

// Set by exit().
bool g_is_ending = false;

void NoteEnd() {
  g_is_ending = true;
}

// Among the names that the program was started with are the library's. glibc adds the names of a
// library that is opened later after its constructors have run, if at all (2.31 to 2.41). A function
// is asked for: of a variable the program may have a copy.
bool CameWithTheProgram() {
  void* const program = dlopen(nullptr, RTLD_LAZY | RTLD_NOLOAD);
  if (program == nullptr) return false;
  Dl_info found;
  Dl_info own;
  const void* const name = dlsym(program, "_Z15TWVersionNumberv");
  const bool same = name != nullptr && dladdr(name, &found) != 0 &&
                    dladdr(reinterpret_cast<void*>(NoteEnd), &own) != 0 &&
                    found.dli_fbase == own.dli_fbase;
  dlclose(program);
  return same;
}

// What exit() calls for a library that was opened later, it calls before the library's destructors.
// For one that came with the program it is the other way round.
__attribute__((constructor)) void WatchTheEnd() {
  g_stays = CameWithTheProgram() || atexit(NoteEnd) != 0;
}

}  // namespace

bool IsBeingUnloaded() {
  return !g_stays && !g_is_ending;
}
