// Changes the level of one log category for all running daemons, as an administrator's tool does.
#include <cstdio>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"

namespace {

// The value from 0 to count - 1 with this name, or -1.
template <typename T>
int FindByName(const char* name, int count) {
  for (int value = 0; value < count; ++value) {
    if (std::strcmp(Enum2String(static_cast<T>(value)), name) == 0) return value;
  }
  return -1;
}

}  // namespace

int main(int argc, char** argv) {
  const int categ = argc == 3 ? FindByName<LOG_CATEG>(argv[1], LOG_CATEG_COUNT) : -1;
  const int level = argc == 3 ? FindByName<LOG_LEVEL>(argv[2], LOG_LEVEL_DEBUG3 + 1) : -1;
  if (categ == -1 || level == -1) {
    std::fprintf(stderr, "usage: set_level CATEGORY LEVEL, for example: set_level http debug3\n");
    return 2;
  }
  if (g_pDbgLogCfg == nullptr) {
    std::fprintf(stderr, "set_level: there is no shared record of levels\n");
    return 1;
  }
  const auto before = static_cast<LOG_LEVEL>(g_pDbgLogCfg->Level(static_cast<LOG_CATEG>(categ)));
  g_pDbgLogCfg->SetLevel(static_cast<LOG_CATEG>(categ), level);
  std::printf("%s: %s -> %s\n", argv[1], Enum2String(before), argv[2]);
  return 0;
}
