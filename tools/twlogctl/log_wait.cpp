#include "tools/twlogctl/log_wait.h"

#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>

void WaitForLog(int fd, std::chrono::milliseconds patience) {
  constexpr std::chrono::milliseconds kLongest(std::chrono::hours(1));
  const auto wait = std::clamp(patience, std::chrono::milliseconds(0), kLongest);
  struct pollfd fds[] = {{fd, POLLIN, 0}, {STDOUT_FILENO, 0, 0}};
  poll(fds, 2, static_cast<int>(wait.count()));
  if ((fds[1].revents & (POLLERR | POLLNVAL)) == 0) return;
  // Whoever started this process may have told it to ignore the signal.
  std::signal(SIGPIPE, SIG_DFL);
  std::raise(SIGPIPE);
}
