#include "tools/twlogctl/top_terminal.h"

#include <ncurses.h>
#include <sys/ioctl.h>
#include <sys/signalfd.h>
#include <term.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <utility>

#include "tools/common/terminal.h"
#include "tools/twlogctl/top_screen.h"

namespace {

constexpr int kSignals[] = {SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGWINCH};

// Handlers of ncurses wait for none of them: they stay blocked until the terminal is put back.
int OpenSignals() {
  sigset_t set;
  sigemptyset(&set);
  for (const int signal : kSignals) sigaddset(&set, signal);
  sigprocmask(SIG_BLOCK, &set, nullptr);
  return signalfd(-1, &set, SFD_NONBLOCK | SFD_CLOEXEC);
}

TopKey KeyOf(int code) {
  constexpr std::pair<int, TopKey> kKeys[] = {
      {KEY_UP, TopKey::kUp},          {KEY_DOWN, TopKey::kDown},  {KEY_PPAGE, TopKey::kPageUp},
      {KEY_NPAGE, TopKey::kPageDown}, {KEY_HOME, TopKey::kHome},  {KEY_END, TopKey::kEnd},
      {KEY_LEFT, TopKey::kLess},      {KEY_RIGHT, TopKey::kMore}, {'n', TopKey::kNotice},
      {'s', TopKey::kSort},           {'o', TopKey::kOnly},       {' ', TopKey::kHold},
      {'?', TopKey::kHelp},           {'q', TopKey::kLeave},
  };
  for (const auto& [known, key] : kKeys) {
    if (code == known) return key;
  }
  return TopKey::kNone;
}

// Some terminals send the short forms although they were asked for the long ones.
void DefineShortKeys() {
  define_key("\x1b[A", KEY_UP);
  define_key("\x1b[B", KEY_DOWN);
  define_key("\x1b[C", KEY_RIGHT);
  define_key("\x1b[D", KEY_LEFT);
}

// A description of a terminal says what is sent to it, and root's environment may still name those
// of the user who became root.
void TakeSystemTerminalsAlone() {
  if (geteuid() != 0) return;
  for (const char* name : {"TERMINFO", "TERMINFO_DIRS", "TERMCAP", "TERMPATH", "HOME"}) {
    unsetenv(name);
  }
}

// Nothing can be drawn without it.
bool MovesTheCursor() {
  int error = 0;
  if (setupterm(nullptr, STDOUT_FILENO, &error) != OK) return false;
  const char* const cup = tigetstr("cup");
  const bool moves = cup != nullptr && cup != reinterpret_cast<const char*>(-1);
  del_curterm(cur_term);
  return moves;
}

}  // namespace

TopSignals::TopSignals() : fd_(OpenSignals()) {}

int TopSignals::Take() {
  struct signalfd_siginfo info;
  return read(fd_.Get(), &info, sizeof(info)) == sizeof(info) ? static_cast<int>(info.ssi_signo)
                                                              : 0;
}

void TopSignals::EndBy(int signal) {
  sigset_t set;
  sigemptyset(&set);
  sigaddset(&set, signal);
  std::signal(signal, SIG_DFL);
  sigprocmask(SIG_UNBLOCK, &set, nullptr);
  raise(signal);
}

bool TopTerminal::Open() {
  TakeSystemTerminalsAlone();
  if (!MovesTheCursor()) return false;
  // Not initscr, which ends the program when it fails.
  SCREEN* const screen = newterm(nullptr, stdout, stdin);
  if (screen == nullptr) return false;
  screen_ = screen;
  cbreak();
  noecho();
  nonl();
  keypad(stdscr, TRUE);
  nodelay(stdscr, TRUE);
  set_escdelay(25);
  curs_set(0);
  DefineShortKeys();
  if (MayColour(STDOUT_FILENO)) StartScreenColours();
  return true;
}

TopTerminal::~TopTerminal() {
  if (screen_ == nullptr) return;
  endwin();
  delscreen(static_cast<SCREEN*>(screen_));
}

void TopTerminal::Resize() {
  struct winsize size = {};
  if (ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) != 0 || size.ws_row == 0 || size.ws_col == 0) return;
  resizeterm(size.ws_row, size.ws_col);
}

bool TopTerminal::TakeKey(TopKey* key) {
  const int code = getch();
  if (code == ERR) return false;
  *key = KeyOf(code);
  return true;
}
