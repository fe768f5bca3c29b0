// tarnwick_log(3): a source file of a daemon that logs.
#define TW_LOG_SOURCE "camerad"

#include <string>

#include "docs/man/examples/examples.h"
#include "tarnwick/log/twdebuglog.h"

namespace {

std::string Describe(int camera) {
  return "camera " + std::to_string(camera);
}

}  // namespace

void ReportCamera(int camera, bool responds) {
  if (responds)
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG, "camera %d responds\n", camera);
  else
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_WARN, "camera %d does not respond\n", camera);

  // Work that is for the log alone.
  if (TWLogEnabled(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG2)) {
    const std::string text = Describe(camera);
    TW_LOG(LOG_CATEG_CAMERA, LOG_LEVEL_DEBUG2, "%s\n", text.c_str());
  }
}

void NotifyUser(const char* text) {
  TWPrintf(LOG_TYPE_NOTIFICATION, Enum2String(LOG_CATEG_NOTIFY), Enum2String(LOG_LEVEL_NOTICE),
           TW_LOG_SOURCE, __LINE__, __func__, "%s\n", text);
}
