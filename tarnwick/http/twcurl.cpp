#define TW_LOG_SOURCE "twcurl"

#include "tarnwick/http/twcurl.h"

#include <pthread.h>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/cancel.h"

using namespace tarnwick;

namespace {

pthread_mutex_t g_mutex = PTHREAD_MUTEX_INITIALIZER;
bool g_initialised = false;  // guarded by g_mutex

class MutexLock {
 public:
  MutexLock() { pthread_mutex_lock(&g_mutex); }
  ~MutexLock() { pthread_mutex_unlock(&g_mutex); }
  MutexLock(const MutexLock&) = delete;
  MutexLock& operator=(const MutexLock&) = delete;
};

// Once per process; a failed attempt is made again by the next call.
bool CurlGlobalInit() {
  const MutexLock lock;
  if (g_initialised) return true;
  const CURLcode code = curl_global_init(CURL_GLOBAL_ALL);
  if (code != CURLE_OK) {
    TW_LOG(LOG_CATEG_HTTP, LOG_LEVEL_ERROR, "Failed to global init curl with res [%d].\n", code);
    return false;
  }
  g_initialised = true;
  return true;
}

}  // namespace

CURL* TWCurlInit() {
  const NoCancel no_cancel;
  return CurlGlobalInit() ? curl_easy_init() : nullptr;
}
