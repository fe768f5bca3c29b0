#define TW_LOG_SOURCE "utils"

#include <unistd.h>

#include <cerrno>

#include "tarnwick/log/twdebuglog.h"
#include "tarnwick/platform/signal_guard.h"
#include "tarnwick/utils/utils.h"

using namespace tarnwick;

namespace {

constexpr int kRetryPeriodUs = 10000;
constexpr int kMaxEmptyWrites = 5;

}  // namespace

int WriteFd(int fd, const void* buf, int len) {
  DelayTimer timer(kRetryPeriodUs);
  if (len < 1) return 0;
  SignalGuard guard(SIGPIPE);
  const char* const bytes = static_cast<const char*>(buf);
  int written = 0;
  int emptyWrites = 0;
  while (written < len) {
    const ssize_t count = write(fd, bytes + written, static_cast<size_t>(len - written));
    if (count > 0) {
      written += static_cast<int>(count);
    } else if (count == 0) {
      if (++emptyWrites > kMaxEmptyWrites) return written;
    } else if (errno == EAGAIN || errno == EINTR) {
      timer.Delay();
    } else {
      guard.DiscardPending();
      TW_LOG(LOG_CATEG_UTILS, LOG_LEVEL_NOTICE, "Write fd[%d] error[%d]\n", fd, errno);
      return written;
    }
  }
  return written;
}
