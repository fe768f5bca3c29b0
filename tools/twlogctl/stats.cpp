// twlogctl stats: who logs how much.
#include <sys/ioctl.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>

#include "tools/common/terminal.h"
#include "tools/common/units.h"
#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/log_options.h"
#include "tools/twlogctl/log_plot.h"
#include "tools/twlogctl/log_reading.h"
#include "tools/twlogctl/log_tail.h"
#include "tools/twlogctl/log_wait.h"
#include "tools/twlogctl/report.h"
#include "tools/twlogctl/stats_report.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;

constexpr seconds kWindow(60);

struct StatsOptions : LogOptions {
  size_t most = 10;
  std::string interval;
  bool watch = false;
};

StatsLayout LayoutFor(const StatsOptions& options) {
  StatsLayout layout;
  layout.width = static_cast<size_t>(std::max(TerminalWidth(STDOUT_FILENO), 20));
  layout.most = options.most;
  layout.blocks = MayDrawBlocks();
  layout.colour = MayColour(STDOUT_FILENO);
  return layout;
}

// What standard output does not take the program reports at its end.
bool FlushOutput() {
  return fflush(stdout) == 0 && ferror(stdout) == 0;
}

bool Print(const StatsReport& report, const StatsOptions& options) {
  if (options.json) return PrintStatsJson(report);
  for (const std::string& line : StatsLines(report, LayoutFor(options))) puts(line.c_str());
  return FlushOutput();
}

// The span is the one that was asked for; a log that is still written ends now.
StatsReport ReportOf(const LogCounter& counter, const LogFilter& filter,
                     const StatsOptions& options) {
  const Moment now = Now();
  const Moment first = std::chrono::floor<seconds>(counter.First().value_or(now));
  const Moment last = std::chrono::floor<seconds>(counter.Last().value_or(now)) + seconds(1);
  StatsReport report;
  report.source = LogPath(options);
  report.own_processes = options.file.empty();
  report.amounts = counter.Amounts();
  report.lines_by_second = counter.LinesBySecond();
  report.begin = filter.since.value_or(first);
  report.end = filter.until.value_or(filter.since && options.file.empty() ? now : last);
  report.end = std::max(report.end, report.begin + seconds(1));
  return report;
}

int CountOnce(const StatsOptions& options) {
  const std::string path = LogPath(options);
  const LogFilter filter = MakeFilter(options, Now(), Direction::kBack);
  LogCounter counter;
  const int error = ReadLog(path, filter, [&](const LogMessage& message) { counter.Add(message); });
  if (error != 0) {
    Complain(path + ": " + std::strerror(error));
    return kExitWrong;
  }
  if (counter.Amounts().all.lines == 0) {
    Complain(path + ": no message matches");
    return kExitWrong;
  }
  return Print(ReportOf(counter, filter, options), options) ? kExitDone : kExitWrong;
}

// Counts the last minute, or the span of --since, again and again.
class StatsWatch {
 public:
  StatsWatch(const StatsOptions& options, milliseconds interval)
      : options_(options),
        interval_(interval),
        selector_(MakeFilter(options, Now(), Direction::kAhead), Now(), false),
        tail_(FollowedPath(options)),
        counter_(WindowOf(selector_.Filter())) {
    selector_.Filter().since = Now() - counter_.Window();
  }

  int Run();

 private:
  static seconds WindowOf(const LogFilter& filter);
  void Take(bool all);
  bool PrintNow();
  void PrintScreen(const StatsReport& report);
  void TakeUntil(Moment next);

  const StatsOptions& options_;
  milliseconds interval_;
  LogSelector selector_;
  LogTail tail_;
  SlidingCounter counter_;
};

seconds StatsWatch::WindowOf(const LogFilter& filter) {
  if (!filter.since) return kWindow;
  return std::max(std::chrono::ceil<seconds>(Now() - *filter.since), seconds(1));
}

