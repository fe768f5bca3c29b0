// A program with settings-file functions of its own: the library calls these.
#include <cstdio>
#include <cstring>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/qlibcfile.h"

int QLIBCFileGetKeyValue(const char* /*path*/, const char* key, char* value, int size,
                         int /*flags*/) {
  printf("get %s\n", key);
  snprintf(value, static_cast<size_t>(size), "%s",
           strcmp(key, "tw_dbglog_time_scale") == 0 ? "yes" : "7,6");
  return 3;
}

int QLIBCFileSetKeyValue(const char* /*path*/, const char* key, const char* value,
                         const char* /*format*/) {
  printf("set %s=%.5s\n", key, value);
  return 0;
}

int main() {
  static TWDbgLogCfg record;
  const int loaded = record.Init(0);
  const int saved = record.SaveDbgLogSettings();
  printf("%d %d %d\n", loaded, saved, record.Level(LOG_CATEG_ACCOUNT_API));
  return 0;
}
