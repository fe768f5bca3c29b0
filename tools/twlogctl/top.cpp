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
      : m_path(std::move(path)),
        m_terminal(terminal),
        m_signals(signals),
        m_selector(LogFilter(), Now(), false),
        m_tail(m_path) {}

  // Results: the signal that ended it, or 0.
  int Run();

 private:
  void Read();
  void Draw();
  bool TakeKeys();
  int TakeSignals();
  short Wait();

  std::string m_path;
  TopTerminal* m_terminal;
  TopSignals* m_signals;
  LogSelector m_selector;
  LogTail m_tail;
  TopModel m_model;
  Clock::time_point m_read;
  bool m_due = true;  // the log is to be looked at
};

void Top::Read() {
  const Moment now = Now();
  m_selector.Advance(now);
  m_tail.Poll([&](std::string_view text, bool continues) {
    m_selector.Take(text, continues, [&](const LogMessage& message) { m_model.Add(message, now); });
  });
  m_model.Refresh(now);
  m_read = Clock::now();
}

void Top::Draw() {
  const int error = m_tail.Error();
  DrawTop(m_model, error == 0 ? m_path : m_path + ": " + std::strerror(error));
}

bool Top::TakeKeys() {
  for (TopKey key = TopKey::kNone; m_terminal->TakeKey(&key);) {
    if (!m_model.Press(key, CategoryRows())) return false;
  }
  return true;
}

// Results: a signal to end by, or 0.
int Top::TakeSignals() {
  for (int signal = m_signals->Take(); signal != 0; signal = m_signals->Take()) {
    if (signal != SIGWINCH) return signal;
    m_terminal->Resize();
  }
  return 0;
}

// Keys and signals count at once; the log is looked at once a frame at most. Results: what poll
// says of the keyboard.
short Top::Wait() {
  const auto since = std::chrono::duration_cast<milliseconds>(Clock::now() - m_read);
  const bool early = since < kFrame;
  const milliseconds left = (early ? kFrame : m_tail.Patience()) - since;
  struct pollfd fds[] = {{STDIN_FILENO, POLLIN, 0},
                         {m_signals->Descriptor(), POLLIN, 0},
                         {early ? -1 : m_tail.Descriptor(), POLLIN, 0}};
  const int ready = poll(fds, 3, static_cast<int>(std::max(left, milliseconds(0)).count()));
  m_due = !early && (ready == 0 || fds[2].revents != 0);
  return fds[0].revents;
}

int Top::Run() {
  for (;;) {
    if (m_due) Read();
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

void AddTop(CLI::App* app, int* exitCode) {
  auto options = std::make_shared<LogOptions>();
  CLI::App* top =
      app->add_subcommand("top", "Show levels and log on the screen, and change levels.");
  AddSourceOptions(top, options.get());
  top->callback([=] { *exitCode = RunTop(FollowedPath(*options)); });
}
