// twlogctl show: the messages of a log.
#include <CLI/CLI.hpp>
#include <cstring>
#include <memory>
#include <optional>

#include "tools/twlogctl/commands.h"
#include "tools/twlogctl/log_options.h"
#include "tools/twlogctl/log_printer.h"
#include "tools/twlogctl/log_reading.h"
#include "tools/twlogctl/log_window.h"
#include "tools/twlogctl/report.h"

namespace {

struct ShowOptions : LogOptions {
  std::optional<size_t> count;
};

// Counts what was shown, because nothing found is a result of its own.
class Shower {
 public:
  explicit Shower(const LogOptions& options) : printer_(options.json, options.mark) {}

  void Show(const LogMessage& message) {
    printer_.Print(message);
    found_ = true;
  }
  bool Found() const { return found_; }
  bool Flush() { return printer_.Flush(); }

 private:
  LogPrinter printer_;
  bool found_ = false;
};

int Show(const ShowOptions& options) {
  const std::string path = LogPath(options);
  const LogFilter filter = MakeFilter(options, Now(), Direction::kBack);
  Shower shower(options);
  LogWindow window(options.count.value_or(0));
  const int error = ReadLog(path, filter, [&](const LogMessage& message) {
    options.count ? window.Add(message) : shower.Show(message);
  });
  window.Drain([&](const LogMessage& message) { shower.Show(message); });
  if (!shower.Flush()) return kExitWrong;
  if (error != 0) {
    Complain(path + ": " + std::strerror(error));
    return kExitWrong;
  }
  if (shower.Found()) return kExitDone;
  Complain(path + ": no message matches");
  return kExitWrong;
}

}  // namespace

void AddShow(CLI::App* app, int* exit_code) {
  auto options = std::make_shared<ShowOptions>();
  CLI::App* show = app->add_subcommand("show", "Show the messages of a log.");
  AddSourceOptions(show, options.get());
  AddFilterOptions(show, options.get());
  AddTimeOptions(show, options.get());
  AddJsonOption(show, options.get());
  AddMarkOption(show, options.get());
  show->add_option("-n,--lines", options->count, "Show the last messages only, so many of them.")
      ->check(IsWholeNumber)
      ->type_name("COUNT");
  show->callback([=] { *exit_code = Show(*options); });
}
