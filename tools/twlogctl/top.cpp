// twlogctl top: levels and log on one screen.
#include <poll.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <clocale>
#include <cstring>
#include <memory>

#include "tools/common/terminal.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/log_options.h"
#include "tools/twlogctl/log_tail.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/top_model.h"
#include "tools/twlogctl/top_screen.h"
#include "tools/twlogctl/top_terminal.h"

namespace {

using Clock = LogTail::Clock;
using std::chrono::milliseconds;

// A busy log is drawn so often at most.
constexpr milliseconds kFrame(100);

class Top {
 public:
  Top(std::string path, TopTerminal* terminal, TopSignals* signals)
      : path_(std::move(path)),
        terminal_(terminal),
        signals_(signals),
        selector_(LogFilter(), Now(), false),
        tail_(path_) {}

  // Results: the signal that ended it, or 0.
  int Run();

 private:
  void Read();
  void Draw();
  bool TakeKeys();
  int TakeSignals();
  short Wait();

  std::string path_;
  TopTerminal* terminal_;
  TopSignals* signals_;
  LogSelector selector_;
  LogTail tail_;
  TopModel model_;
  Clock::time_point read_;
  bool due_ = true;  // the log is to be looked at
};

void Top::Read() {
  const Moment now = Now();
  selector_.Advance(now);
  tail_.Poll([&](std::string_view text, bool continues) {
    selector_.Take(text, continues, [&](const LogMessage& message) { model_.Add(message, now); });
  });
  model_.Refresh(now);
  read_ = Clock::now();
}

void Top::Draw() {
  const int error = tail_.Error();
  DrawTop(model_, error == 0 ? path_ : path_ + ": " + std::strerror(error));
}

bool Top::TakeKeys() {
  for (TopKey key = TopKey::kNone; terminal_->TakeKey(&key);) {
    if (!model_.Press(key, CategoryRows())) return false;
  }
  return true;
}

// Results: a signal to end by, or 0.
int Top::TakeSignals() {
  for (int signal = signals_->Take(); signal != 0; signal = signals_->Take()) {
    if (signal != SIGWINCH) return signal;
    terminal_->Resize();
  }
  return 0;
}

// Keys and signals count at once; the log is looked at once a frame at most. Results: what poll
// says of the keyboard.
short Top::Wait() {
  const auto since = std::chrono::duration_cast<milliseconds>(Clock::now() - read_);
  const bool early = since < kFrame;
  const milliseconds left = (early ? kFrame : tail_.Patience()) - since;
  struct pollfd fds[] = {{STDIN_FILENO, POLLIN, 0},
                         {signals_->Descriptor(), POLLIN, 0},
                         {early ? -1 : tail_.Descriptor(), POLLIN, 0}};
  const int ready = poll(fds, 3, static_cast<int>(std::max(left, milliseconds(0)).count()));
  due_ = !early && (ready == 0 || fds[2].revents != 0);
  return fds[0].revents;
}

int Top::Run() {
  for (;;) {
    if (due_) Read();
    Draw();
    const short keyboard = Wait();
    if (const int signal = TakeSignals()) return signal;
    if (!TakeKeys() || (keyboard & (POLLHUP | POLLERR | POLLNVAL)) != 0) return 0;
  }
}

int RunTop(const std::string& path) {
  if (!IsTerminal(STDIN_FILENO) || !IsTerminal(STDOUT_FILENO)) {
    Complain("top needs a terminal; \"twlogctl stats --watch\" and \"twlogctl follow\" do not");
    return kExitWrong;
  }
  std::setlocale(LC_CTYPE, "");
  TopSignals signals;
  int ended = 0;
  {
    TopTerminal terminal;
    if (!terminal.Open()) {
      Complain("top does not know this terminal; is TERM set?");
      return kExitWrong;
    }
    ended = Top(path, &terminal, &signals).Run();
  }
  if (ended != 0) TopSignals::EndBy(ended);
  return kExitDone;
}

}  // namespace

void AddTop(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<LogOptions>();
  CLI::App* top =
      app->add_subcommand("top", "Show levels and log on the screen, and change levels.");
  AddSourceOptions(top, options.get());
  top->callback([=] { *exit_code = RunTop(FollowedPath(*options)); });
}
