// twlogctl follow: the messages of a log as they come.
#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>

#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/log_options.h"
#include "tools/twlogctl/log_paths.h"
#include "tools/twlogctl/log_printer.h"
#include "tools/twlogctl/log_tail.h"
#include "tools/twlogctl/log_wait.h"
#include "tools/twlogctl/log_window.h"
#include "tools/twlogctl/report.h"

namespace {

constexpr size_t kDefaultCount = 10;

struct FollowOptions : LogOptions {
  std::optional<size_t> count;
};

// Says on standard error that the log is away and that it is back. A rotation leaves it away for a
// moment, which is not worth a word.
class Absence {
 public:
  explicit Absence(std::string path) : m_path(std::move(path)) {}

  void Look(int error) {
    if (error == 0 && m_told != 0) Tell("it is there");
    if (error == 0) m_seen = m_told = 0;
    if (error == 0 || error == m_told) return;
    if (error == m_seen && LogTail::Clock::now() - m_since >= std::chrono::seconds(2)) {
      TellAway(error);
    } else if (error != m_seen) {
      m_seen = error;
      m_since = LogTail::Clock::now();
    }
  }

  void TellAway(int error) {
    m_seen = m_told = error;
    Tell(std::string(std::strerror(error)) + "; waiting for it");
  }

 private:
  void Tell(const std::string& text) const { Complain(m_path + ": " + text); }

  std::string m_path;
  int m_seen = 0;
  int m_told = 0;
  LogTail::Clock::time_point m_since;
};

class Follower {
 public:
  explicit Follower(const FollowOptions& options)
      : m_printer(options.json, options.mark),
        m_path(FollowedPath(options)),
        m_selector(MakeFilter(options, Now(), Direction::kAhead), Now(), IsOwnLog(m_path)),
        m_tail(m_path),
        m_absence(m_path) {}

  int Run(std::optional<size_t> count);

 private:
  bool ShowExisting(std::optional<size_t> count);
  void Take(std::string_view text, bool continues);
  void Poll();
  bool Ended();
  int Finish();
  void Wait();

  LogPrinter m_printer;
  std::string m_path;
  LogSelector m_selector;
  LogTail m_tail;
  Absence m_absence;
};

// What stands in the log already: all of it that is wanted when a time was given, else the last
// messages. Results: false when the log may not be read.
bool Follower::ShowExisting(std::optional<size_t> count) {
  const bool all = m_selector.Filter().since && !count;
  LogWindow window(count.value_or(kDefaultCount));
  const auto print = [this](const LogMessage& message) { m_printer.Print(message); };
  const auto keep = [&](const LogMessage& message) {
    all ? m_printer.Print(message) : window.Add(message);
  };
  const auto take = [&](std::string_view text, bool continues) {
    m_selector.Take(text, continues, keep);
  };
  m_tail.Poll(take);
  m_tail.Flush(take);
  window.Drain(print);
  const int error = m_tail.Error();
  if (error == ENOENT) m_absence.TellAway(error);
  if (error == 0 || error == ENOENT) return true;
  Complain(m_path + ": " + std::strerror(error));
  return false;
}

void Follower::Take(std::string_view text, bool continues) {
  m_selector.Take(text, continues, [this](const LogMessage& message) { m_printer.Print(message); });
}

void Follower::Poll() {
  m_selector.Advance(Now());
  m_tail.Poll([this](std::string_view text, bool continues) { Take(text, continues); });
  m_absence.Look(m_tail.Error());
}

bool Follower::Ended() {
  const std::optional<Moment> until = m_selector.Filter().until;
  return until && Now() >= *until;
}

void Follower::Wait() {
  auto patience = m_tail.Patience();
  if (const auto until = m_selector.Filter().until) patience = std::min(patience, *until - Now());
  WaitForLog(m_tail.Descriptor(), patience);
}

// The last message need not wait for further lines any more.
int Follower::Finish() {
  m_tail.Flush([this](std::string_view text, bool continues) { Take(text, continues); });
  return m_printer.Flush() ? kExitDone : kExitWrong;
}

int Follower::Run(std::optional<size_t> count) {
  if (!ShowExisting(count)) return kExitWrong;
  while (m_printer.Flush()) {
    if (Ended()) return Finish();
    Wait();
    Poll();
  }
  return kExitWrong;
}

}  // namespace

void AddFollow(CLI::App* app, int* exitCode) {
  auto options = std::make_shared<FollowOptions>();
  CLI::App* follow = app->add_subcommand("follow", "Show the messages of a log as they come.");
  AddSourceOptions(follow, options.get());
  AddFilterOptions(follow, options.get());
  AddTimeOptions(follow, options.get());
  AddJsonOption(follow, options.get());
  AddMarkOption(follow, options.get());
  follow
      ->add_option("-n,--lines", options->count,
                   "Show so many of the messages that are there already (10, or all of --since).")
      ->check(IsWholeNumber)
      ->type_name("COUNT");
  follow->callback([=] { *exitCode = Follower(*options).Run(options->count); });
}
