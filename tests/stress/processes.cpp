#include "tests/stress/processes.h"

#include <gtest/gtest.h>
#include <linux/capability.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>

#include "tests/support/process.h"

namespace {

constexpr int kFailedCheck = 99;  // of the test support

}  // namespace

pid_t Spawn(const std::function<int()>& body) {
  fflush(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    const int code = body();
    _exit(::testing::Test::HasFailure() ? kFailedCheck : code);
  }
  if (pid < 0) {
    perror("fork");
    abort();
  }
  return pid;
}

std::optional<int> WaitFor(pid_t pid, double seconds) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::duration<double>(seconds);
  int status = 0;
  while (waitpid(pid, &status, WNOHANG) == 0) {
    if (std::chrono::steady_clock::now() >= deadline) return std::nullopt;
    usleep(1000);
  }
  return status;
}

std::string StatusText(const std::optional<int>& status) {
  if (!status) return "still running";
  if (WIFSIGNALED(*status)) return "signal " + std::to_string(WTERMSIG(*status));
  return "exit code " + std::to_string(WEXITSTATUS(*status));
}

bool DropCapabilities() {
  __user_cap_header_struct header = {_LINUX_CAPABILITY_VERSION_3, 0};
  const __user_cap_data_struct none[2] = {};
  return syscall(SYS_capset, &header, none) == 0;
}

int DescriptorsOn(const std::string& part) {
  int count = 0;
  for (const auto& [fd, target] : OpenDescriptors()) {
    if (target.find(part) != std::string::npos) ++count;
  }
  return count;
}
