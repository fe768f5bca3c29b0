#include "tarnwick/platform/unloading.h"

#include <dlfcn.h>

namespace tarnwick {

namespace {

// The library came with the program, which is never unloaded.
bool g_stays = false;

// Set by exit(), and after the destructor functions by dlclose.
bool g_is_ending = false;

// Among the names that the program was started with are the library's. glibc adds the names of a
// library that is opened later after its constructors have run, if at all (2.31 to 2.41). A
// function is asked for: of a variable the program may have a copy.
bool CameWithTheProgram() {
  void* const program = dlopen(nullptr, RTLD_LAZY | RTLD_NOLOAD);
  if (program == nullptr) return false;
  Dl_info found;
  Dl_info own;
  const void* const name = dlsym(program, "_Z15TWVersionNumberv");
  const bool same = name != nullptr && dladdr(name, &found) != 0 && dladdr(&g_stays, &own) != 0 &&
                    found.dli_fbase == own.dli_fbase;
  dlclose(program);
  return same;
}

// exit() destroys the objects of a library that was opened later before it calls the library's
// destructor functions. For a library that came with the program it is the other way round.
struct EndOfProcess {
  EndOfProcess() noexcept { g_stays = CameWithTheProgram(); }
  ~EndOfProcess() { g_is_ending = true; }
} const g_end;

}  // namespace

bool IsBeingUnloaded() {
  return !g_stays && !g_is_ending;
}

}  // namespace tarnwick
