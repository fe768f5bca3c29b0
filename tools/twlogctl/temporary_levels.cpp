#include "tools/twlogctl/temporary_levels.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/signalfd.h>
#include <sys/socket.h>
#include <sys/timerfd.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>

#include "tarnwick/platform/unique.h"

namespace {

// The signals that end a waiting tool; the reverter takes them for "now" as well, because a service
// manager sends SIGTERM to all processes of a service.
sigset_t EndingSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  for (const int signal : {SIGINT, SIGTERM, SIGHUP, SIGQUIT}) sigaddset(&signals, signal);
  return signals;
}

void PutBack(TWDbgLogCfg* record, const std::vector<LevelChange>& changes) {
  for (const LevelChange& change : changes) {
    if (record->Level(change.categ) == change.after) record->SetLevel(change.categ, change.before);
  }
}

// A timer that also counts the time that the machine sleeps.
bool StartTimer(int timer, std::chrono::milliseconds span) {
  struct itimerspec setting = {};
  setting.it_value.tv_sec = static_cast<time_t>(span.count() / 1000);
  setting.it_value.tv_nsec = static_cast<long>(span.count() % 1000) * 1000000;
  return timerfd_settime(timer, 0, &setting, nullptr) == 0;
}

// A pipe that the parent writes to would stay open as long as the reverter has it.
void LeaveTerminal() {
  setsid();
  prctl(PR_SET_NAME, "twlogctl-guard");
  const int null = open("/dev/null", O_RDWR | O_CLOEXEC);
  for (int fd = 0; fd < 3; ++fd) dup2(null, fd);
  if (null > 2) close(null);
  // A directory that cannot be left keeps its file system busy, no more.
  if (chdir("/") != 0) return;
}

// One byte goes each way: the reverter is ready; the levels are set.
bool SendByte(int socket) {
  return send(socket, "", 1, MSG_NOSIGNAL) == 1;
}

bool ReceiveByte(int socket) {
  char byte;
  ssize_t count = recv(socket, &byte, 1, 0);
  while (count == -1 && errno == EINTR) count = recv(socket, &byte, 1, 0);
  return count == 1;
}

void WaitForAny(int first, int second, int third) {
  struct pollfd events[] = {{first, POLLIN, 0}, {second, POLLIN, 0}, {third, POLLIN, 0}};
  while (poll(events, 3, -1) == -1 && errno == EINTR) {
  }
}

[[noreturn]] void RevertLater(TWDbgLogCfg* record, const std::vector<LevelChange>& changes,
                              std::chrono::milliseconds span, int parent) {
  LeaveTerminal();
  const sigset_t signals = EndingSignals();
  const int signal = signalfd(-1, &signals, SFD_CLOEXEC);
  const int timer = timerfd_create(CLOCK_BOOTTIME, TFD_CLOEXEC);
  if (signal == -1 || timer == -1 || !SendByte(parent)) _exit(1);
  // The time runs from the change on: it could otherwise pass before the levels are set.
  if (ReceiveByte(parent) && StartTimer(timer, span)) WaitForAny(parent, timer, signal);
  PutBack(record, changes);
  _exit(0);
}

// The signals are blocked, so that they can be waited for, until the levels are back.
class BlockedSignals {
 public:
  BlockedSignals() {
    sigset_t signals = EndingSignals();
    sigaddset(&signals, SIGCHLD);
    sigprocmask(SIG_BLOCK, &signals, &before_);
  }
  ~BlockedSignals() { sigprocmask(SIG_SETMASK, &before_, nullptr); }
  BlockedSignals(const BlockedSignals&) = delete;
  BlockedSignals& operator=(const BlockedSignals&) = delete;

 private:
  sigset_t before_;
};

// The child with this process's end of its socket.
class Reverter {
 public:
  Reverter(TWDbgLogCfg* record, const std::vector<LevelChange>& changes,
           std::chrono::milliseconds span) {
    int ends[2];
    if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) == -1) return;
    socket_ = ends[0];
    pid_ = fork();
    if (pid_ == 0) {
      close(socket_);
      RevertLater(record, changes, span, ends[1]);
    }
    close(ends[1]);
  }
  ~Reverter() {
    if (socket_ >= 0) close(socket_);
  }
  Reverter(const Reverter&) = delete;
  Reverter& operator=(const Reverter&) = delete;

  bool IsReady() const { return pid_ > 0 && ReceiveByte(socket_); }
  void LevelsAreSet() const { SendByte(socket_); }

  // Waits for its end or for a signal to this process, which is the result; 0 for its end.
  int WaitForEndOrSignal() {
    sigset_t signals = EndingSignals();
    sigaddset(&signals, SIGCHLD);
    for (;;) {
      const int signal = sigwaitinfo(&signals, nullptr);
      if (signal == SIGCHLD && HasEnded(WNOHANG)) return 0;
      if (signal > 0 && signal != SIGCHLD) return signal;
    }
  }

  // Lets it act at once. Results: false when it was killed before it could.
  bool Finish() {
    close(socket_);
    socket_ = -1;
    while (!ended_ && !HasEnded(0)) {
    }
    return WIFEXITED(status_) && WEXITSTATUS(status_) == 0;
  }

 private:
  bool HasEnded(int flags) {
    if (waitpid(pid_, &status_, flags) == pid_) ended_ = true;
    return ended_;
  }

  int socket_ = -1;
  pid_t pid_ = -1;
  bool ended_ = false;
  int status_ = 0;
};

}  // namespace

TemporaryResult SetTemporarily(TWDbgLogCfg* record, const std::vector<LevelChange>& changes,
                               std::chrono::milliseconds span,
                               const std::function<void()>& started) {
  const BlockedSignals blocked;
  Reverter reverter(record, changes, span);
  if (!reverter.IsReady()) return {TemporaryEnd::kNoReverter, 0, {}};
  for (const LevelChange& change : changes) record->SetLevel(change.categ, change.after);
  reverter.LevelsAreSet();
  started();
  const int signal = reverter.WaitForEndOrSignal();
  TemporaryResult result = {
      signal == 0 ? TemporaryEnd::kTimePassed : TemporaryEnd::kInterrupted, signal, {}};
  if (!reverter.Finish()) {
    PutBack(record, changes);
    result.end = TemporaryEnd::kReverterKilled;
  }
  for (const LevelChange& change : changes) {
    if (record->Level(change.categ) != change.before) result.left.push_back(change);
  }
  return result;
}
