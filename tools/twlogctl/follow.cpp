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
class MissingLogNotice {
 public:
  explicit MissingLogNotice(std::string path) : path_(std::move(path)) {}

  void Look(int error) {
    if (error == 0 && told_ != 0) Tell("it is there");
    if (error == 0) seen_ = told_ = 0;
    if (error == 0 || error == told_) return;
    if (error == seen_ && LogTail::Clock::now() - since_ >= std::chrono::seconds(2)) {
      TellAway(error);
    } else if (error != seen_) {
      seen_ = error;
      since_ = LogTail::Clock::now();
    }
  }

  void TellAway(int error) {
    seen_ = told_ = error;
    Tell(std::string(std::strerror(error)) + "; waiting for it");
  }

 private:
  void Tell(const std::string& text) const { Complain(path_ + ": " + text); }

  std::string path_;
  int seen_ = 0;
  int told_ = 0;
  LogTail::Clock::time_point since_;
};

class Follower {
 public:
  explicit Follower(const FollowOptions& options)
      : printer_(options.json, options.mark),
        path_(FollowedPath(options)),
        selector_(MakeFilter(options, Now(), Direction::kAhead), Now(), IsOwnLog(path_)),
        tail_(path_),
        missing_(path_) {}

  int Run(std::optional<size_t> count);

 private:
  bool ShowExisting(std::optional<size_t> count);
  void Take(std::string_view text, bool continues);
  void Poll();
  bool Ended();
  int Finish();
  void Wait();

  LogPrinter printer_;
  std::string path_;
  LogSelector selector_;
  LogTail tail_;
  MissingLogNotice missing_;
};

// What stands in the log already: all of it that is wanted when a time was given, else the last
// messages. Results: false when the log may not be read.
bool Follower::ShowExisting(std::optional<size_t> count) {
  const bool all = selector_.Filter().since && !count;
  LogWindow window(count.value_or(kDefaultCount));
  const auto print = [this](const LogMessage& message) { printer_.Print(message); };
  const auto keep = [&](const LogMessage& message) {
    all ? printer_.Print(message) : window.Add(message);
  };
  const auto take = [&](std::string_view text, bool continues) {
    selector_.Take(text, continues, keep);
  };
  tail_.Poll(take);
  tail_.Flush(take);
  window.Drain(print);
  const int error = tail_.Error();
  if (error == ENOENT) missing_.TellAway(error);
  if (error == 0 || error == ENOENT) return true;
  Complain(path_ + ": " + std::strerror(error));
  return false;
}

void Follower::Take(std::string_view text, bool continues) {
  selector_.Take(text, continues, [this](const LogMessage& message) { printer_.Print(message); });
}

void Follower::Poll() {
  selector_.Advance(Now());
  tail_.Poll([this](std::string_view text, bool continues) { Take(text, continues); });
  missing_.Look(tail_.Error());
}

bool Follower::Ended() {
  const std::optional<Moment> until = selector_.Filter().until;
  return until && Now() >= *until;
}

void Follower::Wait() {
  auto patience = tail_.Patience();
  if (const auto until = selector_.Filter().until) patience = std::min(patience, *until - Now());
  WaitForLog(tail_.Descriptor(), patience);
}

// The last message need not wait for further lines any more.
int Follower::Finish() {
  tail_.Flush([this](std::string_view text, bool continues) { Take(text, continues); });
  return printer_.Flush() ? kExitDone : kExitWrong;
}

int Follower::Run(std::optional<size_t> count) {
  if (!ShowExisting(count)) return kExitWrong;
  while (printer_.Flush()) {
    if (Ended()) return Finish();
    Wait();
    Poll();
  }
  return kExitWrong;
}

}  // namespace

void AddFollow(CLI::App* app, int* exit_code) {
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
  follow->callback([=] { *exit_code = Follower(*options).Run(options->count); });
}
