#define TW_LOG_SOURCE "utils"

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/utils/utils.h"

namespace {

class ThreadAttributes {
 public:
  ThreadAttributes() : m_valid(pthread_attr_init(&m_attributes) == 0) {}
  ~ThreadAttributes() {
    if (m_valid) pthread_attr_destroy(&m_attributes);
  }
  ThreadAttributes(const ThreadAttributes&) = delete;
  ThreadAttributes& operator=(const ThreadAttributes&) = delete;

  bool Valid() const { return m_valid; }
  pthread_attr_t* Get() { return &m_attributes; }

 private:
  pthread_attr_t m_attributes;
  bool m_valid;
};

}  // namespace

int CreateThread(void* (*start)(void*), void* arg, unsigned stackSize, int detached,
                 pthread_t* thread) {
  ThreadAttributes attributes;
  if (attributes.Valid() && start != nullptr && thread != nullptr) {
    // A size that the system refuses leaves the default; pinned by
    // CreateThread.AStackSizeThatIsRefusedLeavesTheDefault.
    if (stackSize != 0) pthread_attr_setstacksize(attributes.Get(), stackSize);
    if (detached != 0) pthread_attr_setdetachstate(attributes.Get(), PTHREAD_CREATE_DETACHED);
    if (pthread_create(thread, attributes.Get(), start, arg) == 0) return 1;
  }
  TW_LOG(LOG_CATEG_UTILS, LOG_LEVEL_ERROR, "Failed to create thread.\n");
  return 0;
}