// `all` takes the last message too, for which further lines may come.
void StatsWatch::Take(bool all) {
  const Moment now = Now();
  selector_.Advance(now);
  const auto take = [&](std::string_view text, bool continues) {
    selector_.Take(text, continues, [&](const LogMessage& message) { counter_.Add(message, now); });
  };
  tail_.Poll(take);
  if (all) tail_.Flush(take);
  counter_.Advance(now);
}

// Each report overwrites the one before; what does not fit would scroll.
void StatsWatch::PrintScreen(const StatsReport& report) {
  struct winsize size = {};
  const bool known = ioctl(STDOUT_FILENO, TIOCGWINSZ, &size) == 0 && size.ws_row > 0;
  const size_t height = known ? size.ws_row : 24;
  StatsLayout layout = LayoutFor(options_);
  // Twelve lines are not of the three tables.
  layout.most = std::min(layout.most, height > 15 ? (height - 13) / 3 : 1);
  std::vector<std::string> lines = StatsLines(report, layout);
  lines.resize(std::min(lines.size(), height - 1));
  fputs("\x1b[H", stdout);
  for (const std::string& line : lines) printf("%s\x1b[K\n", line.c_str());
  fputs("\x1b[J", stdout);
}

bool StatsWatch::PrintNow() {
  StatsReport report;
  report.source = LogPath(options_);
  report.own_processes = options_.file.empty();
  report.end = Now();
  report.begin = report.end - counter_.Window();
  report.amounts = counter_.Amounts();
  report.lines_by_second = counter_.LinesBySecond();
  const char* terminal = std::getenv("TERM");
  const bool dumb = terminal == nullptr || std::strcmp(terminal, "dumb") == 0;
  if (options_.json || dumb || !IsTerminal(STDOUT_FILENO)) return Print(report, options_);
  PrintScreen(report);
  return FlushOutput();
}

void StatsWatch::TakeUntil(Moment next) {
  for (Moment now = Now(); now < next; now = Now()) {
    WaitForLog(tail_.Descriptor(), std::min(tail_.Patience(), milliseconds(next - now)));
    Take(false);
  }
}

int StatsWatch::Run() {
  Take(true);
  if (tail_.Error() != 0 && tail_.Error() != ENOENT) {
    Complain(LogPath(options_) + ": " + std::strerror(tail_.Error()));
    return kExitWrong;
  }
  if (!options_.json && IsTerminal(STDOUT_FILENO)) fputs("\x1b[2J", stdout);
  while (PrintNow()) {
    const std::optional<Moment> until = selector_.Filter().until;
    if (until && Now() >= *until) return kExitDone;
    Moment next = Now() + interval_;
    if (until) next = std::min(next, *until);
    TakeUntil(next);
  }
  return kExitWrong;
}

int Stats(const StatsOptions& options) {
  // For the characters of the plot alone: numbers and months stay as they are.
  std::setlocale(LC_CTYPE, "");
  if (!options.watch) return CountOnce(options);
  const auto interval = ParseSpan(options.interval.empty() ? "2" : options.interval);
  if (!interval || *interval < milliseconds(100)) {
    throw CLI::ValidationError("--watch",
                               "\"" + options.interval + "\" is no span of 100 ms or more");
  }
  return StatsWatch(options, *interval).Run();
}

}  // namespace

void AddStats(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<StatsOptions>();
  CLI::App* stats =
      app->add_subcommand("stats", "Count lines and bytes by category, level and process.");
  AddSourceOptions(stats, options.get());
  AddFilterOptions(stats, options.get());
  AddTimeOptions(stats, options.get());
  AddJsonOption(stats, options.get());
  stats
      ->add_option("-n,--most", options->most,
                   "Show so many categories and processes, the loudest first (10).")
      ->check(IsWholeNumber)
      ->type_name("COUNT");
  auto* watch = stats
                    ->add_option("-w,--watch", options->interval,
                                 "Show the last minute, or the span of --since, again every so "
                                 "many seconds (2).")
                    ->expected(0, 1)
                    ->type_name("SPAN");
  stats->callback([=] {
    options->watch = watch->count() > 0;
    *exit_code = Stats(*options);
  });
}
